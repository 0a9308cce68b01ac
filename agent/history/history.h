#pragma once

#include <sys/types.h>

#include <cstdint>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <vector>

#include "agent/core/plugin.h"
#include "agent/history/entries.h"
#include "agent/history/history_error.h"
#include "agent/history/limits.h"
#include "agent/history/place.h"

namespace cvagent {

/// What has happened, in a file that several processes write at once. A number, once given, is never given
/// again, over restarts either. A file that is damaged is moved aside, which is told, and a new one begun;
/// its numbers go on. Everything throws HistoryError. Any thread.
class History {
public:
    /// Opens the file, makes it where it is missing, and brings one of an earlier version to today's form.
    /// @param tell hears what became of a damaged file
    explicit History(const HistoryPlace& place, Tell tell = tellNobody);
    History(const History&) = delete;
    History& operator=(const History&) = delete;
    ~History();

    /// Numbers the events and keeps them, all or none; they are on the disk when it returns. One that has a
    /// number keeps it unless an entry has it. An alert that an earlier process has kept and that its plug-in
    /// had not taken for told gets the number of that entry, and no other entry.
    /// @param floor numbers up to it were given although nothing could be kept
    void append(std::vector<Event>& events, std::uint64_t floor = 0);
    /// The plug-ins have taken for told what this object has kept so far.
    void settle();
    /// The number that was given last; 0 when none was.
    std::uint64_t last();

    std::vector<HistoryEntry> read(const HistoryQuery& query, std::size_t most);
    /// What was not shown to a user.
    struct Unseen {
        std::vector<HistoryEntry> entries;  ///< the last of them, the oldest first
        std::uint64_t left = 0;             ///< how many came before these
    };
    Unseen unseen(uid_t user, std::size_t most);
    /// The user has been shown everything up to this number; never less than before.
    void shown(uid_t user, std::uint64_t number);

    HistoryLimits limits();
    void setLimits(const HistoryLimits& limits);
    /// Whole path of the file.
    std::string file() const { return place_.file(); }

private:
    struct Opened;
    using Numbers = std::vector<std::uint64_t>;

    template <class Work>
    auto attempt(Work work);
    void open();
    void openAlone(std::uint64_t last = 0);
    void recover();
    std::uint64_t lastOfDamaged() const;
    Numbers appendOnce(const std::vector<Event>& events, std::uint64_t floor);
    std::int64_t beginRun();
    void mend();
    void trimSometimes(std::size_t added);

    HistoryPlace place_;
    const Tell tell_;
    std::mutex guard_;  // guards everything below
    std::unique_ptr<Opened> opened_;
    FileIdentity identity_;
    bool damaged_ = false;          // as was found at a moment when that could not be mended
    std::int64_t run_ = 0;          // 0: nothing was kept in this file so far
    std::uint64_t kept_ = 0;        // the last number that this object has given
    bool settled_ = true;           // no alert was kept since the plug-ins took the last one for told
    std::set<std::string> toldOf_;  // the nodes that this object has kept alerts of
    std::size_t untrimmed_ = 0;     // entries that were added since the last trim
};

/// Reads a history and changes nothing. Throws HistoryError. One thread at a time.
class HistoryReader {
public:
    explicit HistoryReader(const HistoryPlace& place);
    ~HistoryReader();

    std::vector<HistoryEntry> read(const HistoryQuery& query, std::size_t most);
    Entries::Tail lastOf(const HistoryQuery& query, std::size_t most);

private:
    std::unique_ptr<Database> database_;
    std::unique_ptr<Entries> entries_;
};

}  // namespace cvagent
