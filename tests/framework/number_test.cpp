#include "framework/ic/number.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <sstream>

#include "framework/ic/conversion_error.h"

namespace {

using IC::ConversionError;
using IC::Number;

constexpr unsigned int kGreatest = std::numeric_limits<unsigned int>::max();

unsigned int as32(const Number& number) {
    return number;
}

TEST(Number, RemembersItsKind) {
    EXPECT_EQ(Number().kind(), Number::none);
    EXPECT_EQ(Number(7U).kind(), Number::unsigned32);
    EXPECT_EQ(Number(7ULL).kind(), Number::unsigned64);
    EXPECT_EQ(Number(true).kind(), Number::boolean);
    EXPECT_EQ(Number(7.5).kind(), Number::real);
    EXPECT_EQ(Number(7L, 1).kind(), Number::scaled);
}

TEST(Number, OfAKindAloneIsEmpty) {
    EXPECT_TRUE(Number().empty());
    for (const auto kind : {Number::none, Number::unsigned32, Number::unsigned64, Number::boolean,
                            Number::real, Number::scaled}) {
        const Number number(kind);
        EXPECT_TRUE(number.empty()) << kind;
        EXPECT_EQ(number.kind(), kind);
        EXPECT_EQ(as32(number), 0U);
        EXPECT_EQ(number.toUnsigned64(), 0U);
        EXPECT_EQ(number.toDouble(), 0.0);
        EXPECT_EQ(number.toString(), "");
    }
    EXPECT_FALSE(Number(0U).empty());
    EXPECT_FALSE(Number(false).empty());
}

TEST(Number, ConvertsTo32Bits) {
    EXPECT_EQ(as32(Number(kGreatest)), kGreatest);
    EXPECT_EQ(as32(Number(4294967295ULL)), kGreatest);
    EXPECT_EQ(as32(Number(true)), 1U);
    EXPECT_EQ(as32(Number(false)), 0U);
    EXPECT_EQ(as32(Number(2.999)), 2U);
    EXPECT_EQ(as32(Number(4294967295.9)), kGreatest);
    EXPECT_EQ(as32(Number(12399L, 2)), 123U);
    EXPECT_EQ(as32(Number(5L, 1)), 0U);
    EXPECT_EQ(as32(Number(5L, 65535)), 0U);
}

TEST(Number, ANegativeValueWrapsToTwosComplement) {
    EXPECT_EQ(as32(Number(-60L, 0)), kGreatest - 59);
    EXPECT_EQ(as32(Number(-300.0)), kGreatest - 299);
    EXPECT_EQ(as32(Number(-199L, 2)), kGreatest);  // the fraction goes first
    EXPECT_EQ(as32(Number(-0.5)), 0U);
    EXPECT_EQ(as32(Number(std::numeric_limits<int>::min(), 0)), 0x80000000U);
    EXPECT_EQ(Number(-1L, 0).toUnsigned64(), std::numeric_limits<unsigned long long>::max());
    EXPECT_EQ(Number(-1.0).toUnsigned64(), std::numeric_limits<unsigned long long>::max());
}

TEST(Number, WhatDoesNotFitThrows) {
    EXPECT_THROW(as32(Number(4294967296ULL)), ConversionError);
    EXPECT_THROW(as32(Number(4294967296.0)), ConversionError);
    EXPECT_THROW(as32(Number(-2147483649.0)), ConversionError);
    EXPECT_THROW(as32(Number(std::nan(""))), ConversionError);
    EXPECT_THROW(as32(Number(std::numeric_limits<double>::infinity())), ConversionError);
    EXPECT_THROW(as32(Number(-std::numeric_limits<double>::infinity())), ConversionError);
    EXPECT_THROW(static_cast<void>(Number(18446744073709551616.0).toUnsigned64()), ConversionError);
    EXPECT_EQ(Number(18446744073709549568.0).toUnsigned64(), 18446744073709549568ULL);
}

TEST(Number, AScaledValueBeyond32BitsThrowsWhereALongIsWider) {
    if constexpr (sizeof(long) > sizeof(unsigned int)) {
        EXPECT_THROW(as32(Number(static_cast<long>(4294967296LL), 0)), ConversionError);
        EXPECT_THROW(as32(Number(static_cast<long>(-2147483649LL), 0)), ConversionError);
        EXPECT_EQ(as32(Number(static_cast<long>(4294967296LL), 1)), 429496729U);
    } else {
        EXPECT_EQ(as32(Number(std::numeric_limits<long>::max(), 0)), 0x7fffffffU);
    }
}

TEST(Number, ConvertsToDouble) {
    EXPECT_DOUBLE_EQ(Number(7U).toDouble(), 7.0);
    EXPECT_DOUBLE_EQ(Number(-2.5).toDouble(), -2.5);
    EXPECT_DOUBLE_EQ(Number(-12345L, 2).toDouble(), -123.45);
    EXPECT_DOUBLE_EQ(Number(true).toDouble(), 1.0);
    EXPECT_EQ(Number(5L, 65535).toDouble(), 0.0);
}

TEST(Number, PrintsDecimalText) {
    EXPECT_EQ(Number(kGreatest).toString(), "4294967295");
    EXPECT_EQ(Number(18446744073709551615ULL).toString(), "18446744073709551615");
    EXPECT_EQ(Number(true).toString(), "true");
    EXPECT_EQ(Number(false).toString(), "false");
    EXPECT_EQ(Number(2000.0).toString(), "2000");
    EXPECT_EQ(Number(-300.0).toString(), "-300");
    EXPECT_EQ(Number(0.1).toString(), "0.1");
    EXPECT_EQ(Number(1732136580L, 0).toString(), "1732136580");
    EXPECT_EQ(Number(12345L, 2).toString(), "123.45");
    EXPECT_EQ(Number(-5L, 2).toString(), "-0.05");
    EXPECT_EQ(Number(100L, 2).toString(), "1.00");
    EXPECT_EQ(Number(0L, 1).toString(), "0.0");
    EXPECT_EQ(Number(std::numeric_limits<long>::min(), 0).toString(),
              std::to_string(std::numeric_limits<long>::min()));
    std::ostringstream out;
    out << Number(12345L, 2) << Number();
    EXPECT_EQ(out.str(), "123.45");
}

TEST(Number, EqualsInKindAndValue) {
    EXPECT_TRUE(Number(7U) == Number(7U));
    EXPECT_FALSE(Number(7U) == Number(8U));
    EXPECT_FALSE(Number(7U) == Number(7ULL));
    EXPECT_FALSE(Number() == Number(Number::real));
    EXPECT_FALSE(Number(10L, 1) == Number(100L, 2));
    EXPECT_TRUE(Number() == Number());
}

}  // namespace
