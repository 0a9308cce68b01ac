#include "agent/change/unified_diff.h"

#include <algorithm>
#include <vector>

#include "agent/core/text.h"

namespace cvagent::change {

namespace {

using Lines = std::vector<std::string_view>;

constexpr std::size_t kAround = 3;
constexpr std::size_t kMostCells = 4'000'000;  // of the table below; larger differences are told as a whole

/// With their line breaks.
Lines linesOf(std::string_view text) {
    Lines lines;
    while (!text.empty()) {
        const std::size_t end = std::min(text.find('\n'), text.size() - 1) + 1;
        lines.push_back(text.substr(0, end));
        text.remove_prefix(end);
    }
    return lines;
}

struct Edit {
    char sign;
    std::string_view line;
};

/// The longest common subsequence of what lies between the ends that are alike.
void addMiddle(std::vector<Edit>& edits, const Lines& before, const Lines& after) {
    const std::size_t width = after.size() + 1;
    const bool isSmall = (before.size() + 1) * width <= kMostCells;
    std::vector<unsigned> longest(isSmall ? (before.size() + 1) * width : 0);
    for (std::size_t i = before.size(); isSmall && i-- > 0;) {
        for (std::size_t k = after.size(); k-- > 0;) {
            longest[i * width + k] = before[i] == after[k]
                                         ? longest[(i + 1) * width + k + 1] + 1
                                         : std::max(longest[(i + 1) * width + k], longest[i * width + k + 1]);
        }
    }
    std::size_t i = 0;
    std::size_t k = 0;
    while (i < before.size() || k < after.size()) {
        const bool bothLeft = isSmall && i < before.size() && k < after.size();
        if (bothLeft && before[i] == after[k]) {
            edits.push_back({' ', before[i++]});
            ++k;
        } else if (i < before.size() &&
                   (!bothLeft || longest[(i + 1) * width + k] >= longest[i * width + k + 1])) {
            edits.push_back({'-', before[i++]});
        } else {
            edits.push_back({'+', after[k++]});
        }
    }
}

std::vector<Edit> editsOf(const Lines& before, const Lines& after) {
    const std::size_t most = std::min(before.size(), after.size());
    std::size_t head = 0;
    while (head < most && before[head] == after[head]) {
        ++head;
    }
    std::size_t tail = 0;
    while (tail < most - head && before[before.size() - 1 - tail] == after[after.size() - 1 - tail]) {
        ++tail;
    }
    std::vector<Edit> edits;
    const auto addSame = [&edits, &before](std::size_t from, std::size_t count) {
        for (std::size_t i = 0; i < count; ++i) {
            edits.push_back({' ', before[from + i]});
        }
    };
    addSame(0, head);
    addMiddle(edits, Lines(before.begin() + static_cast<long>(head), before.end() - static_cast<long>(tail)),
              Lines(after.begin() + static_cast<long>(head), after.end() - static_cast<long>(tail)));
    addSame(before.size() - tail, tail);
    return edits;
}

/// Tabs, of which settings files are full, stay what they are, so that the difference can be applied.
std::string withTabs(std::string_view line) {
    std::string text;
    for (;;) {
        const std::size_t tab = std::min(line.find('\t'), line.size());
        text += printable(std::string(line.substr(0, tab)));
        if (tab == line.size()) {
            return text;
        }
        text += '\t';
        line.remove_prefix(tab + 1);
    }
}

std::string shown(const Edit& edit) {
    const bool isWhole = edit.line.ends_with('\n');
    const std::string text = edit.sign + withTabs(edit.line.substr(0, edit.line.size() - (isWhole ? 1 : 0)));
    return text + (isWhole ? "\n" : "\n\\ No newline at end of file\n");
}

/// "12,3" as the format has it.
std::string range(std::size_t first, std::size_t count) {
    return std::to_string(count == 0 ? first : first + 1) + (count == 1 ? "" : "," + std::to_string(count));
}

}  // namespace

std::string unifiedDiff(std::string_view before, std::string_view after) {
    const std::vector<Edit> edits = editsOf(linesOf(before), linesOf(after));
    std::vector<bool> wanted(edits.size());
    for (std::size_t i = 0; i < edits.size(); ++i) {
        for (std::size_t k = i - std::min(i, kAround);
             edits[i].sign != ' ' && k < std::min(edits.size(), i + kAround + 1); ++k) {
            wanted[k] = true;
        }
    }
    std::string text;
    std::size_t oldLine = 0;
    std::size_t newLine = 0;
    for (std::size_t i = 0; i < edits.size();) {
        std::string hunk;
        std::size_t removed = 0;
        std::size_t added = 0;
        for (; i < edits.size() && wanted[i]; ++i) {
            hunk += shown(edits[i]);
            removed += edits[i].sign != '+' ? 1 : 0;
            added += edits[i].sign != '-' ? 1 : 0;
        }
        if (!hunk.empty()) {
            text += "@@ -" + range(oldLine, removed) + " +" + range(newLine, added) + " @@\n" + hunk;
            oldLine += removed;
            newLine += added;
        } else {
            ++oldLine;
            ++newLine;
            ++i;
        }
    }
    return text;
}

}  // namespace cvagent::change
