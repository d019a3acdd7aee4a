#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <set>
#include <string>

#include "file_size_limit.h"
#include "msg_capture.h"
#include "port_file.h"
#include "scoped_env.h"
#include "scratch_dir.h"

namespace {

mode_t mode_of(const std::string& path) {
    struct stat st;
    EXPECT_EQ(::stat(path.c_str(), &st), 0) << path;
    return st.st_mode & 07777;
}

TEST(Stream, WritesExactlyTheBytesGivenAndCrLfLineEnds) {
    ScratchDir dir;
    Port::Stream out(Port::ACCESS_WRITE, 4096);
    ASSERT_EQ(Port::File::open(dir.file("a.txt").c_str(), &out, true), &out);
    const std::string large(10000, 'L');  // larger than the buffer
    EXPECT_TRUE(out.write("ab", 2));
    EXPECT_TRUE(out.writeline("line"));
    EXPECT_TRUE(out.write(large.data(), large.size()));
    EXPECT_TRUE(out.write("", 0));
    EXPECT_TRUE(out.writeline(""));
    EXPECT_TRUE(Port::File::close(&out));
    EXPECT_EQ(ScratchDir::read_file(dir.file("a.txt")), "abline\r\n" + large + "\r\n");

    Port::Stream in(Port::ACCESS_READ, 512);
    ASSERT_EQ(Port::File::open(dir.file("a.txt").c_str(), &in, true), &in);
    std::string back(20000, '\0');
    back.resize(in.read(back.data(), back.size()));
    EXPECT_EQ(back, "abline\r\n" + large + "\r\n");
    EXPECT_EQ(in.read(back.data(), 1), 0u);
    EXPECT_TRUE(Port::File::close(&in));
}

TEST(Stream, FailedWriteToAFullDeviceIsReportedAtClose) {
    Port::Stream out(Port::ACCESS_WRITE, 4096);
    ASSERT_EQ(Port::File::open("/dev/full", &out, true), &out);
    EXPECT_TRUE(out.write("buffered", 8));  // still in the buffer
    const std::string more(8192, 'x');
    out.write(more.data(), more.size());
    EXPECT_FALSE(Port::File::close(&out));
    EXPECT_EQ(out.error(), ENOSPC);
    EXPECT_FALSE(out.write("x", 1));
}

TEST(Stream, SmallWriteThatFailsOnlyAtTheFinalFlushIsStillReported) {
    Port::Stream out(Port::ACCESS_WRITE, 4096);
    ASSERT_EQ(Port::File::open("/dev/full", &out, true), &out);
    EXPECT_TRUE(out.writeline("one short line"));
    EXPECT_FALSE(Port::File::close(&out));
}

TEST(File, OpenFailureIsReportedUnlessQuiet) {
    MsgCapture capture;
    Port::Stream in(Port::ACCESS_READ, 4096);
    EXPECT_EQ(Port::File::open("/nonexistent/x.vrx", &in, true), nullptr);
    EXPECT_TRUE(capture.messages().empty());
    EXPECT_EQ(Port::File::open("/nonexistent/x.vrx", &in, false), nullptr);
    ASSERT_EQ(capture.messages().size(), 1u);
    EXPECT_EQ(capture.messages()[0].level, PORT_MSG_ERROR);
    EXPECT_EQ(capture.messages()[0].text,
              "cannot open file '/nonexistent/x.vrx': No such file or directory\n");
}

TEST(File, CopyReplacesTheDestinationAndKeepsItsPermissions) {
    ScratchDir dir;
    const std::string from = dir.file("from"), to = dir.file("to");
    ScratchDir::write_file(from, "new contents");
    ScratchDir::write_file(to, "old");
    ASSERT_EQ(::chmod(to.c_str(), 0640), 0);
    EXPECT_TRUE(Port::File::copy(from.c_str(), to.c_str()));
    EXPECT_EQ(ScratchDir::read_file(to), "new contents");
    EXPECT_EQ(mode_of(to), 0640u);
    EXPECT_EQ(dir.entries(), (std::vector<std::string>{"from", "to"}));
}

TEST(File, CopyGivesANewFileTheUsualPermissions) {
    ScratchDir dir;
    ScratchDir::write_file(dir.file("from"), "x");
    const mode_t mask = ::umask(0);
    ::umask(mask);
    EXPECT_TRUE(Port::File::copy(dir.file("from").c_str(), dir.file("to").c_str()));
    // Not the temporary file's private 0600, but what a new file gets.
    EXPECT_EQ(mode_of(dir.file("to")), 0666u & ~static_cast<unsigned>(mask));
}

TEST(File, CopyThroughASymbolicLinkReplacesTheTarget) {
    ScratchDir dir;
    ScratchDir::write_file(dir.file("from"), "fresh");
    ScratchDir::write_file(dir.file("target"), "stale");
    ASSERT_EQ(::symlink("target", dir.file("link").c_str()), 0);
    EXPECT_TRUE(Port::File::copy(dir.file("from").c_str(), dir.file("link").c_str()));
    EXPECT_EQ(ScratchDir::read_file(dir.file("target")), "fresh");
    struct stat st;
    ASSERT_EQ(::lstat(dir.file("link").c_str(), &st), 0);
    EXPECT_TRUE(S_ISLNK(st.st_mode));
}

TEST(File, FailedCopyLeavesTheDestinationUntouchedAndNoTemporaryFile) {
    ScratchDir dir;
    const std::string to = dir.file("to");
    ScratchDir::write_file(to, "precious");
    ::mkdir(dir.file("a_directory").c_str(), 0755);
    ScratchDir::write_file(dir.file("big"), std::string(200000, 'b'));

    EXPECT_FALSE(Port::File::copy(dir.file("missing").c_str(), to.c_str()));
    // Reading a directory fails after the temporary file exists.
    EXPECT_FALSE(Port::File::copy(dir.file("a_directory").c_str(), to.c_str()));
    {
        FileSizeLimit limit(4096);  // the disk "fills up" mid-copy
        EXPECT_FALSE(Port::File::copy(dir.file("big").c_str(), to.c_str()));
    }
    EXPECT_FALSE(Port::File::copy(dir.file("big").c_str(), dir.file("no/such/dir").c_str()));
    EXPECT_EQ(ScratchDir::read_file(to), "precious");
    EXPECT_EQ(dir.entries(), (std::vector<std::string>{"a_directory", "big", "to"}));
}

TEST(File, RemoveDeletesAndReportsFailure) {
    ScratchDir dir;
    ScratchDir::write_file(dir.file("x"), "");
    EXPECT_TRUE(Port::File::remove(dir.file("x").c_str()));
    EXPECT_FALSE(ScratchDir::exists(dir.file("x")));
    EXPECT_FALSE(Port::File::remove(dir.file("x").c_str()));
    EXPECT_FALSE(Port::File::remove(nullptr));
}

class TmpnamTest : public testing::Test {
  protected:
    ScratchDir dir_;
    ScopedEnv tmpdir_{"TMPDIR", dir_.path().c_str()};
};

TEST_F(TmpnamTest, NeverGivesTheSameNameTwiceAndCreatesEachFilePrivately) {
    std::set<std::string> names;
    for (int i = 0; i < 1000; ++i) {
        const char* name = Port::File::tmpnam();
        ASSERT_NE(name, nullptr);
        EXPECT_TRUE(names.insert(name).second) << name;
        EXPECT_EQ(std::string(name).rfind(dir_.path() + "/", 0), 0u) << name;
    }
    EXPECT_EQ(dir_.entries().size(), 1000u);
    EXPECT_EQ(mode_of(*names.begin()), 0600u);
}

TEST_F(TmpnamTest, NameDoesNotChangeUnderTheCallerAndABufferTooSmallLeavesNoFile) {
    std::string first = Port::File::tmpnam();
    char buffer[4096];
    ASSERT_EQ(Port::File::tmpnam(buffer, sizeof buffer), buffer);
    EXPECT_NE(first, buffer);
    char tiny[4];
    EXPECT_EQ(Port::File::tmpnam(tiny, sizeof tiny), nullptr);
    EXPECT_EQ(dir_.entries().size(), 2u);
}

TEST_F(TmpnamTest, UnusableTmpdirFallsBackToTmp) {
    tmpdir_.set("/nonexistent/dir");
    const char* name = Port::File::tmpnam();
    ASSERT_NE(name, nullptr);
    EXPECT_EQ(std::string(name).rfind("/tmp/", 0), 0u);
    EXPECT_TRUE(Port::File::remove(name));
}

}  // namespace
