#include "agent/core/pool.h"

#include <deque>
#include <map>
#include <set>
#include <system_error>
#include <thread>
#include <vector>

namespace cvagent {

namespace {

constexpr std::size_t kFewestPerLane = 4;
constexpr std::size_t kMostPerLane = 8;
constexpr std::size_t kLanes = 4;  // that can be at work with all their threads
// Where addresses have 32 bits, the stacks of more would leave the plug-in no room.
constexpr std::size_t kMostReplaced = sizeof(void*) > 4 ? 256 : 64;

std::size_t laneForThisMachine() {
    return std::clamp<std::size_t>(std::thread::hardware_concurrency(), kFewestPerLane, kMostPerLane);
}

}  // namespace

struct Pool::State : std::enable_shared_from_this<Pool::State> {
    struct Work {
        unsigned int lane = 0;
        const void* batch = nullptr;
        std::function<void()> run;
    };
    struct Running {
        const void* batch = nullptr;
        Clock::time_point begun;
        bool givenUp = false;
    };
    using Lane = std::vector<Running>;

    std::size_t usual = 0;  // threads
    std::size_t perLane = 0;
    Patience patience;
    std::mutex guard;  // guards everything below
    std::condition_variable changed;
    std::condition_variable done;  // some work is
    bool stopped = false;
    std::deque<Work> queue;
    std::map<unsigned int, Lane> running;
    std::size_t idle = 0;  // threads that look for work, or will when they have started
    std::vector<std::thread> threads;

    // All of these under the guard.
    std::size_t replaced() const;
    std::size_t allowed() const { return usual + std::min(replaced(), kMostReplaced); }
    std::size_t shareOf(unsigned int lane, bool crowded) const;
    std::deque<Work>::iterator next();
    std::size_t ready() const;
    bool grow();
    void leave(unsigned int lane, const void* batch, Clock::time_point begun);
    void retire();

