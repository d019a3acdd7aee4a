// A moment of local time (or UTC) as texts: hour, minute and second with two digits,
// the month as its English three-letter name ("Dec"), the day of the month
// without a leading zero and the year with four digits.
#pragma once

#include <ctime>

class UT_TIMESTAMP {
  public:
    enum Zone { LOCAL, UTC };
    UT_TIMESTAMP();  ///< now
    explicit UT_TIMESTAMP(std::time_t when, Zone zone = LOCAL);

    const char* get_ts_year() const { return year_; }
    const char* get_ts_monthst() const { return month_; }
    const char* get_ts_mday() const { return mday_; }
    const char* get_ts_hour() const { return hour_; }
    const char* get_ts_minute() const { return minute_; }
    const char* get_ts_second() const { return second_; }

  private:
    char year_[12] = {};
    char month_[4] = {};
    char mday_[4] = {};
    char hour_[4] = {};
    char minute_[4] = {};
    char second_[4] = {};
};
