#include "agent/core/facts.h"

#include <limits>

namespace cvagent {

bool Facts::meet(unsigned int node) {
    const std::lock_guard lock(guard_);
    return met_.emplace(node, Clock::now()).second;
}

void Facts::forget(unsigned int node) {
    const std::lock_guard lock(guard_);
    met_.erase(node);
    facts_.erase(facts_.lower_bound({node, 0}),
                 facts_.upper_bound({node, std::numeric_limits<unsigned int>::max()}));
}

Reading Facts::ask(const IC::MutableNode& node, unsigned int id, Source source) {
    const auto begun = Clock::now();
    Reading reading = readProperty(node, id, source);
    judge(node, reading, begun);
    return reading;
}

void Facts::judge(const IC::MutableNode& node, Reading& reading, Clock::time_point begun) {
    if (reading.timedOut) {
        attachLast(node, reading, begun);
        return;
    }
    if (reading.failed()) {
        return;
    }
    reading.asOf = begun;
    const std::lock_guard lock(guard_);
    if (!met_.contains(node.getNodeId())) {
        return;  // withdrawn meanwhile
    }
    Fact& fact = facts_[{node.getNodeId(), reading.id}];
    if (fact.asOf <= begun) {
        fact = {reading.value, begun, false};
    }
}

Reading Facts::overdue(const IC::MutableNode& node, unsigned int id, Clock::time_point begun) {
    Reading reading{id, findProperty(node.nodeType(), id), {}, "no answer in time"};
    reading.timedOut = true;
    attachLast(node, reading, begun);
    return reading;
}

void Facts::attachLast(const IC::MutableNode& node, Reading& reading, Clock::time_point begun) {
    const Reading last = known(node, reading.id);
    if (last.failed() || !last.asOf) {
        return;
    }
    reading.value = last.value;
    reading.asOf = last.asOf;
    reading.stale = true;
    const std::lock_guard lock(guard_);
    if (!met_.contains(node.getNodeId())) {
        return;
    }
    Fact& fact =
        facts_.try_emplace({node.getNodeId(), reading.id}, Fact{last.value, *last.asOf}).first->second;
    fact.stale = fact.stale || fact.asOf <= begun;
}

std::optional<IC::PropertyValue> Facts::note(unsigned int node, unsigned int id,
                                             const IC::PropertyValue& value) {
    const std::lock_guard lock(guard_);
    if (!met_.contains(node)) {
        return std::nullopt;
    }
    const auto [fact, isNew] = facts_.try_emplace({node, id});
    auto before = isNew ? std::nullopt : std::optional(fact->second.value);
    fact->second = {value, Clock::now(), false};
    return before;
}

Reading Facts::known(const IC::MutableNode& node, unsigned int id) const {
    Reading reading{id, findProperty(node.nodeType(), id), {}, {}};
    {
        const std::lock_guard lock(guard_);
        if (const auto found = facts_.find({node.getNodeId(), id}); found != facts_.end()) {
            reading.value = found->second.value;
            reading.asOf = found->second.asOf;
            reading.stale = found->second.stale;
            return reading;
        }
        if (const auto met = met_.find(node.getNodeId()); met != met_.end()) {
            reading.asOf = met->second;
        }
    }
    const Properties stored = storedProperties(node);
    const auto found = stored.find(id);
    if (found == stored.end()) {
        return {id, reading.row, {}, "not asked yet", true};
    }
    reading.value = found->second;
    return reading;
}

}  // namespace cvagent
