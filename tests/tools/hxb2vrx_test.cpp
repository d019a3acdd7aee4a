// hxb2vrx run as a program: its command line, exit statuses, messages and files.
#include <gtest/gtest.h>

#include <cstdio>
#include <string>
#include <vector>

#include "hx_library.h"
#include "port_file.h"
#include "scratch_dir.h"
#include "tool_run.h"
#include "ut_ptrfile.h"

namespace {

using vrx_test::ToolRun;

const std::string kHeaderLine2 = "// $Header: basvrxwrite,v 1.1 2003/01/23 19:53:39 Exp $";

class Hxb2vrxTest : public ::testing::Test {
  protected:
    /// Runs the tool with `args` in dir_, TMPDIR pointing at a directory of
    /// its own. Standard output goes to `stdout_path` when one is given (and
    /// is then not read back).
    ToolRun run(const std::vector<std::string>& args, const std::string& stdout_path = "") {
        return vrx_test::run_tool(HXB2VRX_PATH, args,
                                  {dir_.path(), tmp_.path(), capture_.path(), stdout_path});
    }

    /// A design "top": a user block u1 with property MYCOLOR and an AND gate.
    std::string write_design_file() {
        HX_LIBRARY* library = hx_env.create_library("work", 0);
        HX_DESIGN* design = library->create_design("top");
        HX_LOGBLOCK* root = design->create_logblock(nullptr, 2, "top");
        HX_LOGBLOCK* child = design->create_logblock(root, 1, "u1");
        child->set_user(1);
        child->create_prop("MYCOLOR", "red", 1);
        HX_LOGPRIM* gate = design->create_logprim(root, HX_PRIM_AND, 2, "g1");
        HX_SIGNAL* a = design->create_signal(root, "a");
        HX_SIGNAL* y = design->create_signal(root, "y");
        design->create_conn(a, gate, 0);
        design->create_conn(a, gate, 1);
        design->create_conn(y, gate, 2);
        design->create_conn(y, child, 0);
        return save("top.hxb", library,
                    [&](UT_PTRFILE* f) { return hx_env.write_design(f, design); });
    }

    /// A library "cells" of two empty designs, "inv" and "nand".
    std::string write_library_file() {
        HX_LIBRARY* library = hx_env.create_library("cells", 0);
        for (const char* name : {"inv", "nand"}) {
            library->create_design(name)->create_logblock(nullptr, 2, name);
        }
        return save("cells.hxl", library,
                    [&](UT_PTRFILE* f) { return hx_env.write_library(f, library); });
    }

    /// Writes a database file into dir_ with `write`, then drops the library.
    template <class Write>
    std::string save(const char* name, HX_LIBRARY* library, Write write) {
        const std::string path = dir_.file(name);
        UT_PTRFILE file(Port::ACCESS_WRITE);
        bool written = Port::File::open(path.c_str(), &file, false) != nullptr && write(&file);
        written = Port::File::close(&file) && written;
        hx_env.delete_library(library);
        EXPECT_TRUE(written) << path;
        return path;
    }

    static std::vector<std::string> lines_of(const std::string& text) {
        std::vector<std::string> lines;
        size_t start = 0;
        for (size_t end; (end = text.find("\r\n", start)) != std::string::npos; start = end + 2) {
            lines.push_back(text.substr(start, end - start));
        }
        return lines;
    }

    /// Checks the two comment lines that open every written file. From the
    /// 10th of a month on, the first one reaches 79 columns, and the line
    /// length rule puts an empty line before it.
    static void expect_header(const std::vector<std::string>& lines) {
        size_t first = 0;
        if (!lines.empty() && lines[0].empty()) {
            first = 1;
            ASSERT_GE(lines.size(), 2u);
            EXPECT_GE(lines[1].size(), 79u) << "empty line before a short first line";
        }
        ASSERT_GE(lines.size(), first + 2);
        EXPECT_EQ(lines[first].rfind("// Created ", 0), 0u) << lines[first];
        EXPECT_EQ(lines[first + 1], kHeaderLine2);
    }

