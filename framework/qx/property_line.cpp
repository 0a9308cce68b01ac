#include "framework/qx/property_line.h"

#include "framework/qx/hex.h"
#include "framework/qx/utf8.h"
#include "framework/qx/whole_number.h"

namespace QX {
namespace {

/// Appends a text with everything escaped that would break the line, the key or the file's UTF-8.
void appendEscaped(std::string& line, std::string_view text, bool isKey) {
    while (!text.empty()) {
        const std::size_t length = firstUtf8Character(text).length;
        const char first = text.front();
        if (length == 0) {
            const auto byte = static_cast<unsigned char>(first);
            line += {'\\', 'x', kHexDigits[byte >> 4U], kHexDigits[byte & 0xfU]};
        } else if (first == '\n') {
            line += "\\n";
        } else if (first == '\\' || (isKey && first == '=')) {
            line += {'\\', first};
        } else {
            line += text.substr(0, length);
        }
        text.remove_prefix(length == 0 ? 1 : length);
    }
}

/// Takes the escape at the start of `rest` (behind its backslash) off it; nothing for a broken one.
std::optional<char> takeEscape(std::string_view& rest) {
    if (rest.empty()) {
        return {};
    }
    const char kind = rest.front();
    rest.remove_prefix(1);
    if (kind == 'n') {
        return '\n';
    }
    if (kind == '\\' || kind == '=') {
        return kind;
    }
    if (kind != 'x' || rest.size() < 2) {
        return {};
    }
    const auto byte = wholeNumber<unsigned char>(rest.substr(0, 2), 16);
    if (!byte) {
        return {};
    }
    rest.remove_prefix(2);
    return static_cast<char>(*byte);
}

}  // namespace

std::string formatPropertyLine(std::string_view key, std::string_view value) {
    std::string line;
    line.reserve(key.size() + value.size() + 1);
    appendEscaped(line, key, true);
    line += '=';
    appendEscaped(line, value, false);
    return line;
}

std::optional<std::pair<std::string, std::string>> parsePropertyLine(std::string_view line) {
    std::pair<std::string, std::string> result;
    bool inKey = true;
    while (!line.empty()) {
        std::string& part = inKey ? result.first : result.second;
        const std::size_t length = firstUtf8Character(line).length;
        if (length == 0) {
            return {};
        }
        const std::string_view character = line.substr(0, length);
        line.remove_prefix(length);
        if (inKey && character == "=") {
            inKey = false;
        } else if (character == "\\") {
            const auto escaped = takeEscape(line);
            if (!escaped) {
                return {};
            }
            part += *escaped;
        } else {
            part += character;
        }
    }
    if (inKey) {
        return {};
    }
    return result;
}

}  // namespace QX
