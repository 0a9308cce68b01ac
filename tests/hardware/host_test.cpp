// Reading a host's files below a root, and what becomes of texts and numbers that nobody vouches for.
#include "plugins/hardware/host.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <limits>

#include "tests/hardware/recorded_host.h"

namespace {

using hardware::asNumber;
using hardware::comesBefore;
using hardware::printable;
using hardware::trimmed;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Optional;

class HostFiles : public testing::Test {
protected:
    RecordedHost recorded_;
    const hardware::Host host_ = recorded_.host();
};

TEST_F(HostFiles, ALineIsTheFirstWithoutBlanks) {
    recorded_.file("/a", "  two words \nmore");
    EXPECT_THAT(host_.line("/a"), Optional(std::string("two words")));
    recorded_.file("/nul", std::string("Raspberry Pi\0", 13));
    EXPECT_THAT(host_.line("/nul"), Optional(std::string("Raspberry Pi")));
}

TEST_F(HostFiles, WhatIsEmptyOrNotThereIsNotTold) {
    recorded_.file("/empty", "");
    recorded_.file("/blank", " \t \nsecond");
    recorded_.file("/directory/", "");
    for (const char* path : {"/empty", "/blank", "/directory", "/none", ""}) {
        EXPECT_EQ(host_.line(path), std::nullopt) << path;
        EXPECT_EQ(host_.number(path), std::nullopt) << path;
        EXPECT_EQ(host_.flag(path), std::nullopt) << path;
    }
    EXPECT_THAT(host_.lines("/none"), IsEmpty());
    EXPECT_THAT(host_.entries("/none"), IsEmpty());
}

TEST_F(HostFiles, AFifoDoesNotHold) {
    ASSERT_EQ(mkfifo((recorded_.root() + "/fifo").c_str(), 0600), 0);
    EXPECT_EQ(host_.line("/fifo"), std::nullopt);
}

TEST_F(HostFiles, NoMoreIsReadThanAMebibyte) {
    recorded_.file("/big", std::string((1 << 20) + 8192, 'x'));
    EXPECT_LT(host_.text("/big").value_or("").size(), (1U << 20U) + 4096);
}

TEST_F(HostFiles, NumbersAreDecimalOrHexadecimal) {
    recorded_.file("/a", "42");
    recorded_.file("/b", "0x1f");
    recorded_.file("/c", "18446744073709551615");
    EXPECT_THAT(host_.number("/a"), Optional(42));
    EXPECT_THAT(host_.number("/b"), Optional(31));
    EXPECT_THAT(host_.number("/c"), Optional(std::numeric_limits<unsigned long long>::max()));
}

TEST(Numbers, AreTheWholeText) {
    for (const char* text :
         {"", " 1", "1 ", "-1", "+1", "1K", "0x", "0x-1", "0X1f", "1.5", "18446744073709551616",
          "99999999999999999999999", "0x10000000000000000", "one"}) {
        EXPECT_EQ(asNumber(text), std::nullopt) << text;
    }
    EXPECT_THAT(asNumber("007"), Optional(7));
}

TEST_F(HostFiles, SignedNumbersEndWhereTheirTypeEnds) {
    const auto read = [this](const std::string& text) {
        recorded_.file("/n", text);
        return host_.signedNumber("/n");
    };
    EXPECT_THAT(read("-5000"), Optional(-5000));
    EXPECT_THAT(read("9223372036854775807"), Optional(std::numeric_limits<long long>::max()));
    EXPECT_EQ(read("9223372036854775808"), std::nullopt);
    EXPECT_EQ(read("--5"), std::nullopt);
    EXPECT_EQ(read("-"), std::nullopt);
}

TEST_F(HostFiles, FlagsAreTheKernelsTwoKinds) {
    const auto read = [this](const std::string& text) {
        recorded_.file("/f", text);
        return host_.flag("/f");
    };
    EXPECT_EQ(read("1"), true);
    EXPECT_EQ(read("Y"), true);
    EXPECT_EQ(read("0"), false);
    EXPECT_EQ(read("N"), false);
    for (const char* other : {"2", "yes", "y", "-1", "01"}) {
        EXPECT_EQ(read(other), std::nullopt) << other;
    }
}

TEST_F(HostFiles, FieldsAreNamedInFull) {
    recorded_.file("/uevent", "XDEVTYPE=no\nDEVTYPE=vlan\nDEVTYPE=second\nEMPTY=\nBAD=a\x1b[31m");
    EXPECT_THAT(host_.field("/uevent", "DEVTYPE"), Optional(std::string("vlan")));
    EXPECT_THAT(host_.field("/uevent", "EMPTY"), Optional(std::string()));
    EXPECT_THAT(host_.field("/uevent", "BAD"), Optional(std::string("a?[31m")));
    EXPECT_EQ(host_.field("/uevent", "DEV"), std::nullopt);
}

TEST_F(HostFiles, EntriesAreInTheOrderOfTheirNumbers) {
    for (const char* name : {"eth10", "eth2", "lo", "eth1"}) {
        recorded_.file(std::string("/net/") + name, "");
    }
    EXPECT_THAT(host_.entries("/net"), ElementsAre("eth1", "eth2", "eth10", "lo"));
}

TEST_F(HostFiles, LinksAreFollowedBelowTheRootOnly) {
    recorded_.file("/sys/devices/a/file", "");
    recorded_.link("/sys/class/a", "../devices/a");
    recorded_.link("/sys/class/out", "/etc");
    EXPECT_THAT(host_.resolved("/sys/class/a"), Optional(std::string("/sys/devices/a")));
    EXPECT_THAT(host_.target("/sys/class/a"), Optional(std::string("a")));
    EXPECT_EQ(host_.resolved("/sys/class/out"), std::nullopt);
    EXPECT_EQ(host_.target("/sys/devices/a"), std::nullopt) << "no link";
}

TEST_F(HostFiles, LinksInACircleLeadNowhere) {
    recorded_.link("/a/b", "../c");
    recorded_.link("/c", "a/b");
    EXPECT_EQ(host_.resolved("/c"), std::nullopt);
    EXPECT_EQ(host_.line("/c/file"), std::nullopt);
    EXPECT_FALSE(host_.exists("/c"));
    EXPECT_THAT(host_.entries("/c"), IsEmpty());
}

TEST(HostNames, AreOrderedByTheNumbersInThem) {
    const std::vector<std::string> ordered = {"",
                                              "0",
                                              "1",
                                              "2",
                                              "10",
                                              "a",
                                              "a1",
                                              "a1b",
                                              "a2",
                                              "a10",
                                              "a10b1",
                                              "a10b2",
                                              "b",
                                              "eth9",
                                              "eth10",
                                              "eth99999999999999999999998",
                                              "eth99999999999999999999999"};
    for (std::size_t left = 0; left < ordered.size(); ++left) {
        for (std::size_t right = 0; right < ordered.size(); ++right) {
            EXPECT_EQ(comesBefore(ordered[left], ordered[right]), left < right)
                << ordered[left] << " and " << ordered[right];
        }
    }
    EXPECT_NE(comesBefore("a01", "a1"), comesBefore("a1", "a01")) << "different names are never equal";
}

TEST(Printable, KeepsTextOfAllLanguages) {
    for (const char* text :
         {"", "Intel(R) Xeon(R)", "\xc3\xa4\xc3\xb6", "\xe2\x84\xa2", "\xf0\x9f\x98\x80", "\xc2\xa0"}) {
        EXPECT_EQ(printable(text), text);
    }
}

TEST(Printable, ShowsWhatIsNoText) {
    EXPECT_EQ(printable("a\x01\x1b[2J\n\x7f"), "a??[2J??");
    EXPECT_EQ(printable(std::string("\0", 1)), "?");
    EXPECT_EQ(printable("\xc2\x9b"
                        "31m"),
              "??31m")
        << "a terminal's other control characters";
    EXPECT_EQ(printable("\xff\x80"), "??");
    EXPECT_EQ(printable("\xc0\xaf"), "??") << "longer than needed";
    EXPECT_EQ(printable("\xe0\x80\xaf"), "???");
    EXPECT_EQ(printable("\xed\xa0\x80"), "???") << "half of a pair";
    EXPECT_EQ(printable("\xf4\x90\x80\x80"), "????") << "beyond the last";
    EXPECT_EQ(printable("a\xe2\x84"), "a??") << "cut off";
}

TEST(Trimmed, TakesBlanksAndNulFromBothEnds) {
    EXPECT_EQ(trimmed(" \t a b\r\n"), "a b");
    EXPECT_EQ(trimmed(std::string("a\0\0", 3)), "a");
    EXPECT_EQ(trimmed(" \n"), "");
}

}  // namespace
