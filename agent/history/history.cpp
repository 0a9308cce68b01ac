#include "agent/history/history.h"

#include <algorithm>
#include <fstream>
#include <utility>

#include "agent/core/text.h"
#include "agent/history/schema.h"

namespace cvagent {

namespace {

constexpr std::size_t kBetweenTrims = 256;  // entries

std::string bootId() {
    std::ifstream file("/proc/sys/kernel/random/boot_id");
    std::string id;
    std::getline(file, id);
    return id;
}

/// What every connection wants: a commit is on the disk when it returns, and little memory is used.
void prepareForWriting(const Database& database) {
    database.execute("PRAGMA auto_vacuum = INCREMENTAL");  // counts before the first table
    database.execute("PRAGMA journal_mode = WAL");
    database.execute("PRAGMA synchronous = FULL");
    database.execute("PRAGMA journal_size_limit = 1048576");
    database.execute("PRAGMA cache_size = -128");
    database.execute("PRAGMA temp_store = MEMORY");
    database.execute("PRAGMA foreign_keys = OFF");
}

/// The number to go on from where nobody can tell the last one: no host has had an event each second.
std::uint64_t beyondAll() {
    return static_cast<std::uint64_t>(std::max<std::time_t>(std::time(nullptr), 0));
}

}  // namespace

struct History::Opened {
    Opened(const std::string& file, std::uint64_t last) : database(file, Database::Access::write) {
        prepareForWriting(database);
        migrate(database, last);
        entries.emplace(database);
    }

