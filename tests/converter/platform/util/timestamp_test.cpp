#include <gtest/gtest.h>

#include <cstdlib>
#include <ctime>
#include <string>

#include "ut_timestamp.h"

namespace {

class TimestampTest : public testing::Test {
  protected:
    void SetUp() override {
        const char* tz = std::getenv("TZ");
        had_tz_ = tz != nullptr;
        if (had_tz_) old_tz_ = tz;
        ::setenv("TZ", "UTC", 1);
        ::tzset();
    }
    void TearDown() override {
        if (had_tz_) {
            ::setenv("TZ", old_tz_.c_str(), 1);
        } else {
            ::unsetenv("TZ");
        }
        ::tzset();
    }
    bool had_tz_ = false;
    std::string old_tz_;
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
