#include "framework/qx/utf8.h"

#include <array>

namespace QX {
namespace {

struct Form {
    unsigned char mask;    // the bits of the first byte that tell the form
    unsigned char marker;  // what they hold
    char32_t least;        // the first code that needs this form
};

constexpr std::array<Form, 4> kForms{
    {{0x80, 0x00, 0}, {0xe0, 0xc0, 0x80}, {0xf0, 0xe0, 0x800}, {0xf8, 0xf0, 0x10000}}};

}  // namespace

Utf8Character firstUtf8Character(std::string_view text) {
    for (std::size_t length = 1; length <= kForms.size() && length <= text.size(); ++length) {
        const Form& form = kForms[length - 1];
        const auto first = static_cast<unsigned char>(text[0]);
        if ((first & form.mask) != form.marker) {
            continue;
        }
        char32_t code = first & static_cast<unsigned char>(~form.mask);
        for (const char next : text.substr(1, length - 1)) {
            const auto byte = static_cast<unsigned char>(next);
            if ((byte & 0xc0U) != 0x80U) {
                return {};
            }
            code = (code << 6U) | (byte & 0x3fU);
        }
        return code >= form.least && isUnicodeScalar(code) ? Utf8Character{code, length} : Utf8Character{};
    }
    return {};
}

}  // namespace QX
