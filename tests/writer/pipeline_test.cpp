#include <algorithm>
#include <cmath>
#include <memory>
#include <regex>
#include <string>

#include "file_size_limit.h"
#include "hx_library.h"
#include "scoped_env.h"
#include "writer_access.h"

namespace writer_test {
namespace {

// The converter's own wording of these failures, as patterns.
std::string literal(const std::string& text) {
    static const std::regex special(R"([.^$|()\[\]{}*+?\\])");
    return std::regex_replace(text, special, R"(\$&)");
}
std::string not_a_database_file(const std::string& path) {
    return literal("input file '" + path + "' is neither a design nor a library file") +
           "( \\(it holds text: [^)]*\\))?\n";
}
std::string nothing_loaded(const std::string& path) {
    return literal("no design or library has been read to write to '" + path + "'\n");
}
std::string write_failed(const std::string& /*path*/) {
    return "error writing temporary output file '[^']+': File too large\n";
}

const std::string kHeaderLine2 = "// $Header: basvrxwrite,v 1.1 2003/01/23 19:53:39 Exp $\r\n";

const char* const kSmallDesign = R"(
DESIGN d (DP="x y") {
   BLOCK top 1 (NAME=top) {
      PIN a (TYPE=IN CONN=a)
   }
   PRIM OR 2 (NAME=g) {
      PIN IN (NAME=IN0)
      PIN IN (NAME=IN1 CONN=a)
      PIN OUT (NAME=OUT)
   }
   SIGNAL a (SP=2)
}
)";

/// Temporary files go to a directory of the test's own, to show that none is left behind.
class PipelineTest : public WriterFixture {
  protected:
    void make_small_design() {
        design->create_prop("DP", "x y", 1);
        HX_LOGBLOCK* top = design->create_logblock(nullptr, 1, "top");
        name_pin(top, 0, "a", HX_PIN_IN);
        HX_SIGNAL* a = design->create_signal(top, "a");
        a->create_prop("SP", 2);
        design->create_conn(a, top, 0);
        design->create_conn(a, design->create_logprim(top, HX_PRIM_OR, 2, "g"), 1);
    }
    void select_design() {
        A::design(vrx) = design;
        A::is_design(vrx) = 1;
    }
    /// A destination that holds something already.
    std::string old_destination() {
        const std::string path = dir.file("old.vrx");
        ScratchDir::write_file(path, "old");
        return path;
    }
    /// Expects one error at least; when `expected` is not empty, one of them is it.
    /// Expects an error whose whole text matches `pattern`.
    void expect_failure_reported(const std::string& pattern) {
        const std::regex wanted(pattern);
        const std::vector<std::string> texts = errors();
        EXPECT_TRUE(std::any_of(texts.begin(), texts.end(),
                                [&](const std::string& t) { return std::regex_match(t, wanted); }))
            << pattern << "\nreported:\n"
            << ::testing::PrintToString(texts);
    }
    /// Expects `expected` at `level` exactly once, from the pipeline's own source.
    void expect_pipeline_report(Port_MsgLevel level, const std::string& expected) {
        int found = 0;
        for (const CapturedMsg& m : capture.messages()) {
            if (m.level != level || m.text != expected) continue;
            ++found;
            EXPECT_EQ(m.module, "Quorra");
            EXPECT_EQ(m.file, "../s/basvrxwrite");
            EXPECT_EQ(m.revision, "$Revision: 1.1 $");
        }
        EXPECT_EQ(found, 1) << expected;
    }
    /// The destination holds `content` (null: it does not exist); no temporary file stays.
    void expect_untouched(const std::string& destination, const char* content) {
        if (content == nullptr) {
            EXPECT_FALSE(ScratchDir::exists(destination));
        } else {
            EXPECT_EQ(ScratchDir::read_file(destination), content);
        }
        EXPECT_EQ(tmp.entries(), std::vector<std::string>{});
    }
    static void write_db_file(const std::string& path, HX_DESIGN* d, HX_LIBRARY* l) {
        UT_PTRFILE file(Port::ACCESS_WRITE);
        ASSERT_NE(Port::File::open(path.c_str(), &file, false), nullptr);
        ASSERT_TRUE(d ? hx_env.write_design(&file, d) : hx_env.write_library(&file, l));
        ASSERT_TRUE(Port::File::close(&file));
    }

