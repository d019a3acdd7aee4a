// The reader's line-numbered reports and the per-file error limit.
#include <gtest/gtest.h>

#include <string>

#include "recorder.h"

namespace {

TEST(Diagnostics, ReportsCarryTheLineAndTheWholeText) {
    ParseLog log;
    vrx_parse_init();
    line_number = 12;
    const std::string name(5000, 'n');
    vrx_parse_warning(("no pin " + name).c_str());
    EXPECT_EQ(error_count, 0);
    EXPECT_TRUE(log.statuses.empty());
    vrx_parse_error(("bad " + name).c_str());
    EXPECT_EQ(error_count, 1);
    EXPECT_EQ(log.statuses, std::vector<VX_PARSER_STATUS>{VX_PARSER_ERROR});
    EXPECT_EQ(log.events,
              (std::vector<std::string>{"WARNING: Line number 12: no pin " + name + "\n",
                                        "ERROR: Line number 12: bad " + name + "\n"}));
    vrx_parse_init();
    EXPECT_EQ(line_number, 1);
    EXPECT_EQ(error_count, 0);
}

TEST(Diagnostics, TheTwentiethErrorOfAFileEndsTheRun) {
    ParseLog log;
    vrx_parse_init();
    for (int k = 1; k <= 19; ++k)
        vrx_parse_error("e");
    EXPECT_EQ(log.events.size(), 19u);
    EXPECT_EQ(log.statuses.size(), 19u);
    vrx_parse_error("e");
    EXPECT_EQ(log.events, [] {
        std::vector<std::string> all(20, "ERROR: Line number 1: e\n");
        all.push_back("ERROR: maximum error limit reached...aborting\n");
        all.push_back("exit(2)");
        return all;
    }());
    vrx_parse_error("e");  // a report after the limit is issued, and ends nothing more
    EXPECT_EQ(log.events.size(), 23u);
    EXPECT_EQ(error_count, 21);

    vrx_parse_init();  // a new file starts a new count
    for (int k = 1; k <= 19; ++k)
        vrx_parse_error("e");
    EXPECT_EQ(log.events.size(), 23u + 19u);
}

}  // namespace
