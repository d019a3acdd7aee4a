// What the writer tests share: access to the converter's private writer
// operations, a scratch stream for the output layer, and a fixture that
// writes a design through vrx_write and gives the text back.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "msg_capture.h"
#include "scratch_dir.h"
#include "vrx.h"

struct VRX_TEST_ACCESS {
    static Port::Stream*& out_stream(VRX& v);
    static int32_t& column(VRX& v);
    static int16_t& indent(VRX& v);
    static HX_DESIGN*& design(VRX& v);
    static HX_LIBRARY*& library(VRX& v);
    static uint8_t& is_design(VRX& v);
    static Hxb_PropFilter*& prop_filter(VRX& v);

    static void write_string(VRX& v, const char* first, const char* second);
    static void write_indent(VRX& v, int32_t count, const char* w1, const char* w2,
                             const char* w3 = nullptr, const char* w4 = nullptr);
    static void begin_construct(VRX& v);
    static void end_construct(VRX& v);
    static std::string quote_kwd(VRX& v, const char* name);
    static std::string vrx_legal(VRX& v, const char* name, const void* object);
    static std::string build_hiername(VRX& v, HX_BLOCK* block);
    static void write_props(VRX& v, const HX_OBJECT* object, uint8_t* opened);
};

namespace writer_test {

using A = VRX_TEST_ACCESS;
using Substitutions = std::vector<std::pair<std::string, std::string>>;

/// Expected output: `lines` without its first line feed, each "\n" made
/// "\r\n", and each key of `subs` replaced by its value.
std::string text(std::string lines, const Substitutions& subs = {});
/// Names pin `index` of `block` and gives it direction `dir`.
HX_PIN* name_pin(HX_BLOCK* block, uint16_t index, const char* name, uint8_t dir);

/// Expects that the only report above status level is `text` at `level`,
/// from the writer's own source.
void expect_writer_report(const MsgCapture& capture, Port_MsgLevel level, const std::string& text);

/// Points the converter's output at a scratch file for the output layer's tests.
class ScratchStream {
  public:
    ScratchStream(VRX& vrx, const ScratchDir& dir);
    ~ScratchStream();
    /// Closes the stream and gives every byte written.
    std::string bytes();

  private:
    VRX& vrx_;
    std::string path_;
    Port::Stream stream_{Port::ACCESS_WRITE, 4096};
};

/// One converter, messages captured, and a design "d" of the test's own.
class WriterFixture : public ::testing::Test {
  protected:
    /// Writes `design` with vrx_write, expecting success without errors, and
    /// gives the text behind the two header lines.
    std::string body(const char* filter = nullptr, uint8_t omit_user = 0);
    std::vector<std::string> errors() const { return capture.texts(PORT_MSG_ERROR); }

    MsgCapture capture;
    ScratchDir dir;
    VRX vrx;
    HX_LIBRARY lib{"lib", 0};
    HX_DESIGN* design = lib.create_design("d");
};

}  // namespace writer_test
