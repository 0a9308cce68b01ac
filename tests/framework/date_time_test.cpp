#include "framework/qx/date_time.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <ctime>
#include <limits>
#include <optional>
#include <stdexcept>

namespace {

long long seconds(const std::string& text) {
    return QX::DateTime(text, 3).seconds();
}

/// Another zone for local times while it stands.
class Zone {
public:
    explicit Zone(const char* rule) {
        if (const char* const old = getenv("TZ")) {
            old_ = old;
        }
        setenv("TZ", rule, 1);
        tzset();
    }
    ~Zone() {
        old_ ? setenv("TZ", old_->c_str(), 1) : unsetenv("TZ");
        tzset();
    }

private:
    std::optional<std::string> old_;
};

TEST(DateTime, ReadsUtc) {
    EXPECT_EQ(seconds("1970-01-01T00:00:00Z"), 0);
    EXPECT_EQ(seconds("1969-12-31T23:59:59Z"), -1);
    EXPECT_EQ(seconds("2026-11-20T21:03:00Z"), 1795208580);
    EXPECT_EQ(seconds("2000-02-29T12:00:00Z"), 951825600);
}

TEST(DateTime, SecondsMayBeLeftOut) {
    EXPECT_EQ(seconds("2026-11-20T21:03Z"), 1795208580);
    EXPECT_EQ(seconds("2026-11-20T21:03+01:00"), 1795208580 - 3600);
}

TEST(DateTime, ReadsOffsets) {
    EXPECT_EQ(seconds("2026-11-20T21:03:00+05:30"), 1795208580 - 19800);
    EXPECT_EQ(seconds("2026-11-20T21:03:00-05:30"), 1795208580 + 19800);
    EXPECT_EQ(seconds("2026-11-20T21:03:00+05"), 1795208580 - 18000);
    EXPECT_EQ(seconds("2026-11-20T21:03:00+00:00"), 1795208580);
    EXPECT_EQ(seconds("2026-11-20T21:03:00-12"), 1795208580 + 43200);
    EXPECT_EQ(seconds("2027-01-01T00:30:00+01:00"), seconds("2026-12-31T23:30:00Z"));
}

TEST(DateTime, WithoutAnOffsetTheTimeIsLocal) {
    const Zone zone("CET-1CEST,M3.5.0,M10.5.0/3");
    EXPECT_EQ(seconds("2026-11-20T21:03:00"), 1795208580 - 3600);
    EXPECT_EQ(seconds("2026-07-01T12:00:00"), seconds("2026-07-01T10:00:00Z"));
    EXPECT_EQ(seconds("1970-01-01T00:59:59"), -1);
    EXPECT_EQ(seconds("2050-01-01T00:00:00"), seconds("2049-12-31T23:00:00Z"));
}

TEST(DateTime, RefusesWhatIsNoTime) {
    for (const char* const text : {"",
                                   "now",
                                   "2026",
                                   "2026-11",
                                   "2026-11-20",
                                   "2026-11-20T",
                                   "2026-11-20T21",
                                   "2026-11-20T21Z",
                                   "20261120T210300Z",
                                   "2026-11-20T2103Z",
                                   "2026-1-20T21:03:00Z",
                                   "26-11-20T21:03:00Z",
                                   "2026-11-20t21:03:00Z",
                                   "2026-11-20 21:03:00Z",
                                   "2026-11-20T21:03:00z",
                                   " 2026-11-20T21:03:00Z",
                                   "2026-11-20T21:03:00Z ",
                                   "2026-11-20T21:03:00Z\n",
                                   "2026-11-20T21:03:00ZZ",
                                   "2026-11-20T21:03:00+",
                                   "2026-11-20T21:03:00+1",
                                   "2026-11-20T21:03:00+0130",
                                   "2026-11-20T21:03:00+01:",
                                   "2026-11-20T21:03:00+01:3",
                                   "2026-11-20T21:03:00+24:00",
                                   "2026-11-20T21:03:00+01:60",
                                   "2026-11-20T21:03:",
                                   "2026-11-20T21:03:0Z",
                                   "+2026-11-20T21:03:00Z",
                                   "-2026-11-20T21:03:00Z",
                                   "12026-11-20T21:03:00Z",
                                   "2026-W47-5T21:03:00Z",
                                   "2026-324T21:03:00Z",
                                   "2026/11/20T21:03:00Z",
                                   "2026-11-20T21.03.00Z",
                                   "２026-11-20T21:03:00Z"}) {
        EXPECT_THROW(seconds(text), std::invalid_argument) << '"' << text << '"';
    }
    EXPECT_THROW(seconds(std::string("2026-11-20T21:03:00Z\0", 21)), std::invalid_argument);
}

TEST(DateTime, RefusesDatesThatDoNotExist) {
    for (const char* const date : {"2026-00-01", "2026-13-01", "2026-01-00", "2026-01-32", "2026-04-31",
                                   "2026-02-29", "1900-02-29", "2100-02-29", "2024-02-30"}) {
        EXPECT_THROW(seconds(std::string(date) + "T00:00:00Z"), std::invalid_argument) << date;
    }
    EXPECT_NO_THROW(seconds("2024-02-29T00:00:00Z"));
    EXPECT_NO_THROW(seconds("2000-02-29T00:00:00Z"));
}

TEST(DateTime, RefusesTimesTheClockCannotHold) {
    for (const char* const time : {"24:00:00", "25:00:00", "23:60:00", "23:59:60", "23:59:61", "23:59:59.5",
                                   "23:59:59,5", "23:59:59.0"}) {
        EXPECT_THROW(seconds("2016-12-31T" + std::string(time) + "Z"), std::invalid_argument) << time;
    }
}

TEST(DateTime, SaysWhatItCouldNotRead) {
    try {
        seconds("tomorrow");
        FAIL() << "no exception";
    } catch (const std::invalid_argument& error) {
        EXPECT_STREQ(error.what(), "not an ISO 8601 time: \"tomorrow\"");
    }
}

TEST(DateTime, KnowsNoOtherFormat) {
    for (const unsigned int format : {0U, 1U, 2U, 4U, ~0U}) {
        EXPECT_THROW(QX::DateTime("2026-11-20T21:03:00Z", format), std::invalid_argument);
    }
}

TEST(DateTime, AYearAfter2038IsRightAndFitsWhereALongIsWide) {
    constexpr long long kFarAway = 4102444800;  // 2100-01-01
    const QX::DateTime time("2100-01-01T00:00:00Z", 3);
    EXPECT_EQ(time.seconds(), kFarAway);
    EXPECT_EQ(seconds("9999-12-31T23:59:59Z"), 253402300799);
    EXPECT_EQ(seconds("0000-01-01T00:00:00Z"), -62167219200);
    if constexpr (sizeof(long) == sizeof(long long)) {
        EXPECT_EQ(static_cast<long>(time), kFarAway);
    } else {
        EXPECT_THROW(static_cast<void>(static_cast<long>(time)), std::out_of_range);
        EXPECT_EQ(static_cast<long>(QX::DateTime("2038-01-19T03:14:07Z", 3)),
                  std::numeric_limits<long>::max());
        EXPECT_THROW(static_cast<void>(static_cast<long>(QX::DateTime("2038-01-19T03:14:08Z", 3))),
                     std::out_of_range);
    }
}

}  // namespace
