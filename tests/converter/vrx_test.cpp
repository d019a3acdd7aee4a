#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include <sys/resource.h>

#include "msg_capture.h"
#include "scratch_dir.h"
#include "vrx.h"

// Reaches the converter's private state for the tests.
struct VRX_TEST_ACCESS {
    static const uint16_t* indices(const VRX& v) { return v.curr_indices; }
    static int16_t indent(const VRX& v) { return v.indent; }
    static int32_t column(const VRX& v) { return v.column; }
    static VX_PARSER_STATUS status(const VRX& v) { return v.parser_status; }
    static char*& first_input(VRX& v) { return v.first_input; }
    static UT_PTRFILE*& db_file(VRX& v) { return v.db_file; }
    static HX_DESIGN*& design(VRX& v) { return v.design; }
    static VX_SIGNALCACHE& log_signals(VRX& v) { return v.log_signals; }
    static void init_curr_indices(VRX& v, uint16_t value) { v.init_curr_indices(value); }
};

namespace {

using A = VRX_TEST_ACCESS;

TEST(ConverterTest, StartsEmptyWithEveryPinIndexUnset) {
    VRX vrx;
    EXPECT_EQ(active_vrx, &vrx);
    EXPECT_EQ(vrx.get_design(), nullptr);
    EXPECT_EQ(vrx.get_library(), nullptr);
    EXPECT_EQ(A::indent(vrx), 0);
    EXPECT_EQ(A::column(vrx), 0);
    EXPECT_EQ(A::status(vrx), VX_PARSER_OK);
    const uint16_t* indices = A::indices(vrx);
    EXPECT_TRUE(std::all_of(indices, indices + 16, [](uint16_t i) { return i == 0xFFFF; }));
    A::init_curr_indices(vrx, 0);
    EXPECT_TRUE(std::all_of(indices, indices + 16, [](uint16_t i) { return i == 0; }));
}

TEST(ConverterTest, ParserStatusCallbackReachesTheActiveConverter) {
    VRX vrx;
    vrx_set_parser_status(VX_PARSER_ERROR);
    EXPECT_EQ(A::status(vrx), VX_PARSER_ERROR);
}

TEST(ConverterTest, SecondConverterIsFatalAndTheFirstsEndFreesTheSlot) {
    MsgCapture capture;
    auto first = std::make_unique<VRX>();
    {
        VRX second;  // the test's exit handler returns, so construction goes on
        ASSERT_EQ(capture.exits(), std::vector<int>{2});
        ASSERT_EQ(capture.messages().size(), 1u);
        const CapturedMsg& msg = capture.messages()[0];
        EXPECT_EQ(msg.level, PORT_MSG_FATAL);
        EXPECT_EQ(msg.text, "multiple concurrent VX objects\n");
        EXPECT_EQ(msg.module, "Quorra");
        EXPECT_EQ(msg.file, "../s/basvrx");
        EXPECT_EQ(msg.revision, "$Revision: 1.2 $");
        EXPECT_EQ(active_vrx, &second);
    }
    // The second is gone; it cleared the pointer because it was the active one.
    EXPECT_EQ(active_vrx, nullptr);
    first.reset();
    capture.clear();
    VRX third;
    EXPECT_TRUE(capture.messages().empty());
    EXPECT_EQ(active_vrx, &third);
}

TEST(ConverterTest, CopiesOwnTheirFirstInputAndLeaveTheActiveConverterAlone) {
    VRX vrx;
    A::first_input(vrx) = UT_STR::Dup("design.vrx");
    A::db_file(vrx) = new UT_PTRFILE(Port::ACCESS_READ);
    {
        VRX copy(vrx);
        EXPECT_EQ(active_vrx, &vrx);
        ASSERT_NE(A::first_input(copy), nullptr);
        EXPECT_NE(A::first_input(copy), A::first_input(vrx));
        EXPECT_STREQ(A::first_input(copy), "design.vrx");
        EXPECT_EQ(A::db_file(copy), nullptr);
        VRX assigned = copy;
        assigned = vrx;
        VRX& same = assigned;
        assigned = same;  // self-assignment keeps the name
        EXPECT_STREQ(A::first_input(assigned), "design.vrx");
    }
    // Destroying the copies neither freed the source's objects nor cleared
    // the active converter (the sanitizer build catches a double free).
    EXPECT_EQ(active_vrx, &vrx);
    EXPECT_STREQ(A::first_input(vrx), "design.vrx");
}

// A copy reads for itself, whether or not its source is still there, and
// reports its own parse's outcome.
TEST(ConverterTest, CopiesReadTheirOwnTextAndStatus) {
    MsgCapture capture;
    ScratchDir dir;
    const std::string good = dir.file("good.vrx");
    const std::string bad = dir.file("bad.vrx");
    ScratchDir::write_file(good, "DESIGN top { BLOCK top 1 { PIN a (TYPE=IN) } }\n");
    ScratchDir::write_file(bad, "DESIGN top { BLOCK top 1 { PIN a (TYPE=IN) }\n");
    auto source = std::make_unique<VRX>();
    VRX copy(*source);
    EXPECT_EQ(copy.vrx_read(bad.c_str(), 1, 0, 0), VX_PARSE_ERROR);
    EXPECT_EQ(copy.vrx_read(good.c_str(), 1, 0, 0), VX_OK);
    ASSERT_NE(copy.get_design(), nullptr);
    EXPECT_EQ(source->get_design(), nullptr);
    EXPECT_EQ(active_vrx, source.get());
    source.reset();
    EXPECT_EQ(copy.vrx_read(bad.c_str(), 1, 0, 0), VX_PARSE_ERROR);
    EXPECT_EQ(active_vrx, nullptr);
    hx_env.delete_library(copy.get_library());
}

// Reads `path` under a memory limit, as a host whose exit handler returns:
// 0 when the read ends in one fatal report and an error status.
int read_out_of_memory(const std::string& path) {
    const rlimit limit{300u << 20, 300u << 20};
    setrlimit(RLIMIT_AS, &limit);
    MsgCapture capture;
    VRX vrx;
    const VX_STATUS status = vrx.vrx_read(path.c_str(), 1, 0, 0);
    const std::vector<std::string> fatal = capture.texts(PORT_MSG_FATAL);
    const bool reported = fatal.size() == 1 && capture.exits() == std::vector<int>{2} &&
                          fatal[0].starts_with("out of memory while building design 'd");
    return status == VX_PARSE_ERROR && reported ? 0 : 1;
}

// Each design grafts the one before twice; no exception reaches the host.
TEST(ConverterTest, RunningOutOfMemoryReturnsAnErrorToAHostThatCarriesOn) {
    if (VRX_SANITIZED) GTEST_SKIP() << "the sanitizers' shadow memory does not fit the limit";
    ScratchDir dir;
    std::string text = "DESIGN d0 { BLOCK d0 1 { PIN a (TYPE=IN CONN=a) } }\n";
    for (int i = 1; i <= 40; ++i) {
        const std::string d = "d" + std::to_string(i), use = " BLOCK d" + std::to_string(i - 1);
        text += "DESIGN " + d + " { BLOCK " + d + " 1 { PIN a (TYPE=IN CONN=a) }" + use +
                " 1 (NAME=u1) { PIN a (CONN=a) }" + use + " 1 (NAME=u2) { PIN a (CONN=a) } }\n";
    }
    ScratchDir::write_file(dir.file("doubling.vrx"), text);
    EXPECT_EXIT(std::_Exit(read_out_of_memory(dir.file("doubling.vrx"))),
                ::testing::ExitedWithCode(0), "");
}

TEST(SignalCacheTest, FindOrCreateMakesEachNameOnceInTheRightRoot) {
    HX_LIBRARY library("lib", 0);
    HX_DESIGN* design = library.create_design("top");
    VX_SIGNALCACHE log_cache;
    VX_SIGNALCACHE phys_cache;
    EXPECT_EQ(log_cache.find_or_create("n", 0), nullptr);  // no design yet
    log_cache.design = design;
    phys_cache.design = design;
    EXPECT_EQ(log_cache.find_or_create("n", 0), nullptr);  // no root yet
    HX_LOGBLOCK* log_root = design->create_logblock(nullptr, 0, "top");
    HX_PHYSBLOCK* phys_root = design->create_physblock(nullptr, 0, "top");

    HX_SIGNAL* n = log_cache.find_or_create("n", 0);
    ASSERT_NE(n, nullptr);
    EXPECT_EQ(n->get_block(), log_root);
    EXPECT_EQ(log_cache.find_or_create("n", 0), n);
    HX_SIGNAL* p = phys_cache.find_or_create("n", 1);
    EXPECT_EQ(p->get_block(), phys_root);
    EXPECT_EQ(log_cache.count(), 1u);

    HX_SIGNAL* global = design->create_global_signal("n");
    log_cache.add_signal(global);
    EXPECT_EQ(log_cache.find_or_create("n", 0), global);
    EXPECT_EQ(log_cache.count(), 1u);

    // A new design starts from an empty cache: the name makes a new signal.
    log_cache.flush(false);
    HX_DESIGN* next = library.create_design("next");
    HX_LOGBLOCK* next_root = next->create_logblock(nullptr, 0, "next");
    log_cache.design = next;
    HX_SIGNAL* again = log_cache.find_or_create("n", 0);
    EXPECT_NE(again, n);
    EXPECT_EQ(again->get_block(), next_root);
}

}  // namespace
