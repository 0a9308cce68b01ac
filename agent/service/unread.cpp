#include "agent/service/unread.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <iterator>

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"
#include "agent/service/log.h"

namespace cvagent::service {

namespace {

constexpr unsigned int kWeightPerUnreadLook = 64;
constexpr unsigned int kRefusalsBeforeSilence = 100;  // they are not read either
constexpr std::size_t kMostRecentCallers = 512;
constexpr std::chrono::seconds kNextUnreadLook{1};
constexpr std::chrono::seconds kFiguresPatience{10};

struct UnreadLimit {
    std::uint64_t ofAll;  ///< from so many bytes that wait for all readers on,
    std::uint64_t ofOne;  ///< so many at most may wait for one
};
constexpr UnreadLimit kUnreadLimits[] = {{64U << 20U, 0}, {32U << 20U, 64U << 10U}, {8U << 20U, 1U << 20U}};

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

Unread::Answer Unread::answerFor(const std::string& caller, unsigned int weight) {
    if (untold_) {
        return Answer::whole;
    }
    if (const auto silent = silent_.find(caller); silent != silent_.end()) {
        const bool refused = silent->second > 0;
        silent->second -= refused ? 1 : 0;
        return refused ? Answer::refusal : Answer::none;
    }
    if (recent_.size() < kMostRecentCallers) {
        recent_.insert(caller);
    }
    weight_ += weight;
    if (weight_ >= kWeightPerUnreadLook) {
        look();
    }
    return Answer::whole;
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
        }));
}

void Unread::takeOwn(std::optional<std::uint64_t> bytes) {
    nextLook_.reset();
    const auto* const limit =
        std::ranges::find_if(kUnreadLimits, [bytes](const UnreadLimit& each) { return bytes >= each.ofAll; });
    if (untold_ || (bytes && limit == std::end(kUnreadLimits))) {
        recent_.clear();
        silent_.clear();
        return;
    }
    nextLook_ = loop_.after(kNextUnreadLook, [this] { look(); });
    if (!bytes) {
        return;  // it was not told in time
    }
    for (const auto& [name, refusals] : silent_) {
        recent_.insert(name);
    }
    for (const std::string& name : std::exchange(recent_, {})) {
        ask(name, "OutgoingBytes",
            [this, name, most = limit->ofOne](auto unread) { judge(name, unread > most); });
    }
}

void Unread::judge(const std::string& name, bool readsNothing) {
    if (!readsNothing) {
        silent_.erase(name);
    } else if (silent_.emplace(name, kRefusalsBeforeSilence).second && silent_.size() == 1) {
        log(Priority::warning, name + " does not read what it is sent and gets no answers until it does");
    }
}

}  // namespace cvagent::service
