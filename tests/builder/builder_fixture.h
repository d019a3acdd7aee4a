// What the builder tests share: a converter that reads a VRX text written to a
// scratch file, the reader's line-numbered reports in a comparable form, and
// lookups of the objects built.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "hx_library.h"
#include "msg_capture.h"
#include "scoped_env.h"
#include "scratch_dir.h"
#include "vrx.h"

namespace builder_test {

/// A report of the reader as "E <text>" (error) or "W <text>" (warning).
std::string E(int line, const std::string& text);
std::string W(int line, const std::string& text);

/// The design of `library` called `name`; fails the test when there is none.
HX_DESIGN* design_named(HX_LIBRARY* library, const char* name);
/// The block of `design` whose hierarchical name is `hiername`, of the kind asked.
HX_BLOCK* block_named(HX_DESIGN* design, const std::string& hiername, bool physical = false);
/// Child `index` of `parent` in creation order, or null.
HX_BLOCK* child(const HX_BLOCK* parent, size_t index);
/// The network of `design` whose name is `name`, or null.
HX_NETWORK* net_named(HX_DESIGN* design, const std::string& name);
/// The text of property `name` of `object`, or "<none>" when it has none.
std::string text_prop(const HX_OBJECT* object, const char* name);
/// The names of the properties of `object`, in order, each followed by a space.
std::string prop_names(const HX_OBJECT* object);
/// The kind of property `name` of `object`, or -1 when it has none.
int prop_kind(const HX_OBJECT* object, const char* name);
/// True when a network of any design of `library` still carries a merge record.
bool has_merge_records(HX_LIBRARY* library);

class BuilderTest : public ::testing::Test {
  protected:
    /// Writes `text` to in.vrx and reads it.
    VX_STATUS read(const std::string& text, uint8_t is_design = 1, uint8_t make_physroot = 0,
                   uint8_t nograft = 0);
    /// The reader's reports ("../s/vrx") at warning and error level, in order.
    std::vector<std::string> reports() const;
    /// Texts at `level` from the converter's other sources (not the reader, not the DRC).
    std::vector<std::string> own_texts(Port_MsgLevel level) const;
    HX_DESIGN* design() const { return vrx.get_design(); }
    HX_BLOCK* root() const { return design()->get_log_root(); }

    // Device descriptions come from the library's own folder only.
    ScopedEnv device_path{"HX_DEVICE_PATH", nullptr};
    ScratchDir dir;
    std::string input = dir.file("in.vrx");
    MsgCapture capture;
    VRX vrx;
};

}  // namespace builder_test
