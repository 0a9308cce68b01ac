#include "agent/keep/resolver_file.h"

#include <algorithm>
#include <iterator>
#include <optional>

#include "agent/keep/interfaces_file.h"
#include "agent/keep/network_file.h"

namespace cvagent::keep {

namespace {

using Texts = std::vector<std::string>;

constexpr const char* kSection = "[Resolve]";
constexpr const char* kServers = "DNS";
constexpr const char* kDomains = "Domains";
/// With it the host's own servers are asked for all names, and not those of a link beside them.
constexpr const char* kAllNames = "~.";

/// "Key = value" in its parts; no key for any other line.
std::pair<std::string, std::string> partsOfSetting(const std::string& line) {
    const std::size_t equals = line.find('=');
    const std::string key = equals == std::string::npos ? "" : joinedWords(wordsOf(line.substr(0, equals)));
    return {key, key.empty() ? "" : line.substr(equals + 1)};
}

/// What the lines of a key come to: each adds to those before, an empty one takes all of them away. Nothing
/// when none does that, and others' may count as well.
std::optional<Texts> listIn(const Texts& lines, const char* wanted) {
    std::optional<Texts> list;
    for (const std::string& line : lines) {
        const auto [key, value] = partsOfSetting(line);
        const Texts words = wordsOf(value);
        if (key == wanted && words.empty()) {
            list = Texts();
        } else if (key == wanted && list) {
            list->insert(list->end(), words.begin(), words.end());
        }
    }
    return list;
}

/// An empty one first, so that it counts alone.
void addSetting(const char* key, const Texts& list, Texts& lines) {
    lines.push_back(key + std::string("="));
    if (!list.empty()) {
        lines.push_back(key + std::string("=") + joinedWords(list));
    }
}

Texts settingsOfResolved(const std::optional<Texts>& servers, const std::optional<Texts>& domains) {
    Texts lines;
    const bool isForAll = servers && !servers->empty();
    if (servers) {
        addSetting(kServers, *servers, lines);
    }
    if (domains) {
        Texts all = *domains;
        if (isForAll) {
            all.emplace_back(kAllNames);
        }
        addSetting(kDomains, all, lines);
    } else if (isForAll) {
        lines.push_back(kDomains + std::string("=") + kAllNames);
    }
    return lines;
}

std::string ourMark() {
    const std::string line = kOurMark;
    return line.substr(0, line.size() - 1);
}

}  // namespace

ResolverLists resolverListsIn(const std::string& text) {
    ResolverLists lists;
    for (const std::string& line : splitLines(text)) {
        const Texts words = wordsOf(line);
        if (words.size() > 1 && words[0] == "nameserver") {
            lists.nameServers.push_back(words[1]);
        } else if (!words.empty() && (words[0] == "search" || words[0] == "domain")) {
            lists.searchDomains.assign(words.begin() + 1, words.end());
        }
    }
    return lists;
}

std::string editedResolvedDropIn(const std::string& text, const Wish& wish) {
    Texts lines = splitLines(text);
    auto domains = listIn(lines, kDomains);
    if (domains) {
        std::erase(*domains, kAllNames);
    }
    const Texts settings = settingsOfResolved(wish.nameServers ? wish.nameServers : listIn(lines, kServers),
                                              wish.searchDomains ? wish.searchDomains : domains);
    std::erase_if(lines, [](const std::string& line) {
        const std::string key = partsOfSetting(line).first;
        return key == kServers || key == kDomains;
    });
    if (text.empty()) {
        lines.push_back(ourMark());
    }
    auto section = std::ranges::find(lines, kSection, keywordOf);
    if (section == lines.end()) {
        section = lines.insert(section, kSection);
    }
    lines.insert(section + 1, settings.begin(), settings.end());
    return joined(lines, "");
}

std::string editedResolverLines(const std::string& text, const std::string& keyword, const Texts& lines) {
    Texts edited;
    std::optional<std::size_t> place;
    for (const std::string& line : splitLines(text)) {
        if (keywordOf(line) != keyword) {
            edited.push_back(line);
            continue;
        }
        if (!edited.empty() && edited.back() == ourMark()) {
            edited.pop_back();
        }
        place = place.value_or(edited.size());
    }
    if (!lines.empty()) {
        Texts ours{ourMark()};
        ours.insert(ours.end(), lines.begin(), lines.end());
        const auto at = static_cast<std::ptrdiff_t>(place.value_or(edited.size()));
        edited.insert(edited.begin() + at, ours.begin(), ours.end());
    }
    return joined(edited, "");
}

}  // namespace cvagent::keep