    void serve();
};

/// Threads that are at work which is slow or given up.
std::size_t Pool::State::replaced() const {
    const auto slowSince = Clock::now() - patience.slow;
    std::size_t count = 0;
    for (const auto& [id, lane] : running) {
        count += static_cast<std::size_t>(std::count_if(
            lane.begin(), lane.end(),
            [slowSince](const Running& work) { return work.givenUp || work.begun < slowSince; }));
    }
    return count;
}

/// How many threads more a lane may have. When many threads hang, one is enough to learn of another lane that
/// it does.
std::size_t Pool::State::shareOf(unsigned int lane, bool crowded) const {
    const std::size_t most = crowded ? 1 : perLane;
    const auto found = running.find(lane);
    if (found == running.end()) {
        return most;
    }
    const bool hangs = std::any_of(found->second.begin(), found->second.end(),
                                   [](const Running& work) { return work.givenUp; });
    return hangs || found->second.size() >= most ? 0 : most - found->second.size();
}

/// The first work whose lane may have a thread; the end when there is none.
std::deque<Pool::State::Work>::iterator Pool::State::next() {
    const bool crowded = replaced() >= usual;
    return std::find_if(queue.begin(), queue.end(),
                        [this, crowded](const Work& work) { return shareOf(work.lane, crowded) > 0; });
}

/// How much of the queue could be begun now.
std::size_t Pool::State::ready() const {
    const bool crowded = replaced() >= usual;
    std::map<unsigned int, std::size_t> left;
    std::size_t count = 0;
    for (const Work& work : queue) {
        const auto lane = left.try_emplace(work.lane, shareOf(work.lane, crowded)).first;
        if (lane->second > 0) {
            --lane->second;
            ++count;
        }
    }
    return count;
}

/// Makes one more thread if there is work for it.
/// @return whether it did
bool Pool::State::grow() {
    if (stopped || threads.size() >= allowed() || ready() <= idle) {
        return false;
    }
    try {
        threads.emplace_back([state = shared_from_this()] { state->serve(); });
    } catch (const std::system_error&) {
        return false;
    }
    ++idle;
    return true;
}

void Pool::State::leave(unsigned int lane, const void* batch, Clock::time_point begun) {
    Lane& works = running[lane];
    works.erase(std::find_if(works.begin(), works.end(), [batch, begun](const Running& work) {
        return work.batch == batch && work.begun == begun;
    }));
    if (works.empty()) {
        running.erase(lane);
    }
    changed.notify_all();  // work of that lane may go on
    done.notify_all();
}

/// Of a thread that is too many, on that thread.
void Pool::State::retire() {
    const auto own = std::find_if(threads.begin(), threads.end(), [](const std::thread& thread) {
        return thread.get_id() == std::this_thread::get_id();
    });
    own->detach();
    threads.erase(own);
}

void Pool::State::serve() {
    std::unique_lock lock(guard);
    --idle;
    while (!stopped) {
        const auto found = next();
        if (found == queue.end()) {
            if (threads.size() > allowed()) {
                retire();
                return;
            }
            ++idle;
            changed.wait(lock);
            --idle;
            continue;
        }
        Work work = std::move(*found);
        queue.erase(found);
        const auto begun = Clock::now();
        running[work.lane].push_back({work.batch, begun});
        lock.unlock();
        work.run();
        work.run = nullptr;  // what it held can be the last of the agent, and goes without the lock
        lock.lock();
        leave(work.lane, work.batch, begun);
    }
}

Pool::Pool(std::size_t threads, std::size_t perLane, Patience patience) : state_(std::make_shared<State>()) {
    state_->usual = threads;
    state_->perLane = perLane;
    state_->patience = patience;
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
    state->queue.push_back({lane, batch, std::move(work)});
    state->grow();
    if (state->threads.empty()) {
        const State::Work alone = std::move(state->queue.back());
        state->queue.pop_back();
        lock.unlock();
        alone.run();
        return;
    }
    lock.unlock();
    state->changed.notify_one();
}

void Pool::giveUp(const void* batch) {
    std::deque<State::Work> dropped;  // goes without the lock
    const std::lock_guard lock(state_->guard);
    const auto isKept = [batch](const State::Work& work) { return work.batch != batch; };
    const auto first = std::stable_partition(state_->queue.begin(), state_->queue.end(), isKept);
    dropped.assign(std::make_move_iterator(first), std::make_move_iterator(state_->queue.end()));
    state_->queue.erase(first, state_->queue.end());
    const auto isBatch = [batch](const auto& work) { return work.batch == batch; };
    std::set<unsigned int> lanes;
    for (const State::Work& work : dropped) {
        lanes.insert(work.lane);
    }
    for (auto& lane : state_->running) {
        State::Lane& works = lane.second;
        if (lanes.contains(lane.first) || std::any_of(works.begin(), works.end(), isBatch)) {
            std::for_each(works.begin(), works.end(), [](State::Running& work) { work.givenUp = true; });
        }
    }
    while (state_->grow()) {
    }
    state_->done.notify_all();
}

bool Pool::isStuck(unsigned int lane) const {
    const auto since = Clock::now() - state_->patience.stuck;
    const std::lock_guard lock(state_->guard);
    const auto found = state_->running.find(lane);
    return found != state_->running.end() &&
           std::any_of(found->second.begin(), found->second.end(),
                       [since](const State::Running& work) { return work.givenUp && work.begun < since; });
}

void Pool::relieve() {
    const std::lock_guard lock(state_->guard);
    while (state_->grow()) {
    }
}

bool Pool::settle(std::chrono::milliseconds longest) {
    std::unique_lock lock(state_->guard);
    return state_->done.wait_for(lock, longest,
                                 [this] { return state_->queue.empty() && state_->running.empty(); });
}

std::size_t Pool::threads() const {
    const std::lock_guard lock(state_->guard);
    return state_->threads.size();
}

}  // namespace cvagent
