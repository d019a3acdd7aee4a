// The converter's progress hook over the four conversions, on a netlist large
// enough for many chunks of each.
#include <gtest/gtest.h>

#include <cstdint>
#include <new>
#include <string>
#include <vector>

#include "chain_netlist.h"
#include "msg_capture.h"
#include "scoped_env.h"
#include "scratch_dir.h"
#include "vrx.h"

namespace {

using vrx_test::chain_netlist;

struct Report {
    std::string what;
    uint64_t done;
    uint64_t total;
};

void record(void* reports, const char* what, uint64_t done, uint64_t total) {
    static_cast<std::vector<Report>*>(reports)->push_back({what, done, total});
}

/// One step's reports, taken: all on `verb` and `path`, at least
/// `min_count`, `done` never decreasing, the last complete at the file's size.
void expect_step(std::vector<Report>& reports, const char* verb, const std::string& path,
                 std::size_t min_count) {
    SCOPED_TRACE(path);
    const uint64_t size = ScratchDir::read_file(path).size();
    ASSERT_GE(reports.size(), min_count);
    for (std::size_t i = 0; i < reports.size(); ++i) {
        EXPECT_EQ(reports[i].what, verb + (" " + path)) << i;
        EXPECT_GE(reports[i].done, i > 0 ? reports[i - 1].done : 0) << i;
        EXPECT_LE(reports[i].done, reports[i].total != 0 ? reports[i].total : size) << i;
    }
    EXPECT_EQ(reports.back().done, size);
    EXPECT_EQ(reports.back().total, size);
    reports.clear();
}

// A host's hook that fails the way the library itself might: its exception
// is the host's all the same.
void refuse(void*, const char*, uint64_t, uint64_t) {
    throw std::bad_alloc();
}

class ProgressTest : public ::testing::Test {
  protected:
    static void SetUpTestSuite() {
        dir_ = new ScratchDir;
        ScratchDir::write_file(dir_->file("chain.vrx"), chain_netlist(150'000));
    }
    static void TearDownTestSuite() {
        delete dir_;
        dir_ = nullptr;
    }

    static ScratchDir* dir_;
    MsgCapture capture_;  // keeps status lines out of the test's output
    std::vector<Report> reports_;
};

ScratchDir* ProgressTest::dir_ = nullptr;

TEST_F(ProgressTest, EachConversionReportsBytesUpToTheFileSize) {
    const std::string text = dir_->file("chain.vrx");
    const std::string db = dir_->file("chain.hxb");
    const std::string back = dir_->file("back.vrx");
    {
        VRX vrx;
        vrx.set_progress(record, &reports_);
        ASSERT_EQ(vrx.vrx_read(text.c_str(), 1, 0, 0), VX_OK);
        expect_step(reports_, "reading", text, 10);
        ASSERT_EQ(vrx.hxb_write(db.c_str()), VX_OK);
        expect_step(reports_, "writing", db, 3);
    }
    VRX vrx;
    vrx.set_progress(record, &reports_);
    ASSERT_EQ(vrx.hxb_read(db.c_str()), VX_OK);
    expect_step(reports_, "reading", db, 4);
    ASSERT_EQ(vrx.vrx_write(back.c_str(), nullptr, 0), VX_OK);
    expect_step(reports_, "writing", back, 10);
}

// The reader's and the database's hooks must end with the conversion that
// installed them: here they would reach a converter that is gone.
TEST_F(ProgressTest, HooksEndWithTheirConversion) {
    const std::string text = dir_->file("small.vrx");
    const std::string db = dir_->file("small.hxb");
    ScratchDir::write_file(text, chain_netlist(100));
    {
        VRX vrx;
        vrx.set_progress(record, &reports_);
        ASSERT_EQ(vrx.vrx_read(text.c_str(), 1, 0, 0), VX_OK);
        ASSERT_EQ(vrx.hxb_write(db.c_str()), VX_OK);
        ASSERT_FALSE(reports_.empty());
    }
    reports_.clear();
    VRX vrx;
    vrx.set_progress(record, &reports_);
    vrx.set_progress(nullptr, &reports_);
    ASSERT_EQ(vrx.vrx_read(text.c_str(), 1, 0, 0), VX_OK);
    ASSERT_EQ(vrx.hxb_write(db.c_str()), VX_OK);
    ASSERT_EQ(vrx.hxb_read(db.c_str()), VX_OK);
    EXPECT_TRUE(reports_.empty());
}

// Each conversion lets go of its files before a hook's exception reaches the
// caller: no temporary file, no destination, and the converter works on.
TEST_F(ProgressTest, HookExceptionsReachTheCallerAfterCleanUp) {
    ScratchDir out;
    ScratchDir tmp;
    const ScopedEnv tmpdir("TMPDIR", tmp.path().c_str());
    const std::string text = dir_->file("chain.vrx");
    const std::string db = out.file("chain.hxb");
    const std::string back = out.file("back.vrx");
    VRX vrx;
    ASSERT_EQ(vrx.vrx_read(text.c_str(), 1, 0, 0), VX_OK);
    vrx.set_progress(refuse, nullptr);
    EXPECT_THROW(vrx.hxb_write(db.c_str()), std::bad_alloc);
    EXPECT_THROW(vrx.vrx_write(back.c_str(), nullptr, 0), std::bad_alloc);
    EXPECT_TRUE(out.entries().empty());
    EXPECT_TRUE(tmp.entries().empty());

    vrx.set_progress(nullptr, nullptr);
    ASSERT_EQ(vrx.hxb_write(db.c_str()), VX_OK);
    vrx.set_progress(refuse, nullptr);
    EXPECT_THROW(vrx.hxb_read(db.c_str()), std::bad_alloc);
    EXPECT_THROW(vrx.vrx_read(text.c_str(), 1, 0, 0), std::bad_alloc);
    EXPECT_TRUE(capture_.exits().empty());  // not taken for running out of memory

    vrx.set_progress(nullptr, nullptr);
    EXPECT_EQ(vrx.vrx_read(text.c_str(), 1, 0, 0), VX_OK);
    EXPECT_EQ(vrx.hxb_read(db.c_str()), VX_OK);
    EXPECT_EQ(vrx.vrx_write(back.c_str(), nullptr, 0), VX_OK);
    EXPECT_EQ(out.entries(), (std::vector<std::string>{"back.vrx", "chain.hxb"}));
}

}  // namespace
