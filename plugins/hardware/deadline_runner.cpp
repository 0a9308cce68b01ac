#include "plugins/hardware/deadline_runner.h"

#include <dlfcn.h>
#include <link.h>

#include <algorithm>
#include <condition_variable>
#include <exception>
#include <list>
#include <map>
#include <mutex>
#include <system_error>
#include <thread>
#include <utility>

#include "plugins/hardware/quiet_thread.h"

namespace hardware {

namespace {

constexpr std::size_t kMostThreads = 16;
constexpr int kShortest = 32;  // a limit is never shortened to less than this part of it

/// A thread that hangs in this library's code must find it there when it goes on.
void keepMapped() {
    static const char here = 0;
    Dl_info ignored{};
    void* found = nullptr;
    if (dladdr1(&here, &ignored, &found, RTLD_DL_LINKMAP) != 0) {
        const char* const library = static_cast<const link_map*>(found)->l_name;
        if (*library != '\0') {  // not in a program
            dlopen(library, RTLD_NOW | RTLD_NOLOAD | RTLD_NODELETE);
        }
    }
}

std::chrono::steady_clock::time_point now() {
    return std::chrono::steady_clock::now();
}

}  // namespace

/// Devices that one thread asks one after the other. Guarded by the state's guard but for the work itself.
struct DeadlineRunner::Job {
    enum class Outcome { open, done, busy };

    std::vector<std::string> devices;
    std::function<void(std::size_t)> work;
    std::vector<Outcome> outcomes = std::vector<Outcome>(devices.size(), Outcome::open);
    std::size_t at = 0;  // the device that is being asked ...
    Time since = now();  // ... and since when
    bool abandoned = false;
    bool ended = false;
};

struct DeadlineRunner::State : std::enable_shared_from_this<State> {
    std::mutex guard;
    std::condition_variable changed;
    std::shared_ptr<Job> next;         // waits for a thread; guarded, like all below
    std::map<std::string, Time> busy;  // devices that are being asked, and since when
    std::list<std::thread> threads;
    unsigned int idle = 0;
    unsigned int running = 0;
    bool ending = false;

