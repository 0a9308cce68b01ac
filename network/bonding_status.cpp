#include "network/bonding_status.h"

#include <algorithm>
#include <string_view>

#include "mi/text.h"

namespace IC::parse {

namespace {

constexpr std::string_view kMember = "Slave Interface: ";
constexpr std::string_view kStatus = "MII Status: ";
constexpr std::string_view kFailures = "Link Failure Count: ";

/// Takes the first word behind the label, if the line begins with it and the word is not known yet.
void takeWord(std::string_view line, std::string_view label, std::string& word) {
    if (word.empty() && line.starts_with(label)) {
        line.remove_prefix(label.size());
        word = line.substr(0, line.find_first_of(" \n"));
    }
}

}  // namespace

std::optional<BondingMember> bondingMember(const std::vector<std::string>& lines, const std::string& port) {
    const std::string start = std::string(kMember) + port;
    auto line = std::ranges::find_if(lines, [&](const std::string& text) { return trimEnd(text) == start; });
    if (line == lines.end()) {
        return std::nullopt;
    }
    BondingMember member;
    for (++line; line != lines.end() && !line->starts_with(kMember); ++line) {
        takeWord(*line, kStatus, member.miiStatus);
        takeWord(*line, kFailures, member.linkFailures);
    }
    return member;
}

}  // namespace IC::parse
