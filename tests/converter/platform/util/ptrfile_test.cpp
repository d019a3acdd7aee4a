#include <gtest/gtest.h>
#include <sys/stat.h>

#include <string>

#include "file_size_limit.h"
#include "port_file.h"
#include "scratch_dir.h"
#include "ut_ptrfile.h"

namespace {

bool write_text(UT_PTRFILE& file, const std::string& text) {
    return file.write(text.data(), text.size());
}

TEST(PtrFile, CleanWriteIsPublishedOnClose) {
    ScratchDir dir;
    const std::string dest = dir.file("top.hxb");
    UT_PTRFILE file(Port::ACCESS_WRITE);
    ASSERT_EQ(Port::File::open(dest.c_str(), &file, true), &file);
    EXPECT_TRUE(write_text(file, "HXB"));
    EXPECT_FALSE(ScratchDir::exists(dest));  // nothing visible before the close
    EXPECT_EQ(file.size(), 3u);
    EXPECT_TRUE(Port::File::close(&file));
    EXPECT_EQ(ScratchDir::read_file(dest), "HXB");
    EXPECT_EQ(dir.entries(), std::vector<std::string>{"top.hxb"});
}

TEST(PtrFile, FailedWriteLeavesNoFileAndTheOldOneUntouched) {
    ScratchDir dir;
    const std::string fresh = dir.file("fresh.hxb");
    const std::string old = dir.file("old.hxb");
    ScratchDir::write_file(old, "old design");
    const std::string payload(100000, 'p');
    {
        FileSizeLimit limit(4096);
        UT_PTRFILE a(Port::ACCESS_WRITE), b(Port::ACCESS_WRITE);
        ASSERT_NE(Port::File::open(fresh.c_str(), &a, true), nullptr);
        ASSERT_NE(Port::File::open(old.c_str(), &b, true), nullptr);
        write_text(a, payload);
        write_text(b, payload);
        EXPECT_TRUE(a.failed());
        EXPECT_FALSE(Port::File::close(&a));
        EXPECT_FALSE(Port::File::close(&b));
    }
    EXPECT_FALSE(ScratchDir::exists(fresh));
    EXPECT_EQ(ScratchDir::read_file(old), "old design");
    EXPECT_EQ(dir.entries(), std::vector<std::string>{"old.hxb"});
}

TEST(PtrFile, WriterMarkedFailedOrAbandonedPublishesNothing) {
    ScratchDir dir;
    {
        UT_PTRFILE file(Port::ACCESS_WRITE);
        ASSERT_NE(Port::File::open(dir.file("marked.hxb").c_str(), &file, true), nullptr);
        write_text(file, "half a design");
        file.fail();
        EXPECT_FALSE(Port::File::close(&file));
    }
    {
        UT_PTRFILE file(Port::ACCESS_WRITE);
        ASSERT_NE(Port::File::open(dir.file("abandoned.hxb").c_str(), &file, true), nullptr);
        write_text(file, "never closed");
    }
    {
        UT_PTRFILE file(Port::ACCESS_WRITE);
        ASSERT_NE(Port::File::open(dir.file("interrupted.hxb").c_str(), &file, true), nullptr);
        write_text(file, "first half");
        ASSERT_NE(Port::File::open(dir.file("second.hxb").c_str(), &file, true), nullptr);
        write_text(file, "complete");
        EXPECT_TRUE(Port::File::close(&file));
    }
    EXPECT_EQ(dir.entries(), std::vector<std::string>{"second.hxb"});
    EXPECT_EQ(ScratchDir::read_file(dir.file("second.hxb")), "complete");
}

TEST(PtrFile, OpenForWriteFailsWhereNoFileCanBeMade) {
    UT_PTRFILE file(Port::ACCESS_WRITE);
    EXPECT_EQ(Port::File::open("/nonexistent/dir/x.hxb", &file, true), nullptr);
    EXPECT_EQ(Port::File::open("", &file, true), nullptr);
    EXPECT_FALSE(file.write("x", 1));
    EXPECT_FALSE(Port::File::close(&file));
}

TEST(PtrFile, ReadGivesTheBytesAndTheSize) {
    ScratchDir dir;
    const std::string bytes(70000, 'r');  // larger than the buffer
    ScratchDir::write_file(dir.file("in.hxl"), bytes);
    UT_PTRFILE file(Port::ACCESS_READ);
    ASSERT_NE(Port::File::open(dir.file("in.hxl").c_str(), &file, true), nullptr);
    EXPECT_EQ(file.size(), bytes.size());
    std::string back(bytes.size() + 10, '\0');
    back.resize(file.read(back.data(), back.size()));
    EXPECT_EQ(back, bytes);
    EXPECT_TRUE(Port::File::close(&file));
    EXPECT_EQ(file.read(back.data(), 1), 0u);

    EXPECT_EQ(Port::File::open(dir.file("missing").c_str(), &file, true), nullptr);
    EXPECT_EQ(Port::File::open(dir.path().c_str(), &file, true), nullptr);  // a directory
}

}  // namespace
