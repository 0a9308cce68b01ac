#include "framework/qx/strings.h"

#include <gtest/gtest.h>

namespace {

using QX::make_string;
using QX::make_wstring;

TEST(Strings, PlainTextGoesBothWays) {
    EXPECT_EQ(make_wstring("eth0"), L"eth0");
    EXPECT_EQ(make_string(L"eth0"), "eth0");
    EXPECT_EQ(make_wstring(""), L"");
    EXPECT_EQ(make_string(L""), "");
}

TEST(Strings, CharactersOfEveryLengthGoBothWays) {
    const std::string narrow = "a\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80\xEF\xBF\xBF\xF4\x8F\xBF\xBF";
    const std::wstring wide = {
        L'a', wchar_t(0xe9), wchar_t(0x20ac), wchar_t(0x1f600), wchar_t(0xffff), wchar_t(0x10ffff)};
    EXPECT_EQ(make_wstring(narrow), wide);
    EXPECT_EQ(make_string(wide), narrow);
}

TEST(Strings, ANulByteIsACharacterLikeOthers) {
    const std::string narrow("a\0b", 3);
    EXPECT_EQ(make_wstring(narrow).size(), 3U);
    EXPECT_EQ(make_string(make_wstring(narrow)), narrow);
}

TEST(Strings, EveryByteAloneSurvives) {
    for (int byte = 0; byte < 256; ++byte) {
        const std::string narrow = "x" + std::string(1, static_cast<char>(byte)) + "y";
        EXPECT_EQ(make_string(make_wstring(narrow)), narrow) << byte;
    }
}

TEST(Strings, BytesThatAreNotUtf8Survive) {
    const std::vector<std::string> texts{
        "\xE9t\xE9",             // Latin-1
        "\xC3",                  // cut off
        "\xE2\x82",              // cut off
        "\xF0\x9F\x98",          // cut off
        "\xC0\x80",              // overlong NUL
        "\xE0\x80\xAF",          // overlong slash
        "\xED\xA0\x80",          // surrogate
        "\xED\xB2\xA9",          // the stand-in of a stray byte, spelt as UTF-8
        "\xF4\x90\x80\x80",      // above the last code
        "\xF8\x88\x80\x80\x80",  // five bytes
        "\xFF\xFE",
        "\x80\xC3\xA9\x80",
    };
    for (const std::string& text : texts) {
        EXPECT_EQ(make_string(make_wstring(text)), text) << testing::PrintToString(text);
    }
}

TEST(Strings, StrayBytesStandInTheirOwnRange) {
    EXPECT_EQ(make_wstring("\xFF"), std::wstring(1, wchar_t(0xdcff)));
    EXPECT_EQ(make_wstring("\x80"), std::wstring(1, wchar_t(0xdc80)));
}

TEST(Strings, WideCharactersThatAreNoneBecomeTheReplacement) {
    const std::string replacement = "\xEF\xBF\xBD";
    EXPECT_EQ(make_string(std::wstring(1, wchar_t(0xd800))), replacement);
    EXPECT_EQ(make_string(std::wstring(1, wchar_t(0xdc7f))), replacement);
    EXPECT_EQ(make_string(std::wstring(1, wchar_t(0xdd00))), replacement);
    EXPECT_EQ(make_string(std::wstring(1, wchar_t(0x110000))), replacement);
    EXPECT_EQ(make_string(std::wstring(1, static_cast<wchar_t>(-1))), replacement);
}

}  // namespace
