#include "writer_access.h"

#include <cstdio>

Port::Stream*& VRX_TEST_ACCESS::out_stream(VRX& v) {
    return v.out_stream;
}
int32_t& VRX_TEST_ACCESS::column(VRX& v) {
    return v.column;
}
int16_t& VRX_TEST_ACCESS::indent(VRX& v) {
    return v.indent;
}
HX_DESIGN*& VRX_TEST_ACCESS::design(VRX& v) {
    return v.design;
}
HX_LIBRARY*& VRX_TEST_ACCESS::library(VRX& v) {
    return v.library;
}
uint8_t& VRX_TEST_ACCESS::is_design(VRX& v) {
    return v.is_design;
}
Hxb_PropFilter*& VRX_TEST_ACCESS::prop_filter(VRX& v) {
    return v.prop_filter;
}

void VRX_TEST_ACCESS::write_string(VRX& v, const char* first, const char* second) {
    v.write_string(first, second);
}
void VRX_TEST_ACCESS::write_indent(VRX& v, int32_t count, const char* w1, const char* w2,
                                   const char* w3, const char* w4) {
    // An absent word is a view without data.
    auto word = [](const char* w) { return w ? std::string_view(w) : std::string_view(); };
    v.write_indent(count, word(w1), word(w2), word(w3), word(w4));
}
void VRX_TEST_ACCESS::begin_construct(VRX& v) {
    v.begin_construct();
}
void VRX_TEST_ACCESS::end_construct(VRX& v) {
    v.end_construct();
}
std::string VRX_TEST_ACCESS::quote_kwd(VRX& v, const char* name) {
    return std::string(v.quote_kwd(name).view());
}
std::string VRX_TEST_ACCESS::vrx_legal(VRX& v, const char* name, const void* object) {
    return std::string(v.vrx_legal(name, object).view());
}
std::string VRX_TEST_ACCESS::build_hiername(VRX& v, HX_BLOCK* block) {
    return v.build_hiername(block);
}
void VRX_TEST_ACCESS::write_props(VRX& v, const HX_OBJECT* object, uint8_t* opened) {
    v.write_props(object, opened);
}

namespace writer_test {

std::string text(std::string lines, const Substitutions& subs) {
    if (!lines.empty() && lines[0] == '\n') lines.erase(0, 1);
    for (const auto& [key, value] : subs) {
        for (size_t at = lines.find(key); at != std::string::npos; at = lines.find(key, at)) {
            lines.replace(at, key.size(), value);
            at += value.size();
        }
    }
    std::string out;
    for (char c : lines) {
        if (c == '\n') out += '\r';
        out += c;
    }
    return out;
}

HX_PIN* name_pin(HX_BLOCK* block, uint16_t index, const char* name, uint8_t dir) {
    HX_PIN* pin = block->get_pin(index);
    pin->set_name(name);
    pin->set_dir(dir);
    return pin;
}

void expect_writer_report(const MsgCapture& capture, Port_MsgLevel level, const std::string& text) {
    std::vector<CapturedMsg> reports;
    for (const CapturedMsg& m : capture.messages()) {
        if (m.level != PORT_MSG_STATUS) reports.push_back(m);
    }
    ASSERT_EQ(reports.size(), 1u);
    EXPECT_EQ(reports[0].level, level);
    EXPECT_EQ(reports[0].text, text);
    EXPECT_EQ(reports[0].module, "Quorra");
    EXPECT_EQ(reports[0].file, "basvxwrite");
    EXPECT_EQ(reports[0].revision, "$Revision: 1.3 $");
}

ScratchStream::ScratchStream(VRX& vrx, const ScratchDir& dir)
    : vrx_(vrx), path_(dir.file("layer.out")) {
    EXPECT_NE(Port::File::open(path_.c_str(), &stream_, false), nullptr);
    A::out_stream(vrx_) = &stream_;
}

ScratchStream::~ScratchStream() {
    A::out_stream(vrx_) = nullptr;
}

std::string ScratchStream::bytes() {
    EXPECT_TRUE(Port::File::close(&stream_));
    return ScratchDir::read_file(path_);
}

std::string WriterFixture::body(const char* filter, uint8_t omit_user) {
    A::design(vrx) = design;
    A::is_design(vrx) = 1;
    const std::string path = dir.file("out.vrx");
    EXPECT_EQ(vrx.vrx_write(path.c_str(), filter, omit_user), VX_OK);
    EXPECT_EQ(errors(), std::vector<std::string>{});
    EXPECT_EQ(capture.exits(), std::vector<int>{});
    EXPECT_EQ(A::indent(vrx), 0);
    std::string written = ScratchDir::read_file(path);
    for (int line = 0; line < 2; ++line) {  // the header lines have tests of their own
        const size_t end = written.find("\r\n");
        if (end == std::string::npos) return "(header line missing) " + written;
        written.erase(0, end + 2);
    }
    return written;
}

}  // namespace writer_test
