// vrx2hxb run as a program: its command line, exit statuses, messages and the
// database files it writes (or does not write).
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "hx_library.h"
#include "port_file.h"
#include "scratch_dir.h"
#include "tool_run.h"
#include "ut_ptrfile.h"

namespace {

using vrx_test::ToolRun;

// A design "top" with one AND gate between its two pins.
constexpr const char* kTop =
    "DESIGN top {\n"
    "   BLOCK top 2 (NAME=top) {\n"
    "      PIN a (TYPE=IN CONN=a)\n"
    "      PIN y (TYPE=OUT CONN=y)\n"
    "   }\n"
    "   PRIM AND 2 (NAME=g1) {\n"
    "      PIN IN (CONN=a)\n"
    "      PIN IN (CONN=a)\n"
    "      PIN OUT (CONN=y)\n"
    "   }\n"
    "}\n";

// A cell "inv" and a design "chip" that uses it.
constexpr const char* kCells =
    "DESIGN inv {\n"
    "   BLOCK inv 2 (NAME=inv) {\n"
    "      PIN a (TYPE=IN CONN=a)\n"
    "      PIN y (TYPE=OUT CONN=y)\n"
    "   }\n"
    "   PRIM BUF (NAME=b) {\n"
    "      PIN IN (CONN=a INV)\n"
    "      PIN OUT (CONN=y)\n"
    "   }\n"
    "}\n"
    "DESIGN chip {\n"
    "   BLOCK chip 2 (NAME=chip) {\n"
    "      PIN i (TYPE=IN CONN=i)\n"
    "      PIN o (TYPE=OUT CONN=o)\n"
    "   }\n"
    "   BLOCK inv 2 (NAME=u1) {\n"
    "      PIN a (CONN=i)\n"
    "      PIN y (CONN=o)\n"
    "   }\n"
    "}\n";

// Two gates drive y: complete, but the design-rule check fails.
constexpr const char* kTwoDrivers =
    "DESIGN clash {\n"
    "   BLOCK clash 2 (NAME=clash) {\n"
    "      PIN a (TYPE=IN CONN=a)\n"
    "      PIN y (TYPE=OUT CONN=y)\n"
    "   }\n"
    "   PRIM BUF (NAME=b1) { PIN IN (CONN=a) PIN OUT (CONN=y) }\n"
    "   PRIM BUF (NAME=b2) { PIN IN (CONN=a) PIN OUT (CONN=y) }\n"
    "}\n";

// The root block carries PHYSICAL, so -p derives a physical root.
constexpr const char* kPhysical =
    "DESIGN top {\n"
    "   BLOCK top 2 (NAME=top PHYSICAL) {\n"
    "      PIN a (TYPE=IN CONN=a)\n"
    "      PIN y (TYPE=OUT CONN=y)\n"
    "   }\n"
    "   PRIM BUF (NAME=b) { PIN IN (CONN=a) PIN OUT (CONN=y) }\n"
    "}\n";

class Vrx2hxbTest : public ::testing::Test {
  protected:
    ToolRun run(const std::vector<std::string>& args, const std::string& stdout_path = "") {
        return vrx_test::run_tool(VRX2HXB_PATH, args,
                                  {dir_.path(), tmp_.path(), capture_.path(), stdout_path});
    }

    /// Writes `text` into dir_ under `name`; returns its path.
    std::string input(const char* name, const char* text) {
        const std::string path = dir_.file(name);
        ScratchDir::write_file(path, text);
        return path;
    }

    /// Reads the database file at `path`; null (with a test failure) when it
    /// is not a design file or a library file as `library` asks.
    static HX_LIBRARY* load(const std::string& path, bool library) {
        UT_PTRFILE file(Port::ACCESS_READ);
        if (Port::File::open(path.c_str(), &file, true) == nullptr) {
            ADD_FAILURE() << "cannot open " << path;
            return nullptr;
        }
        HX_LIBRARY* result = nullptr;
        const HX_FILE_TYPE kind = hx_env.get_file_type(&file);
        if (kind != (library ? HX_FILE_LIBRARY : HX_FILE_DESIGN)) {
            ADD_FAILURE() << path << " has file type " << kind;
        } else if (library) {
            result = hx_env.create_library(&file);
        } else if (HX_DESIGN* design = hx_env.create_design(&file, 0)) {
            result = design->get_library();
        }
        Port::File::close(&file);
        EXPECT_NE(result, nullptr) << path;
        return result;
    }

