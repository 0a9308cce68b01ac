#include "computer/calendar.h"

#include <gmock/gmock.h>

#include <climits>
#include <cstdlib>

#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

constexpr int kStandardTime = 0;
constexpr int kSummerTime = 1;
constexpr int kUnknown = -1;

void useZone(const char* zone) {
    setenv("TZ", zone, 1);
}

struct Month {
    int number;
    const char* name;
    time_t begin;  // 2001, UTC
};

constexpr Month kMonths[] = {
    {1, "Jan", 978307200}, {2, "Feb", 980985600},   {3, "Mar", 983404800},   {4, "Apr", 986083200},
    {5, "May", 988675200}, {6, "Jun", 991353600},   {7, "Jul", 993945600},   {8, "Aug", 996624000},
    {9, "Sep", 999302400}, {10, "Oct", 1001894400}, {11, "Nov", 1004572800}, {12, "Dec", 1007164800},
};

HOST_TEST(Calendar, KnowsTheTwelveMonthsByNameAndByNumber) {
    useZone("UTC0");
    for (const Month& month : kMonths) {
        EXPECT_EQ(IC::to_time_t(2001, month.name, 1, 0, 0, 0, 0, kStandardTime), month.begin) << month.name;
        EXPECT_EQ(IC::ito_time_t(2001, month.number, 1, 0, 0, 0, 0, kStandardTime), month.begin)
            << month.number;
    }
}

HOST_TEST(Calendar, TakesEveryFieldAndLeavesTheWeekdayToTheCalendar) {
    useZone("UTC0");
    EXPECT_EQ(IC::to_time_t(2001, "Sep", 9, 0, 1, 46, 40, kStandardTime), 1000000000);
    EXPECT_EQ(IC::to_time_t(2001, "Sep", 9, 3, 1, 46, 40, kStandardTime), 1000000000);
    EXPECT_EQ(IC::to_time_t(1970, "Jan", 1, 4, 0, 0, 0, kStandardTime), 0);
}

HOST_TEST(Calendar, ReadsTheFieldsAsLocalTime) {
    useZone("XXX-5:30");
    EXPECT_EQ(IC::to_time_t(2001, "Sep", 9, 0, 7, 16, 40, kStandardTime), 1000000000);
}

HOST_TEST(Calendar, UsesTheDaylightSavingFlag) {
    useZone("CET-1CEST,M3.5.0,M10.5.0/3");
    const time_t summer = IC::to_time_t(2001, "Jul", 1, 0, 12, 0, 0, kSummerTime);
    EXPECT_EQ(summer, 993945600 + 10 * 3600);
    EXPECT_EQ(IC::to_time_t(2001, "Jul", 1, 0, 12, 0, 0, kUnknown), summer);
    EXPECT_EQ(IC::to_time_t(2001, "Jul", 1, 0, 12, 0, 0, kStandardTime), summer + 3600);
    EXPECT_EQ(IC::ito_time_t(2001, 7, 1, 0, 12, 0, 0, kSummerTime), summer);
}

HOST_TEST(Calendar, FindsNoMonthUnderAnyOtherName) {
    useZone("UTC0");
    for (const char* name : {"jan", "JAN", "January", "Ja", "", "   ", "Sept", " Jan", "Jan ", "1"}) {
        EXPECT_EQ(IC::to_time_t(2001, name, 1, 0, 0, 0, 0, kStandardTime), -1) << name;
    }
    EXPECT_EQ(IC::to_time_t(2001, nullptr, 1, 0, 0, 0, 0, kStandardTime), -1);
}

HOST_TEST(Calendar, FindsNoMonthOutsideOneToTwelve) {
    useZone("UTC0");
    for (const int number : {0, 13, 14, 1000, -1, INT_MAX, INT_MIN}) {
        EXPECT_EQ(IC::ito_time_t(2001, number, 1, 0, 0, 0, 0, kStandardTime), -1) << number;
    }
}

HOST_TEST(Calendar, SaysHonestlyWhatATimeOfThisPlatformCannotHold) {
    useZone("UTC0");
    EXPECT_EQ(IC::to_time_t(2038, "Jan", 19, 0, 3, 14, 7, kStandardTime), 2147483647);
    const long long beyond = sizeof(time_t) == 4 ? -1LL : 2147483648LL;
    EXPECT_EQ(IC::to_time_t(2038, "Jan", 19, 0, 3, 14, 8, kStandardTime), beyond);
    EXPECT_EQ(IC::to_time_t(INT_MIN, "Jan", 1, 0, 0, 0, 0, kStandardTime), -1);
    EXPECT_EQ(IC::to_time_t(INT_MIN + 1899, "Jan", 1, 0, 0, 0, 0, kStandardTime), -1);
}

HOST_TEST(Calendar, LogsEntryAndExit) {
    LogCapture capture;
    IC::ito_time_t(2001, 7, 1, 0, 12, 0, 0, kStandardTime);
    EXPECT_THAT(capture.messages(3000),
                TextsAre("ito_time_t: entry", "to_time_t: entry", "to_time_t: exit", "ito_time_t: exit"));
    EXPECT_TRUE(capture.everyLineTwice());
}

}  // namespace
