// The converter installs its progress hook in the reader and the database
// only for the length of one conversion call.
#pragma once

#include "hx_file.h"
#include "vrx_scan.h"

/// Takes the hooks back on every way out of a call, exceptions included:
/// they point at the converter, which may be gone before the next call.
struct VX_PROGRESS_HOOKS_OFF {
    VX_PROGRESS_HOOKS_OFF() = default;
    VX_PROGRESS_HOOKS_OFF(const VX_PROGRESS_HOOKS_OFF&) = delete;
    VX_PROGRESS_HOOKS_OFF& operator=(const VX_PROGRESS_HOOKS_OFF&) = delete;
    ~VX_PROGRESS_HOOKS_OFF() {
        vrx_set_scan_progress(nullptr, nullptr);
        HX_FILE_IO::set_progress(nullptr, nullptr);
    }
};
