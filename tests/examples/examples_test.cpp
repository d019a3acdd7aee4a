// The bundled examples. Both netlists read without any finding (no warning
// or error, design-rule check included), what they show arrives in the
// database, and text -> database file -> text -> database file -> text is
// stable. The property filter changes what hxb2vrx writes as its rules say,
// and the embedding example converts both ways and reports a failed step.
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "hx_library.h"
#include "msg_capture.h"
#include "scratch_dir.h"
#include "tool_run.h"
#include "vrx.h"

namespace {

const std::string kExamples = VRX_EXAMPLES_DIR;

/// Warnings and worse, one a line.
std::string findings(const MsgCapture& capture) {
    std::string out;
    for (const CapturedMsg& m : capture.messages())
        if (m.level >= PORT_MSG_WARNING) out += m.module + ": " + m.text + "\n";
    return out;
}

/// Frees what a converter read, for design and library files alike.
void free_read(const VRX& vrx) {
    HX_LIBRARY* library = vrx.get_library();
    if (library == nullptr && vrx.get_design() != nullptr)
        library = vrx.get_design()->get_library();
    if (library != nullptr) hx_env.delete_library(library);
}

/// Reads the text `in` as a design or a library and stores it as `db`.
void text_to_database(const std::string& in, const std::string& db, bool is_design) {
    MsgCapture capture;
    {
        VRX vrx;
        EXPECT_EQ(vrx.vrx_read(in.c_str(), is_design ? 1 : 0, 0, 0), VX_OK) << in;
        EXPECT_EQ(vrx.hxb_write(db.c_str()), VX_OK) << db;
        free_read(vrx);
    }
    EXPECT_EQ(findings(capture), "") << "reading " << in;
}

/// Writes the database file `db` as the text `out` and returns that text.
std::string database_to_text(const std::string& db, const std::string& out) {
    MsgCapture capture;
    {
        VRX vrx;
        EXPECT_EQ(vrx.hxb_read(db.c_str()), VX_OK) << db;
        EXPECT_EQ(vrx.vrx_write(out.c_str(), nullptr, 0), VX_OK) << out;
        free_read(vrx);
    }
    EXPECT_EQ(findings(capture), "") << "writing " << out;
    return ScratchDir::read_file(out);
}

/// The text without its time stamp line.
std::string normalised(const std::string& text) {
    return text.substr(text.starts_with("// Created") ? text.find('\n') + 1 : 0);
}

struct ExampleCase {
    const char* file;
    bool is_design;
    std::vector<const char*> shown;  ///< lines (or parts) the written text must hold
};

TEST(ExampleNetlists, ReadCleanKeepWhatTheyShowAndStayStable) {
    const ExampleCase cases[] = {
        {"design.vrx",
         true,
         {"SIGNAL gsr_n ( GLOBAL)", "SIGNAL flag (MERGEDFROM=accum/full)",
          "SIGNAL code (JOINED=accum/full)", "SIGNAL g (CRITICAL)",
          "SIGNAL clk_b (USER_ALIAS=clock MAXSKEW=100ps)", "PHYSSIGNAL gclk (PERIOD=10ns)",
          "BLOCK accum/add1 (NAME=add1 USER CRITICAL)", "PHYSICAL=qx10 PURPOSE=\"debug tap\"",
          "PIN RST (NAME=RST INV CONN=gsr_n)", "CLK2OUT=1:3ns CLKREF=CLK,R)",
          "PIN ADR (NAME=A1 CONN=q1)", "PRIM ROM 2 (NAME=gray INIT=@0x2310)",
          "PHYSPRIM PULLUP (NAME=keep_y0)", "MAPSIGNAL accum/SLICE_0 {",
          "MAPCONN accum/r1 OUT (MAPINV)", "MAPSIGNAL accum P1 (NAME=clk_pad)"}},
        {"design.vrx",
         false,
         {"(CASESENSE LOG_PM=qx10 PROJECT=vrx_tour)", "DESIGN full_adder fa {",
          "DESIGN full_adder (AUTHOR=examples DESCRIPTION=\"one-bit full adder\")"}},
        {"library.vrx",
         false,
         {"(CASESENSE LIBRARY_KIND=cells VERSION=1.2)", "DESIGN half_adder HA {",
          "DESIGN mux4 \"mux 4:1\" {", "DESIGN io_cell \"BLOCK\" {",
          "BLOCK full_adder/h2 (NAME=h2)", "SETUP=:40ps HOLD=10:20ps SETUPREF=CLK,R)",
          "PIN WADR (NAME=WADR1 CONN=wa1)", "PIN PAD (NAME=PAD TYPE=BI CONN=pad CAP=1.500000)",
          "SIGNAL t (RECOVERED_NAME=carry_t)"}},
    };
    for (const ExampleCase& example : cases) {
        SCOPED_TRACE(std::string(example.file) +
                     (example.is_design ? " as a design" : " as a library"));
        ScratchDir dir;
        const std::string db = dir.file(example.is_design ? "t.hxb" : "t.hxl");
        text_to_database(kExamples + "/" + example.file, db, example.is_design);
        const std::string t1 = database_to_text(db, dir.file("t1.vrx"));
        for (const char* part : example.shown)
            EXPECT_NE(t1.find(part), std::string::npos) << "missing: " << part;
        text_to_database(dir.file("t1.vrx"), db, example.is_design);
        const std::string t2 = database_to_text(db, dir.file("t2.vrx"));
        EXPECT_EQ(normalised(t1), normalised(t2));
    }
}

vrx_test::ToolPlace place_in(const ScratchDir& dir) {
    return {dir.path(), dir.path(), dir.path(), ""};
}

struct FilterRule {
    const char* written;   ///< as written without the filter
    const char* filtered;  ///< as written with it; null when left out
};

TEST(ExamplePropertyFilter, ChangesWhatHxb2vrxWritesAsItsRulesSay) {
    const std::string filter = kExamples + "/props.filter";
    const std::pair<const char*, std::vector<FilterRule>> cases[] = {
        {"design.vrx",
         {{"PURPOSE=", nullptr},
          {" LOC=R1C1", " SITE=R1C1"},
          {"IOSTANDARD=LVCMOS33", "IO_STANDARD=LVCMOS33"},
          {"SETUP=:1ns SETUPREF=CLK,R", "TSU=:1ns TSUREF=CLK,R"},
          {"DRIVE=8", "DRIVE=8"}}},
        {"library.vrx",
         {{"AREA=", nullptr},
          {"DESCRIPTION=", nullptr},
          {"HOLD=10:20ps", "TH=10:20ps"},
          {"CLK2OUT=50:90ps", "CLK2OUT=50:90ps"}}},
    };
    for (const auto& [file, rules] : cases) {
        SCOPED_TRACE(file);
        ScratchDir dir;
        const std::string db = dir.file("t.hxl");
        text_to_database(kExamples + "/" + file, db, false);
        const vrx_test::ToolRun plain =
            vrx_test::run_tool(HXB2VRX_PATH, {db, "plain.vrx"}, place_in(dir));
        const vrx_test::ToolRun filtered =
            vrx_test::run_tool(HXB2VRX_PATH, {"-f", filter, db, "filtered.vrx"}, place_in(dir));
        ASSERT_EQ(plain.status, 0) << plain.err;
        ASSERT_EQ(filtered.status, 0) << filtered.err;
        EXPECT_EQ(filtered.err, "");
        const std::string before = ScratchDir::read_file(dir.file("plain.vrx"));
        const std::string after = ScratchDir::read_file(dir.file("filtered.vrx"));
        for (const FilterRule& rule : rules) {
            EXPECT_NE(before.find(rule.written), std::string::npos) << rule.written;
            if (rule.filtered != nullptr) {
                EXPECT_NE(after.find(rule.filtered), std::string::npos) << rule.filtered;
            }
            if (rule.filtered == nullptr || std::strcmp(rule.written, rule.filtered) != 0) {
                EXPECT_EQ(after.find(rule.written), std::string::npos) << rule.written;
            }
        }
    }
}

TEST(ExampleHost, ConvertsBothWaysAndNamesTheStepThatFails) {
    ScratchDir dir;
    const vrx_test::ToolRun run = vrx_test::run_tool(
        VRX_EXAMPLE_PATH, {kExamples + "/design.vrx", dir.path()}, place_in(dir));
    ASSERT_EQ(run.status, 0) << run.err;
    EXPECT_NE(run.out.find("vrx_example: design accum: 9 blocks, 20 primitives, 97 pins"),
              std::string::npos)
        << run.out;
    // What it wrote reads back as the same design.
    text_to_database(dir.file("design.vrx"), dir.file("again.hxb"), true);
    EXPECT_EQ(normalised(database_to_text(dir.file("again.hxb"), dir.file("again.vrx"))),
              normalised(database_to_text(dir.file("design.hxb"), dir.file("direct.vrx"))));

    const vrx_test::ToolRun missing =
        vrx_test::run_tool(VRX_EXAMPLE_PATH, {dir.file("none.vrx"), dir.path()}, place_in(dir));
    EXPECT_EQ(missing.status, 1);
    EXPECT_NE(missing.err.find("converting " + dir.file("none.vrx") + " failed"), std::string::npos)
        << missing.err;
    EXPECT_FALSE(ScratchDir::exists(dir.file("none.hxb")));
    EXPECT_EQ(vrx_test::run_tool(VRX_EXAMPLE_PATH, {"only-one-argument"}, place_in(dir)).status,
              64);
}

}  // namespace
