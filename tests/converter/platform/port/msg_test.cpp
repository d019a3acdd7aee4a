#include <gtest/gtest.h>

#include <string>

#include "msg_capture.h"
#include "port_msg.h"

namespace {

constexpr const char* kRev = "$Revision: 1.3 $";

static_assert(Port_SourceStem("../s/basvrx.cpp") == "basvrx");
static_assert(Port_SourceStem("basvxread") == "basvxread");
static_assert(Port_SourceStem("dir.d/x.tar.gz") == "x.tar");

TEST(Messages, EveryLevelCarriesItsLocationAndFormattedText) {
    MsgCapture capture;
    const Port_MsgManData msg = Port_MsgManData::createObject("Quorra", "basvrx", 42, kRev);
    msg.issueStatus("reading %s ...\n", "top.vrx");
    msg.issueInfo("info %d", 1);
    msg.issueWarning("warn %s", "w");
    msg.issueError("error %c", 'e');
    msg.issueInternal("internal %x", 255u);

    const auto& got = capture.messages();
    ASSERT_EQ(got.size(), 5u);
    const Port_MsgLevel levels[] = {PORT_MSG_STATUS, PORT_MSG_INFO, PORT_MSG_WARNING,
                                    PORT_MSG_ERROR, PORT_MSG_INTERNAL};
    const char* texts[] = {"reading top.vrx ...\n", "info 1", "warn w", "error e", "internal ff"};
    for (std::size_t i = 0; i < got.size(); ++i) {
        EXPECT_EQ(got[i].level, levels[i]);
        EXPECT_EQ(got[i].text, texts[i]);
        EXPECT_EQ(got[i].module, "Quorra");
        EXPECT_EQ(got[i].file, "basvrx");
        EXPECT_EQ(got[i].line, 42);
        EXPECT_EQ(got[i].revision, kRev);
    }
    EXPECT_TRUE(capture.exits().empty());
}

TEST(Messages, MacroTakesTheSourceStemAndLine) {
    MsgCapture capture;
    const int line = __LINE__ + 1;
    PORT_MSG("Quorra", kRev).issueWarning("x");
    ASSERT_EQ(capture.messages().size(), 1u);
    EXPECT_EQ(capture.messages()[0].file, "msg_test");
    EXPECT_EQ(capture.messages()[0].line, line);
}

TEST(Messages, FatalReachesTheExitHandlerWithItsCodeAndControlReturns) {
    MsgCapture capture;
    PORT_MSG("Quorra", kRev).issueFatal(2, "multiple concurrent VX objects\n");
    ASSERT_EQ(capture.messages().size(), 1u);
    EXPECT_EQ(capture.messages()[0].level, PORT_MSG_FATAL);
    EXPECT_EQ(capture.messages()[0].text, "multiple concurrent VX objects\n");
    EXPECT_EQ(capture.exits(), std::vector<int>{2});

    Port_MsgDispatcher::exit(5);
    EXPECT_EQ(capture.exits(), (std::vector<int>{2, 5}));
}

TEST(MessagesDeathTest, DefaultExitHandlerEndsTheProcessWithTheCode) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(PORT_MSG("Quorra", kRev).issueFatal(7, "boom %d", 7), testing::ExitedWithCode(7),
                "FATAL_ERROR:Quorra - boom 7\n");
}

TEST(Messages, TextOfTenThousandBytesArrivesWhole) {
    MsgCapture capture;
    std::string big(10000, 'n');
    big[0] = 'A';
    big[9999] = 'Z';
    PORT_MSG("Quorra", kRev).issueError("Line number %d: %s\n", 12, big.c_str());
    Port_CLocWarningFn(Port_CArgFn("Quorra", "../s/vrx", 7, kRev), big.c_str());

    ASSERT_EQ(capture.messages().size(), 2u);
    EXPECT_EQ(capture.messages()[0].text, "Line number 12: " + big + "\n");
    EXPECT_EQ(capture.messages()[1].text, big);
    EXPECT_EQ(capture.messages()[1].level, PORT_MSG_WARNING);
    EXPECT_EQ(capture.messages()[1].file, "../s/vrx");
    EXPECT_EQ(capture.messages()[1].line, 7);
}

TEST(Messages, DispatcherCountsErrorsAndWarnings) {
    MsgCapture capture;
    Port_MsgDispatcher::reset_counts();
    const Port_MsgManData msg = PORT_MSG("Quorra", kRev);
    msg.issueStatus("s");
    msg.issueInfo("i");
    msg.issueWarning("w");
    msg.issueWarning("w");
    msg.issueError("e");
    msg.issueInternal("x");
    msg.issueFatal(1, "f");
    Port_CLocErrorFn(Port_CArgFn("Quorra", "vrx", 1, kRev), "e");
    EXPECT_EQ(Port_MsgDispatcher::num_warnings(), 2);
    EXPECT_EQ(Port_MsgDispatcher::num_errors(), 4);
    Port_MsgDispatcher::reset_counts();
    EXPECT_EQ(Port_MsgDispatcher::num_errors(), 0);
}

TEST(Messages, DefaultSinkFormatsEachLevel) {
    const Port_MsgLocation where{"Quorra", "basvrx", 1, kRev};
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    Port_MsgDispatcher::default_sink(PORT_MSG_STATUS, where, "   writing VRX file 'a' ...\n");
    Port_MsgDispatcher::default_sink(PORT_MSG_STATUS, where, "no line end");
    Port_MsgDispatcher::default_sink(PORT_MSG_INFO, where, "i");
    Port_MsgDispatcher::default_sink(PORT_MSG_WARNING, where, "w\n");
    Port_MsgDispatcher::default_sink(PORT_MSG_ERROR, where, "e");
    Port_MsgDispatcher::default_sink(PORT_MSG_INTERNAL, where, "x");
    Port_MsgDispatcher::default_sink(PORT_MSG_FATAL, where, "f\n");
    const std::string err = testing::internal::GetCapturedStderr();
    const std::string out = testing::internal::GetCapturedStdout();
    EXPECT_EQ(out, "   writing VRX file 'a' ...\nno line end");
    EXPECT_EQ(err,
              "INFO:Quorra - i\n"
              "WARNING:Quorra - w\n"
              "ERROR:Quorra - e\n"
              "INTERNAL_ERROR:Quorra - x\n"
              "FATAL_ERROR:Quorra - f\n");
}

}  // namespace
