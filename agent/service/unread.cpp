#include "agent/service/unread.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <limits>

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"
#include "agent/service/log.h"

namespace cvagent::service {

namespace {

constexpr unsigned int kWeightPerUnreadLook = 64;     // in small answers
constexpr unsigned int kWeightOfLarge = 16;           // it can be of some megabytes
constexpr unsigned int kRefusalsBeforeSilence = 100;  // they are not read either
constexpr std::size_t kMostReaders = 2048;            // as many as a system's bus has connections
constexpr std::uint64_t kNoLimit = std::numeric_limits<std::uint64_t>::max();
constexpr std::uint32_t kNobody = 0xFFFFFFFF;  // no user's number: who has asked for nothing large
constexpr std::chrono::seconds kNextUnreadLook{1};
constexpr std::chrono::seconds kFiguresPatience{10};

/// Whether an answer means that the bus never tells.
bool isRefusal(const bus::Message& answer) {
    constexpr std::array kNames = {bus::kUnknownMethod, bus::kUnknownInterface, bus::kUnknownObject,
                                   bus::kAccessDenied};
    return answer.isError() && std::ranges::find(kNames, answer.error().name()) != std::ranges::end(kNames);
}

/// A figure of the bus about a connection.
std::optional<std::uint64_t> figureIn(const bus::Message& answer, const std::string& name) {
    std::optional<std::uint64_t> figure;
    if (answer.isError()) {
        return figure;
    }
    bus::Reader reader(answer);
    reader.array("{sv}", [&] {
        reader.entry("sv", [&] {
            if (reader.text() == name) {
                reader.variant([&](const std::string& /*type*/) { figure = reader.number(); });
            } else {
                reader.skip();
            }
        });
    });
    return figure;
}

}  // namespace

Unread::Limits Unread::standardLimits() {
    constexpr std::uint64_t kKibi = 1024;
    constexpr std::uint64_t kMebi = kKibi * kKibi;
    return {{{64 * kMebi, 0, kMebi}, {32 * kMebi, 64 * kKibi, 16 * kMebi}, {8 * kMebi, kMebi, kNoLimit}},
            96 * kMebi};
}

Unread::Answer Unread::answerFor(const std::string& caller) {
    return answer(caller, std::nullopt, 1);
}

Unread::Answer Unread::largeAnswerFor(const Caller& caller) {
    return answer(caller.name, caller.user, kWeightOfLarge);
}

Unread::Answer Unread::answer(const std::string& caller, const User& user, unsigned int weight) {
    if (untold_) {
        return Answer::whole;
    }
    if (const auto silent = silent_.find(caller); silent != silent_.end()) {
        const bool refused = silent->second > 0;
        silent->second -= refused ? 1 : 0;
        return refused ? Answer::refusal : Answer::none;
    }
    if (readers_.size() < kMostReaders || readers_.contains(caller)) {
        User& known = readers_[caller];
        known = user ? user : known;
    }
    const bool isRefused = user && silentUsers_.contains(*user);
    weigh(isRefused ? 1 : weight);
    return isRefused ? Answer::refusal : Answer::whole;
}

bool Unread::isKnown() const {
    return untold_ || weight_ < kWeightPerUnreadLook;
}

void Unread::weigh(unsigned int weight) {
    weight_ += weight;
    if (weight_ >= kWeightPerUnreadLook && !untold_) {
        look();
    }
}

void Unread::look() {
    if (questions_ == 0) {
        weight_ = 0;
        slots_.clear();
        ask(connection_.uniqueName(), "IncomingBytes", [this](auto bytes) { takeOwn(bytes); });
    }
}

void Unread::ask(const std::string& name, const std::string& figure, const Told& told) {
    const bus::Message call = connection_.newCall({"org.freedesktop.DBus", "/org/freedesktop/DBus",
                                                   "org.freedesktop.DBus.Debug.Stats", "GetConnectionStats"});
    bus::Writer(call).put(name);
    ++questions_;
    slots_.push_back(
        connection_.askLater(call, kFiguresPatience, [this, figure, told](const bus::Message& answer) {
            --questions_;
            const auto found = figureIn(answer, figure);
            untold_ = untold_ || isRefusal(answer) || (!answer.isError() && !found);
            told(found);
            weigh(0);  // what was sent meanwhile
        }));
}

void Unread::takeOwn(std::optional<std::uint64_t> bytes) {
    nextLook_.reset();
    const auto limit =
        std::ranges::find_if(limits_.rows, [bytes](const Limit& each) { return bytes >= each.ofAll; });
    if (untold_ || (bytes && limit == limits_.rows.end())) {
        readers_.clear();
        silent_.clear();
        silentUsers_.clear();
        return;
    }
    nextLook_ = loop_.after(kNextUnreadLook, [this] { look(); });
    if (!bytes) {
        return;  // it was not told in time
    }
    if (*bytes >= limits_.full && full_) {
        std::exchange(full_, nullptr)();
    }
    for (const auto& [name, refusals] : silent_) {
        readers_.try_emplace(name);
    }
    unreadOf_.clear();
    for (const auto& [name, user] : std::exchange(readers_, {})) {
        ask(name, "OutgoingBytes", [this, reader = name, whose = user, limit](auto unread) {
            judge(reader, whose, unread.value_or(0), *limit);
        });
    }
}

void Unread::judge(const std::string& name, const User& user, std::uint64_t unread, const Limit& limit) {
    if (unread > 0) {
        readers_.try_emplace(name, user);
        unreadOf_[user.value_or(kNobody)] += unread;
    }
    if (unread <= limit.ofOne) {
        silent_.erase(name);
    } else if (silent_.emplace(name, kRefusalsBeforeSilence).second && silent_.size() == 1) {
        log(Priority::warning, name + " does not read what it is sent and gets no answers until it does");
    }
    if (questions_ == 0) {
        std::set<std::uint32_t> users;
        for (const auto& [whose, bytes] : unreadOf_) {
            if (whose != kNobody && bytes > limit.ofUser) {
                users.insert(whose);
            }
        }
        silentUsers_ = std::move(users);
    }
}

}  // namespace cvagent::service
