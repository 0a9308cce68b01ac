#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <map>
#include <utility>

namespace cvagent::service {

/// Work that waits, by user: however much one of them asks for, each other one's next comes after one of his.
/// One thread at a time.
template <class Work>
class TurnQueue {
public:
    /// @return false, and nothing is added, when there is so much already, of this user or of all
    bool add(std::uint32_t user, Work work, std::size_t mostOfOne, std::size_t most) {
        const auto own = waiting_.find(user);
        const std::size_t ofOne = own == waiting_.end() ? 0 : own->second.size();
        if (count_ >= most || ofOne >= mostOfOne) {
            return false;
        }
        waiting_[user].push_back(std::move(work));
        ++count_;
        return true;
    }
    std::size_t size() const { return count_; }
    /// There is some.
    Work takeNext() {
        auto user = waiting_.upper_bound(last_);
        if (user == waiting_.end()) {
            user = waiting_.begin();
        }
        last_ = user->first;
        Work work = std::move(user->second.front());
        user->second.pop_front();
        if (user->second.empty()) {
            waiting_.erase(user);
        }
        --count_;
        return work;
    }

private:
    std::map<std::uint32_t, std::deque<Work>> waiting_;  // no empty ones
    std::size_t count_ = 0;
    std::uint32_t last_ = 0;  // who had the last turn
};

}  // namespace cvagent::service
