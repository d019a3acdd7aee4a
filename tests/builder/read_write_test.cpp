// Text files in, database files out: input names, several files, the
// design-rule check after reading and the names hxb_write chooses.
#include <sys/stat.h>

#include <algorithm>

#include "builder_fixture.h"
#include "file_size_limit.h"
#include "ut_ptrfile.h"

namespace builder_test {
namespace {

const char* const kClean = "DESIGN top { BLOCK top 1 { PIN a (TYPE=IN CONN=a) } }\n";

HX_FILE_TYPE file_type(const std::string& path) {
    UT_PTRFILE file(Port::ACCESS_READ);
    if (Port::File::open(path.c_str(), &file, false) == nullptr) return HX_FILE_UNKNOWN;
    const HX_FILE_TYPE type = hx_env.get_file_type(&file);
    Port::File::close(&file);
    return type;
}

TEST_F(BuilderTest, InputNameWithAndWithoutExtension) {
    ScratchDir::write_file(dir.file("top.vrx"), kClean);
    ASSERT_EQ(vrx.vrx_read(dir.file("top").c_str(), 1, 0, 0), VX_OK);
    EXPECT_EQ(own_texts(PORT_MSG_STATUS),
              (std::vector<std::string>{"reading VRX file " + dir.file("top.vrx") + " ...\n",
                                        "DRC complete\n"}));
    EXPECT_STREQ(vrx.get_library()->get_name(), "top");
    EXPECT_STREQ(design()->get_name(), "top");

    capture.clear();
    ScratchDir::write_file(dir.file("other.txt"), kClean);
    ASSERT_EQ(vrx.vrx_read(dir.file("other.txt").c_str(), 1, 0, 0), VX_OK);
    EXPECT_EQ(own_texts(PORT_MSG_STATUS)[0],
              "reading VRX file " + dir.file("other.txt") + " ...\n");
    EXPECT_STREQ(vrx.get_library()->get_name(), "other");

    capture.clear();
    ASSERT_EQ(vrx.vrx_read(dir.file("missing.vrx").c_str(), 1, 0, 0), VX_FILE_ERROR);
    EXPECT_EQ(own_texts(PORT_MSG_ERROR),
              std::vector<std::string>{"cannot open input file " + dir.file("missing.vrx") +
                                       ": No such file or directory\n"});
    EXPECT_STREQ(vrx.get_library()->get_name(), "missing");
}

TEST_F(BuilderTest, SeveralFilesContinueOneLibraryAndStopAtTheFirstFailure) {
    const std::string first = dir.file("first.vrx");
    ScratchDir::write_file(first, "DESIGN a {\n   BLOCK a 1 { PIN p (TYPE=IN CONN=p) }\n}\n");
    ScratchDir::write_file(dir.file("second.vrx"),
                           "DESIGN b { BLOCK b 1 { PIN p (TYPE=IN CONN=p) } }\n");
    ScratchDir::write_file(dir.file("bad.vrx"), "DESIGN c {\n}\n");
    const auto names = [&](std::initializer_list<const char*> stems) {
        DARRAY_NAME list;
        for (const char* stem : stems)
            list.add(dir.file(stem).c_str());
        return list;
    };
    ASSERT_EQ(vrx.vrx_read(names({"first.vrx", "second"}), 1, 0, 0), VX_OK);
    EXPECT_STREQ(design()->get_name(), "b");
    EXPECT_EQ(vrx.get_library()->design_count(), 2u);
    EXPECT_STREQ(vrx.get_library()->get_name(), "first");

    capture.clear();
    ASSERT_EQ(vrx.vrx_read(names({"first", "gone"}), 0, 0, 0), VX_FILE_ERROR);
    EXPECT_EQ(own_texts(PORT_MSG_ERROR),
              std::vector<std::string>{"cannot open input file " + dir.file("gone.vrx") +
                                       ": No such file or directory\n"});
    EXPECT_NE(vrx.get_library()->find_design("a"), nullptr);
    EXPECT_EQ(own_texts(PORT_MSG_STATUS),  // no check of an incomplete result
              std::vector<std::string>{"reading VRX file " + first + " ...\n"});

    capture.clear();
    ASSERT_EQ(vrx.vrx_read(names({"first", "bad", "gone"}), 1, 0, 0), VX_PARSE_ERROR);
    EXPECT_EQ(reports(), std::vector<std::string>{E(2, "parse error")});  // lines of its own file
    // The file after the failed one is never opened.
    EXPECT_EQ(own_texts(PORT_MSG_ERROR), std::vector<std::string>{"parse of input file failed\n"});
}

TEST_F(BuilderTest, CheckAfterReadingDecidesOnlyOnErrors) {
    ASSERT_EQ(read("DESIGN d {\n"
                   "   BLOCK d 1 { PIN a (TYPE=IN CONN=a) }\n"
                   "   BLOCK u 2 { PIN x (CONN=a) PIN z }\n"
                   "}\n"),
              VX_OK);
    EXPECT_EQ(own_texts(PORT_MSG_WARNING),
              std::vector<std::string>{"DRC complete with 1 warnings\n"});

    capture.clear();
    ASSERT_EQ(read("DESIGN d {\n"
                   "   BLOCK d 1 { PIN y (TYPE=OUT CONN=y) }\n"
                   "   PRIM ONE { PIN OUT (CONN=y) }\n"
                   "   PRIM ZERO { PIN OUT (CONN=y) }\n"
                   "}\n"),
              VX_DRC_ERROR);
    EXPECT_EQ(own_texts(PORT_MSG_ERROR),
              std::vector<std::string>{"DRC failed with 1 errors and 0 warnings\n"});
    EXPECT_NE(design(), nullptr);  // the result stays built
}

TEST_F(BuilderTest, DesignsReadButNotPartOfTheStoredDesignAreNamed) {
    // a is part of top through b; the four after b are not.
    std::string text = "DESIGN a { BLOCK x 0 } DESIGN b { BLOCK b 0 BLOCK a }\n";
    for (const char* name : {"c", "d", "e", "f"})
        text += std::string("DESIGN ") + name + " { BLOCK x 0 }\n";
    text += "DESIGN top { BLOCK top 0 BLOCK b }\n";
    const auto warnings = [&](const std::string& input, uint8_t is_design) {
        capture.clear();
        EXPECT_EQ(read(input, is_design), VX_OK);
        return own_texts(PORT_MSG_WARNING);
    };
    EXPECT_EQ(warnings(text, 1),
              std::vector<std::string>{"4 designs read are not part of the stored design 'top' "
                                       "(neither grafted nor instantiated into it): 'c', 'd', "
                                       "'e' and 1 more; the input may be cut short\n"});
    EXPECT_TRUE(warnings(text, 0).empty());  // a library keeps every design
    // Cells of an earlier file need not all be used.
    ScratchDir::write_file(dir.file("cells.vrx"), "DESIGN a { BLOCK x 0 } DESIGN c { BLOCK x 0 }");
    ScratchDir::write_file(dir.file("top.vrx"), "DESIGN top { BLOCK top 0 BLOCK a }");
    DARRAY_NAME names;
    names.add(dir.file("cells.vrx").c_str());
    names.add(dir.file("top.vrx").c_str());
    capture.clear();
    EXPECT_EQ(vrx.vrx_read(names, 1, 0, 0), VX_OK);
    EXPECT_TRUE(own_texts(PORT_MSG_WARNING).empty());
}

TEST_F(BuilderTest, DatabaseFileNamesFollowTheFirstInputOrTheGivenPath) {
    for (uint8_t is_design : {1, 0}) {
        SCOPED_TRACE(is_design);
        ScratchDir out;
        const std::string ext = is_design ? ".hxb" : ".hxl";
        const std::string input_name = out.file("top.vrx");
        ScratchDir::write_file(input_name, kClean);
        ASSERT_EQ(vrx.vrx_read(input_name.c_str(), is_design, 0, 0), VX_OK);
        capture.clear();
        ASSERT_EQ(vrx.hxb_write(nullptr), VX_OK);
        EXPECT_EQ(own_texts(PORT_MSG_STATUS),
                  std::vector<std::string>{"writing " + out.file("top" + ext) + " ...\n"});
        for (const char* given : {"a.txt", "b", "c.hxb", "d.hxl"})
            ASSERT_EQ(vrx.hxb_write(out.file(given).c_str()), VX_OK) << given;
        std::vector<std::string> want;
        for (const char* stem : {"a", "b", "c", "d", "top"})
            want.push_back(stem + ext);
        want.push_back("top.vrx");
        EXPECT_EQ(out.entries(), want);
        EXPECT_EQ(file_type(out.file("top" + ext)), is_design ? HX_FILE_DESIGN : HX_FILE_LIBRARY);
    }
}

TEST_F(BuilderTest, LongPathsAreReadAndWritten) {
    const std::string sub = dir.file(std::string(200, 'd'));
    ASSERT_EQ(::mkdir(sub.c_str(), 0700), 0);
    const std::string stem = sub + "/" + std::string(70, 'n');
    ASSERT_GT(stem.size(), 270u);
    ScratchDir::write_file(stem + ".vrx", kClean);
    ASSERT_EQ(vrx.vrx_read(stem.c_str(), 1, 0, 0), VX_OK);
    EXPECT_STREQ(vrx.get_library()->get_name(), std::string(70, 'n').c_str());
    ASSERT_EQ(vrx.hxb_write(nullptr), VX_OK);
    EXPECT_EQ(file_type(stem + ".hxb"), HX_FILE_DESIGN);
    const std::string other = sub + "/" + std::string(60, 'o');
    ASSERT_EQ(vrx.hxb_write((other + ".txt").c_str()), VX_OK);
    EXPECT_EQ(file_type(other + ".hxb"), HX_FILE_DESIGN);
}

TEST_F(BuilderTest, WritingWithoutAnythingReadIsAnError) {
    EXPECT_EQ(vrx.hxb_write(nullptr), VX_FILE_ERROR);
    EXPECT_FALSE(capture.texts(PORT_MSG_ERROR).empty());

    capture.clear();
    const DARRAY_NAME none;
    EXPECT_NE(vrx.vrx_read(none, 1, 0, 0), VX_OK);
    EXPECT_FALSE(capture.texts(PORT_MSG_ERROR).empty());
}

TEST_F(BuilderTest, FailedWriteLeavesNoFileBehind) {
    ASSERT_EQ(read(kClean), VX_OK);
    const std::string lost = dir.file("nosuch/out.hxb");
    capture.clear();
    EXPECT_EQ(vrx.hxb_write(lost.c_str()), VX_FILE_ERROR);
    const std::vector<std::string> errors = own_texts(PORT_MSG_ERROR);
    EXPECT_TRUE(std::any_of(errors.begin(), errors.end(), [&](const std::string& e) {
        return e.find(lost) != std::string::npos;
    })) << ::testing::PrintToString(errors);
    EXPECT_EQ(dir.entries(), std::vector<std::string>{"in.vrx"});

    // The database cannot store the whole file: the old one stays as it was.
    const std::string old = dir.file("old.hxb");
    ScratchDir::write_file(old, "old");
    {
        FileSizeLimit limit(16);
        EXPECT_EQ(vrx.hxb_write(old.c_str()), VX_FILE_ERROR);
    }
    EXPECT_EQ(ScratchDir::read_file(old), "old");
    EXPECT_EQ(dir.entries(), (std::vector<std::string>{"in.vrx", "old.hxb"}));
}

}  // namespace
}  // namespace builder_test
