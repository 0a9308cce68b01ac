#include "mi/text.h"

#include <gtest/gtest.h>

#include <array>
#include <cstring>
#include <limits>

namespace {

/// A writable copy of a text, as callers hold it.
struct Buffer {
    explicit Buffer(const char* text) { std::strncpy(data.data(), text, data.size() - 1); }
    std::array<char, 64> data{};
};

TEST(Strget, SkipsLeadingDelimitersAndEndsAtTheFirstLineBreak) {
    Buffer buffer("  eth0\nand more\n");
    char* word = IC::strget(buffer.data.data(), ' ');
    EXPECT_EQ(word, buffer.data.data() + 2);
    EXPECT_STREQ(word, "eth0");
    EXPECT_EQ(buffer.data[6], '\0');
    EXPECT_EQ(buffer.data[15], '\0') << "every later line break becomes a NUL too";
}

TEST(Strget, GivesNothingOfATextThatStartsWithALineBreak) {
    Buffer buffer("\neth0\n");
    EXPECT_STREQ(IC::strget(buffer.data.data(), ' '), "");
}

TEST(Strget, LeavesATextOfDelimitersAloneEmpty) {
    Buffer buffer("   ");
    EXPECT_STREQ(IC::strget(buffer.data.data(), ' '), "");
}

TEST(Strget, KeepsDelimitersInsideTheText) {
    Buffer buffer(":a:b\n");
    EXPECT_STREQ(IC::strget(buffer.data.data(), ':'), "a:b");
}

TEST(Strreplace, NeverTouchesTheFirstCharacter) {
    Buffer buffer("::1");
    EXPECT_EQ(IC::strreplace(buffer.data.data(), ':', '-'), buffer.data.data());
    EXPECT_STREQ(buffer.data.data(), ":-1");
}

TEST(Strreplace, ReplacesEveryLaterMatch) {
    Buffer buffer("a:b:c:");
    EXPECT_STREQ(IC::strreplace(buffer.data.data(), ':', '_'), "a_b_c_");
}

TEST(Strreplace, CutsAtTheFirstMatchBehindTheFirstCharacterWhenReplacingByNul) {
    Buffer buffer("::1:2");
    IC::strreplace(buffer.data.data(), ':', '\0');
    EXPECT_STREQ(buffer.data.data(), ":");
    EXPECT_EQ(std::memcmp(buffer.data.data(), ":\0001:2", 5), 0) << "nothing behind the cut is changed";
}

TEST(Strreplace, AcceptsAnEmptyText) {
    Buffer buffer("");
    EXPECT_STREQ(IC::strreplace(buffer.data.data(), ':', '-'), "");
    EXPECT_EQ(buffer.data[1], '\0');
}

TEST(LeadingDecimal, IsTheNearestThatFits) {
    EXPECT_EQ(IC::leadingDecimal("1000Mb/s"), 1000);
    EXPECT_EQ(IC::leadingDecimal(" -7\n"), -7);
    EXPECT_EQ(IC::leadingDecimal("4294967296"), 4294967296);
    EXPECT_EQ(IC::leadingDecimal("99999999999999999999"), std::numeric_limits<long long>::max());
    EXPECT_EQ(IC::leadingDecimal("-99999999999999999999"), std::numeric_limits<long long>::min());
}

TEST(LeadingDecimal, TellsWhatStandsBehindIt) {
    std::string rest;
    EXPECT_EQ(IC::leadingDecimal("100baseT", &rest), 100);
    EXPECT_EQ(rest, "baseT");
    EXPECT_EQ(IC::leadingDecimal(" x1", &rest), 0);
    EXPECT_EQ(rest, " x1") << "no number";
    EXPECT_EQ(IC::leadingDecimal("", &rest), 0);
    EXPECT_EQ(rest, "");
}

TEST(SignedDecimal, PrintsWhatNoIntHoldsAsANegativeNumber) {
    EXPECT_EQ(IC::signedDecimal(64), "64");
    EXPECT_EQ(IC::signedDecimal(2147483647), "2147483647");
    EXPECT_EQ(IC::signedDecimal(2147483648), "-2147483648");
    EXPECT_EQ(IC::signedDecimal(4294967295), "-1");
}

TEST(Trim, CutsOnlyTheNamedCharacterAndOnlyAtItsEnd) {
    EXPECT_EQ(IC::trimEnd("\neth0 \n\n"), "\neth0 ");
    EXPECT_EQ(IC::trimEnd("\n\n"), "");
    EXPECT_EQ(IC::trimEnd(";;a;", ';'), ";;a");
    EXPECT_EQ(IC::trimStart("  \teth0 "), "\teth0 ");
    EXPECT_EQ(IC::trimStart("    "), "");
}

}  // namespace
