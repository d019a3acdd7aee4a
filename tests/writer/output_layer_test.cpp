#include <functional>
#include <string>

#include "writer_access.h"

namespace writer_test {
namespace {

class OutputLayerTest : public ::testing::Test {
  protected:
    /// The bytes that `write` produces from `column` and `indent`.
    std::string run(int32_t column, int16_t indent, const std::function<void()>& write) {
        ScratchStream out(vrx, dir);
        A::column(vrx) = column;
        A::indent(vrx) = indent;
        write();
        return out.bytes();
    }

    ScratchDir dir;
    VRX vrx;
};

TEST_F(OutputLayerTest, LineBreaksOfItemsPairsAndLineEnds) {
    const std::string s79(79, 'x');
    const std::string s100(100, 'y');
    struct Case {
        int32_t column;
        const char* first;
        const char* second;
        std::string expected;
        int32_t column_after;
    };
    const Case cases[] = {
        {70, "abcdefghi", nullptr, "abcdefghi", 79},  // a single item may reach 79
        {70, "abcdefghij", nullptr, "\r\nabcdefghij", 10},
        {0, s79.c_str(), nullptr, s79, 79},
        {0, s100.c_str(), nullptr, "\r\n" + s100, 100},  // broken even at column 0
        {70, " ", "123456789", " 123456789", 80},        // a pair may reach 80
        {71, " ", "123456789", "\r\n 123456789", 10},
        {67, "abcdefghij", "\r\n", "abcdefghij\r\n", 0},  // text and line end: up to 78
        {68, "abcdefghij", "\r\n", "abcdefghij\r\n", 0},
        {69, "abcdefghij", "\r\n", "\r\nabcdefghij\r\n", 0},
        {50, nullptr, nullptr, "", 50},
        {78, nullptr, "xyz", "xyz", 81},  // no first text: never broken
        {50, "\r\n", "abc", "\r\nabc", 3},
        {50, "\r\n", nullptr, "\r\n", 0},
    };
    for (const Case& c : cases) {
        const std::string label = std::to_string(c.column) + " " + (c.first ? c.first : "(null)");
        EXPECT_EQ(run(c.column, 0, [&] { A::write_string(vrx, c.first, c.second); }), c.expected)
            << label;
        EXPECT_EQ(A::column(vrx), c.column_after) << label;
    }
}

TEST_F(OutputLayerTest, IndentedLines) {
    auto indent = [&](int16_t level, int32_t column, int32_t count, const char* w1, const char* w2,
                      const char* w3 = nullptr, const char* w4 = nullptr) {
        return run(column, level, [&] { A::write_indent(vrx, count, w1, w2, w3, w4); });
    };
    EXPECT_EQ(indent(2, 0, 2, "}", "\r\n"), "      }\r\n");
    EXPECT_EQ(A::column(vrx), 0);
    EXPECT_EQ(indent(1, 0, 3, "MAPCONN", "u1", "\r\n"), "   MAPCONN u1\r\n");
    EXPECT_EQ(indent(1, 0, 2, "PRIM", nullptr), "   PRIM");  // left open for the caller
    EXPECT_EQ(A::column(vrx), 7);
    EXPECT_EQ(indent(0, 0, 4, "SIGNAL", "s", "(", "GLOBAL"), "SIGNAL s ( GLOBAL");
    // The space before a word depends on its position, not on what came before.
    EXPECT_EQ(indent(0, 0, 2, nullptr, "x"), " x");
    EXPECT_EQ(indent(0, 0, 3, "A", nullptr, "B"), "A B");
    EXPECT_EQ(indent(-1, 0, 2, "PIN", "p"), "PIN p");
    // The whole line is one item of the line-length rule.
    EXPECT_EQ(indent(1, 75, 2, "PIN", "abc"), "\r\n   PIN abc");
    // Longer than any fixed line buffer: written whole.
    const std::string name(1500, 'n');
    EXPECT_EQ(indent(3, 0, 3, "PIN", name.c_str(), "\r\n"), "\r\n         PIN " + name + "\r\n");
}

TEST_F(OutputLayerTest, ConstructsNestAndCloseAtTheOpeningIndent) {
    EXPECT_EQ(run(0, 0,
                  [&] {
                      A::write_string(vrx, "DESIGN d", nullptr);
                      A::begin_construct(vrx);
                      A::write_indent(vrx, 2, "BLOCK", "b");
                      A::begin_construct(vrx);
                      A::write_indent(vrx, 3, "PIN", "a", "\r\n");
                      A::end_construct(vrx);
                      A::end_construct(vrx);
                  }),
              text(R"(
DESIGN d {
   BLOCK b {
      PIN a
   }
}
)"));
    EXPECT_EQ(A::indent(vrx), 0);
    EXPECT_EQ(A::column(vrx), 0);
    // " {" is a space item and a brace with its line end, so the brace may start a line.
    EXPECT_EQ(run(78, 0, [&] { A::begin_construct(vrx); }), " \r\n{\r\n");
}

TEST_F(OutputLayerTest, NamesAreQuotedWhenTheReaderWouldNotReadThemBack) {
    for (const char* bare : {"clk", "block", "Block", "GLOBAL", "a/b", "a//b", "/x", "0", "42",
                             "a-1", "x.y", "a\"b"}) {
        EXPECT_EQ(A::vrx_legal(vrx, bare, nullptr), bare);
    }
    const std::vector<std::string> quoted = {"a=b", "x(3)", "x)", "a b", "PIN x", "a\tb", "a\nb",
                                             "a{b", "}", "//x", "//", "007", "00", "a\rb",
                                             // The ten statement keywords, exactly as written.
                                             "DESIGN", "BLOCK", "PHYSBLOCK", "PRIM", "PHYSPRIM",
                                             "SIGNAL", "PHYSSIGNAL", "PIN", "MAPSIGNAL", "MAPCONN"};
    for (const std::string& name : quoted) {
        EXPECT_EQ(A::vrx_legal(vrx, name.c_str(), nullptr), '"' + name + '"') << name;
    }
    EXPECT_EQ(A::quote_kwd(vrx, "MAPCONN"), "\"MAPCONN\"");
    EXPECT_EQ(A::quote_kwd(vrx, "a b"), "a b");  // keywords only
}

TEST_F(OutputLayerTest, MissingNamesGetAnIdentityByTheOrderNamed) {
    HX_OBJECT object;
    // Addresses alike in their low 32 bits are still two objects.
    const auto* far = reinterpret_cast<const void*>(static_cast<uintptr_t>(0x7f000000000c0ffeULL));
    const auto* near = reinterpret_cast<const void*>(static_cast<uintptr_t>(0x000c0ffeULL));
    EXPECT_EQ(A::vrx_legal(vrx, "", &object), "OBJ_$1");
    EXPECT_EQ(A::vrx_legal(vrx, nullptr, far), "OBJ_$2");
    EXPECT_EQ(A::vrx_legal(vrx, nullptr, near), "OBJ_$3");
    EXPECT_EQ(A::vrx_legal(vrx, nullptr, &object), "OBJ_$1");
    EXPECT_EQ(A::vrx_legal(vrx, "", nullptr), "\"\"");
    EXPECT_EQ(A::vrx_legal(vrx, nullptr, nullptr), "\"\"");
}

TEST_F(OutputLayerTest, HierarchicalNamesAndTransparentBlocks) {
    HX_LIBRARY lib("lib", 0);
    HX_DESIGN* design = lib.create_design("d");
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 0, "top");
    HX_LOGBLOCK* u1 = design->create_logblock(top, 0, "u1");
    EXPECT_EQ(A::build_hiername(vrx, u1), "top/u1");

    u1->create_prop("A", 1);
    u1->create_prop("TRANSPARENT", "yes", 1);
    u1->create_prop("B", 2);
    EXPECT_EQ(A::build_hiername(vrx, u1), "top/u1.TRANSPARENT");
    // The property comes back last, as a flag: its value is lost.
    std::vector<std::string> names;
    auto* iter = u1->create_prop_iter();
    while (const HX_PROPERTY* p = iter->l_next())
        names.push_back(p->get_name() + std::to_string(p->get_kind()));
    u1->delete_prop_iter(iter);
    EXPECT_EQ(names, (std::vector<std::string>{"A1", "B1", "TRANSPARENT0"}));
    EXPECT_EQ(A::build_hiername(vrx, u1), "top/u1.TRANSPARENT");

    const std::string name(3000, 'b');  // beyond any fixed name buffer
    HX_LOGBLOCK* deep = design->create_logblock(top, 0, name.c_str());
    deep->create_prop("TRANSPARENT", HX_PROP_FLAG);
    EXPECT_EQ(A::build_hiername(vrx, deep), "top/" + name + ".TRANSPARENT");
}

}  // namespace
}  // namespace writer_test
