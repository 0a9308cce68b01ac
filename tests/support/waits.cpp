#include "tests/support/waits.h"

#include <atomic>
#include <chrono>
#include <limits>
#include <utility>

#include "framework/qx/clock.h"

namespace {

std::atomic<Waits*> now{nullptr};
std::atomic<int> inside{0};  // threads that may be using it
constexpr std::size_t kNobody = std::numeric_limits<std::size_t>::max();

}  // namespace

Waits::Waits() : heldFrom_(kNobody) {
    now = this;
    QX::setWaitWitness(witness);
}

Waits::~Waits() {
    QX::setWaitWitness(nullptr);
    now = nullptr;
    letGo();
    while (inside != 0) {
        std::this_thread::yield();
    }
}

void Waits::witness(double seconds) {
    ++inside;
    if (Waits* const waits = now) {
        waits->note(seconds);
    }
    --inside;
}

void Waits::note(double seconds) {
    if (std::this_thread::get_id() == us_) {
        {
            const std::lock_guard lock(guard_);
            ours_.push_back(seconds);
        }
        if (action_) {
            action_(seconds);
        }
        return;
    }
    std::unique_lock lock(guard_);
    others_.push_back(seconds);
    const std::size_t number = others_.size();
    changed_.notify_all();
    changed_.wait(lock, [&] { return number < heldFrom_; });
}

std::vector<double> Waits::ours() const {
    const std::lock_guard lock(guard_);
    return ours_;
}

std::vector<double> Waits::others() const {
    const std::lock_guard lock(guard_);
    return others_;
}

bool Waits::othersBegin(std::size_t count) const {
    std::unique_lock lock(guard_);
    return changed_.wait_for(lock, std::chrono::seconds(20), [&] { return others_.size() >= count; });
}

void Waits::holdFrom(std::size_t number) {
    const std::lock_guard lock(guard_);
    heldFrom_ = number;
}

void Waits::letGo() {
    const std::lock_guard lock(guard_);
    heldFrom_ = kNobody;
    changed_.notify_all();
}

void Waits::whenWeWait(std::function<void(double seconds)> action) {
    action_ = std::move(action);
}
