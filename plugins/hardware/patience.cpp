#include "plugins/hardware/patience.h"

#include <dlfcn.h>
#include <link.h>

#include <condition_variable>
#include <exception>
#include <list>
#include <mutex>
#include <set>
#include <system_error>
#include <thread>
#include <utility>

namespace hardware {

namespace {

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

}  // namespace

struct Patience::State {
    struct Job {
        std::string device;
        std::function<void()> work;
        bool done = false;
    };

    std::mutex guard;
    std::condition_variable changed;
    std::shared_ptr<Job> next;   // waits for a thread; guarded, like all below
    std::set<std::string> busy;  // devices that are being asked
    std::list<std::thread> threads;
    unsigned int idle = 0;
    unsigned int running = 0;
    bool ending = false;

    static void serve(const std::shared_ptr<State>& state);
};

void Patience::State::serve(const std::shared_ptr<State>& state) {
    std::unique_lock lock(state->guard);
    for (;;) {
        ++state->idle;
        state->changed.wait(lock, [&] { return state->next != nullptr || state->ending; });
        --state->idle;
        if (state->next == nullptr) {
            break;
        }
        const std::shared_ptr<Job> job = std::exchange(state->next, nullptr);
        state->changed.notify_all();
        lock.unlock();
        try {
            job->work();
        } catch (const std::exception&) {
            // What cannot be read has no facts.
        }
        job->work = nullptr;
        lock.lock();
        job->done = true;
        state->busy.erase(job->device);
        state->changed.notify_all();
    }
    --state->running;
    state->changed.notify_all();
}

Patience::Patience(std::chrono::milliseconds limit) : state_(std::make_shared<State>()), limit_(limit) {}

Patience::~Patience() {
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

bool Patience::run(const std::string& device, std::function<void()> work) {
    const auto until = std::chrono::steady_clock::now() + limit_;
    std::unique_lock lock(state_->guard);
    const auto free = [&] { return !state_->busy.contains(device) && state_->next == nullptr; };
    if (!state_->changed.wait_until(lock, until, free)) {
        return false;
    }
    if (state_->idle == 0) {
        try {
            state_->threads.emplace_back(State::serve, state_);
        } catch (const std::system_error&) {
            return false;
        }
        ++state_->running;
    }
    const auto job = std::make_shared<State::Job>(State::Job{device, std::move(work)});
    state_->busy.insert(device);
    state_->next = job;
    state_->changed.notify_all();
    state_->changed.wait_until(lock, until, [&] { return job->done; });
    if (state_->next == job) {  // no thread got round to it
        state_->next = nullptr;
        state_->busy.erase(device);
    }
    return job->done;
}

}  // namespace hardware
