#pragma once

#include <chrono>
#include <condition_variable>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <utility>

#include "plugins/hardware/patience.h"

namespace hardware {

/// Answers of devices, kept for a while. A device is asked at most once in that time; one that does not
/// answer soon is left alone for as long, and its answer counts when it comes. Any thread.
template <class Answer>
class Answers {
public:
    struct Times {
        std::chrono::milliseconds patience;
        std::chrono::milliseconds kept;
    };
    explicit Answers(Times times) : times_(times), patience_(times.patience) {}

    /// @param question owns all that it uses: it may return long after its caller has gone
    /// @return nothing when the device has not answered
    std::optional<Answer> of(const std::string& device, std::function<Answer()> question) {
        std::unique_lock lock(state_->guard);
        if (isDue(device)) {
            lock.unlock();
            const bool answered =
                patience_.run(device, [state = state_, device, question = std::move(question)] {
                    Answer answer = question();
                    const std::lock_guard inner(state->guard);
                    state->known[device] = {std::move(answer), Clock::now()};
                });
            lock.lock();
            Known& known = state_->known[device];
            known = {std::move(known.answer), Clock::now(), !answered};
            state_->answered.notify_all();
        } else {
            state_->answered.wait_for(lock, times_.patience, [&] {
                const Known& known = state_->known[device];
                return (known.answer && !known.isOld) || !known.beingAsked;
            });
        }
        const Known& known = state_->known[device];
        return known.isOld ? std::nullopt : known.answer;
    }
    /// What it answered last, however long ago.
    std::optional<Answer> lastOf(const std::string& device) const {
        const std::lock_guard lock(state_->guard);
        return state_->known[device].answer;
    }

private:
    using Clock = std::chrono::steady_clock;
    static constexpr std::size_t kMost = 1000;
    struct Known {
        std::optional<Answer> answer;
        std::optional<Clock::time_point> asOf;
        bool isOld = false;  ///< it has not answered since
        bool beingAsked = false;
    };
    struct State {
        std::mutex guard;
        std::condition_variable answered;
        std::map<std::string, Known> known;  // guarded
    };

    /// Whether it is time to ask; who is told so does it. Others make do with what is known, and wait for the
    /// first answer. The guard is held.
    bool isDue(const std::string& device) {
        const auto isOver = [this](const Known& known) {
            return !known.asOf || Clock::now() - *known.asOf >= times_.kept;
        };
        if (state_->known.size() >= kMost) {  // devices come and go
            std::erase_if(state_->known, [&](const auto& entry) { return isOver(entry.second); });
        }
        Known& known = state_->known[device];
        const bool due = isOver(known);
        if (due) {
            known.asOf = Clock::now();
            known.beingAsked = true;
        }
        return due;
    }

    const Times times_;
    const std::shared_ptr<State> state_ = std::make_shared<State>();
    Patience patience_;
};

}  // namespace hardware
