#include "framework/ic/error.h"

#include <gtest/gtest.h>

#include <sstream>

#include "framework/ic/alert.h"

namespace {

using IC::Error;
using IC::Number;

TEST(Error, IsSuccessByDefault) {
    EXPECT_EQ(Error().getStatus(), 0);
    EXPECT_EQ(static_cast<Error::StatusType>(Error()), Error::success);
    EXPECT_EQ(static_cast<std::string>(Error()), "success");
}

TEST(Error, KeepsWhatItWasGiven) {
    const Error error(255, Number(17U), "no such disk");
    EXPECT_EQ(error.getStatus(), 255);
    EXPECT_EQ(static_cast<int>(static_cast<Error::StatusType>(error)), 255);
    EXPECT_TRUE(error.code() == Number(17U));
    EXPECT_EQ(error.text(), "no such disk");
    EXPECT_EQ(static_cast<std::string>(error), "no such disk");
}

TEST(Error, WithoutATextSaysItsStatus) {
    std::ostringstream out;
    out << Error(1, Number(Number::none), "") << '/' << Error(0, Number(), "done");
    EXPECT_EQ(out.str(), "status 1/done");
}

TEST(Alert, IsAPlainValue) {
    const IC::Alert alert(3, 4, {"/oshw/root", "x"}, 12, "NIC is Online ");
    std::vector<IC::Alert> copies(2, alert);
    EXPECT_EQ(copies[1].firstCode(), 3);
    EXPECT_EQ(copies[1].secondCode(), 4);
    EXPECT_EQ(copies[1].substitutions(), (std::vector<std::string>{"/oshw/root", "x"}));
    EXPECT_EQ(copies[1].eventCode(), 12U);
    EXPECT_EQ(copies[1].message(), "NIC is Online ");
}

}  // namespace