    Database database;
    std::optional<Entries> entries;
};

History::History(const HistoryPlace& place, Tell tell) : place_(place), tell_(std::move(tell)) {
    open();
}

History::~History() = default;

/// Under the lock (alone).
/// @param last the number to go on from in a file that has nothing in it
void History::openAlone(std::uint64_t last) {
    const bool hadOne = hasTraces(place_);
    prepareHistoryFile(place_);
    if (!hasSchema(Database(place_.file(), Database::Access::read)) && last == 0 && hadOne) {
        last = beyondAll();
    }
    opened_ = std::make_unique<Opened>(place_.file(), std::max(last, kept_));
    identity_ = identityOf(place_.file());
    run_ = 0;
}

void History::open() {
    place_ = reachHistoryPlace(place_);  // it may have been removed
    const HistoryLock lock(place_, HistoryLock::Kind::alone);
    try {
        openAlone();
    } catch (const HistoryError& error) {
        if (error.kind() != HistoryError::damaged) {
            throw;
        }
        recover();
    }
}

/// The number to go on from, though part of the file cannot be read.
std::uint64_t History::lastOfDamaged() const {
    for (const char* question :
         {"SELECT seq FROM sqlite_sequence WHERE name = 'entries'", "SELECT max(number) FROM entries"}) {
        try {
            const std::int64_t last = Database(place_.file(), Database::Access::read).number(question);
            if (last > 0) {
                return std::max(static_cast<std::uint64_t>(last), kept_);
            }
        } catch (const HistoryError&) {
            // That part of it is damaged, too.
        }
    }
    return std::max(beyondAll(), kept_);
}

/// Under the lock (alone).
void History::recover() {
    opened_.reset();
    const std::uint64_t last = lastOfDamaged();
    const std::string aside = moveAside(place_);
    damaged_ = false;
    openAlone(last);
    tell_("the history was damaged; it is " + inQuotes(aside) + " now, and a new one is begun");
}

/// Works on the file under the name, whoever has moved or removed the one before, and once more when it turns
/// out to be damaged. With the guard.
template <class Work>
auto History::attempt(Work work) {
    const std::lock_guard guard(guard_);
    try {
        if (damaged_) {
            mend();
        } else if (!opened_ || identityOf(place_.file()) != identity_) {
            opened_.reset();
            open();
        }
        const HistoryLock lock(place_, HistoryLock::Kind::shared);
        return work();
    } catch (const HistoryError& error) {
        if (error.kind() != HistoryError::damaged) {
            throw;
        }
    }
    mend();
    const HistoryLock lock(place_, HistoryLock::Kind::shared);
    return work();
}

/// Another process may have been faster.
void History::mend() {
    const HistoryLock lock(place_, HistoryLock::Kind::alone);
    if (identityOf(place_.file()) == identity_) {
        recover();
    } else {
        openAlone();
    }
    damaged_ = false;
}

std::int64_t History::beginRun() {
    Statement begin(opened_->database.handle(), "INSERT INTO runs (boot, began) VALUES (:boot, :began)");
    const std::string boot = bootId();
    begin.set(":boot", boot).set(":began", static_cast<std::int64_t>(std::time(nullptr))).run();
    return opened_->database.number("SELECT last_insert_rowid()");
}

History::Numbers History::appendOnce(const std::vector<Event>& events, std::uint64_t floor) {
    Entries& entries = *opened_->entries;
    Transaction transaction(opened_->database);
    const std::int64_t run = run_ != 0 ? run_ : beginRun();
    std::uint64_t last = std::max({entries.last(), kept_, floor});
    Numbers numbers;
    std::set<std::string> toldOf;
    bool anyAlert = false;
    for (const Event& event : events) {
        const bool isAlert = event.kind == Event::Kind::alert;
        anyAlert = anyAlert || isAlert;
        std::uint64_t number = 0;
        if (isAlert && !toldOf_.contains(event.path) && toldOf.insert(event.path).second) {
            number = entries.doubtful(event);
        }
        if (number == 0) {
            number = event.number != 0 && !entries.has(event.number) ? event.number : ++last;
            entries.add(number, run, event);
        }
        numbers.push_back(number);
    }
    transaction.commit();
    run_ = run;
    kept_ = last;
    settled_ = settled_ && !anyAlert;
    toldOf_.merge(toldOf);
    return numbers;
}

void History::append(std::vector<Event>& events, std::uint64_t floor) {
    if (events.empty()) {
        return;
    }
    const Numbers numbers = attempt([&] {
        Numbers given = appendOnce(events, floor);
        trimSometimes(events.size());
        return given;
    });
    for (std::size_t i = 0; i < numbers.size(); ++i) {
        events[i].number = numbers[i];
    }
}

/// What was kept is kept, whatever becomes of this; what is left over is for the next time.
void History::trimSometimes(std::size_t added) {
    untrimmed_ += added;
    if (untrimmed_ != added && untrimmed_ < kBetweenTrims) {
        return;
    }
    untrimmed_ = 1;
    try {
        trim(opened_->database, limitsOf(opened_->database), std::time(nullptr));
    } catch (const HistoryError& error) {
        damaged_ = error.kind() == HistoryError::damaged;
    }
}

/// What earlier processes left in doubt is settled with it: a plug-in tells it again before anything else.
void History::settle() {
    {
        const std::lock_guard guard(guard_);
        if (settled_) {
            return;
        }
    }
    attempt([this] {
        setFactOf(opened_->database, "settled", static_cast<std::int64_t>(kept_));
        settled_ = true;
    });
}

std::uint64_t History::last() {
    return attempt([this] { return std::max(opened_->entries->last(), kept_); });
}

std::vector<HistoryEntry> History::read(const HistoryQuery& query, std::size_t most) {
    return attempt([&] { return opened_->entries->read(query, most); });
}

History::Unseen History::unseen(uid_t user, std::size_t most) {
    return attempt([&] {
        Statement mark(opened_->database.handle(), "SELECT number FROM marks WHERE uid = :uid");
        HistoryQuery query;
        if (mark.set(":uid", static_cast<std::int64_t>(user)).next()) {
            query.after = static_cast<std::uint64_t>(mark.number(0));
            mark.reset();
        }
        const Entries::Tail tail = opened_->entries->lastOf(query, most);
        query.after = tail.after;
        Unseen found{opened_->entries->read(query, most), 0};
        found.left = tail.count - std::min<std::uint64_t>(tail.count, found.entries.size());
        return found;
    });
}

void History::shown(uid_t user, std::uint64_t number) {
    attempt([&] {
        Statement mark(opened_->database.handle(),
                       "INSERT INTO marks (uid, number) VALUES (:uid, :number) "
                       "ON CONFLICT (uid) DO UPDATE SET number = max(number, :number)");
        mark.set(":uid", static_cast<std::int64_t>(user))
            .set(":number", static_cast<std::int64_t>(std::min(number, opened_->entries->last())))
            .run();
    });
}

HistoryLimits History::limits() {
    return attempt([this] { return limitsOf(opened_->database); });
}

void History::setLimits(const HistoryLimits& limits) {
    attempt([&] {
        setLimitsOf(opened_->database, limits);
        trim(opened_->database, limits, std::time(nullptr));
    });
}

}  // namespace cvagent
