#include "framework/qx/strings.h"

#include <string_view>

#include "framework/qx/utf8.h"

namespace QX {
namespace {

// A byte b that is not UTF-8 stands as this plus b: lone surrogates, which valid text never holds.
constexpr char32_t kStrayByte = 0xdc00;
constexpr char32_t kReplacement = 0xfffd;

bool isStrayByte(char32_t code) {
    return code >= kStrayByte + 0x80 && code <= kStrayByte + 0xff;
}

char byteOf(char32_t bits) {
    return static_cast<char>(static_cast<unsigned char>(bits));
}

void appendUtf8(std::string& text, char32_t code) {
    if (code < 0x80) {
        text += byteOf(code);
        return;
    }
    const unsigned int following = code < 0x800 ? 1 : code < 0x10000 ? 2 : 3;
    const char32_t marker = 0xff00U >> (following + 1);
    text += byteOf((marker & 0xffU) | (code >> (6 * following)));
    for (unsigned int left = following; left-- > 0;) {
        text += byteOf(0x80U | ((code >> (6 * left)) & 0x3fU));
    }
}

}  // namespace

std::wstring make_wstring(const std::string& text) {
    std::wstring wide;
    wide.reserve(text.size());
    std::string_view rest = text;
    while (!rest.empty()) {
        auto [code, length] = firstUtf8Character(rest);
        if (length == 0) {
            code = kStrayByte + static_cast<unsigned char>(rest.front());
            length = 1;
        }
        wide += static_cast<wchar_t>(code);
        rest.remove_prefix(length);
    }
    return wide;
}

std::string make_string(const std::wstring& text) {
    std::string narrow;
    narrow.reserve(text.size());
    for (const wchar_t character : text) {
        const auto code = static_cast<char32_t>(character);
        if (isStrayByte(code)) {
            narrow += byteOf(code - kStrayByte);
        } else {
            appendUtf8(narrow, isUnicodeScalar(code) ? code : kReplacement);
        }
    }
    return narrow;
}

}  // namespace QX