    ScratchDir tmp;
    ScopedEnv tmpdir{"TMPDIR", tmp.path().c_str()};
};

TEST_F(PipelineTest, FileStartsWithTheTwoHeaderLines) {
    select_design();
    A::indent(vrx) = 2;  // whatever came before, a file starts at column 0
    A::column(vrx) = 75;
    const std::string path = dir.file("out.vrx");
    ASSERT_EQ(vrx.vrx_write(path.c_str(), nullptr, 0), VX_OK);
    const std::string written = ScratchDir::read_file(path);
    const std::regex layout(
        "// Created [0-9]{2}:[0-9]{2}:[0-9]{2}, [A-Z][a-z]{2} [1-9][0-9]?, [0-9]{4}\\. "
        "by Vondrel package hxb2vrx: Version Quillate\r\n"
        "([^\r\n]*\r\n)"
        "DESIGN d \\{\r\n\\}\r\n");
    std::smatch match;
    ASSERT_TRUE(std::regex_match(written, match, layout)) << written;
    EXPECT_EQ(match[1].str(), kHeaderLine2);
    expect_pipeline_report(PORT_MSG_STATUS, "   writing VRX file '" + path + "' ...\n");
    expect_writer_report(capture, PORT_MSG_WARNING,
                         "design d has no root block; text cannot hold such a design, so the text "
                         "written will not read back\n");
    EXPECT_EQ(errors(), std::vector<std::string>{});
    expect_untouched(path, written.c_str());
}

// The text cannot carry some names; the file is written, and the write says so once.
TEST_F(PipelineTest, NamesThatWillNotReadBackAreCountedInOneWarning) {
    HX_LOGBLOCK* top = design->create_logblock(nullptr, 3, "top");
    name_pin(top, 0, "a\"b", HX_PIN_IN);
    name_pin(top, 1, std::string(1025, 'n').c_str(), HX_PIN_IN);
    name_pin(top, 2, "cr\r\nlf", HX_PIN_IN);
    HX_LOGBLOCK* c = design->create_logblock(top, 0, "c");
    c->create_prop(HX_PROPERTY::make_float("CAP", -INFINITY), nullptr);
    c->create_prop(HX_PROPERTY::make_float("DRIVE", 1), nullptr);  // an integer on reading
    select_design();
    const std::string path = dir.file("out.vrx");
    ASSERT_EQ(vrx.vrx_write(path.c_str(), nullptr, 0), VX_OK);
    expect_pipeline_report(PORT_MSG_WARNING,
                           "5 name(s) in '" + path +
                               "' will not read back as written (a double quote, a carriage "
                               "return before a line feed, more than 1024 bytes, a float that "
                               "is not finite, or a value of another kind than its property's "
                               "name takes), the first 'a\"b'\n");
    capture.clear();
    ASSERT_EQ(vrx.vrx_write(path.c_str(), nullptr, 0), VX_OK);  // counted afresh
    EXPECT_EQ(capture.texts(PORT_MSG_WARNING).size(), 1u);
}

TEST_F(PipelineTest, DesignFileReadsBackToTheSameText) {
    make_small_design();
    EXPECT_EQ(body(), text(kSmallDesign));
    const std::string file = dir.file("d.hxb");
    write_db_file(file, design, nullptr);
    capture.clear();
    ASSERT_EQ(vrx.hxb_read(file.c_str()), VX_OK);
    expect_pipeline_report(PORT_MSG_STATUS, "   reading design from '" + file + "' ...\n");
    ASSERT_NE(vrx.get_design(), design);
    EXPECT_STREQ(vrx.get_design()->get_name(), "d");
    EXPECT_EQ(A::is_design(vrx), 1);
    const std::string path = dir.file("again.vrx");
    ASSERT_EQ(vrx.vrx_write(path.c_str(), nullptr, 0), VX_OK);
    const std::string written = ScratchDir::read_file(path);
    EXPECT_EQ(written.substr(written.find(kHeaderLine2) + kHeaderLine2.size()), text(kSmallDesign));
}

TEST_F(PipelineTest, LibraryFileWritesItsPropertiesThenEachDesignThenItsAliases) {
    HX_LIBRARY source("L", 1);
    source.create_prop("LP", 1);
    source.create_prop("LF", HX_PROP_FLAG);
    source.create_design("d1")->create_logblock(nullptr, 0, "t1");
    source.create_design("d2")->create_logblock(nullptr, 0, "t2");
    ASSERT_TRUE(source.alias_design("d2", "also d2"));
    const std::string file = dir.file("l.hxl");
    write_db_file(file, nullptr, &source);
    ASSERT_EQ(vrx.hxb_read(file.c_str()), VX_OK);
    EXPECT_EQ(A::is_design(vrx), 0);
    ASSERT_NE(vrx.get_library(), nullptr);

    const std::string path = dir.file("l.vrx");
    ASSERT_EQ(vrx.vrx_write(path.c_str(), nullptr, 0), VX_OK);
    const std::string written = ScratchDir::read_file(path);
    ASSERT_EQ(written.find(kHeaderLine2), written.find("\r\n") + 2);
    EXPECT_EQ(written.substr(written.find(kHeaderLine2) + kHeaderLine2.size()), text(R"(
 (CASESENSE LP=1 LF)
DESIGN d1 {
   BLOCK t1 0 (NAME=t1) {
   }
}
DESIGN d2 {
   BLOCK t2 0 (NAME=t2) {
   }
}
DESIGN d2 "also d2" {
}
)"));
    EXPECT_EQ(capture.texts(PORT_MSG_STATUS),
              (std::vector<std::string>{"   reading library from '" + file + "' ...\n",
                                        "   writing VRX file '" + path + "' ...\n",
                                        "   processing design d1 ...\n",
                                        "   processing design d2 ...\n"}));
    expect_pipeline_report(PORT_MSG_STATUS, "   processing design d2 ...\n");
    EXPECT_EQ(errors(), std::vector<std::string>{});

    HX_LIBRARY empty("E", 0);  // no designs, no properties: the header lines only
    A::library(vrx) = &empty;
    ASSERT_EQ(vrx.vrx_write(path.c_str(), nullptr, 0), VX_OK);
    const std::string header_only = ScratchDir::read_file(path);
    EXPECT_EQ(header_only.substr(header_only.find("\r\n") + 2), kHeaderLine2);
    expect_pipeline_report(PORT_MSG_WARNING,
                           "library E holds no design; text cannot hold an "
                           "empty library, so the text written will not read "
                           "back\n");
    A::library(vrx) = nullptr;
}

TEST_F(PipelineTest, ALibraryDesignIsLeftOutOnlyWhereTheSectionOfItsNameHoldsItWhole) {
    HX_LIBRARY lib("L", 0);
    HX_DESIGN* part = lib.create_design("top/u1");
    HX_LOGBLOCK* root = part->create_logblock(nullptr, 1, "top/u1");
    name_pin(root, 0, "z", HX_PIN_OUT);
    HX_SIGNAL* z = part->create_signal(root, "z");
    HX_LOGPRIM* one = part->create_logprim(root, HX_PRIM_ONE, 0, "c");
    ASSERT_TRUE(part->create_conn(z, root, 0) && part->create_conn(z, one, 0));
    HX_DESIGN* whole = lib.create_design("TOP");
    HX_LOGBLOCK* u1 = whole->create_logblock(whole->create_logblock(nullptr, 0, "top"), 1, "u1");
    name_pin(u1, 0, "z", HX_PIN_OUT);
    ASSERT_NE(whole->graft(u1, part, 0, 0, nullptr, 0), nullptr);
    A::library(vrx) = &lib;
    A::is_design(vrx) = 0;
    const std::string path = dir.file("l.vrx");
    const auto sections = [&] {
        const std::string written = ScratchDir::read_file(path);
        const std::regex header("DESIGN top/u1 \\{");
        return std::distance(std::sregex_iterator(written.begin(), written.end(), header), {});
    };
    ASSERT_EQ(vrx.vrx_write(path.c_str(), nullptr, 0), VX_OK);
    EXPECT_EQ(sections(), 1);
    expect_pipeline_report(PORT_MSG_STATUS,
                           "   design top/u1 is written as a section of another design\n");
    EXPECT_EQ(capture.texts(PORT_MSG_WARNING), std::vector<std::string>{});

    one->set_name("other");  // the library's design no longer is what the section holds
    capture.clear();
    ASSERT_EQ(vrx.vrx_write(path.c_str(), nullptr, 0), VX_OK);
    EXPECT_EQ(sections(), 2);
    EXPECT_EQ(capture.texts(PORT_MSG_WARNING),
              std::vector<std::string>{
                  "design top/u1 differs from the section of design TOP written under the same "
                  "name: the text holds two designs of that name and will not read back as "
                  "written\n"});
    A::library(vrx) = nullptr;
}

TEST_F(PipelineTest, InputFilesThatCannotBeLoadedLeaveWhatWasLoaded) {
    select_design();
    const std::string missing = dir.file("missing.hxb");
    EXPECT_EQ(vrx.hxb_read(missing.c_str()), VX_FILE_ERROR);
    const std::string not_found =
        "cannot open input file '" + missing + "': No such file or directory\n";
    EXPECT_EQ(errors(), std::vector<std::string>{not_found});
    expect_pipeline_report(PORT_MSG_ERROR, not_found);

    const std::string garbage = dir.file("garbage.hxb");
    ScratchDir::write_file(garbage, "this is no database file\n");
    capture.clear();
    EXPECT_EQ(vrx.hxb_read(garbage.c_str()), VX_FILE_ERROR);
    expect_failure_reported(not_a_database_file(garbage));

    make_small_design();
    const std::string damaged = dir.file("damaged.hxb");
    write_db_file(damaged, design, nullptr);
    std::string bytes = ScratchDir::read_file(damaged);
    bytes[bytes.size() - 3] ^= 0x5a;
    ScratchDir::write_file(damaged, bytes);
    capture.clear();
    EXPECT_EQ(vrx.hxb_read(damaged.c_str()), VX_FILE_ERROR);  // refused by the database
    expect_failure_reported(
        literal("cannot read database file '" + damaged + "': corrupt (checksum mismatch)\n"));

    EXPECT_EQ(vrx.get_design(), design);
    EXPECT_EQ(vrx.get_library(), nullptr);
    EXPECT_EQ(A::is_design(vrx), 1);
}

// --- failed writes: the destination stays as it was and no temporary file stays ---------

TEST_F(PipelineTest, NothingLoaded) {
    const std::string path = dir.file("none.vrx");
    EXPECT_EQ(vrx.vrx_write(path.c_str(), nullptr, 0), VX_FILE_ERROR);
    expect_failure_reported(nothing_loaded(path));
    expect_untouched(path, nullptr);
}

TEST_F(PipelineTest, UnreadableFilterFile) {
    select_design();
    const std::string path = old_destination();
    const std::string filter = dir.file("missing.flt");
    EXPECT_EQ(vrx.vrx_write(path.c_str(), filter.c_str(), 0), VX_FILE_ERROR);
    expect_pipeline_report(PORT_MSG_ERROR, "error reading property filter file '" + filter + "'\n");
    expect_untouched(path, "old");
}

TEST_F(PipelineTest, DestinationInAMissingDirectory) {
    select_design();
    const std::string path = dir.file("no/such/dir/out.vrx");
    EXPECT_EQ(vrx.vrx_write(path.c_str(), nullptr, 0), VX_FILE_ERROR);
    expect_pipeline_report(PORT_MSG_ERROR, "cannot open temporary output file '" + path +
                                               "': No such file or directory\n");
    expect_untouched(path, nullptr);
}

TEST_F(PipelineTest, DiskFullWhileWriting) {
    make_small_design();
    select_design();
    const std::string path = old_destination();
    {
        FileSizeLimit limit(64);
        EXPECT_EQ(vrx.vrx_write(path.c_str(), nullptr, 0), VX_FILE_ERROR);
    }
    expect_failure_reported(write_failed(path));
    // Found when the file is closed, not left to the copy (which the limit happens to stop too).
    for (const std::string& error : errors()) {
        EXPECT_EQ(error.find("Unable to copy"), std::string::npos) << error;
    }
    expect_untouched(path, "old");
}

TEST_F(PipelineTest, FatalReportWhoseHandlerReturnsFailsTheWrite) {
    make_small_design();
    select_design();
    HX_PIN* pin = design->get_log_root()->get_pin(0);
    pin->set_dir(9);  // no pin type has this value
    const std::string path = old_destination();
    EXPECT_EQ(vrx.vrx_write(path.c_str(), nullptr, 0), VX_FILE_ERROR);
    EXPECT_EQ(capture.exits(), std::vector<int>{2});
    EXPECT_EQ(capture.texts(PORT_MSG_FATAL),
              std::vector<std::string>{"cannot find pin type name for pin 'a'\n"});
    for (const CapturedMsg& m : capture.messages()) {
        if (m.level == PORT_MSG_FATAL) {
            EXPECT_EQ(m.file + " " + m.revision, "basvxwrite $Revision: 1.3 $");
        }
    }
    expect_untouched(path, "old");

    pin->set_dir(HX_PIN_IN);
    design->create_prop(std::make_unique<HX_PROPERTY>("ODD", static_cast<HX_PROP_TYPE>(42)),
                        nullptr);
    capture.clear();
    EXPECT_EQ(vrx.vrx_write(path.c_str(), nullptr, 0), VX_FILE_ERROR);
    EXPECT_EQ(capture.exits(), std::vector<int>{2});
    EXPECT_EQ(capture.texts(PORT_MSG_FATAL), std::vector<std::string>{"invalid property type.\n"});
    expect_untouched(path, "old");

    design->delete_prop("ODD", 0);  // the converter writes on as before
    capture.clear();
    EXPECT_EQ(body(), text(kSmallDesign));
}

}  // namespace
}  // namespace writer_test
