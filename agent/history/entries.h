#pragma once

#include <cstdint>
#include <ctime>
#include <limits>
#include <string>
#include <vector>

#include "agent/core/event.h"
#include "agent/history/database.h"

namespace cvagent {

/// One event as it was kept.
struct HistoryEntry {
    Event event;
    std::string boot;  ///< the kernel's id of the boot in which it happened
};

/// Which entries are asked for; by default all.
struct HistoryQuery {
    static constexpr std::uint64_t kLast = std::numeric_limits<std::int64_t>::max();

    std::uint64_t after = 0;     ///< only those behind this number
    std::uint64_t upTo = kLast;  ///< and up to this one
    std::time_t since = std::numeric_limits<std::time_t>::min();
    std::time_t until = std::numeric_limits<std::time_t>::max();
    /// A node's path, the last part of it, or the name in that; "" for all.
    std::string node{};
    std::vector<Event::Kind> kinds{};  ///< empty for all
};

/// The entries of an open file. Everything throws HistoryError. One thread at a time.
class Entries {
public:
    /// @param database outlives it
    explicit Entries(const Database& database);

    /// The number that was given last.
    std::uint64_t last();
    bool has(std::uint64_t number);
    /// @param event texts of more than 64 KiB are kept in part, with a note of their length
    void add(std::uint64_t number, std::int64_t run, const Event& event);
    /// The number of the alert that the node told last, if it is this one and its process was ended before
    /// the plug-in could take it for told; else 0.
    std::uint64_t doubtful(const Event& alert);

    /// Those of a query, the oldest first.
    std::vector<HistoryEntry> read(const HistoryQuery& query, std::size_t most);
    /// How many of a query there are, at most so many; and behind which number the last of them begin.
    struct Tail {
        std::uint64_t count = 0;  ///< of all
        std::uint64_t after = 0;
    };
    Tail lastOf(const HistoryQuery& query, std::size_t most);

private:
    Statement last_;
    Statement has_;
    Statement add_;
    Statement alert_;
    Statement read_;
    Statement count_;
    Statement place_;
};

}  // namespace cvagent
