#include "agent/change/unforeseen.h"

#include <algorithm>

#include "agent/core/text.h"

namespace cvagent::change {

namespace {

constexpr std::size_t kMostLines = 10;  // of one kind; the others are counted

using Sentences = std::vector<std::string>;

/// A command of the clock stands as a call, without a tool.
bool isClockCall(const PlannedCommand& command) {
    return command.recorded && (command.text.starts_with("settimeofday") ||
                                command.text.starts_with("clock_") || command.text.starts_with("adjtime"));
}

void addRecorded(const Plan& plan, Sentences& sentences) {
    for (const PlannedCommand& command : plan.commands) {
        const std::string said =
            isClockCall(command) ? "The clock was not set: what depends on the time is not known."
                                 : "What " + inQuotes(command.text) + " does to the host: it did not run.";
        if (command.recorded && std::ranges::find(sentences, said) == sentences.end()) {
            sentences.push_back(said);
        }
    }
}

void addDhcp(const Plan& plan, Sentences& sentences) {
    const bool asks = std::ranges::any_of(plan.files, [](const FileChange& file) {
        return file.after && file.after->content.find("BOOTPROTO='dhcp") != std::string::npos;
    });
    if (asks) {
        sentences.emplace_back("Which address, gateway and name servers DHCP will give.");
    }
}

void addNames(const Plan& plan, Sentences& sentences) {
    const bool asks = std::ranges::any_of(
        plan.commands, [](const PlannedCommand& command) { return command.text.starts_with("hostname "); });
    if (asks) {
        sentences.emplace_back("What name servers say of the host: names were looked up in files alone.");
    }
}

void addUntold(const Plan& plan, Sentences& sentences) {
    for (const FileChange& file : plan.files) {
        if ((file.before && file.before->withheld) || (file.after && file.after->withheld)) {
            sentences.push_back("What changes within " + printable(file.path) +
                                ": it is longer than 1 MiB, or cannot be read.");
        }
    }
}

void addLines(const std::vector<std::string>& lines, const std::string& start, Sentences& sentences) {
    for (std::size_t at = 0; at < std::min(lines.size(), kMostLines); ++at) {
        sentences.push_back(start + lines[at]);
    }
    if (lines.size() > kMostLines) {
        sentences.push_back(start + std::to_string(lines.size() - kMostLines) + " more");
    }
}

}  // namespace

std::vector<std::string> unforeseen(const Plan& plan, const Isolation& isolation) {
    Sentences sentences;
    addRecorded(plan, sentences);
    addDhcp(plan, sentences);
    addNames(plan, sentences);
    addUntold(plan, sentences);
    if (plan.changes.size() > 1) {
        sentences.emplace_back(
            "Each change but the first was tried on what those before it left here, which the host may "
            "answer otherwise.");
    }
    addLines(isolation.network.missing, "Tried without what the network has: ", sentences);
    addLines(isolation.network.added, "Tried with what the network has not: ", sentences);
    if (isolation.fence == Fence::droppedRights) {
        sentences.emplace_back(
            "What the plug-in asks the network's drivers at its start: as the host allows no user namespace, "
            "it "
            "was in the copy from the beginning.");
    }
    if (isolation.asUser) {
        sentences.emplace_back(
            "Tried as a user on copies of the files that he may read; on the host it takes root.");
    }
    return sentences;
}

}  // namespace cvagent::change
