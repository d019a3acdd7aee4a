// Both tools as a user meets them with every kind of path: what a
// destination becomes, refused and failing writes, signals, standard streams.
#include <gtest/gtest.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <filesystem>
#include <string>
#include <thread>
#include <vector>

#include "chain_netlist.h"
#include "scoped_env.h"
#include "scratch_dir.h"
#include "tool_run.h"

namespace {

using vrx_test::ToolRun;

// A chain of named gates: nothing in it gets an invented name.
std::string named_chain(int gates) {
    std::string text = "DESIGN top {\n   BLOCK top 2 (NAME=top) {\n      PIN a (TYPE=IN CONN=n0)\n";
    text += "      PIN y (TYPE=OUT CONN=n" + std::to_string(gates) + ")\n   }\n";
    for (int i = 0; i < gates; ++i) {
        text += "   PRIM AND 2 (NAME=g" + std::to_string(i) + ") { PIN IN (CONN=n" +
                std::to_string(i) + ") PIN IN (CONN=n0) PIN OUT (CONN=n" + std::to_string(i + 1) +
                ") }\n";
    }
    return text + "}\n";
}

class ToolFilesTest : public ::testing::Test {
  protected:
    void SetUp() override {
        ScratchDir::write_file(dir_.file("top.vrx"), named_chain(200));
        ASSERT_EQ(shell("$VRX2HXB -q top.vrx && $HXB2VRX -q top.hxb ref.text").status, 0);
        hxb_ = ScratchDir::read_file(dir_.file("top.hxb"));
        text_ = ScratchDir::read_file(dir_.file("ref.text"));
        EXPECT_LT(text_.find("// Created 22:13:20, Nov 14, 2023. "), 3u) << text_.substr(0, 80);
    }

    /// Runs a shell command in dir_; $VRX2HXB and $HXB2VRX name the tools.
    ToolRun shell(const std::string& command) {
        return vrx_test::run_tool("/bin/sh", {"-c", command},
                                  {dir_.path(), tmp_.path(), capture_.path(), ""});
    }

    /// Names that a write left behind: hidden entries of dir_, anything in TMPDIR.
    std::vector<std::string> leftovers() const {
        std::vector<std::string> found = tmp_.entries();
        for (const std::string& name : dir_.entries()) {
            if (name.starts_with('.')) found.push_back(name);
        }
        return found;
    }

