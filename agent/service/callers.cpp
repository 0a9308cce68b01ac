#include "agent/service/callers.h"

#include <algorithm>
#include <chrono>
#include <optional>
#include <utility>

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"

namespace cvagent::service {

namespace {

constexpr std::size_t kMostKnown = 512;
constexpr std::size_t kMostWaiting = 64;  // calls of one connection
constexpr std::chrono::seconds kPatience{10};

std::optional<Caller> readCaller(const std::string& name, const bus::Message& answer) {
    if (answer.isError() || answer.sender() != "org.freedesktop.DBus") {
        return std::nullopt;
    }
    Caller caller{name, 0, {}};
    bool userTold = false;
    bus::Reader reader(answer);
    reader.array("{sv}", [&] {
        reader.entry("sv", [&] {
            const std::string key = reader.text();
            if (key == "UnixUserID") {
                reader.variant([&](const std::string&) { caller.user = reader.number(); });
                userTold = true;
            } else if (key == "UnixGroupIDs") {
                reader.variant([&](const std::string&) { caller.groups = reader.numbers(); });
            } else {
                reader.skip();
            }
        });
    });
    return userTold ? std::optional(caller) : std::nullopt;
}

}  // namespace

bool Caller::isIn(std::uint32_t group) const {
    return std::ranges::find(groups, group) != groups.end();
}

bool Callers::find(const std::string& name, Found found) {
    if (const auto known = known_.find(name); known != known_.end()) {
        found(&known->second);
        return true;
    }
    const auto asked = asked_.find(name);
    if (asked == asked_.end()) {
        ask(name);
    } else if (asked->second.waiting.size() >= kMostWaiting) {
        return false;
    }
    asked_[name].waiting.push_back(std::move(found));
    return true;
}

void Callers::ask(const std::string& name) {
    const bus::Message call = connection_.newCall({"org.freedesktop.DBus", "/org/freedesktop/DBus",
                                                   "org.freedesktop.DBus", "GetConnectionCredentials"});
    bus::Writer(call).put(name);
    asked_[name].slot = connection_.askLater(
        call, kPatience, [this, name](const bus::Message& answer) { answered(name, answer); });
}

void Callers::answered(const std::string& name, const bus::Message& answer) {
    const auto asked = asked_.extract(name);
    const std::optional<Caller> caller = readCaller(name, answer);
    if (caller) {
        remember(*caller);
    }
    for (const Found& found : asked.mapped().waiting) {
        found(caller ? &*caller : nullptr);
    }
}

void Callers::remember(const Caller& caller) {
    if (!known_.emplace(caller.name, caller).second) {
        return;
    }
    oldestFirst_.push_back(caller.name);
    if (oldestFirst_.size() > kMostKnown) {
        known_.erase(oldestFirst_.front());
        oldestFirst_.pop_front();
    }
}

}  // namespace cvagent::service
