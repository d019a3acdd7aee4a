// Both tools' progress line and -q: progress only on a terminal, erased before
// messages and at the end of each step; quiet runs print errors only.
#include <gtest/gtest.h>
#include <pty.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "chain_netlist.h"
#include "scratch_dir.h"
#include "tool_progress.h"
#include "tool_run.h"

namespace {

using vrx_test::chain_netlist;

using vrx_test::ToolRun;
using namespace std::chrono_literals;

struct Captured {
    int status = -1;
    std::string output;  // standard output and standard error, interleaved
};

void exec_in(const std::string& dir, std::vector<char*>& argv) {
    if (chdir(dir.c_str()) == 0) execv(argv[0], argv.data());
    _exit(127);
}

// A pseudo-terminal ends in EIO once the child is gone, a pipe in 0.
std::string read_until_closed(int fd) {
    std::string text;
    char buffer[4096];
    ssize_t got = 0;
    while ((got = read(fd, buffer, sizeof buffer)) > 0 || (got < 0 && errno == EINTR))
        text.append(buffer, static_cast<std::size_t>(std::max<ssize_t>(got, 0)));
    return text;
}

/// Runs `program` in `dir` with standard output and error on one new
/// pseudo-terminal (`terminal`) or on one pipe.
Captured run_attached(const char* program, std::vector<std::string> args, const std::string& dir,
                      bool terminal) {
    std::vector<char*> argv{const_cast<char*>(program)};
    for (std::string& arg : args)
        argv.push_back(arg.data());
    argv.push_back(nullptr);
    Captured result;
    int reader = -1;
    pid_t pid = -1;
    if (terminal) {
        pid = forkpty(&reader, nullptr, nullptr, nullptr);
        if (pid == 0) exec_in(dir, argv);
    } else {
        int ends[2];
        if (pipe(ends) != 0) return result;
        pid = fork();
        if (pid == 0) {
            dup2(ends[1], STDOUT_FILENO);
            dup2(ends[1], STDERR_FILENO);
            exec_in(dir, argv);
        }
        close(ends[1]);
        reader = ends[0];
    }
    if (pid < 0) {
        ADD_FAILURE() << "cannot start " << program;
        return result;
    }
    result.output = read_until_closed(reader);
    close(reader);
    int wait_status = 0;
    waitpid(pid, &wait_status, 0);
    if (WIFEXITED(wait_status)) result.status = WEXITSTATUS(wait_status);
    return result;
}

/// Each message starts at the start of a line: the progress line was erased.
void expect_alone(const std::string& output, const std::string& message) {
    const std::size_t at = output.find(message);
    ASSERT_NE(at, std::string::npos) << message << " missing from:\n" << output;
    ASSERT_GT(at, 0u);
    EXPECT_TRUE(output[at - 1] == '\r' || output[at - 1] == '\n') << output;
}

/// The output ends in blanks that overwrite the last progress text.
void expect_erased_at_end(const std::string& output) {
    ASSERT_TRUE(output.ends_with(" \r")) << output;
    const std::size_t start = output.rfind('\r', output.size() - 2);
    ASSERT_NE(start, std::string::npos);
    EXPECT_EQ(output.find_first_not_of(' ', start + 1), output.size() - 1) << output;
}

class ToolProgressTest : public ::testing::Test {
  protected:
    void SetUp() override { ScratchDir::write_file(dir_.file("chain.vrx"), chain_netlist(6000)); }

    ToolRun run(const char* program, const std::vector<std::string>& args) {
        return vrx_test::run_tool(program, args, {dir_.path(), tmp_.path(), capture_.path(), ""});
    }

