#include "agent/history/limits.h"

namespace cvagent {

namespace {

constexpr std::int64_t kEntriesOfAStep = 500;
constexpr int kStepsOfACall = 16;
// A clock that was not set yet tells no age.
constexpr std::int64_t kClockWasSet = 1577836800;  // 2020

/// Up to the last of the entries that are too old before the first one that is not. The order is that of the
/// numbers, for clocks go back.
std::int64_t lastTooOld(const Database& database, const HistoryLimits& limits, std::time_t now) {
    const std::int64_t oldest = static_cast<std::int64_t>(now) - limits.age.count();
    Statement young(database.handle(),
                    "SELECT number FROM entries WHERE time >= :oldest ORDER BY number LIMIT 1");
    std::int64_t end = INT64_MAX;
    if (young.set(":oldest", oldest).next()) {
        end = young.number(0);
        young.reset();
    }
    Statement old(database.handle(),
                  "SELECT number FROM entries WHERE number < :end AND time < :oldest AND time >= :sane "
                  "ORDER BY number DESC LIMIT 1");
    const bool any = old.set(":end", end).set(":oldest", oldest).set(":sane", kClockWasSet).next();
    const std::int64_t last = any ? old.number(0) : 0;
    old.reset();
    return last;
}

void removeStep(const Database& database, std::int64_t upTo) {
    Transaction transaction(database);
    Statement remove(database.handle(),
                     "DELETE FROM entries WHERE number IN (SELECT number FROM entries WHERE number <= :upTo "
                     "ORDER BY number LIMIT :most)");
    remove.set(":upTo", upTo).set(":most", kEntriesOfAStep).run();
    transaction.commit();
}

bool isTooLarge(const Database& database, const HistoryLimits& limits) {
    const std::int64_t used = database.number("PRAGMA page_count") - database.number("PRAGMA freelist_count");
    const std::int64_t bytes = used * database.number("PRAGMA page_size");
    return bytes > 0 && static_cast<std::uint64_t>(bytes) > limits.bytes;
}

bool hasEntries(const Database& database) {
    return database.number("SELECT EXISTS (SELECT 1 FROM entries)") != 0;
}

std::int64_t valueOf(const Database& database, const char* name, std::int64_t standard) {
    Statement statement(database.handle(), "SELECT value FROM facts WHERE name = :name");
    const std::string wanted = name;
    const std::int64_t value = statement.set(":name", wanted).next() ? statement.number(0) : standard;
    statement.reset();
    return value;
}

}  // namespace

HistoryLimits limitsOf(const Database& database) {
    const HistoryLimits standard;
    return {
        std::chrono::seconds(valueOf(database, "age", standard.age.count())),
        static_cast<std::uint64_t>(valueOf(database, "bytes", static_cast<std::int64_t>(standard.bytes)))};
}

void setFactOf(const Database& database, const std::string& name, std::int64_t value) {
    Statement statement(database.handle(),
                        "INSERT INTO facts (name, value) VALUES (:name, :value) "
                        "ON CONFLICT (name) DO UPDATE SET value = :value");
    statement.set(":name", name).set(":value", value).run();
}

void setLimitsOf(const Database& database, const HistoryLimits& limits) {
    Transaction transaction(database);
    setFactOf(database, "age", limits.age.count());
    setFactOf(database, "bytes", static_cast<std::int64_t>(limits.bytes));
    transaction.commit();
}

void trim(const Database& database, const HistoryLimits& limits, std::time_t now) {
    bool removed = false;
    for (int step = 0; step < kStepsOfACall; ++step) {
        const bool tooLarge = isTooLarge(database, limits) && hasEntries(database);
        const std::int64_t upTo = tooLarge ? INT64_MAX : lastTooOld(database, limits, now);
        if (upTo == 0) {
            break;
        }
        removeStep(database, upTo);
        removed = true;
    }
    if (!removed) {
        return;
    }
    database.execute("DELETE FROM runs WHERE run < (SELECT min(run) FROM entries)");
    database.execute("PRAGMA incremental_vacuum(4096)");
    database.execute("PRAGMA wal_checkpoint(PASSIVE)");
}

}  // namespace cvagent
