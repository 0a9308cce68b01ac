#include "framework/ic/property_value.h"

#include <gtest/gtest.h>

#include <sstream>

namespace {

using IC::ConversionError;
using IC::EnumValue;
using IC::Number;
using IC::PropertyValue;
using Texts = std::vector<std::string>;

unsigned int as32(const PropertyValue& value) {
    return static_cast<unsigned int>(value);
}

std::string asText(const PropertyValue& value) {
    return static_cast<std::string>(value);
}

TEST(PropertyValue, KnowsItsKindAndWhetherItIsKnown) {
    EXPECT_EQ(PropertyValue().kind(), PropertyValue::none);
    EXPECT_FALSE(PropertyValue().known());
    EXPECT_EQ(PropertyValue(Number(1U), true).kind(), PropertyValue::number);
    EXPECT_EQ(PropertyValue(std::string("a"), true).kind(), PropertyValue::text);
    EXPECT_EQ(PropertyValue("a", true).kind(), PropertyValue::text);
    EXPECT_EQ(PropertyValue(EnumValue(3), true).kind(), PropertyValue::enumeration);
    EXPECT_EQ(PropertyValue(Texts{"a"}, true).kind(), PropertyValue::texts);
    EXPECT_EQ(PropertyValue(std::vector<Number>{1U}, true).kind(), PropertyValue::numbers);
    EXPECT_TRUE(PropertyValue("a", true).known());
    EXPECT_FALSE(PropertyValue("a", false).known());
}

TEST(PropertyValue, OfAKindAloneIsEmpty) {
    for (const auto kind : {PropertyValue::none, PropertyValue::number, PropertyValue::text,
                            PropertyValue::enumeration, PropertyValue::texts, PropertyValue::numbers}) {
        const PropertyValue value(kind, true);
        EXPECT_TRUE(value.empty());
        EXPECT_EQ(value.kind(), kind);
        EXPECT_EQ(asText(value), "");
        EXPECT_EQ(static_cast<Texts>(value), Texts());
        EXPECT_THROW(as32(value), ConversionError);
    }
    EXPECT_FALSE(PropertyValue("", true).empty());
    EXPECT_FALSE(PropertyValue(Texts(), true).empty());
}

TEST(PropertyValue, ANullTextIsAnEmptyOne) {
    const char* const nothing = nullptr;
    EXPECT_EQ(asText(PropertyValue(nothing, true)), "");
    EXPECT_EQ(PropertyValue(nothing, true).kind(), PropertyValue::text);
}

TEST(PropertyValue, ConvertsToANumber) {
    EXPECT_EQ(as32(PropertyValue(Number(12U), true)), 12U);
    EXPECT_EQ(as32(PropertyValue(Number(-60L, 0), true)), 0U - 60U);
    EXPECT_EQ(as32(PropertyValue(EnumValue(59), true)), 59U);
    EXPECT_EQ(as32(PropertyValue("0", true)), 0U);
    EXPECT_EQ(as32(PropertyValue("007", true)), 7U);
    EXPECT_EQ(as32(PropertyValue("4294967295", true)), 4294967295U);
    EXPECT_EQ(as32(PropertyValue("-1", true)), 4294967295U);
    EXPECT_EQ(as32(PropertyValue("-2147483648", true)), 2147483648U);
}

TEST(PropertyValue, ATextThatIsNoNumberOf32BitsThrows) {
    for (const char* const text : {"", "abc", "1a", "a1", " 1", "1 ", "+1", "-", "--1", "1.0", "0x10",
                                   "4294967296", "-2147483649", "99999999999999999999", "1\n"}) {
        EXPECT_THROW(as32(PropertyValue(text, true)), ConversionError) << '"' << text << '"';
    }
    EXPECT_THROW(as32(PropertyValue(std::string("1\0", 2), true)), ConversionError);
    EXPECT_THROW(as32(PropertyValue(Number(4294967296ULL), true)), ConversionError);
    EXPECT_THROW(as32(PropertyValue(Texts{"1"}, true)), ConversionError);
    EXPECT_THROW(as32(PropertyValue(std::vector<Number>{1U}, true)), ConversionError);
}

TEST(PropertyValue, AConversionErrorTellsTheText) {
    try {
        as32(PropertyValue("twelve", true));
        FAIL() << "no exception";
    } catch (const std::exception& error) {
        EXPECT_STREQ(error.what(), "not a number of 32 bits: \"twelve\"");
    }
}

TEST(PropertyValue, ConvertsToAText) {
    EXPECT_EQ(asText(PropertyValue(Number(12345L, 2), true)), "123.45");
    EXPECT_EQ(asText(PropertyValue("eth0", true)), "eth0");
    EXPECT_EQ(asText(PropertyValue(EnumValue(12), true)), "12");
    EXPECT_EQ(asText(PropertyValue(Texts{"10.0.0.1", "", "10.0.0.2"}, true)), "10.0.0.1  10.0.0.2");
    EXPECT_EQ(asText(PropertyValue(Texts(), true)), "");
    EXPECT_EQ(asText(PropertyValue(std::vector<Number>{1U, 3U}, true)), "1 3");
    std::ostringstream out;
    out << PropertyValue(Texts{"a", "b"}, true);
    EXPECT_EQ(out.str(), "a b");
}

TEST(PropertyValue, ConvertsToAListOfTexts) {
    EXPECT_EQ(static_cast<Texts>(PropertyValue(Texts{"a", "b"}, true)), (Texts{"a", "b"}));
    EXPECT_EQ(static_cast<Texts>(PropertyValue("a b", true)), Texts{"a b"});
    EXPECT_THROW(static_cast<Texts>(PropertyValue(Number(1U), true)), ConversionError);
    EXPECT_THROW(static_cast<Texts>(PropertyValue(EnumValue(1), true)), ConversionError);
    EXPECT_THROW(static_cast<Texts>(PropertyValue(std::vector<Number>{1U}, true)), ConversionError);
}

TEST(PropertyValue, EqualsInKindAndContent) {
    EXPECT_TRUE(PropertyValue("a", true) == PropertyValue(std::string("a"), false));
    EXPECT_FALSE(PropertyValue("a", true) == PropertyValue("b", true));
    EXPECT_FALSE(PropertyValue("1", true) == PropertyValue(Number(1U), true));
    EXPECT_FALSE(PropertyValue("", true) == PropertyValue(PropertyValue::text, true));
    EXPECT_FALSE(PropertyValue(PropertyValue::text, true) == PropertyValue(PropertyValue::number, true));
    EXPECT_TRUE(PropertyValue() == PropertyValue());
    EXPECT_TRUE(PropertyValue("a", true) != PropertyValue("b", true));
}

TEST(PropertyValue, ShowsItsContentByType) {
    const PropertyValue value(EnumValue(5), true);
    ASSERT_NE(value.asEnum(), nullptr);
    EXPECT_EQ(value.asEnum()->code(), 5U);
    EXPECT_EQ(value.asText(), nullptr);
    EXPECT_EQ(value.asNumber(), nullptr);
    EXPECT_EQ(value.asTexts(), nullptr);
    EXPECT_EQ(value.asNumbers(), nullptr);
}

TEST(EnumValue, PrintsItsCode) {
    std::ostringstream out;
    out << EnumValue(33) << EnumValue();
    EXPECT_EQ(out.str(), "330");
}

}  // namespace
