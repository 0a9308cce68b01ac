#include "agent/service/workers.h"

#include <system_error>
#include <utility>

namespace cvagent::service {

Workers::~Workers() {
    stop();
    for (std::thread& thread : threads_) {
        thread.join();
    }
}

void Workers::stop() {
    std::map<std::uint32_t, std::deque<Job>> dropped;  // they go outside of the lock
    {
        const std::lock_guard lock(guard_);
        stopped_ = true;
        count_ = 0;
        dropped.swap(waiting_);
    }
    changed_.notify_all();
}

bool Workers::isBusy() const {
    const std::lock_guard lock(guard_);
    return count_ > 0 || atWork_ > 0;
}

bool Workers::submit(std::uint32_t user, Job job) {
    const std::lock_guard lock(guard_);
    const auto own = waiting_.find(user);
    const std::size_t ofOne = own == waiting_.end() ? 0 : own->second.size();
    if (stopped_ || count_ >= limits_.waiting || ofOne >= limits_.waitingOfOne) {
        return false;
    }
    if (atWork_ + count_ >= threads_.size() && threads_.size() < limits_.threads) {
        startThread();
    }
    if (threads_.empty()) {
        return false;
    }
    waiting_[user].push_back(std::move(job));
    ++count_;
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

Workers::Job Workers::next() {
    auto user = waiting_.upper_bound(last_);
    if (user == waiting_.end()) {
        user = waiting_.begin();
    }
    last_ = user->first;
    Job job = std::move(user->second.front());
    user->second.pop_front();
    if (user->second.empty()) {
        waiting_.erase(user);
    }
    --count_;
    return job;
}

void Workers::run() {
    std::unique_lock lock(guard_);
    while (true) {
        changed_.wait(lock, [this] { return stopped_ || count_ > 0; });
        if (stopped_) {
            return;
        }
        Job job = next();
        ++atWork_;
        lock.unlock();
        job();
        job = nullptr;
        lock.lock();
        --atWork_;
    }
}

}  // namespace cvagent::service