    ScratchDir dir_;
    ScratchDir tmp_;
    ScratchDir capture_;
};

TEST_F(ToolProgressTest, QuietRunsPrintNothingOnSuccessAndStillReportErrors) {
    for (const char* quiet : {"-q", "--quiet"}) {
        SCOPED_TRACE(quiet);
        const ToolRun read = run(VRX2HXB_PATH, {quiet, "chain.vrx"});
        EXPECT_EQ(read.status, 0) << read.err;
        EXPECT_EQ(read.out, "");
        EXPECT_EQ(read.err, "");
        const ToolRun write = run(HXB2VRX_PATH, {quiet, "chain.hxb", "back.vrx"});
        EXPECT_EQ(write.status, 0) << write.err;
        EXPECT_EQ(write.out, "");
        EXPECT_EQ(write.err, "");
    }
    for (const ToolRun& missing : {run(VRX2HXB_PATH, {"-q", "missing.vrx"}),
                                   run(HXB2VRX_PATH, {"-q", "missing.hxb", "out.vrx"})}) {
        EXPECT_EQ(missing.status, 1);
        EXPECT_EQ(missing.out, "");
        EXPECT_NE(missing.err.find("ERROR:Quorra - cannot open input file"), std::string::npos)
            << missing.err;
    }
}

TEST_F(ToolProgressTest, TerminalShowsEachStepAndEraseItBeforeMessages) {
    const Captured read = run_attached(VRX2HXB_PATH, {"chain.vrx"}, dir_.path(), true);
    EXPECT_EQ(read.status, 0) << read.output;
    EXPECT_NE(read.output.find("\rreading chain.vrx: "), std::string::npos) << read.output;
    EXPECT_NE(read.output.find(" kB of "), std::string::npos) << read.output;
    EXPECT_NE(read.output.find("\rwriting chain.hxb: "), std::string::npos) << read.output;
    expect_alone(read.output, "DRC complete");
    expect_alone(read.output, "writing chain.hxb ...");
    expect_erased_at_end(read.output);

    const Captured write = run_attached(HXB2VRX_PATH, {"chain.hxb", "back.vrx"}, dir_.path(), true);
    EXPECT_EQ(write.status, 0) << write.output;
    EXPECT_NE(write.output.find("\rreading chain.hxb: "), std::string::npos) << write.output;
    EXPECT_NE(write.output.find("\rwriting back.vrx: "), std::string::npos) << write.output;
    expect_alone(write.output, "   writing VRX file 'back.vrx' ...");
    expect_erased_at_end(write.output);

    const Captured quiet = run_attached(VRX2HXB_PATH, {"-q", "chain.vrx"}, dir_.path(), true);
    EXPECT_EQ(quiet.status, 0);
    EXPECT_EQ(quiet.output, "");
}

TEST_F(ToolProgressTest, PipeGetsMessagesOnly) {
    const Captured read = run_attached(VRX2HXB_PATH, {"chain.vrx"}, dir_.path(), false);
    EXPECT_EQ(read.status, 0);
    EXPECT_EQ(read.output, "reading VRX file chain.vrx ...\nDRC complete\nwriting chain.hxb ...\n");
    const Captured write =
        run_attached(HXB2VRX_PATH, {"chain.hxb", "back.vrx"}, dir_.path(), false);
    EXPECT_EQ(write.status, 0);
    EXPECT_EQ(write.output.find('\r'), std::string::npos) << write.output;
    EXPECT_EQ(write.output.find("%"), std::string::npos) << write.output;
}

// --- the line itself ---------------------------------------------------------------

TEST(ProgressLineTest, ThrottlesRedrawsPadsShorterTextsAndErases) {
    char* bytes = nullptr;
    std::size_t size = 0;
    std::FILE* stream = open_memstream(&bytes, &size);
    ASSERT_NE(stream, nullptr);
    vrx_tool::ProgressLine line(stream, 40);
    const auto start = vrx_tool::ProgressLine::Clock::now();
    line.report_at(start, "reading xyz", 1'500'000, 4'500'000);
    line.report_at(start + 50ms, "reading xyz", 2'500'000, 0);  // too soon
    line.report_at(start + 60ms, "writing y", 700, 0);          // a new step shows at once
    line.report_at(start + 300ms, "writing y", 900, 0);
    line.report_at(start + 310ms, "writing /a/rather/long/path/of/the/output.vrx", 2'000'000, 0);
    line.clear();
    line.clear();  // nothing left to erase
    std::fclose(stream);
    EXPECT_EQ(std::string(bytes, size),
              "\rreading xyz: 1.5 MB of 4.5 MB (33%)"
              "\rwriting y: 0.7 kB                  "
              "\rwriting y: 0.9 kB"
              "\r.../long/path/of/the/output.vrx: 2.0 MB"
              "\r                                       \r");
    std::free(bytes);
}

}  // namespace
