#include "agent/cli/plain_question.h"

#include <algorithm>
#include <string>
#include <vector>

namespace cvagent {

std::optional<Options> plainQuestion(int count, const char* const* words) {
    std::vector<std::string> all(words + std::min(count, 1), words + count);
    Options options;
    if (const auto json = std::ranges::find(all, "--json"); json != all.end()) {
        options.json = true;
        all.erase(json);
    }
    const auto isSpecial = [](const std::string& word) {
        return word.empty() || word.starts_with('-') || word.starts_with('+');
    };
    if (all.empty() || std::ranges::any_of(all, isSpecial)) {
        return std::nullopt;
    }
    if (all.size() == 1 && all.front() == "tree") {
        options.command = Command::tree;
        return options;
    }
    if (all.size() >= 2 && all.front() == "get") {
        options.command = Command::get;
        options.node = all[1];
        options.properties.assign(all.begin() + 2, all.end());
        return options;
    }
    return std::nullopt;
}

}  // namespace cvagent