    /// The one design of the design file at `path`, or null.
    static HX_DESIGN* load_design(const std::string& path) {
        HX_LIBRARY* library = load(path, false);
        if (library == nullptr) return nullptr;
        UT_BLIST_ITER<HX_LIBLINK>* links = library->create_liblink_iter();
        HX_LIBLINK* link = links->l_next();
        library->delete_liblink_iter(links);
        return link != nullptr ? link->get_design() : nullptr;
    }

    ScratchDir dir_;      // inputs and outputs
    ScratchDir tmp_;      // the tool's TMPDIR: empty again after every run
    ScratchDir capture_;  // standard output and error of the runs
};

// --- Command line -------------------------------------------------------------

TEST_F(Vrx2hxbTest, UsageErrorsExit64WithUsageOnStandardError) {
    const std::vector<std::vector<std::string>> cases = {
        {},                       // no operand
        {"-x", "a.vrx"},          // unknown short option
        {"--lib", "a.vrx"},       // long names are not abbreviated
        {"a.vrx", "-o"},          // missing option argument
        {"--library=1", "a.vrx"}  // a flag takes no argument
    };
    for (const auto& args : cases) {
        SCOPED_TRACE(args.empty() ? std::string("no arguments") : args[0]);
        const ToolRun r = run(args);
        EXPECT_EQ(r.status, 64);
        EXPECT_EQ(r.out, "");
        EXPECT_EQ(r.err.rfind("vrx2hxb: ", 0), 0u) << r.err;
        EXPECT_NE(
            r.err.find("usage: vrx2hxb [-l | --library] [-p | --physroot] [-n | --nograft] "
                       "[-o FILE | --output FILE] [-a | --all-findings] [-q | --quiet] INPUT...\n"),
            std::string::npos)
            << r.err;
    }
    EXPECT_TRUE(dir_.entries().empty());
}

TEST_F(Vrx2hxbTest, HelpAndVersionGoToStandardOutputAndExit0) {
    const ToolRun help = run({"--help"});
    EXPECT_EQ(help.status, 0);
    EXPECT_EQ(help.err, "");
    EXPECT_EQ(help.out.rfind("usage: vrx2hxb ", 0), 0u) << help.out;
    for (const char* word : {"--library", "--physroot", "--nograft", "--output", "--quiet",
                             "Exit status", "  3 ", "64"}) {
        EXPECT_NE(help.out.find(word), std::string::npos) << word;
    }
    const ToolRun version = run({"--version"});
    EXPECT_EQ(version.status, 0);
    EXPECT_EQ(version.out, "vrx2hxb " VRX_EXPECTED_VERSION "\n");
    EXPECT_EQ(version.err, "");
}

// --- Conversion ---------------------------------------------------------------

TEST_F(Vrx2hxbTest, DesignFileIsNamedAfterTheFirstInput) {
    const std::string text = input("top.vrx", kTop);
    const ToolRun r = run({text});
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_EQ(r.err, "");
    EXPECT_NE(r.out.find("top.hxb"), std::string::npos) << r.out;
    EXPECT_EQ(dir_.entries(), (std::vector<std::string>{"top.hxb", "top.vrx"}));
    EXPECT_TRUE(tmp_.entries().empty());

    HX_DESIGN* design = load_design(dir_.file("top.hxb"));
    ASSERT_NE(design, nullptr);
    EXPECT_STREQ(design->get_name(), "top");
    ASSERT_NE(design->get_log_root(), nullptr);
    EXPECT_EQ(design->get_log_root()->child_count(), 1u);
    hx_env.delete_library(design->get_library());
}

TEST_F(Vrx2hxbTest, InputsAreReadInOrderAndTheLastDesignIsKept) {
    input("cells.vrx", kCells);
    input("top.vrx", kTop);
    // Relative names, and one without its extension: the tool runs in dir_.
    const ToolRun r = run({"cells", "top.vrx"});
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_LT(r.out.find("cells.vrx"), r.out.find("top.vrx")) << r.out;
    HX_DESIGN* design = load_design(dir_.file("cells.hxb"));
    ASSERT_NE(design, nullptr);
    EXPECT_STREQ(design->get_name(), "top");
    hx_env.delete_library(design->get_library());
}

TEST_F(Vrx2hxbTest, OutputOptionNamesTheFileInEveryForm) {
    const std::string text = input("top.vrx", kTop);
    for (const std::vector<std::string>& args :
         {std::vector<std::string>{"-o", dir_.file("a.hxb"), text},
          {text, "--output", dir_.file("b.hxb")},
          {"--output=" + dir_.file("c.hxb"), text},
          {"-o" + dir_.file("ignored.hxb"), "-o", dir_.file("d"), text}}) {
        SCOPED_TRACE(args[0]);
        const ToolRun r = run(args);
        EXPECT_EQ(r.status, 0) << r.err;
    }
    // The extension fits what is written; a name without one gets it, one
    // with another is told of the change.
    const ToolRun other = run({"-o", dir_.file("e.txt"), text});
    EXPECT_NE(other.err.find("output file " + dir_.file("e.txt") + " is written as " +
                             dir_.file("e.hxb")),
              std::string::npos)
        << other.err;
    EXPECT_EQ(dir_.entries(),
              (std::vector<std::string>{"a.hxb", "b.hxb", "c.hxb", "d.hxb", "e.hxb", "top.vrx"}));
}

TEST_F(Vrx2hxbTest, LibraryOptionWritesEveryDesignAsALibraryFile) {
    const std::string text = input("cells.vrx", kCells);
    ASSERT_EQ(run({"-l", text}).status, 0);
    HX_LIBRARY* library = load(dir_.file("cells.hxl"), true);
    ASSERT_NE(library, nullptr);
    EXPECT_EQ(library->design_count(), 2u);
    HX_DESIGN* chip = library->find_design("chip");
    ASSERT_NE(chip, nullptr);
    ASSERT_NE(chip->get_log_root(), nullptr);
    hx_env.delete_library(library);
    EXPECT_FALSE(ScratchDir::exists(dir_.file("cells.hxb")));
}

TEST_F(Vrx2hxbTest, NograftKeepsTheInstanceATemplateBlock) {
    const std::string text = input("cells.vrx", kCells);
    // The instance u1 of inv: grafted it holds inv's buffer, a template it is empty.
    for (const bool nograft : {false, true}) {
        SCOPED_TRACE(nograft ? "--nograft" : "grafted");
        std::vector<std::string> args{"--library", "-o", dir_.file("out.hxl"), text};
        if (nograft) args.insert(args.begin(), "--nograft");
        ASSERT_EQ(run(args).status, 0);
        HX_LIBRARY* library = load(dir_.file("out.hxl"), true);
        ASSERT_NE(library, nullptr);
        const HX_BASELOGBLOCK* root = library->find_design("chip")->get_log_root();
        ASSERT_EQ(root->child_count(), 1u);
        UT_BLIST_ITER<HX_BLOCK>* children = root->create_child_iter();
        EXPECT_EQ(children->l_next()->child_count(), nograft ? 0u : 1u);
        root->delete_child_iter(children);
        hx_env.delete_library(library);
    }
}

TEST_F(Vrx2hxbTest, PhysrootOptionDerivesAPhysicalRoot) {
    const std::string text = input("top.vrx", kPhysical);
    for (const bool physroot : {false, true}) {
        SCOPED_TRACE(physroot ? "-p" : "without -p");
        std::vector<std::string> args{text};
        if (physroot) args.insert(args.begin(), "-p");
        ASSERT_EQ(run(args).status, 0);
        HX_DESIGN* design = load_design(dir_.file("top.hxb"));
        ASSERT_NE(design, nullptr);
        EXPECT_EQ(design->get_phys_root() != nullptr, physroot);
        hx_env.delete_library(design->get_library());
    }
}

TEST_F(Vrx2hxbTest, FileAndParseErrorsWriteNoDatabaseFile) {
    const std::string good = input("good.vrx", kTop);
    const std::string bad = input("bad.vrx", "DESIGN d { }\n");
    struct Case {
        std::vector<std::string> args;
        int status;
        std::string message;
    };
    const std::vector<Case> cases = {
        {{dir_.file("missing.vrx")}, 1, "cannot open input file"},
        {{good, dir_.file("missing.vrx")}, 1, "cannot open input file"},
        {{bad}, 2, "parse of input file failed"},
        {{bad, good}, 2, "parse of input file failed"},
        {{"-o", dir_.file("out.hxb"), good, bad}, 2, "parse of input file failed"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.args.back());
        const ToolRun r = run(c.args);
        EXPECT_EQ(r.status, c.status);
        EXPECT_NE(r.err.find(c.message), std::string::npos) << r.err;
        EXPECT_EQ(dir_.entries(), (std::vector<std::string>{"bad.vrx", "good.vrx"}));
        EXPECT_TRUE(tmp_.entries().empty());
    }
    // The database file cannot be written.
    const ToolRun r = run({"-o", dir_.file("no-such-folder/top.hxb"), good});
    EXPECT_EQ(r.status, 1);
    EXPECT_NE(r.err, "");
    EXPECT_TRUE(tmp_.entries().empty());
}

TEST_F(Vrx2hxbTest, DesignRuleErrorsStillWriteTheFileAndExit3) {
    const std::string text = input("clash.vrx", kTwoDrivers);
    const ToolRun r = run({text});
    EXPECT_EQ(r.status, 3);
    EXPECT_NE(r.err.find("DRC failed"), std::string::npos) << r.err;
    HX_DESIGN* design = load_design(dir_.file("clash.hxb"));
    ASSERT_NE(design, nullptr);
    EXPECT_EQ(design->get_log_root()->child_count(), 2u);
    hx_env.delete_library(design->get_library());

    // A write that fails after the check does not hide the check's status.
    EXPECT_EQ(run({"-o", dir_.file("no-such-folder/clash.hxb"), text}).status, 3);
}

TEST_F(Vrx2hxbTest, DesignRuleFindingsStopAtTwentyOfAKindUnlessAllAreAsked) {
    std::string text = "DESIGN d {\n   BLOCK d 0\n   BLOCK box 25 {";
    for (int i = 0; i < 25; ++i)
        text += " PIN p" + std::to_string(i);
    const std::string path = input("open.vrx", (text + " }\n}\n").c_str());
    const auto lines = [](const std::string& s) { return std::count(s.begin(), s.end(), '\n'); };
    const ToolRun brief = run({"-q", path});
    EXPECT_EQ(brief.status, 0);
    EXPECT_EQ(lines(brief.err), 22) << brief.err;
    EXPECT_NE(brief.err.find("- 5 more findings 'pin without outer signal' not shown (the first "
                             "20 are above); vrx2hxb --all-findings (VRX::set_all_findings) "
                             "shows them all\nWARNING:Quorra - DRC complete with 25 warnings"),
              std::string::npos);
    for (const char* option : {"-a", "--all-findings"})
        EXPECT_EQ(lines(run({"-q", option, path}).err), 26) << option;
}

TEST_F(Vrx2hxbTest, ErrorLimitEndsTheRunWithStatus2) {
    std::string text = "DESIGN d {\n";
    for (int i = 0; i < 20; ++i)
        text += "   PRIM NOSUCHTYPE\n";
    text += "   BLOCK d 1 { PIN a }\n}\n";
    const std::string many = input("many.vrx", text.c_str());
    const std::string good = input("good.vrx", kTop);
    const ToolRun r = run({many, good});
    EXPECT_EQ(r.status, 2);
    EXPECT_NE(r.err.find("maximum error limit reached"), std::string::npos) << r.err;
    EXPECT_EQ(r.out.find("good.vrx"), std::string::npos) << r.out;  // never read
    EXPECT_EQ(dir_.entries(), (std::vector<std::string>{"good.vrx", "many.vrx"}));
    EXPECT_TRUE(tmp_.entries().empty());
}

// Each design grafts the one before twice: 2^40 blocks from a few kilobytes.
// Under a memory limit the run ends as a fatal error, and writes nothing.
TEST_F(Vrx2hxbTest, RunningOutOfMemoryIsFatalAndLeavesNoFile) {
    if (VRX_SANITIZED) GTEST_SKIP() << "the sanitizers' shadow memory does not fit the limit";
    std::string text = "DESIGN d0 { BLOCK d0 1 { PIN a (TYPE=IN CONN=a) } }\n";
    for (int i = 1; i <= 40; ++i) {
        const std::string d = "d" + std::to_string(i), use = " BLOCK d" + std::to_string(i - 1);
        text += "DESIGN " + d + " { BLOCK " + d + " 1 { PIN a (TYPE=IN CONN=a) }" + use +
                " 1 (NAME=u1) { PIN a (CONN=a) }" + use + " 1 (NAME=u2) { PIN a (CONN=a) } }\n";
    }
    const std::string path = input("doubling.vrx", text.c_str());
    const ToolRun r = vrx_test::run_tool(
        "/bin/sh", {"-c", "ulimit -v 300000 && exec \"$0\" \"$@\"", VRX2HXB_PATH, path},
        {dir_.path(), tmp_.path(), capture_.path(), ""});
    EXPECT_EQ(r.status, 2);
    EXPECT_NE(r.err.find("FATAL_ERROR:Quorra - out of memory while building design 'd"),
              std::string::npos)
        << r.err;
    EXPECT_EQ(dir_.entries(), (std::vector<std::string>{"doubling.vrx"}));
    EXPECT_TRUE(tmp_.entries().empty());
}

}  // namespace
