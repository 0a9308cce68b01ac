#include "agent/cli/print.h"

#include <gmock/gmock.h>

#include <limits>

namespace {

using cvagent::findProperty;
using cvagent::printable;
using cvagent::sizeText;
using cvagent::valueText;
using IC::Number;
using IC::PropertyValue;

std::string shown(unsigned int nodeType, unsigned int id, const PropertyValue& value) {
    return valueText(findProperty(nodeType, id), value);
}

TEST(Print, SizesAreInDecimalAndBinaryUnits) {
    EXPECT_EQ(sizeText(0), "0 B");
    EXPECT_EQ(sizeText(999), "999 B");
    EXPECT_EQ(sizeText(1000), "1.0 kB (1000 B)");
    EXPECT_EQ(sizeText(80026361000ULL), "80.0 GB (74.5 GiB)");
    EXPECT_EQ(sizeText(2199023255552ULL), "2.2 TB (2.0 TiB)");
    EXPECT_EQ(sizeText(std::numeric_limits<unsigned long long>::max()), "18447 PB (16384 PiB)");
}

TEST(Print, DriveAndPartitionSizesHaveTheirOwnUnits) {
    EXPECT_EQ(shown(11, 37, {Number(80026361ULL), true}), "80026361 kB, 80.0 GB (74.5 GiB)");
    EXPECT_EQ(shown(45, 112, {Number(104391ULL), true}), "104391 KiB, 106.9 MB (101.9 MiB)");
}

TEST(Print, SpeedsClocksAndOffsetsReadWell) {
    EXPECT_EQ(shown(12, 57, {Number(1000000ULL), true}), "1000000 kbit/s, 1 Gbit/s");
    EXPECT_EQ(shown(12, 57, {Number(2500000ULL), true}), "2500000 kbit/s, 2.5 Gbit/s");
    EXPECT_EQ(shown(4, 80, {Number(2394U), true}), "2394 MHz");
    EXPECT_EQ(shown(40, 126, {Number(1795208583L, 0), true}),
              "1795208583 s since 1970, 2026-11-20T21:03:03Z");
    EXPECT_EQ(shown(40, 127, {Number(-210.0), true}), "-210 min, UTC-03:30");
    EXPECT_EQ(shown(40, 127, {Number(330.0), true}), "330 min, UTC+05:30");
    EXPECT_EQ(shown(40, 127, {Number(-2147483648.0), true}), "-2147483648 min, UTC-35791394:08");
}

TEST(Print, CodesHaveTheirLabels) {
    EXPECT_EQ(shown(29, 24, {IC::EnumValue(3), true}), "3 (static)");
    EXPECT_EQ(shown(12, 123, {Number(12U), true}), "12 (down)");
    EXPECT_EQ(shown(12, 123, {Number(77U), true}), "77");
    EXPECT_EQ(shown(12, 125, {std::vector<Number>{Number(0U), Number(1U), Number(12U)}, true}),
              "0, 1 (up), 12 (down)");
    EXPECT_EQ(shown(12, 82, {Number(true), true}), "true");
}

TEST(Print, WhatIsNotThereReadsAsSuch) {
    EXPECT_EQ(shown(12, 57, PropertyValue()), "not known");
    EXPECT_EQ(shown(12, 57, {PropertyValue::number, true}), "not known");
    EXPECT_EQ(shown(12, 57, {Number(0ULL), true}), "0 (not known)");
    EXPECT_EQ(shown(12, 38, {Number(0U), true}), "0 (not known)");
    EXPECT_EQ(shown(12, 38, {Number(1000U), true}), "1000 Mbit/s");
    EXPECT_EQ(shown(29, 98, {"", true}), "(empty)");
    EXPECT_EQ(shown(29, 94, {std::vector<std::string>(), true}), "(none)");
}

TEST(Print, UncataloguedValuesAreShownPlainly) {
    EXPECT_EQ(valueText({}, {Number(5U), true}), "5");
    EXPECT_EQ(valueText({}, {std::vector<std::string>{"a", "b"}, true}), "a, b");
}

TEST(Print, WhatDoesNotFitItsUnitIsShownPlainly) {
    const PropertyValue large(Number(1e30), true);
    for (const auto& [type, id] : {std::pair(11U, 37U), {40U, 126U}, {40U, 127U}}) {
        EXPECT_EQ(shown(type, id, large), static_cast<std::string>(large)) << id;
    }
}

TEST(Print, ATimeThatHasNoYearIsShownInSeconds) {
    if (sizeof(std::time_t) < 8) {
        GTEST_SKIP() << "every time that this system counts has a year";
    }
    EXPECT_EQ(cvagent::timeText(std::numeric_limits<std::time_t>::max()), "9223372036854775807 s since 1970");
}

TEST(Print, NamesFromTheHostCannotSteerTheTerminal) {
    EXPECT_EQ(printable("a\x1b[2Jb\n\x7f"), "a\\x1b[2Jb\\x0a\\x7f");
    EXPECT_EQ(printable("\u009b2J"),
              "\\xc2\\x9b"
              "2J");
    EXPECT_EQ(printable("a\xff\xe2\x82z"), "a\\xff\\xe2\\x82z");
    EXPECT_EQ(printable("a\u202eb"), "a\\xe2\\x80\\xaeb") << "what follows would be read backwards";
    EXPECT_EQ(printable("J\u00fcrgen"), "J\u00fcrgen");
    EXPECT_EQ(shown(40, 108, {"a\nb", true}), "a\\x0ab");
}

TEST(Print, QuotesOfGivenValuesAreShort) {
    EXPECT_EQ(cvagent::inQuotes("a"), "'a'");
    EXPECT_EQ(cvagent::inQuotes(std::string(100000, 'x')),
              "'" + std::string(60, 'x') + "...' (100000 bytes)");
    EXPECT_EQ(cvagent::inQuotes(std::string(59, 'x') + "\u00fc\u00fc"),
              "'" + std::string(59, 'x') + "...' (63 bytes)");
}

TEST(Print, ColumnsCountCharactersNotBytes) {
    EXPECT_EQ(cvagent::padded("ab", 4), "ab  ");
    EXPECT_EQ(cvagent::padded("\u00fc", 3), "\u00fc  ");
    EXPECT_EQ(cvagent::padded("abcd", 2), "abcd");
}

}  // namespace
