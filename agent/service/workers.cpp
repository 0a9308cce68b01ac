#include "agent/service/workers.h"

#include <system_error>
#include <utility>

namespace cvagent::service {

Workers::~Workers() {
    end();
}

void Workers::end() {
    stop();
    for (std::thread& thread : threads_) {
        if (thread.joinable()) {
            thread.join();
        }
    }
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
    try {
        threads_.emplace_back([this] { run(); });
    } catch (const std::system_error&) {
    }
}

void Workers::run() {
    std::unique_lock lock(guard_);
    while (true) {
        changed_.wait(lock, [this] { return stopped_ || waiting_.size() > 0; });
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
