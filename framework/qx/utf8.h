#pragma once

#include <cstddef>
#include <string_view>

#include "framework/export.h"

namespace QX {

/// A code that stands for a character: no surrogate, nothing above the last one.
constexpr bool isUnicodeScalar(char32_t code) {
    return code <= 0x10ffff && (code < 0xd800 || code > 0xdfff);
}

struct Utf8Character {
    char32_t code = 0;
    std::size_t length = 0;  ///< bytes; 0 when the text does not start with a whole, valid character
};

/// The character at the start of `text`: no overlong forms, no surrogates, nothing above U+10FFFF.
CORVISTA_API Utf8Character firstUtf8Character(std::string_view text);

}  // namespace QX
