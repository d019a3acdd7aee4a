#include <gtest/gtest.h>

#include <string>

#include "ut_path.h"
#include "ut_str.h"

namespace {

TEST(Str, CompareOrdersAbsentBeforeEveryText) {
    EXPECT_EQ(UT_STR::Compare("a", "a"), 0);
    EXPECT_LT(UT_STR::Compare("a", "b"), 0);
    EXPECT_EQ(UT_STR::Compare(nullptr, nullptr), 0);
    EXPECT_LT(UT_STR::Compare(nullptr, ""), 0);
    EXPECT_GT(UT_STR::Compare("", nullptr), 0);
    EXPECT_EQ(UT_STR::Len(nullptr), 0u);
    EXPECT_EQ(UT_STR::Dup(nullptr), nullptr);
    EXPECT_FALSE(UT_STR::ContainsChar(nullptr, 'a'));
    EXPECT_TRUE(UT_STR::ContainsChar("a b", ' '));
    EXPECT_FALSE(UT_STR::ContainsChar("ab", '\0'));
}

TEST(Str, BoundedCompositionTruncatesAndSaysSo) {
    char buf[8];
    EXPECT_TRUE(UT_STR::Copy(buf, "abc"));
    EXPECT_TRUE(UT_STR::Cat(buf, "defg"));
    EXPECT_STREQ(buf, "abcdefg");
    EXPECT_FALSE(UT_STR::Cat(buf, "h"));
    EXPECT_STREQ(buf, "abcdefg");
    EXPECT_FALSE(UT_STR::Copy(buf, "0123456789"));
    EXPECT_STREQ(buf, "0123456");
    EXPECT_TRUE(UT_STR::SPrintf(buf, sizeof buf, "%d", 1234567));
    EXPECT_FALSE(UT_STR::SPrintf(buf, sizeof buf, "%d", 12345678));
    EXPECT_STREQ(buf, "1234567");
}

TEST(Str, FormattingHasNoLengthLimit) {
    const std::string name(5000, 'q');
    EXPECT_EQ(UT_STR::Format("<%s|%s>", name.c_str(), name.c_str()), "<" + name + "|" + name + ">");
    const std::string via_von = vonform("%s.TRANSPARENT", name.c_str());
    EXPECT_EQ(via_von, name + ".TRANSPARENT");
}

TEST(Str, VonformMayFormatItsOwnPreviousText) {
    const char* first = vonform("%s/%s", "top", "u1");
    const char* second = vonform("%s/%s", first, "n");
    EXPECT_STREQ(second, "top/u1/n");
    const std::string long_part(3000, 'x');
    const char* third = vonform("%s%s", second, long_part.c_str());
    EXPECT_EQ(std::string(third), "top/u1/n" + long_part);
}

struct PathCase {
    const char* path;
    const char* base;
    const char* ext;  // null: none
    const char* root;
};

TEST(Path, BaseExtensionAndRoot) {
    const PathCase cases[] = {
        {"dir/top.vrx", "top", "vrx", "dir/top"},
        {"top.vrx", "top", "vrx", "top"},
        {"top", "top", nullptr, "top"},
        {"dir/top", "top", nullptr, "dir/top"},
        {"my.dir/top", "top", nullptr, "my.dir/top"},
        {"my.dir/top.hxb", "top", "hxb", "my.dir/top"},
        {"a.b/c.d/top.tar.gz", "top.tar", "gz", "a.b/c.d/top.tar"},
        {"/abs/path/x.vrx", "x", "vrx", "/abs/path/x"},
        {".hidden", ".hidden", nullptr, ".hidden"},
        {"dir/.hidden", ".hidden", nullptr, "dir/.hidden"},
        {"top.", "top", "", "top"},
        {"dir/", "", nullptr, "dir/"},
        {"", "", nullptr, ""},
    };
    for (const PathCase& c : cases) {
        SCOPED_TRACE(c.path);
        std::string out;
        EXPECT_STREQ(UT_PATH::GetBase(c.path, out), c.base);
        EXPECT_STREQ(UT_PATH::GetRoot(c.path, out), c.root);
        const char* ext = UT_PATH::GetExt(c.path);
        if (c.ext == nullptr) {
            EXPECT_EQ(ext, nullptr);
        } else {
            ASSERT_NE(ext, nullptr);
            EXPECT_STREQ(ext, c.ext);
        }
    }
}

TEST(Path, ExtensionPointsInsideThePath) {
    char path[] = "out.txt";
    char* ext = const_cast<char*>(UT_PATH::GetExt(path));
    ASSERT_EQ(ext, path + 4);
}

TEST(Path, AbsentPathGivesEmptyPieces) {
    std::string out = "stale";
    EXPECT_STREQ(UT_PATH::GetBase(nullptr, out), "");
    EXPECT_EQ(UT_PATH::GetExt(nullptr), nullptr);
}

}  // namespace
