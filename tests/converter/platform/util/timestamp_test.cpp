#include <gtest/gtest.h>

#include <ctime>

#include "scoped_env.h"
#include "ut_timestamp.h"

namespace {

class TimestampTest : public testing::Test {
  protected:
    void SetUp() override { ::tzset(); }
    // Destroyed after utc_ has put the old zone back, so the library re-reads it.
    struct ReloadZone {
        ~ReloadZone() { ::tzset(); }
    } reload_;
    ScopedEnv utc_{"TZ", "UTC"};
};

TEST_F(TimestampTest, PiecesHaveTheirFixedForms) {
    const UT_TIMESTAMP ts(std::time_t{1733477593});  // 2024-12-06 09:33:13 UTC
    EXPECT_STREQ(ts.get_ts_hour(), "09");
    EXPECT_STREQ(ts.get_ts_minute(), "33");
    EXPECT_STREQ(ts.get_ts_second(), "13");
    EXPECT_STREQ(ts.get_ts_monthst(), "Dec");
    EXPECT_STREQ(ts.get_ts_mday(), "6");
    EXPECT_STREQ(ts.get_ts_year(), "2024");

    const UT_TIMESTAMP epoch(std::time_t{0});
    EXPECT_STREQ(epoch.get_ts_hour(), "00");
    EXPECT_STREQ(epoch.get_ts_monthst(), "Jan");
    EXPECT_STREQ(epoch.get_ts_mday(), "1");
    EXPECT_STREQ(epoch.get_ts_year(), "1970");
}

}  // namespace
