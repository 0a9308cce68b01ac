#include "framework/qx/zone_table.h"

#include <gmock/gmock.h>

#include <climits>
#include <filesystem>

#include "computer/time_zone.h"
#include "tests/support/fake_host.h"

namespace {

struct Row {
    long minutes;
    std::string file;
    std::string text;
};

// Typed from the list that the hosts' administrators were given, not from the code.
const std::vector<Row> kExpected = {
    {-11 * 60, "/usr/share/zoneinfo/Pacific/Midway", "Pacific/Midway"},
    {-10 * 60, "/usr/share/zoneinfo/HST", "HST"},
    {-9 * 60, "/usr/share/zoneinfo/America/Anchorage", "America/Anchorage"},
    {-8 * 60, "/usr/share/zoneinfo/PST8PDT", "PST"},
    {-7 * 60, "/usr/share/zoneinfo/MST7MDT", "MST"},
    {-6 * 60, "/usr/share/zoneinfo/CST6CDT", "CST"},
    {-5 * 60, "/usr/share/zoneinfo/EST5EDT", "EST"},
    {-4 * 60, "/usr/share/zoneinfo/America/Halifax", "America/Halifax"},
    {-3 * 60 - 30, "/usr/share/zoneinfo/America/St_Johns", "America/St_Johns"},
    {-3 * 60, "/usr/share/zoneinfo/America/Godthab", "America/Godthab"},
    {-2 * 60, "/usr/share/zoneinfo/Atlantic/South_Georgia", "Atlantic/South_Georgia"},
    {-1 * 60, "/usr/share/zoneinfo/Atlantic/Azores", "Atlantic/Azores"},
    {0, "/usr/share/zoneinfo/GMT", "GMT"},
    {1 * 60, "/usr/share/zoneinfo/CET", "CET"},
    {2 * 60, "/usr/share/zoneinfo/EET", "EET"},
    {3 * 60, "/usr/share/zoneinfo/Europe/Moscow", "Europe/Moscow"},
    {3 * 60 + 30, "/usr/share/zoneinfo/Asia/Tehran", "Asia/Tehran"},
    {4 * 60, "/usr/share/zoneinfo/Europe/Samara", "Europe/Samara"},
    {4 * 60 + 30, "/usr/share/zoneinfo/Asia/Kabul", "Asia/Kabul"},
    {5 * 60, "/usr/share/zoneinfo/Asia/Yekaterinburg", "Asia/Yekaterinburg"},
    {5 * 60 + 30, "/usr/share/zoneinfo/Asia/Kolkata", "Asia/Kolkata"},
    {6 * 60, "/usr/share/zoneinfo/Asia/Omsk", "Asia/Omsk"},
    {7 * 60, "/usr/share/zoneinfo/Asia/Jakarta", "Asia/Jakarta"},
    {8 * 60, "/usr/share/zoneinfo/Australia/Perth", "Australia/Perth"},
    {9 * 60, "/usr/share/zoneinfo/Japan", "JST"},
    {9 * 60 + 30, "/usr/share/zoneinfo/Australia/Adelaide", "Australia/Adelaide"},
    {10 * 60, "/usr/share/zoneinfo/Australia/Brisbane", "Australia/Brisbane"},
    {11 * 60, "/usr/share/zoneinfo/Asia/Magadan", "Asia/Magadan"},
    {12 * 60, "/usr/share/zoneinfo/Asia/Kamchatka", "Asia/Kamchatka"},
};

unsigned int argument(long minutes) {
    return static_cast<unsigned int>(minutes);
}

TEST(ZoneTable, HoldsTheTwentyNineZonesRowByRow) {
    ASSERT_EQ(kExpected.size(), 29U);
    for (const Row& row : kExpected) {
        const QX::Zone* zone = QX::findZone(argument(row.minutes));
        ASSERT_NE(zone, nullptr) << row.minutes;
        EXPECT_EQ(zone->offset, row.minutes);
        EXPECT_EQ(std::string("/usr/share/zoneinfo/") + zone->file, row.file);
        EXPECT_EQ(zone->name, row.text);
    }
}

TEST(ZoneTable, HoldsNoOtherOffset) {
    std::vector<long> found;
    for (long minutes = -70000; minutes <= 70000; ++minutes) {
        if (QX::findZone(argument(minutes)) != nullptr) {
            found.push_back(minutes);
        }
    }
    std::vector<long> expected;
    for (const Row& row : kExpected) {
        expected.push_back(row.minutes);
    }
    EXPECT_EQ(found, expected);
    for (const unsigned int offset : {UINT_MAX, UINT_MAX / 2, UINT_MAX / 2 + 1}) {
        EXPECT_EQ(QX::findZone(offset), nullptr) << offset;
    }
}

TEST(ZoneTable, TakesWesternOffsetsInTwosComplement) {
    const QX::Zone* zone = QX::findZone(4294967236U);
    ASSERT_NE(zone, nullptr);
    EXPECT_STREQ(zone->file, "Atlantic/Azores");
}

HOST_TEST(ZoneTable, EveryZoneReachesTheClockFileAndTheLink) {
    for (const Row& row : kExpected) {
        host.file("/etc/sysconfig/clock", "TIMEZONE=\"Nowhere\"\n");
        host.file("/etc/localtime", "old");
        EXPECT_TRUE(IC::setTimezone(argument(row.minutes))) << row.minutes;
        EXPECT_EQ(host.read("/etc/sysconfig/clock"), "TIMEZONE=\"" + row.text + "\"\n");
        EXPECT_EQ(std::filesystem::read_symlink("/etc/localtime"), row.file);
        EXPECT_EQ(host.read("/etc/localtime.bak"), "old");
        host.remove("/etc/localtime");
    }
}

}  // namespace
