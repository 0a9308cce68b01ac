#include "agent/shell/filters/pattern.h"

#include <algorithm>

namespace cvagent::shell {

namespace {

char lower(char letter) {
    return letter >= 'A' && letter <= 'Z' ? static_cast<char>(letter - 'A' + 'a') : letter;
}

bool isWordLetter(char letter) {
    const char small = lower(letter);
    return (small >= 'a' && small <= 'z') || (letter >= '0' && letter <= '9') || letter == '_';
}

}  // namespace

std::optional<Pattern::Alternative> Pattern::readAlternative(std::string_view text, Dialect dialect) {
    Alternative found;
    found.atBegin = text.starts_with('^');
    text.remove_prefix(found.atBegin ? 1 : 0);
    found.atEnd = text.ends_with('$');
    text.remove_suffix(found.atEnd ? 1 : 0);
    const bool extended = dialect == Dialect::extended;
    // What is left of a basic pattern may hold ^ and $ as letters, but not where grep's own rules differ.
    if (text.find_first_of(extended ? "^$*+?()[]{}\\" : "^$*[]\\") != std::string_view::npos) {
        return std::nullopt;
    }
    found.text = text;
    for (const char letter : text) {
        found.any.push_back(letter == '.');
        found.plain = found.plain && letter != '.';
    }
    return found;
}

std::optional<Pattern> Pattern::read(std::string_view text, Dialect dialect, bool ignoreCase,
                                     bool wholeWord) {
    Pattern pattern;
    pattern.ignoreCase_ = ignoreCase;
    pattern.wholeWord_ = wholeWord;
    for (bool more = true; more;) {
        const std::size_t bar = dialect == Dialect::extended ? text.find('|') : std::string_view::npos;
        auto found = readAlternative(text.substr(0, bar), dialect);
        more = bar != std::string_view::npos;
        text.remove_prefix(more ? bar + 1 : text.size());
        const bool odd = found && (found->atBegin || found->atEnd || found->text.empty());
        if (!found || (odd && (wholeWord || dialect == Dialect::extended))) {
            return std::nullopt;
        }
        if (ignoreCase) {
            std::ranges::transform(found->text, found->text.begin(), lower);
        }
        pattern.alternatives_.push_back(std::move(*found));
    }
    return pattern;
}

bool Pattern::standsAlone(std::string_view line, std::size_t place, std::size_t length) const {
    const std::size_t end = place + length;
    return !wholeWord_ || ((place == 0 || !isWordLetter(line[place - 1])) &&
                           (end == line.size() || !isWordLetter(line[end])));
}

bool Pattern::fits(const Alternative& wanted, std::string_view line, std::size_t place) const {
    for (std::size_t i = 0; i < wanted.text.size(); ++i) {
        const char letter = ignoreCase_ ? lower(line[place + i]) : line[place + i];
        if (!wanted.any[i] && letter != wanted.text[i]) {
            return false;
        }
    }
    return standsAlone(line, place, wanted.text.size());
}

bool Pattern::isIn(const Alternative& wanted, std::string_view line) const {
    const std::size_t length = wanted.text.size();
    if (length > line.size()) {
        return false;
    }
    const std::size_t last = line.size() - length;
    if (wanted.atBegin || wanted.atEnd) {
        const bool both = wanted.atBegin && wanted.atEnd;
        return (!both || last == 0) && fits(wanted, line, wanted.atBegin ? 0 : last);
    }
    if (wanted.plain && !ignoreCase_ && !wholeWord_) {
        return line.find(wanted.text) != std::string_view::npos;
    }
    for (std::size_t place = 0; place <= last; ++place) {
        if (fits(wanted, line, place)) {
            return true;
        }
    }
    return false;
}

bool Pattern::isIn(std::string_view line) const {
    return std::ranges::any_of(alternatives_, [&](const auto& wanted) { return isIn(wanted, line); });
}

}  // namespace cvagent::shell
