#include "hosttools/text.h"

#include <gtest/gtest.h>

#include <limits>

namespace {

using hosttools::Text;

TEST(Text, NumbersOfEverySize) {
    EXPECT_EQ(Text().number(0).add(' ').number(-1).add(' ').number(7u).str(), "0 -1 7");
    EXPECT_EQ(Text().number(std::numeric_limits<std::uint64_t>::max()).str(), "18446744073709551615");
    EXPECT_EQ(Text().number(std::numeric_limits<std::int64_t>::min()).str(), "-9223372036854775808");
}

TEST(Text, HexadecimalWithZerosInFront) {
    EXPECT_EQ(Text().hex(0xd1f39, 8).str(), "000d1f39");
    EXPECT_EQ(Text().hex(0).str(), "0");
    EXPECT_EQ(Text().hex(0xdeadbeef, 2).str(), "deadbeef");
}

TEST(Text, ColumnsPadAndNeverCut) {
    EXPECT_EQ(Text().left("ab", 4).add('|').str(), "ab  |");
    EXPECT_EQ(Text().left("abcdef", 4).add('|').str(), "abcdef|");
    EXPECT_EQ(Text().right("ab", 4).str(), "  ab");
    EXPECT_EQ(Text().right(std::uint64_t{12345}, 3).str(), "12345");
    EXPECT_EQ(Text().add("x").right(std::uint64_t{5}, 3).str(), "x  5");
}

TEST(Text, WritingToAClosedDescriptorFails) {
    EXPECT_FALSE(hosttools::writeAll(-1, "lost"));
    EXPECT_TRUE(hosttools::writeAll(-1, ""));
}

}  // namespace