    ScopedEnv epoch_{"SOURCE_DATE_EPOCH", "1700000000"};
    ScopedEnv vrx2hxb_{"VRX2HXB", VRX2HXB_PATH};
    ScopedEnv hxb2vrx_{"HXB2VRX", HXB2VRX_PATH};
    ScratchDir dir_;
    ScratchDir tmp_;
    ScratchDir capture_;
    std::string hxb_;   // top.vrx as a design file
    std::string text_;  // that design file as text
};

TEST_F(ToolFilesTest, EveryKindOfDestinationGetsTheWholeOutputAndKeepsItsKind) {
    struct Row {
        const char* kind;
        std::string prepare;  // shell commands run first
        std::string output;   // as given to the tool
        std::string result;   // where the bytes can be read back; empty: nowhere
        mode_t type;          // what `output` is afterwards (0: not checked)
    };
    const bool root = ::geteuid() == 0;
    if (!root) std::cout << "[   INFO   ] not root: no device made with mknod\n";
    for (const std::string ext : {".vrx", ".hxb"}) {
        const std::string longest = std::string(255 - ext.size(), 'n') + ext;
        std::vector<Row> rows = {
            {"absent", "", "new" + ext, "new" + ext, S_IFREG},
            {"regular", "echo old >old" + ext + "; chmod 640 old" + ext, "old" + ext, "old" + ext,
             S_IFREG},
            {"255-byte name", "echo old >" + longest, longest, longest, S_IFREG},
            {"symlink", "echo old >target" + ext + "; ln -s target" + ext + " link" + ext,
             "link" + ext, "target" + ext, S_IFLNK},
            {"dangling symlink", "ln -s made" + ext + " dangling" + ext, "dangling" + ext,
             "made" + ext, S_IFLNK},
            {"FIFO",
             "mkfifo fifo" + ext + "; timeout 20 cat fifo" + ext + " >fifo.got" + ext + " &",
             "fifo" + ext, "fifo.got" + ext, S_IFIFO},
            {"standard output", "", "-", "stdout.got" + ext, 0},
        };
        if (root)
            rows.push_back({"device", "mknod dev" + ext + " c 1 3", "dev" + ext, "", S_IFCHR});
        const bool text = ext == ".vrx";
        for (const Row& row : rows) {
            SCOPED_TRACE(row.kind + ext);
            std::string run = text ? "$HXB2VRX -q top.hxb " + row.output
                                   : "$VRX2HXB -q -o " + row.output + " top.vrx";
            if (row.output == "-") run += " >" + row.result;
            const ToolRun r = shell(row.prepare + "\n" + run + "; s=$?; wait; exit $s");
            ASSERT_EQ(r.status, 0) << r.err;
            EXPECT_EQ(r.err, "");
            if (!row.result.empty()) {
                EXPECT_TRUE(ScratchDir::read_file(dir_.file(row.result)) == (text ? text_ : hxb_));
            }
            struct stat st {};
            const std::string path =
                row.output.starts_with('/') ? row.output : dir_.file(row.output);
            if (row.type != 0 && ::lstat(path.c_str(), &st) == 0) {
                EXPECT_EQ(st.st_mode & S_IFMT, row.type);
            }
            if (std::string(row.kind) == "regular") {
                EXPECT_EQ(st.st_mode & 07777, 0640u);
            }
        }
    }
    EXPECT_EQ(leftovers(), std::vector<std::string>{});
}

TEST_F(ToolFilesTest, StandardInputMayBeAPipe) {
    EXPECT_TRUE(shell("cat top.hxb | $HXB2VRX -q - -").out == text_);
    EXPECT_TRUE(shell("cat top.vrx | $VRX2HXB -q -o - -").out == hxb_);
    // Status lines go to standard error when the output takes standard output.
    const ToolRun r = shell("$HXB2VRX top.hxb - <top.hxb");
    EXPECT_TRUE(r.out == text_);
    EXPECT_NE(r.err.find("   writing VRX file '-' ..."), std::string::npos) << r.err;
}

TEST_F(ToolFilesTest, AnOutputThatIsAnInputIsRefusedBeforeAnythingIsWritten) {
    ScratchDir::write_file(dir_.file("text.hxb"), ScratchDir::read_file(dir_.file("top.vrx")));
    const std::vector<std::string> commands = {
        "$HXB2VRX top.hxb ./top.hxb",
        "ln -s top.hxb alias.vrx; $HXB2VRX top.hxb alias.vrx",
        "$HXB2VRX - ../" + std::filesystem::path(dir_.path()).filename().string() +
            "/top.hxb <top.hxb",
        "$VRX2HXB text.hxb",  // the output is named after the input
        "$VRX2HXB -o ./text.hxb text.hxb",
    };
    for (const std::string& command : commands) {
        SCOPED_TRACE(command);
        const ToolRun r = shell(command);
        EXPECT_EQ(r.status, 1);
        EXPECT_NE(r.err.find("' is the same file as input file '"), std::string::npos) << r.err;
        EXPECT_TRUE(ScratchDir::read_file(dir_.file("top.hxb")) == hxb_);
        EXPECT_TRUE(ScratchDir::read_file(dir_.file("text.hxb")) ==
                    ScratchDir::read_file(dir_.file("top.vrx")));
    }
    EXPECT_EQ(leftovers(), std::vector<std::string>{});
}

TEST_F(ToolFilesTest, FailuresSayWhyAndLeaveTheDestinationAlone) {
    struct Row {
        std::string command;
        std::string reason;
    };
    std::vector<Row> rows = {
        {"ulimit -f 1; $HXB2VRX -q top.hxb out.vrx", "File too large"},
        {"ulimit -f 1; $VRX2HXB -q -o out.hxb top.vrx", "File too large"},
        {"mkdir -p sub; $VRX2HXB -q -o out.hxb sub",
         "cannot open input file sub: sub is a directory"},
        {"$VRX2HXB -q -o out.hxb top.hxb", "input file top.hxb is a design or library file"},
        {"$HXB2VRX -q top.hxb sub", "cannot open temporary output file 'sub': Is a directory"},
        {"$HXB2VRX -q top.hxb /dev/full", "/dev/full': No space left on device"},
    };
    if (::geteuid() != 0) {
        rows.push_back(
            {"mkdir ro; chmod 555 ro; $HXB2VRX -q top.hxb ro/out.vrx", "Permission denied"});
    } else {
        std::cout << "[   INFO   ] root: no read-only folder refuses a write\n";
    }
    for (const Row& row : rows) {
        SCOPED_TRACE(row.command);
        ScratchDir::write_file(dir_.file("out.vrx"), "old");
        ScratchDir::write_file(dir_.file("out.hxb"), "old");
        const ToolRun r = shell(row.command);
        EXPECT_EQ(r.status, 1);
        EXPECT_NE(r.err.find(row.reason), std::string::npos) << r.err;
        EXPECT_EQ(ScratchDir::read_file(dir_.file("out.vrx")), "old");
        EXPECT_EQ(ScratchDir::read_file(dir_.file("out.hxb")), "old");
    }
    EXPECT_EQ(leftovers(), std::vector<std::string>{});
}

// SIGTERM once the output file is open: the process dies of it, and neither
// a temporary file nor a changed destination remains.
TEST_F(ToolFilesTest, SigtermWhileWritingLeavesNothingBehind) {
    ScratchDir::write_file(dir_.file("big.vrx"), vrx_test::chain_netlist(150000));
    ASSERT_EQ(shell("$VRX2HXB -q big.vrx").status, 0);
    ScratchDir::write_file(dir_.file("out.vrx"), "old");
    std::string input = dir_.file("big.hxb");
    const std::string output = dir_.file("out.vrx");
    char* argv[] = {const_cast<char*>(HXB2VRX_PATH), const_cast<char*>("-q"), input.data(),
                    const_cast<char*>(output.c_str()), nullptr};
    pid_t pid = 0;
    ASSERT_EQ(posix_spawn(&pid, HXB2VRX_PATH, nullptr, nullptr, argv, environ), 0);
    // The output is open once a descriptor names the destination's folder.
    const std::string fds = "/proc/" + std::to_string(pid) + "/fd";
    bool writing = false;
    for (int i = 0; i < 20000 && !writing; ++i) {
        std::error_code ignored;
        for (const auto& fd : std::filesystem::directory_iterator(fds, ignored)) {
            const std::string target = std::filesystem::read_symlink(fd.path(), ignored).string();
            writing =
                writing || (target.starts_with(dir_.path() + "/") && !target.ends_with(".hxb"));
        }
        if (!writing) std::this_thread::sleep_for(std::chrono::microseconds(500));
    }
    ::kill(pid, SIGTERM);
    int status = 0;
    ::waitpid(pid, &status, 0);
    if (!writing) GTEST_SKIP() << "the write was not seen in progress";
    EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGTERM) << status;
    EXPECT_EQ(ScratchDir::read_file(output), "old");
    EXPECT_EQ(leftovers(), std::vector<std::string>{});
}

}  // namespace
