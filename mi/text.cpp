#include "mi/text.h"

#include <cstdlib>
#include <cstring>

namespace IC {

char* strget(char* text, char delim) {
    while (*text != '\0' && *text == delim) {
        ++text;
    }
    for (char* newline = std::strchr(text, '\n'); newline != nullptr;
         newline = std::strchr(newline + 1, '\n')) {
        *newline = '\0';
    }
    return text;
}

char* strreplace(char* text, char from, char to) {
    if (*text == '\0') {
        return text;
    }
    for (char* at = text + 1; *at != '\0'; ++at) {
        if (*at == from) {
            *at = to;
            if (to == '\0') {
                break;
            }
        }
    }
    return text;
}

std::string trimEnd(std::string text, char unwanted) {
    text.erase(text.find_last_not_of(unwanted) + 1);
    return text;
}

std::string trimStart(std::string text, char unwanted) {
    text.erase(0, text.find_first_not_of(unwanted));
    return text;
}

long long leadingDecimal(const std::string& text, std::string* rest) {
    char* end = nullptr;
    const long long number = std::strtoll(text.c_str(), &end, 10);
    if (rest != nullptr) {
        *rest = text.substr(static_cast<std::size_t>(end - text.c_str()));
    }
    return number;
}

std::string printable(std::string_view text, char also) {
    constexpr char kHex[] = "0123456789abcdef";
    std::string shown;
    for (const char letter : text) {
        const auto byte = static_cast<unsigned char>(letter);
        if (byte >= ' ' && byte != 0x7fU && letter != also) {
            shown += letter;
        } else {
            shown.append("\\x").append({kHex[byte / 16U], kHex[byte % 16U]});
        }
    }
    return shown;
}

}  // namespace IC
