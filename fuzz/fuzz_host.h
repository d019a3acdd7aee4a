// What the fuzz targets that drive the converter share: a host that hears no
// messages and whose exit handler returns, and text output into /dev/null.
#pragma once

#include <fcntl.h>
#include <unistd.h>

#include <string_view>

#include "port_file.h"
#include "port_msg.h"
#include "vrx.h"

/// Silences every report and keeps the run alive after fatal ones, so that
/// the code under test must carry on safely.
inline void quiet_and_alive() {
    static const bool done = [] {
        Port_MsgDispatcher::set_sink(
            [](Port_MsgLevel, const Port_MsgLocation&, std::string_view) {});
        Port_MsgDispatcher::set_exit_handler([](int) {});
        return true;
    }();
    (void)done;
}

struct VRX_TEST_ACCESS {
    /// Writes `design` (when given) or `library` as text into /dev/null.
    static void write_to_null(VRX& vrx, HX_DESIGN* design, HX_LIBRARY* library) {
        Port::Stream stream(Port::ACCESS_WRITE, 4096);
        const int fd = ::open("/dev/null", O_WRONLY | O_CLOEXEC);
        if (fd < 0) __builtin_trap();
        stream.attach(fd, "/dev/null", true);
        vrx.out_stream = &stream;
        if (design != nullptr) {
            vrx.design = design;
            vrx.write_design();
        } else {
            vrx.library = library;
            vrx.write_library();
        }
        vrx.out_stream = nullptr;
    }

    /// Writes `design` (when given) or `library` as text at `path`.
    static VX_STATUS write_file(VRX& vrx, HX_DESIGN* design, HX_LIBRARY* library,
                                const char* path) {
        vrx.design = design;
        vrx.library = library;
        vrx.is_design = design != nullptr;
        return vrx.vrx_write(path, nullptr, 0);
    }
};
