#include "agent/keep/yaml_line.h"

#include <algorithm>
#include <cctype>
#include <string_view>

#include "agent/core/text.h"
#include "agent/keep/wish.h"

namespace cvagent::keep {

namespace {

/// A tab, an escape, and what no YAML has.
bool isNotUnderstood(char letter) {
    return std::iscntrl(static_cast<unsigned char>(letter)) != 0 || letter == '\\';
}

/// Up to a comment: "#" at the beginning or behind a blank, outside of quotes. Counts brackets on the way.
std::string meaningOf(const std::string& line) {
    char quote = '\0';
    int depth = 0;
    std::size_t end = line.size();
    for (std::size_t at = 0; at < end; ++at) {
        const char letter = line[at];
        const bool isFirst = at == 0 || line[at - 1] == ' ' ||
                             std::string_view("[{,").find(line[at - 1]) != std::string_view::npos;
        if (quote != '\0') {
            quote = letter == quote ? '\0' : quote;
        } else if ((letter == '"' || letter == '\'') && isFirst) {
            quote = letter;
        } else if (letter == '#' && isFirst) {
            end = at;
        } else if (isFirst && std::string_view("&*!|>%@`").find(letter) != std::string_view::npos) {
            refuseYaml(line);
        } else {
            depth += letter == '[' || letter == '{' ? 1 : 0;
            depth -= letter == ']' || letter == '}' ? 1 : 0;
        }
    }
    std::string meaning = line.substr(0, end);
    meaning.erase(meaning.find_last_not_of(" \r") + 1);
    if (quote != '\0' || depth != 0 || std::ranges::any_of(meaning, isNotUnderstood)) {
        refuseYaml(line);
    }
    return meaning;
}

}  // namespace

void refuseYaml(const std::string& line) {
    const std::size_t colon = line.find(':');
    throw CannotKeep("a line of the file is not understood" +
                     (colon == std::string::npos ? "" : ": " + inQuotes(line.substr(0, colon))));
}

std::string unquoted(const std::string& text) {
    const bool isQuoted = text.size() >= 2 && (text[0] == '"' || text[0] == '\'') && text.back() == text[0];
    return isQuoted ? text.substr(1, text.size() - 2) : text;
}

YamlLine parsed(const std::string& line) {
    const std::string meaning = meaningOf(line);
    YamlLine found;
    found.indent = std::min(meaning.find_first_not_of(' '), meaning.size());
    found.text = meaning.substr(found.indent);
    if (found.text == "---") {
        found.text.clear();
    }
    if (found.text.starts_with("- ") || found.text == "-" || found.text == "...") {
        return found;
    }
    const std::size_t colon = found.text.ends_with(':') ? found.text.size() - 1 : found.text.find(": ");
    const std::size_t last = found.text.ends_with(':') ? found.text.find(": ") : std::string::npos;
    if (colon == std::string::npos || last != std::string::npos || found.text[0] == '[' ||
        found.text[0] == '{') {
        if (!found.text.empty()) {
            refuseYaml(line);
        }
        return found;
    }
    found.key = unquoted(found.text.substr(0, colon));
    const std::size_t value = found.text.find_first_not_of(' ', colon + 1);
    found.value = value == std::string::npos ? "" : found.text.substr(value);
    return found;
}

}  // namespace cvagent::keep
