#include "agent/history/entries.h"

#include <algorithm>
#include <array>

namespace cvagent {

namespace {

constexpr std::size_t kLongestText = std::size_t{64} << 10;

constexpr const char* kLast = "SELECT seq FROM sqlite_sequence WHERE name = 'entries'";
constexpr const char* kHas = "SELECT 1 FROM entries WHERE number = :number";
constexpr const char* kAdd =
    "INSERT INTO entries (number, run, kind, time, path, message, node, class, property, name, before, "
    "after, "
    "caller, wanted, verdict, first_code, second_code, event_code, plan) VALUES (:number, :run, :kind, "
    ":time, "
    ":path, "
    ":message, :node, :class, :property, :name, :before, :after, :caller, :wanted, :verdict, :first, "
    ":second, "
    ":event, :plan)";
constexpr const char* kLastAlert =
    "SELECT number, message, first_code, second_code, event_code, number > "
    "ifnull((SELECT value FROM facts WHERE name = 'settled'), 0) "
    "FROM entries WHERE kind = 'alert' AND path = :path ORDER BY number DESC LIMIT 1";

constexpr const char* kCondition =
    " FROM entries JOIN runs USING (run) WHERE number > :after AND number <= :upTo AND time >= :since "
    "AND time <= :until AND (:kinds = '' OR instr(:kinds, ' ' || kind || ' ') > 0) AND (:node = '' OR "
    "path = :node OR substr(path, -length(:node) - 1) IN ('/' || :node, ':' || :node)) ";
// In the order of Column.
constexpr const char* kColumns =
    "SELECT number, kind, time, path, message, node, class, property, name, before, after, caller, wanted, "
    "verdict, first_code, second_code, event_code, plan, boot";
// The form before had no plans; it is read as it is until somebody writes.
constexpr const char* kHasPlans = "SELECT count(*) FROM pragma_table_info('entries') WHERE name = 'plan'";
constexpr const char* kColumnsBefore =
    "SELECT number, kind, time, path, message, node, class, property, name, before, after, caller, wanted, "
    "verdict, first_code, second_code, event_code, '', boot";
constexpr const char* kNothing = "SELECT 1";
constexpr const char* kInOrder = "ORDER BY number LIMIT :most";
constexpr const char* kCount = "SELECT count(*)";
constexpr const char* kPlace = "SELECT number - 1";
constexpr const char* kFromTheEnd = "ORDER BY number DESC LIMIT 1 OFFSET :most";

/// A statement about the entries of a query.
Statement ofQuery(const Database& database, const char* what, const char* order = "") {
    return {database.handle(), (what + std::string(kCondition) + order).c_str()};
}

enum Column : int {
    number,
    kind,
    when,
    path,
    message,
    node,
    nodeClass,
    property,
    name,
    before,
    after,
    caller,
    wanted,
    verdict,
    firstCode,
    secondCode,
    eventCode,
    plan,
    boot,
};

constexpr std::array kKinds = {Event::Kind::published, Event::Kind::withdrawn, Event::Kind::alert,
                               Event::Kind::written, Event::Kind::changed};
static_assert(kKinds.size() == kEventKinds);

Event::Kind kindNamed(const std::string& text) {
    const auto* const found =
        std::ranges::find_if(kKinds, [&text](Event::Kind kind) { return text == eventName(kind); });
    return found != kKinds.end() ? *found : Event::Kind::changed;
}

/// A text as it is kept; never cut within a character.
std::string kept(const std::string& text) {
    if (text.size() <= kLongestText) {
        return text;
    }
    std::size_t length = kLongestText;
    while (length > 0 && (static_cast<unsigned char>(text[length]) & 0xC0U) == 0x80U) {
        --length;
    }
    return text.substr(0, length) + "... (" + std::to_string(text.size()) + " bytes)";
}

std::string listOf(const std::vector<Event::Kind>& kinds) {
    std::string list;
    for (const Event::Kind kind : kinds) {
        list += (list.empty() ? " " : "") + std::string(eventName(kind)) + " ";
    }
    return list;
}

/// The texts of a query; they stay until its end.
struct Texts {
    std::string node;
    std::string kinds;
};

void ask(Statement& statement, const HistoryQuery& query, const Texts& texts) {
    statement.set(":after", static_cast<std::int64_t>(query.after))
        .set(":upTo", static_cast<std::int64_t>(query.upTo))
        .set(":since", static_cast<std::int64_t>(query.since))
        .set(":until", static_cast<std::int64_t>(query.until))
        .set(":kinds", texts.kinds)
        .set(":node", texts.node);
}

unsigned int plain(const Statement& row, Column column) {
    return static_cast<unsigned int>(row.number(column));
}

HistoryEntry entryOf(const Statement& row) {
    HistoryEntry entry;
    Event& event = entry.event;
    event.number = static_cast<std::uint64_t>(row.number(Column::number));
    event.kind = kindNamed(row.text(Column::kind));
    event.time = static_cast<std::time_t>(row.number(Column::when));
    event.path = row.text(Column::path);
    event.message = row.text(Column::message);
    event.nodeId = plain(row, Column::node);
    event.nodeClass = row.text(Column::nodeClass);
    event.property = plain(row, Column::property);
    event.propertyName = row.text(Column::name);
    event.before = row.text(Column::before);
    event.after = row.text(Column::after);
    event.caller = row.text(Column::caller);
    event.wanted = row.text(Column::wanted);
    event.verdict = row.text(Column::verdict);
    event.plan = row.text(Column::plan);
    event.firstCode = plain(row, Column::firstCode);
    event.secondCode = plain(row, Column::secondCode);
    event.eventCode = plain(row, Column::eventCode);
    entry.boot = row.text(Column::boot);
    return entry;
}

}  // namespace

Entries::Entries(const Database& database)
    : last_(database.handle(), kLast),
      has_(database.handle(), kHas),
      add_(database.handle(), database.number(kHasPlans) != 0 ? kAdd : kNothing),
      alert_(database.handle(), kLastAlert),
      read_(ofQuery(database, database.number(kHasPlans) != 0 ? kColumns : kColumnsBefore, kInOrder)),
      count_(ofQuery(database, kCount)),
      place_(ofQuery(database, kPlace, kFromTheEnd)) {}

std::uint64_t Entries::last() {
    const std::int64_t number = last_.next() ? last_.number(0) : 0;
    last_.reset();
    return static_cast<std::uint64_t>(number);
}

bool Entries::has(std::uint64_t number) {
    const bool found = has_.set(":number", static_cast<std::int64_t>(number)).next();
    has_.reset();
    return found;
}

void Entries::add(std::uint64_t number, std::int64_t run, const Event& event) {
    const std::string kind = eventName(event.kind);
    const std::array texts = {kept(event.path),         kept(event.message), kept(event.nodeClass),
                              kept(event.propertyName), kept(event.before),  kept(event.after),
                              kept(event.caller),       kept(event.wanted),  kept(event.verdict),
                              kept(event.plan)};
    constexpr std::array kNames = {":path",  ":message", ":class",  ":name",    ":before",
                                   ":after", ":caller",  ":wanted", ":verdict", ":plan"};
    static_assert(kNames.size() == std::tuple_size_v<decltype(texts)>);
    for (std::size_t i = 0; i < texts.size(); ++i) {
        add_.set(kNames.at(i), texts.at(i));
    }
    add_.set(":number", static_cast<std::int64_t>(number))
        .set(":run", run)
        .set(":kind", kind)
        .set(":time", static_cast<std::int64_t>(event.time))
        .set(":node", static_cast<std::int64_t>(event.nodeId))
        .set(":property", static_cast<std::int64_t>(event.property))
        .set(":first", static_cast<std::int64_t>(event.firstCode))
        .set(":second", static_cast<std::int64_t>(event.secondCode))
        .set(":event", static_cast<std::int64_t>(event.eventCode))
        .run();
}

std::uint64_t Entries::doubtful(const Event& alert) {
    const std::string of = kept(alert.path);
    if (!alert_.set(":path", of).next()) {
        return 0;
    }
    const bool same = alert_.text(1) == kept(alert.message) && alert_.number(2) == alert.firstCode &&
                      alert_.number(3) == alert.secondCode && alert_.number(4) == alert.eventCode;
    const std::int64_t number = same && alert_.number(5) != 0 ? alert_.number(0) : 0;
    alert_.reset();
    return static_cast<std::uint64_t>(number);
}

std::vector<HistoryEntry> Entries::read(const HistoryQuery& query, std::size_t most) {
    const Texts texts{query.node, listOf(query.kinds)};
    ask(read_, query, texts);
    read_.set(":most", static_cast<std::int64_t>(most));
    std::vector<HistoryEntry> found;
    while (read_.next()) {
        found.push_back(entryOf(read_));
    }
    return found;
}

Entries::Tail Entries::lastOf(const HistoryQuery& query, std::size_t most) {
    const Texts texts{query.node, listOf(query.kinds)};
    Tail tail{0, query.after};
    ask(count_, query, texts);
    if (count_.next()) {
        tail.count = static_cast<std::uint64_t>(count_.number(0));
    }
    count_.reset();
    if (most == 0 || tail.count <= most) {
        tail.after = most == 0 ? HistoryQuery::kLast : query.after;
        return tail;
    }
    ask(place_, query, texts);
    place_.set(":most", static_cast<std::int64_t>(most - 1));
    if (place_.next()) {
        tail.after = static_cast<std::uint64_t>(place_.number(0));
    }
    place_.reset();
    return tail;
}

}  // namespace cvagent