    /// False when there is no thread to be had in time.
    bool post(std::unique_lock<std::mutex>& lock, const std::shared_ptr<Job>& job, Time until);
    /// Waits until the job has ended or one of its devices has taken longer than the limit.
    /// @return false when no thread got round to it
    bool await(std::unique_lock<std::mutex>& lock, Job& job, std::chrono::milliseconds limit);
    void serve();
    void ask(std::unique_lock<std::mutex>& lock, Job& job);
};

void DeadlineRunner::State::ask(std::unique_lock<std::mutex>& lock, Job& job) {
    const std::string device = job.devices[job.at];
    job.since = now();
    if (!busy.emplace(device, job.since).second) {
        job.outcomes[job.at] = Job::Outcome::busy;
        return;
    }
    lock.unlock();
    try {
        job.work(job.at);
    } catch (const std::exception&) {
        // What cannot be read has no facts.
    }
    lock.lock();
    job.outcomes[job.at] = Job::Outcome::done;
    busy.erase(device);
}

void DeadlineRunner::State::serve() {
    std::unique_lock lock(guard);
    for (;;) {
        ++idle;
        changed.wait(lock, [this] { return next != nullptr || ending; });
        --idle;
        if (next == nullptr) {
            break;
        }
        const std::shared_ptr<Job> job = std::exchange(next, nullptr);
        changed.notify_all();
        for (; job->at < job->devices.size() && !job->abandoned; ++job->at) {
            ask(lock, *job);
        }
        job->ended = true;
        changed.notify_all();
    }
    --running;
    changed.notify_all();
}

bool DeadlineRunner::State::post(std::unique_lock<std::mutex>& lock, const std::shared_ptr<Job>& job,
                                 Time until) {
    const auto free = [this] { return next == nullptr && (idle > 0 || running < kMostThreads); };
    if (!changed.wait_until(lock, until, free)) {
        return false;
    }
    if (idle == 0) {
        try {
            threads.push_back(quietThread([self = shared_from_this()] { self->serve(); }));
        } catch (const std::system_error&) {
            return false;
        }
        ++running;
    }
    job->since = now();
    next = job;
    changed.notify_all();
    return true;
}

bool DeadlineRunner::State::await(std::unique_lock<std::mutex>& lock, Job& job,
                                  std::chrono::milliseconds limit) {
    while (!job.ended && now() < job.since + limit) {
        const Time until = job.since + limit;  // the thread writes it while this one sleeps
        changed.wait_until(lock, until, [&job] { return job.ended; });
    }
    job.abandoned = !job.ended;
    const bool taken = next.get() != &job;
    if (!taken) {
        next = nullptr;
        changed.notify_all();
    }
    return taken;
}

DeadlineRunner::DeadlineRunner(std::chrono::milliseconds limit)
    : state_(std::make_shared<State>()), limit_(limit) {}

DeadlineRunner::~DeadlineRunner() {
    std::unique_lock lock(state_->guard);
    state_->ending = true;
    state_->changed.notify_all();
    const bool ended = state_->changed.wait_for(lock, limit_, [this] { return state_->running == 0; });
    lock.unlock();
    if (!ended) {
        keepMapped();
    }
    for (std::thread& thread : state_->threads) {
        ended ? thread.join() : thread.detach();
    }
}

bool DeadlineRunner::run(const std::string& device, std::function<void()> work) {
    return runWithin(limit_, device, std::move(work));
}

bool DeadlineRunner::runWithin(std::chrono::milliseconds limit, const std::string& device,
                               std::function<void()> work) {
    const std::function<void(std::size_t)> only = [work = std::move(work)](std::size_t /*place*/) { work(); };
    const Time end = now() + limit;
    std::unique_lock lock(state_->guard);
    for (;;) {
        const auto asked = state_->busy.find(device);
        const Time until = asked == state_->busy.end() ? end : std::min(end, asked->second + limit_);
        if (!state_->changed.wait_until(lock, until, [&] { return !state_->busy.contains(device); })) {
            return false;
        }
        const auto job = std::make_shared<Job>(Job{{device}, only});
        if (!state_->post(lock, job, end)) {
            return false;
        }
        static_cast<void>(state_->await(lock, *job, limit));
        if (job->outcomes.front() != Job::Outcome::busy) {
            return job->outcomes.front() == Job::Outcome::done;
        }
    }
}

std::vector<bool> DeadlineRunner::runAll(std::vector<std::string> devices,
                                         const std::function<void(std::size_t)>& work) {
    std::vector<bool> done(devices.size());
    std::vector<std::size_t> busy;
    std::chrono::milliseconds limit = limit_;
    for (std::size_t first = 0; first < devices.size();) {
        const auto start = devices.begin() + static_cast<std::ptrdiff_t>(first);
        const auto job = std::make_shared<Job>(
            Job{{start, devices.end()}, [work, first](std::size_t place) { work(first + place); }});
        std::unique_lock lock(state_->guard);
        if (!state_->post(lock, job, now() + limit) || !state_->await(lock, *job, limit)) {
            break;
        }
        for (std::size_t place = 0; place < job->outcomes.size(); ++place) {
            done[first + place] = job->outcomes[place] == Job::Outcome::done;
            if (job->outcomes[place] == Job::Outcome::busy) {
                busy.push_back(first + place);
            }
        }
        if (!job->ended) {
            limit = std::max(limit / 2, limit_ / kShortest);
        }
        first += job->at + 1;
    }
    for (const std::size_t place : busy) {
        done[place] = runWithin(limit, devices[place], [work, place] { work(place); });
    }
    return done;
}

}  // namespace hardware
