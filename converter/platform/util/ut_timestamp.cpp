#include "ut_timestamp.h"

#include <cstdio>

#include "ut_str.h"

namespace {
constexpr const char* kMonths[12] = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                     "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
}

UT_TIMESTAMP::UT_TIMESTAMP() : UT_TIMESTAMP(std::time(nullptr)) {}

UT_TIMESTAMP::UT_TIMESTAMP(std::time_t when, Zone zone) {
    std::tm t{};
    const std::tm* got = zone == UTC ? gmtime_r(&when, &t) : localtime_r(&when, &t);
    if (got == nullptr) t = std::tm{};
    const int month = t.tm_mon >= 0 && t.tm_mon < 12 ? t.tm_mon : 0;
    UT_STR::SPrintf(year_, sizeof year_, "%04d", t.tm_year + 1900);
    UT_STR::Copy(month_, kMonths[month]);
    UT_STR::SPrintf(mday_, sizeof mday_, "%d", t.tm_mday);
    UT_STR::SPrintf(hour_, sizeof hour_, "%02d", t.tm_hour);
    UT_STR::SPrintf(minute_, sizeof minute_, "%02d", t.tm_min);
    UT_STR::SPrintf(second_, sizeof second_, "%02d", t.tm_sec);
}