    ScratchDir dir_;      // inputs and outputs
    ScratchDir tmp_;      // the tool's TMPDIR: empty again after every run
    ScratchDir capture_;  // standard output and error of the runs
};

// --- Command line -------------------------------------------------------------

TEST_F(Hxb2vrxTest, UsageErrorsExit64WithUsageOnStandardError) {
    const std::vector<std::vector<std::string>> cases = {
        {},                           // no operands
        {"in.hxb"},                   // one operand
        {"a", "b", "c"},              // three operands
        {"-x", "a", "b"},             // unknown short option
        {"--frobnicate", "a", "b"},   // unknown long option
        {"--filt", "f", "a", "b"},    // long names are not abbreviated
        {"a", "b", "-f"},             // missing option argument
        {"a", "b", "--filter"},       // missing option argument, long form
        {"--omit-user=1", "a", "b"},  // a flag takes no argument
        {"--help=1"},                 // nor does --help
    };
    for (const auto& args : cases) {
        std::string shown;
        for (const auto& arg : args)
            shown += " '" + arg + "'";
        SCOPED_TRACE("arguments:" + shown);
        const ToolRun r = run(args);
        EXPECT_EQ(r.status, 64);
        EXPECT_EQ(r.out, "");
        EXPECT_NE(r.err.find("usage: hxb2vrx [-f FILE | --filter FILE] [-u | --omit-user] "
                             "[-q | --quiet] INPUT OUTPUT\n"),
                  std::string::npos)
            << r.err;
        EXPECT_EQ(r.err.rfind("hxb2vrx: ", 0), 0u) << r.err;
    }
    EXPECT_TRUE(dir_.entries().empty());
}

TEST_F(Hxb2vrxTest, HelpAndVersionGoToStandardOutputAndExit0) {
    const ToolRun help = run({"--help"});
    EXPECT_EQ(help.status, 0);
    EXPECT_EQ(help.err, "");
    EXPECT_EQ(help.out.rfind("usage: hxb2vrx ", 0), 0u) << help.out;
    for (const char* word :
         {"--filter", "--omit-user", "--quiet", "--version", "Exit status", "64"}) {
        EXPECT_NE(help.out.find(word), std::string::npos) << word;
    }

    const ToolRun version = run({"--version"});
    EXPECT_EQ(version.status, 0);
    EXPECT_EQ(version.out, "hxb2vrx " VRX_EXPECTED_VERSION "\n");
    EXPECT_EQ(version.err, "");

    // Help ends the run before the operands are counted or anything is read.
    EXPECT_EQ(run({"missing.hxb", "--help"}).status, 0);
}

TEST_F(Hxb2vrxTest, HelpOrVersionThatCannotBeWrittenIsNoSuccess) {
    if (!ScratchDir::exists("/dev/full")) GTEST_SKIP() << "no /dev/full";
    for (const char* option : {"--help", "--version"}) {
        const ToolRun r = run({option}, "/dev/full");
        EXPECT_EQ(r.status, 1) << option;
        EXPECT_NE(r.err.find("cannot write"), std::string::npos) << r.err;
    }
}

// --- Conversion ---------------------------------------------------------------

TEST_F(Hxb2vrxTest, DesignFileBecomesATextNetlist) {
    const std::string input = write_design_file();
    const std::string output = dir_.file("top.vrx");
    const ToolRun r = run({input, output});
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_EQ(r.err, "");
    EXPECT_EQ(r.out, "   reading design from '" + input + "' ...\n" + "   writing VRX file '" +
                         output + "' ...\n");

    const std::string text = ScratchDir::read_file(output);
    expect_header(lines_of(text));
    for (const char* name : {"top", "u1", "g1", "MYCOLOR", " USER"}) {
        EXPECT_NE(text.find(name), std::string::npos) << name;
    }
    EXPECT_EQ(dir_.entries(), (std::vector<std::string>{"top.hxb", "top.vrx"}));
    EXPECT_TRUE(tmp_.entries().empty());
}

TEST_F(Hxb2vrxTest, OptionsReachTheWriterInEveryForm) {
    const std::string input = write_design_file();
    const std::string filter = dir_.file("rename.pf");
    ScratchDir::write_file(filter, "MYCOLOR=SHADE\n");
    const std::string output = dir_.file("top.vrx");

    const std::vector<std::vector<std::string>> forms = {
        {"-u", "-f", filter, input, output},
        {"--omit-user", "--filter", filter, input, output},
        {"--filter=" + filter, input, output, "--omit-user"},    // options after operands
        {"-uf" + filter, input, output},                         // grouped, argument attached
        {"-u", "-f", "unused.pf", "-f", filter, input, output},  // the last filter counts
    };
    for (const auto& args : forms) {
        SCOPED_TRACE(args[0]);
        ScratchDir::write_file(output, "old");
        const ToolRun r = run(args);
        ASSERT_EQ(r.status, 0) << r.err;
        const std::string text = ScratchDir::read_file(output);
        EXPECT_EQ(text.find(" USER"), std::string::npos);
        EXPECT_EQ(text.find("MYCOLOR"), std::string::npos);
        EXPECT_NE(text.find("SHADE"), std::string::npos);
    }
}

TEST_F(Hxb2vrxTest, DoubleDashEndsOptions) {
    write_design_file();
    // The tool runs in dir_, so these relative names land there.
    EXPECT_EQ(run({"--", "top.hxb", "-u.vrx"}).status, 0);
    EXPECT_EQ(run({"top.hxb", "--", "--omit-user"}).status, 0);
    EXPECT_NE(ScratchDir::read_file(dir_.file("--omit-user")).find(" USER"), std::string::npos);
    EXPECT_EQ(dir_.entries(), (std::vector<std::string>{"--omit-user", "-u.vrx", "top.hxb"}));
}

TEST_F(Hxb2vrxTest, FailedStepExits1AndLeavesNoFileBehind) {
    const std::string design = write_design_file();
    const std::string not_database = dir_.file("text.hxb");
    ScratchDir::write_file(not_database, "// not a database file\n");
    const std::string malformed = dir_.file("bad.pf");
    ScratchDir::write_file(malformed, "A B C\n");
    const std::string absent = dir_.file("absent.pf");
    const std::string output = dir_.file("out.vrx");

    struct Case {
        std::vector<std::string> args;
        std::string message;
    };
    const std::vector<Case> cases = {
        {{dir_.file("missing.hxb"), output}, "cannot open input file '" + dir_.file("missing.hxb")},
        {{dir_.path(), output},
         "cannot open input file '" + dir_.path() + "': '" + dir_.path() + "' is a directory"},
        {{not_database, output},
         not_database + "' is neither a design nor a library file (it holds text"},
        {{"-f", malformed, design, output}, "error reading property filter file '" + malformed},
        {{"--filter", absent, design, output}, "error reading property filter file '" + absent},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.args[c.args.size() - 2]);
        ToolRun r = run(c.args);
        EXPECT_EQ(r.status, 1);
        EXPECT_NE(r.err.find(c.message), std::string::npos) << r.err;
        EXPECT_FALSE(ScratchDir::exists(output));
        EXPECT_TRUE(tmp_.entries().empty());

        ScratchDir::write_file(output, "previous contents");
        EXPECT_EQ(run(c.args).status, 1);
        EXPECT_EQ(ScratchDir::read_file(output), "previous contents");
        std::remove(output.c_str());
    }

