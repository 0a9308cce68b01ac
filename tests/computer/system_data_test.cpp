// Firmware version, system name, vital product data.
#include "computer/system_data.h"

#include <gmock/gmock.h>

#include <array>
#include <cstring>

#include "mi/my_process.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/computer/failing_calls.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

using testing::IsEmpty;

/// Sixteen bytes that show what was written to them.
struct Output {
    std::array<char, 16> bytes;
    Output() { bytes.fill('#'); }
    std::string all() const { return {bytes.begin(), bytes.end()}; }
};

struct FirmwareVersion : testing::Test {
    Output out;
    LogCapture capture;

    int format(const std::string& in, unsigned int inSize, int outSize) {
        std::string input = in + std::string(10, '\0');
        return IC::formatHostFirmwareVersion(input.data(), inSize, out.bytes.data(), outSize);
    }
};

TEST_F(FirmwareVersion, SeparatesTheNineCharacters) {
    std::array<char, 14> exact{};
    char in[] = "123456789";
    EXPECT_EQ(IC::formatHostFirmwareVersion(in, 9, exact.data(), 14), 0);
    EXPECT_STREQ(exact.data(), "12-34.56.78-9");
    EXPECT_THAT(capture.messages(),
                TextsAre("formatHostFirmwareVersion: entry", "formatHostFirmwareVersion: exit"));
}

TEST_F(FirmwareVersion, WritesFourteenBytesAlsoWhenThirteenWereGranted) {
    EXPECT_EQ(format("ABCDEFGHI", 9, 13), 0);
    EXPECT_EQ(out.all(), std::string("AB-CD.EF.GH-I\0##", 16));
}

TEST_F(FirmwareVersion, RefusesAnInputThatIsNotNineLong) {
    for (const unsigned int size : {0U, 8U, 10U}) {
        capture.clear();
        EXPECT_EQ(format("123456789", size, 14), 1);
        EXPECT_THAT(capture.messages(), TextsAre("formatHostFirmwareVersion: entry", "size_ver_in != 9",
                                                 "formatHostFirmwareVersion: exit"));
    }
    EXPECT_EQ(out.all(), std::string(16, '#'));
    EXPECT_THAT(capture.messages(6000), TextsAre("size_ver_in != 9"));
}

TEST_F(FirmwareVersion, RefusesAnOutputShorterThanThirteen) {
    for (const int size : {12, 0, -1}) {
        EXPECT_EQ(format("123456789", 9, size), 1);
    }
    EXPECT_EQ(out.all(), std::string(16, '#'));
    EXPECT_THAT(capture.messages(6000),
                TextsAre("size_ver_out < 13", "size_ver_out < 13", "size_ver_out < 13"));
}

TEST_F(FirmwareVersion, SaysWhenTheTextCameOutShorter) {
    EXPECT_EQ(format("12345", 9, 14), 1);
    EXPECT_THAT(capture.messages(), TextsAre("formatHostFirmwareVersion: entry", "13 != strlen(ver_out)",
                                             "formatHostFirmwareVersion: exit"));
    EXPECT_STREQ(out.bytes.data(), "12-34.5");
}

TEST_F(FirmwareVersion, SaysWhenNoZeroFollowsTheNineCharacters) {
    EXPECT_EQ(format("123456789X", 9, 14), 1);
    EXPECT_EQ(out.all(), "12-34.56.78-9X##");
    EXPECT_THAT(capture.messages(6000), TextsAre("13 != strlen(ver_out)"));
}

HOST_TEST(SystemName, IsEmptyWhateverTheKernelSays) {
    for (const char* name : {"alpha", "alpha  ", "a-name-much-longer-than-an-empty-text-has-room-for"}) {
        host.setHostName(name);
        EXPECT_EQ(IC::getSystemName(), "");
        EXPECT_STREQ(IC::getSystemName().c_str(), "");
    }
    FailingCalls::getHostName = true;
    EXPECT_EQ(IC::getSystemName(), "");
}

HOST_TEST(VitalProductData, RunsBothToolsAndReadsNeither) {
    host.tool("/usr/sbin/vpdupdate", "noise\n");
    host.tool("/sbin/update-lsvpd-db", "noise\n", 1);
    LogCapture capture;
    const int before = IC::MyProcess::cnt;
    IC::OsHwMI().vpdUpdate();
    EXPECT_THAT(host.calls(), TextsAre("/usr/sbin/vpdupdate", "/sbin/update-lsvpd-db"));
    EXPECT_THAT(capture.messages(), TextsAre("vpdUpdate: entry", "vpdUpdate: exit"));
    EXPECT_EQ(IC::MyProcess::cnt, before);
}

HOST_TEST(VitalProductData, DoesNotMindAbsentTools) {
    LogCapture capture;
    IC::OsHwMI().vpdUpdate();
    EXPECT_THAT(host.calls(), IsEmpty());
    EXPECT_THAT(capture.messages(6000), IsEmpty());
}

}  // namespace
