// The grammar: which callbacks a text makes, with which arguments, in which
// order, at which line, and where syntax errors stop the parse.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include <unistd.h>

#include "recorder.h"
#include "vrx_scan.h"

namespace {

using Events = std::vector<std::string>;

std::string parse_error(int line) {
    return "ERROR: Line number " + std::to_string(line) + ": parse error\n";
}

void expect_parse(const std::string& text, int32_t result, const Events& events) {
    const Parsed p = parse_text(text);
    EXPECT_EQ(p.result, result) << text;
    EXPECT_EQ(p.events, events) << text;
}

TEST(Parser, ExampleFileLineByLine) {
    expect_parse(
        "// VRX netlist\n"
        "// top design: top\n"
        "(P=1 Q)\n"
        "DESIGN top (R=x) {\n"
        "   BLOCK top 2 (NAME=top) {\n"
        "      PIN a (TYPE=IN CONN=a)\n"
        "   }\n"
        "   BLOCK u1 (NAME=u1)\n"
        "   SIGNAL a (GLOBAL)\n"
        "}\n",
        0,
        {"do_library_props({P=1, Q=}) @3", "begin_design(top, {R=x}) @4",
         "begin_block(top, 2, 0, {NAME=top}) @5", "do_pin(a, {TYPE=IN, CONN=a}) @6",
         "end_block() @7", "begin_block(u1, 65535, 0, {NAME=u1}) @8", "end_block() @9",
         "do_signal(a, VX_SIGNAL, {GLOBAL=}) @9", "end_design() @10"});
}

TEST(Parser, SmallestFilesAndAliases) {
    expect_parse("DESIGN d { BLOCK b }", 0,
                 {"do_library_props({}) @1", "begin_design(d, {}) @1",
                  "begin_block(b, 65535, 0, {}) @1", "end_block() @1", "end_design() @1"});
    expect_parse("DESIGN a b { }\nDESIGN \"DESIGN\" 7 {}", 0,
                 {"do_library_props({}) @1", "add_alias(a, b) @1", "add_alias(DESIGN, 7) @2"});
    // The parse reads nothing behind the offending "(": the NUL would be reported.
    expect_parse(std::string("DESIGN a b (\0P=1) { }", 21), 1,
                 {"do_library_props({}) @1", parse_error(1)});
}

TEST(Parser, IncompleteFilesFailAtTheirEnd) {
    expect_parse("// a\n// b\n", 1, {"do_library_props({}) @3", parse_error(3)});
    expect_parse("(A)\n", 1, {"do_library_props({A=}) @1", parse_error(2)});
    expect_parse("DESIGN d {\n}", 1,
                 {"do_library_props({}) @1", "begin_design(d, {}) @1", parse_error(2)});
    expect_parse("DESIGN d { BLOCK b { PIN p\n", 1,
                 {"do_library_props({}) @1", "begin_design(d, {}) @1",
                  "begin_block(b, 65535, 0, {}) @1", "do_pin(p, {}) @2", parse_error(2)});
    expect_parse(
        "DESIGN d { BLOCK b } }", 1,
        {"do_library_props({}) @1", "begin_design(d, {}) @1", "begin_block(b, 65535, 0, {}) @1",
         "end_block() @1", "end_design() @1", parse_error(1)});
}

TEST(Parser, BlocksPrimitivesAndPins) {
    expect_parse("DESIGN d {\nBLOCK u1 3 (NAME=x TYPE) { PIN a PIN b (CONN=n) }\n}", 0,
                 {"do_library_props({}) @1", "begin_design(d, {}) @1",
                  "begin_block(u1, 3, 0, {NAME=x, TYPE=}) @2", "do_pin(a, {}) @2",
                  "do_pin(b, {CONN=n}) @2", "end_block() @2", "end_design() @3"});
    // Without a following list or pin block, a statement is complete once the
    // next token is read: its action shows that token's line.
    expect_parse(
        "DESIGN d {\nPHYSPRIM AND 2\n\nPHYSSIGNAL n\n}", 0,
        {"do_library_props({}) @1", "begin_design(d, {}) @1", "begin_prim(AND, 2, 1, {}) @4",
         "end_block() @4", "do_signal(n, VX_PHYSSIGNAL, {}) @5", "end_design() @5"});
    expect_parse("DESIGN d { PRIM BUF {} PHYSBLOCK p (A) {\n} }", 0,
                 {"do_library_props({}) @1", "begin_design(d, {}) @1",
                  "begin_prim(BUF, 65535, 0, {}) @1", "end_block() @1",
                  "begin_block(p, 65535, 1, {A=}) @1", "end_block() @2", "end_design() @2"});
}

TEST(Parser, NumbersAsNamesAndWidths) {
    // A width above 65535 keeps its low 16 bits, with a warning on its line.
    expect_parse("DESIGN 1 {\nBLOCK 5 6\nBLOCK x 70000 { PIN 007 (007=0010) }\n}", 0,
                 {"do_library_props({}) @1", "begin_design(1, {}) @1",
                  "begin_block(5, 6, 0, {}) @3", "end_block() @3",
                  "WARNING: Line number 3: width 70000 is above 65535: its low 16 bits, 4464, "
                  "are used\n",
                  "begin_block(x, 4464, 0, {}) @3", "do_pin(7, {7=10}) @3", "end_block() @3",
                  "end_design() @4"});
    // A digit run above the int range is a word: a name, but no width.
    expect_parse("DESIGN d { BLOCK 99999999999 BLOCK x 99999999999 }", 1,
                 {"do_library_props({}) @1", "begin_design(d, {}) @1",
                  "begin_block(99999999999, 65535, 0, {}) @1", "end_block() @1",
                  "begin_block(x, 65535, 0, {}) @1", "end_block() @1", parse_error(1)});
}

TEST(Parser, StatementOrderInsideADesign) {
    expect_parse("DESIGN d { SIGNAL s BLOCK b }", 1,
                 {"do_library_props({}) @1", "begin_design(d, {}) @1", parse_error(1)});
    expect_parse(
        "DESIGN d { BLOCK b SIGNAL s MAPSIGNAL p { } SIGNAL t }", 1,
        {"do_library_props({}) @1", "begin_design(d, {}) @1", "begin_block(b, 65535, 0, {}) @1",
         "end_block() @1", "do_signal(s, VX_SIGNAL, {}) @1", "do_mapsignal(p, null, null) @1",
         parse_error(1)});
    expect_parse(
        "DESIGN d { BLOCK b SIGNAL s BLOCK c }", 1,
        {"do_library_props({}) @1", "begin_design(d, {}) @1", "begin_block(b, 65535, 0, {}) @1",
         "end_block() @1", "do_signal(s, VX_SIGNAL, {}) @1", parse_error(1)});
}

TEST(Parser, MapSignalGroups) {
    const std::string head = "DESIGN d { BLOCK b\n";
    const Events start = {"do_library_props({}) @1", "begin_design(d, {}) @1",
                          "begin_block(b, 65535, 0, {}) @2", "end_block() @2"};
    auto with = [&](Events more) {
        Events all = start;
        all.insert(all.end(), more.begin(), more.end());
        return all;
    };
    expect_parse(head + "MAPSIGNAL pb {\nMAPCONN lb\nMAPCONN lb2 p2 (INV)\n}\n}", 0,
                 with({"do_mapsignal(pb, null, null) @2", "add_mapconn(lb, null, {}) @4",
                       "add_mapconn(lb2, p2, {INV=}) @4", "end_design() @6"}));
    expect_parse(head + "MAPSIGNAL pb p (P=1)\n}", 1,
                 with({"do_mapsignal(pb, p, {P=1}) @2", parse_error(3)}));
    expect_parse(head + "MAPSIGNAL pb p\n{ MAPCONN a \"\" } MAPSIGNAL q {}}", 0,
                 with({"do_mapsignal(pb, p, {}) @3", "add_mapconn(a, , {}) @3",
                       "do_mapsignal(q, null, null) @3", "end_design() @3"}));
    // The one-name head is complete as soon as the token behind it is no name.
    expect_parse(head + "MAPSIGNAL pb\n(P=1) { }", 1,
                 with({"do_mapsignal(pb, null, null) @3", parse_error(3)}));
}

TEST(Parser, PropertyListsAndTheirLimit) {
    expect_parse("(A = \"x y\" B=\"\" C \"D E\"=007)", 1,
                 {"do_library_props({A=x y, B=, C=, D E=7}) @1", parse_error(1)});
    // 1B is one word, so the second "=" has no name before it.
    expect_parse("(A=1B=2)", 1, {parse_error(1)});
    expect_parse("(A=1 B=2)", 1, {"do_library_props({A=1, B=2}) @1", parse_error(1)});

    // One property per line: P<k> stands on line k + 2.
    std::string text = "(\n";
    for (int k = 0; k < 260; ++k)
        text += "P" + std::to_string(k) + "\n";
    text += ")\n";
    const Parsed p = parse_text(text);
    ASSERT_EQ(p.events.size(), 6u);
    // A name alone is appended once the token behind it has been read.
    EXPECT_EQ(p.events[0], "ERROR: Line number 259: maximum property count exceeded\n");
    EXPECT_EQ(p.events[3], "ERROR: Line number 262: maximum property count exceeded\n");
    EXPECT_EQ(p.events[4].substr(0, 27), "do_library_props({P0=, P1=,");
    EXPECT_NE(p.events[4].find(", P255=}) @262"), std::string::npos);
    EXPECT_EQ(p.events[5], parse_error(263));
}

TEST(Parser, ErrorLimitEndsTheRunAndNothingFollows) {
    std::string list = "(";
    for (int k = 0; k < 256 + 19; ++k)
        list += "P ";
    Parsed p = parse_text(list + ") DESIGN d { BLOCK b }");
    EXPECT_EQ(p.result, 0);
    ASSERT_EQ(p.events.size(), 19u + 5u);
    EXPECT_EQ(p.events[19], "do_library_props(" + p.events[19].substr(17));

    // The twentieth error, here from a builder method, ends the run. The exit
    // handler returns: the parse reads no further token (the NUL behind would
    // be reported) and makes no further callback.
    std::string blocks = "DESIGN d {";
    for (int k = 1; k <= 20; ++k)
        blocks += " BLOCK b" + std::to_string(k) + " ()";
    blocks += std::string("\0 }", 3);
    p = parse_text(blocks, [](const std::string& entry) {
        if (entry.rfind("begin_block", 0) == 0) vrx_parse_error("bad block");
    });
    EXPECT_EQ(p.result, 1);
    ASSERT_EQ(p.events.size(), 2u + 20 * 3 - 1 + 2);
    EXPECT_EQ(p.events[p.events.size() - 4], "begin_block(b20, 65535, 0, {}) @1");
    EXPECT_EQ(p.events[p.events.size() - 3], "ERROR: Line number 1: bad block\n");
    EXPECT_EQ(p.events[p.events.size() - 2], "ERROR: maximum error limit reached...aborting\n");
    EXPECT_EQ(p.events.back(), "exit(2)");
}

TEST(Parser, SecondFileAfterAParseThatStoppedEarly) {
    const std::string filler(50000, ' ');
    expect_parse(
        "DESIGN a { BLOCK b } junk" + filler + "DESIGN c { BLOCK d }", 1,
        {"do_library_props({}) @1", "begin_design(a, {}) @1", "begin_block(b, 65535, 0, {}) @1",
         "end_block() @1", "end_design() @1", parse_error(1)});
    expect_parse("\nDESIGN e { BLOCK f }", 0,
                 {"do_library_props({}) @2", "begin_design(e, {}) @2",
                  "begin_block(f, 65535, 0, {}) @2", "end_block() @2", "end_design() @2"});
}

TEST(Parser, ScannerErrorsLeaveTheParseRunning) {
    expect_parse("DESIGN \"" + std::string(1023, 'n') + "\" { BLOCK b }\n" +
                     std::string("DESIGN c {\0 BLOCK b }", 21),
                 0,
                 {"do_library_props({}) @1",
                  "ERROR: Line number 1: maximum string length exceeded\n", "begin_design(, {}) @1",
                  "begin_block(b, 65535, 0, {}) @1", "end_block() @1", "end_design() @1",
                  "begin_design(c, {}) @2", "ERROR: Line number 2: invalid NUL byte in input\n",
                  "begin_block(b, 65535, 0, {}) @2", "end_block() @2", "end_design() @2"});
}

// --- Fatal scanner stops -------------------------------------------------------

void* failing_realloc(void*, std::size_t) {
    return nullptr;
}
void* realloc_no_growth(void* block, std::size_t size) {
    return block ? nullptr : std::realloc(block, size);
}

struct FatalCase {
    const char* expected_stderr;
    VX_REALLOC_FN allocator;
    std::string text;
    bool write_only;
};

TEST(Parser, FatalScannerStopsEndTheRunSafely) {
    const FatalCase cases[] = {
        {"input in flex scanner failed\n", vrx_scan_realloc, "DESIGN d { BLOCK b }", true},
        {"out of dynamic memory in yy_create_buffer()\n", failing_realloc, "DESIGN", false},
        {"fatal error - scanner input buffer overflow\n", realloc_no_growth,
         "\"" + std::string(20000, 'x'), false},
    };
    for (const FatalCase& c : cases) {
        ParseLog log;
        std::FILE* file = std::tmpfile();
        std::fputs(c.text.c_str(), file);
        std::rewind(file);
        const VX_REALLOC_FN old_allocator = vrx_scan_realloc;
        vrx_scan_realloc = c.allocator;
        char name[] = "/tmp/vrx_reader_XXXXXX";
        std::FILE* write_only = nullptr;
        if (c.write_only) {
            const int fd = mkstemp(name);
            ASSERT_GE(fd, 0);
            close(fd);
            write_only = std::fopen(name, "w");  // reading it fails
        }
        vrx_set_input(write_only ? write_only : file);
        vrx_parse_init();
        testing::internal::CaptureStderr();
        const int32_t result = vrx_parse();
        EXPECT_EQ(testing::internal::GetCapturedStderr(), c.expected_stderr);
        vrx_scan_realloc = old_allocator;
        EXPECT_EQ(result, 1);
        EXPECT_EQ(log.events, Events{"exit(2)"});
        if (write_only) {
            std::fclose(write_only);
            std::remove(name);
        }
        std::fclose(file);
    }
    // The reader serves the next file as usual.
    expect_parse("DESIGN a b {}", 0, {"do_library_props({}) @1", "add_alias(a, b) @1"});
}

}  // namespace
