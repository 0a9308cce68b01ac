#include "agent/service/workers.h"

#include <algorithm>
#include <system_error>
#include <utility>

namespace cvagent::service {

Workers::~Workers() {
    end();
}

void Workers::end() {
    stop();
    std::vector<std::thread> threads;
    {
        const std::lock_guard lock(guard_);
        threads.swap(threads_);
        joinEnded();
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
}

std::size_t Workers::threads() const {
    const std::lock_guard lock(guard_);
    return threads_.size();
}

void Workers::stop() {
    TurnQueue<Job> dropped;  // they go outside of the lock
    {
        const std::lock_guard lock(guard_);
        stopped_ = true;
        std::swap(dropped, waiting_);
    }
    changed_.notify_all();
}

bool Workers::isBusy() const {
    const std::lock_guard lock(guard_);
    return waiting_.size() > 0 || atWork_ > 0;
}

bool Workers::submit(std::uint32_t user, Job job) {
    const std::lock_guard lock(guard_);
    if (stopped_) {
        return false;
    }
    if (atWork_ + waiting_.size() >= threads_.size() && threads_.size() < limits_.threads) {
        startThread();
    }
    if (threads_.empty() || !waiting_.add(user, std::move(job), limits_.waitingOfOne, limits_.waiting)) {
        return false;
    }
    changed_.notify_one();
    return true;
}

/// Where the system gives no more, those that are there do it.
void Workers::startThread() {
    joinEnded();
    try {
        threads_.emplace_back([this] { run(); });
    } catch (const std::system_error&) {
    }
}

/// Of a thread that had nothing to do, on that thread; guard_ is held, as in the next one.
void Workers::retire() {
    const auto own = std::ranges::find(threads_, std::this_thread::get_id(), &std::thread::get_id);
    ended_.push_back(std::move(*own));
    threads_.erase(own);
}

/// They have let the guard go.
void Workers::joinEnded() {
    for (std::thread& thread : ended_) {
        thread.join();
    }
    ended_.clear();
}

void Workers::run() {
    std::unique_lock lock(guard_);
    while (true) {
        if (!changed_.wait_for(lock, limits_.idle, [this] { return stopped_ || waiting_.size() > 0; })) {
            retire();
            return;
        }
        if (stopped_) {
            return;
        }
        Job job = waiting_.takeNext();
        ++atWork_;
        lock.unlock();
        job();
        job = nullptr;
        lock.lock();
        --atWork_;
    }
}

}  // namespace cvagent::service