    // The write itself fails: the temporary file goes too.
    const ToolRun r = run({design, dir_.file("no-such-folder/top.vrx")});
    EXPECT_EQ(r.status, 1);
    EXPECT_NE(r.err, "");
    EXPECT_TRUE(tmp_.entries().empty());
}

TEST_F(Hxb2vrxTest, AValueNoTextCanCarryIsRefusedAsCorruptWithoutOutputOrTemporaryFile) {
    HX_LIBRARY* library = hx_env.create_library("work", 0);
    HX_DESIGN* design = library->create_design("top");
    HX_LOGBLOCK* root = design->create_logblock(nullptr, 1, "top");
    root->get_pin(0)->set_name("a");
    root->get_pin(0)->set_dir(9);  // no direction keyword stands for this
    const std::string input =
        save("bad.hxb", library, [&](UT_PTRFILE* f) { return hx_env.write_design(f, design); });
    const std::string output = dir_.file("bad.vrx");
    ScratchDir::write_file(output, "previous contents");

    const ToolRun r = run({input, output});
    EXPECT_EQ(r.status, 1);
    EXPECT_EQ(r.err, "ERROR:HX - cannot read database file '" + input +
                         "': corrupt (a pin direction is unknown)\n");
    EXPECT_EQ(ScratchDir::read_file(output), "previous contents");
    EXPECT_TRUE(tmp_.entries().empty());
}

TEST_F(Hxb2vrxTest, LibraryFileWritesEveryDesign) {
    const std::string input = write_library_file();
    const std::string output = dir_.file("cells.vrx");
    const ToolRun r = run({input, output});
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_EQ(r.out, "   reading library from '" + input + "' ...\n" + "   writing VRX file '" +
                         output + "' ...\n" + "   processing design inv ...\n" +
                         "   processing design nand ...\n");
    expect_header(lines_of(ScratchDir::read_file(output)));
}

}  // namespace
