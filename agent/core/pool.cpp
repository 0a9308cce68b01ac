#include "agent/core/pool.h"

#include <algorithm>
#include <condition_variable>
#include <deque>
#include <map>
#include <mutex>
#include <system_error>
#include <thread>
#include <vector>

namespace cvagent {

namespace {

constexpr std::size_t kFewestPerLane = 4;
constexpr std::size_t kMostPerLane = 8;
constexpr std::size_t kLanes = 4;  // that can hang before others have to wait

std::size_t laneForThisMachine() {
    return std::clamp<std::size_t>(std::thread::hardware_concurrency(), kFewestPerLane, kMostPerLane);
}

}  // namespace

struct Pool::State {
    struct Work {
        unsigned int lane = 0;
        const void* batch = nullptr;
        std::function<void()> run;
    };

    std::size_t most = 0;
    std::size_t perLane = 0;
    std::mutex guard;  // guards everything below
    std::condition_variable changed;
    std::condition_variable done;  // some work is
    bool stopped = false;
    std::deque<Work> queue;
    std::map<unsigned int, std::size_t> running;  // by lane
    std::size_t idle = 0;
    std::vector<std::thread> threads;

    /// The first work whose lane is not full; the end when there is none.
    std::deque<Work>::iterator next() {
        return std::find_if(queue.begin(), queue.end(), [this](const Work& work) {
            const auto lane = running.find(work.lane);
            return lane == running.end() || lane->second < perLane;
        });
    }
    void leave(unsigned int lane) {
        if (--running[lane] == 0) {
            running.erase(lane);
        }
        changed.notify_all();  // work of that lane may go on
        done.notify_all();
    }
    void serve();
};

void Pool::State::serve() {
    std::unique_lock lock(guard);
    while (!stopped) {
        const auto found = next();
        if (found == queue.end()) {
            ++idle;
            changed.wait(lock);
            --idle;
            continue;
        }
        Work work = std::move(*found);
        queue.erase(found);
        ++running[work.lane];
        lock.unlock();
        work.run();
        work.run = nullptr;  // what it held can be the last of the agent, and goes without the lock
        lock.lock();
        leave(work.lane);
    }
}

Pool::Pool(std::size_t threads, std::size_t perLane) : state_(std::make_shared<State>()) {
    state_->most = threads;
    state_->perLane = perLane;
}

Pool::Pool() : Pool(kLanes * laneForThisMachine(), laneForThisMachine()) {}

Pool::~Pool() {
    std::vector<std::thread> threads;
    {
        const std::lock_guard lock(state_->guard);
        state_->stopped = true;
        threads.swap(state_->threads);
    }
    state_->changed.notify_all();
    for (std::thread& thread : threads) {
        if (thread.get_id() == std::this_thread::get_id()) {
            thread.detach();
        } else {
            thread.join();
        }
    }
}

void Pool::submit(unsigned int lane, const void* batch, std::function<void()> work) {
    const std::shared_ptr<State> state = state_;  // the work may end the pool before this returns
    std::unique_lock lock(state->guard);
    if (state->idle <= state->queue.size() && state->threads.size() < state->most) {
        try {
            state->threads.emplace_back([state] { state->serve(); });
        } catch (const std::system_error&) {
            if (state->threads.empty()) {
                lock.unlock();
                work();
                return;
            }
        }
    }
    state->queue.push_back({lane, batch, std::move(work)});
    lock.unlock();
    state->changed.notify_one();
}

void Pool::drop(const void* batch) {
    std::deque<State::Work> dropped;  // goes without the lock
    const std::lock_guard lock(state_->guard);
    const auto isKept = [batch](const State::Work& work) { return work.batch != batch; };
    const auto first = std::stable_partition(state_->queue.begin(), state_->queue.end(), isKept);
    dropped.assign(std::make_move_iterator(first), std::make_move_iterator(state_->queue.end()));
    state_->queue.erase(first, state_->queue.end());
    state_->done.notify_all();
}

bool Pool::settle(std::chrono::milliseconds longest) {
    std::unique_lock lock(state_->guard);
    return state_->done.wait_for(lock, longest,
                                 [this] { return state_->queue.empty() && state_->running.empty(); });
}

}  // namespace cvagent
