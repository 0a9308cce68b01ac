#include "agent/history/history.h"

#include "agent/cli/commands/commands.h"
#include "agent/cli/event_printer.h"
#include "agent/cli/json.h"
#include "agent/cli/moment.h"
#include "agent/cli/print.h"

namespace cvagent::commands {

namespace {

constexpr std::size_t kAtOnce = 500;  // between two of these others may write

HistoryQuery queryOf(const Options& options) {
    HistoryQuery query;
    if (const auto since = momentNamed(options.since)) {
        query.after = since->number.value_or(query.after);
        query.since = since->number ? query.since : since->time;
    }
    if (const auto until = momentNamed(options.until)) {
        query.upTo = until->number.value_or(query.upTo);
        query.until = until->number ? query.until : until->time;
    }
    for (const std::string& word : options.kinds) {
        if (const auto kind = kindNamed(word)) {
            query.kinds.push_back(*kind);
        }
    }
    query.node = options.node;
    return query;
}

/// Behind the line of a write: what came of it, and who has written.
std::string writeText(const Event& event) {
    std::string text = event.verdict;
    if (!event.wanted.empty() && event.wanted != event.after) {
        text += std::string(text.empty() ? "" : "; ") + "wanted: " + event.wanted;
    }
    if (!event.caller.empty()) {
        text += std::string(text.empty() ? "" : "; ") + "by " + event.caller;
    }
    return text.empty() ? "" : "  (" + printable(text) + ")";
}

std::string lineOf(const HistoryEntry& entry, const Style& style) {
    std::string line = eventLine(entry.event, style);
    line.pop_back();
    const std::string number = std::to_string(entry.event.number);
    return style.faint(std::string(number.size() < 6 ? 6 - number.size() : 0, ' ') + number) + "  " + line +
           writeText(entry.event) + "\n";
}

void printAll(HistoryReader& reader, HistoryQuery query, const Options& options) {
    if (options.limit) {
        query.after = reader.lastOf(query, *options.limit).after;
    }
    for (;;) {
        const std::vector<HistoryEntry> entries = reader.read(query, kAtOnce);
        std::string text;
        for (const HistoryEntry& entry : entries) {
            text += options.json ? json::event(entry.event, entry.boot) : lineOf(entry, Style::detect());
        }
        print(text);
        if (entries.size() < kAtOnce) {
            return;
        }
        query.after = entries.back().event.number;
    }
}

void changeLimits(const Options& options) {
    History history(ownHistoryPlace(), complain);
    HistoryLimits limits = history.limits();
    if (options.keepDays) {
        limits.age = std::chrono::seconds(static_cast<std::int64_t>(*options.keepDays * 86400));
    }
    if (options.keepMegabytes) {
        limits.bytes = static_cast<std::uint64_t>(*options.keepMegabytes * 1e6);
    }
    history.setLimits(limits);
}

std::string adviceOn(const HistoryError& error, const HistoryPlace& place) {
    if (error.kind() != HistoryError::denied) {
        return "";
    }
    return std::string("\nRun: sudo cvagent history") +
           (place.isHosts ? ", or become a member of the group corvista" : "");
}

[[noreturn]] void failWith(const HistoryError& error, const HistoryPlace& place) {
    const std::string file = inQuotes(place.file());
    const std::string reason = error.what();
    throw Failure(error.kind() == HistoryError::busy ? ExitStatus::busy : ExitStatus::failed,
                  "the history cannot be read: " + (reason.starts_with(file) ? "" : file + ": ") + reason +
                      adviceOn(error, place));
}

}  // namespace

ExitStatus history(const Options& options) {
    HistoryPlace place;
    try {
        std::string left;
        place = options.keepDays || options.keepMegabytes ? ownHistoryPlace() : readHistoryPlace(left);
        if (options.keepDays || options.keepMegabytes) {
            changeLimits(options);
            return ExitStatus::done;
        }
        print("");  // an output that is closed is told although there may be nothing to print
        if (!left.empty()) {
            complain("these are the events of your own agents; the host's are not shown: " + left +
                     "\nRun: sudo cvagent history, or become a member of the group corvista");
        }
        HistoryReader reader(place);
        printAll(reader, queryOf(options), options);
        return ExitStatus::done;
    } catch (const HistoryError& error) {
        if (error.kind() != HistoryError::absent) {
            failWith(error, place);
        }
        complain("nothing has been kept so far");
        return ExitStatus::done;
    }
}

}  // namespace cvagent::commands
