#include "agent/keep/yaml_file.h"

#include <algorithm>
#include <string_view>

#include "agent/core/text.h"
#include "agent/keep/interfaces_file.h"
#include "agent/keep/wish.h"

namespace cvagent::keep {

namespace {

/// What separates the words of a list.
constexpr std::string_view kBetweenWords = " []{},\"'";

}  // namespace

YamlFile::YamlFile(const std::string& text) : lines_(splitLines(text)) {
    bool isBegun = false;
    for (const std::string& line : lines_) {
        parsed_.push_back(parsed(line));
        if (isBegun && line.starts_with("---")) {
            refuseYaml(line);
        }
        isBegun = isBegun || !parsed_.back().text.empty();
    }
}

YamlFile::Word YamlFile::valueOf(std::size_t line) const {
    const YamlLine& told = parsed_[line];
    return {line, told.indent + told.text.size() - told.value.size(), told.value};
}

/// The lines below a key, with it: what is indented more, and items of a list that are not.
YamlFile::Span YamlFile::blockAt(std::size_t first, std::size_t limit) const {
    const std::size_t indent = parsed_[first].indent;
    Span block{first, first + 1};
    for (std::size_t at = first + 1; at < limit; ++at) {
        const YamlLine& line = parsed_[at];
        const bool isItem = line.text.starts_with('-');
        if (line.text.empty()) {
            continue;
        }
        if (line.indent < indent || (line.indent == indent && !isItem)) {
            break;
        }
        block.end = at + 1;
    }
    return block;
}

std::optional<YamlFile::Span> YamlFile::childOf(const Span& within, std::optional<std::size_t> parent,
                                                const std::string& key) const {
    if (parent && !parsed_[*parent].value.empty()) {
        refuseYaml(lines_[*parent]);
    }
    std::optional<Span> found;
    std::optional<std::size_t> indent;
    for (std::size_t at = parent ? *parent + 1 : within.first; at < within.end; ++at) {
        const YamlLine& line = parsed_[at];
        if (line.text.empty()) {
            continue;
        }
        const bool isListInstead = parent && !indent && line.text.starts_with('-');
        indent = indent.value_or(line.indent);
        if (line.indent < *indent || isListInstead) {
            refuseYaml(lines_[at]);
        }
        if (line.indent == *indent && line.key == key) {
            if (found) {
                throw CannotKeep("the file says " + inQuotes(key) + " more than once");
            }
            found = blockAt(at, within.end);
        }
    }
    return found;
}

std::vector<YamlFile::Word> YamlFile::wordsIn(const Span& list) const {
    std::vector<Word> words;
    for (std::size_t at = list.first; at < list.end; ++at) {
        const Word whole = at == list.first ? valueOf(at) : Word{at, parsed_[at].indent, parsed_[at].text};
        std::size_t begin = 0;
        while ((begin = whole.text.find_first_not_of(kBetweenWords, begin)) != std::string::npos) {
            const std::size_t end =
                std::min(whole.text.find_first_of(kBetweenWords, begin), whole.text.size());
            const std::string word = whole.text.substr(begin, end - begin);
            words.push_back({at, whole.column + begin, word.substr(0, word.find_last_not_of(':') + 1)});
            begin = end;
        }
    }
    return words;
}

std::size_t YamlFile::itemIndent(const Span& list) const {
    for (std::size_t at = list.first + 1; at < list.end; ++at) {
        if (parsed_[at].text.starts_with('-')) {
            return parsed_[at].indent;
        }
    }
    return parsed_[list.first].indent + 2;
}

void YamlFile::replace(const Word& old, const std::string& value) {
    lines_[old.line].replace(old.column, old.text.size(), value);
    parsed_[old.line] = parsed(lines_[old.line]);
}

void YamlFile::insert(std::size_t place, const std::vector<std::string>& lines) {
    for (std::size_t at = 0; at < lines.size(); ++at) {
        lines_.insert(lines_.begin() + static_cast<std::ptrdiff_t>(place + at), lines[at]);
        parsed_.insert(parsed_.begin() + static_cast<std::ptrdiff_t>(place + at), parsed(lines[at]));
    }
}

void YamlFile::erase(const Span& span) {
    const auto first = static_cast<std::ptrdiff_t>(span.first);
    const auto end = static_cast<std::ptrdiff_t>(span.end);
    lines_.erase(lines_.begin() + first, lines_.begin() + end);
    parsed_.erase(parsed_.begin() + first, parsed_.begin() + end);
}

void YamlFile::eraseItem(const Span& list, const Word& word) {
    if (!at(list.first).value.empty()) {
        eraseFromLine(list, word);
        return;
    }
    const std::size_t indent = itemIndent(list);
    const auto isItem = [&](std::size_t line) {
        return at(line).indent == indent && at(line).text.starts_with('-');
    };
    Span item{word.line, word.line + 1};
    while (item.first > list.first && !isItem(item.first)) {
        --item.first;
    }
    while (item.end < list.end && !isItem(item.end)) {
        ++item.end;
    }
    while (at(item.end - 1).text.empty()) {  // a comment is the next one's
        --item.end;
    }
    unsigned items = 0;
    for (std::size_t line = list.first + 1; line < list.end; ++line) {
        items += isItem(line) ? 1U : 0U;
    }
    if (item.first == list.first) {
        refuse(word.line);
    }
    erase(items == 1 ? list : item);
}

/// From "[a, b]", with the comma.
void YamlFile::eraseFromLine(const Span& list, const Word& word) {
    if (wordsIn(list).size() == 1) {
        erase(list);
        return;
    }
    std::string& line = lines_[word.line];
    const std::size_t begin = line.find_last_of("[,", word.column);
    const std::size_t end = line.find_first_of(",]", word.column);
    const bool isSimple = word.line == list.first && at(list.first).value.find('{') == std::string::npos;
    if (!isSimple || begin == std::string::npos || end == std::string::npos) {
        refuse(word.line);
    }
    if (line[begin] == '[' && line[end] == ',') {
        line.erase(begin + 1, std::min(line.find_first_not_of(' ', end + 1), line.size()) - begin - 1);
    } else {
        const std::size_t from = line[begin] == '[' ? begin + 1 : begin;
        line.erase(from, end - from);
    }
    parsed_[word.line] = parsed(line);
}

}  // namespace cvagent::keep
