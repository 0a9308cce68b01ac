#include "framework/qx/thread.h"

#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <exception>
#include <mutex>
#include <string>
#include <thread>
#include <utility>

#include "framework/cvlog/logger.h"
#include "framework/qx/clock.h"
#include "framework/qx/interruption.h"
#include "framework/qx/process_tree.h"

namespace QX {
namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::seconds kForEver{1'000'000'000};

// How often commands are looked for that an aborted thread still has: one may just be about to start, or stay
// in the middle of a device's answer.
constexpr std::chrono::milliseconds kFirstLook{20};
constexpr std::chrono::milliseconds kSlowestLook{1000};

void logEndByException(const std::string& what) {
    CVLog::CVLogger::logLevelMessage("run", "thread", 0, "Corvista.QX.Thread", 6000, nullptr, 0, 0,
                                     "thread ended by an exception: " + what);
}

/// Whoever stops a thread goes on to free what the thread uses: it must not be kept from waiting for it.
void killCommandsOf(pid_t thread) noexcept {
    try {
        killChildrenOf(thread);
    } catch (...) {
        // No memory to look for them: the next look finds them.
    }
}

}  // namespace

/// Shared with the running thread, which outlives an object that is destroyed in its own run.
struct Thread::State {
    std::mutex guard;  // guards everything below but the interruption, which guards itself
    std::condition_variable changed;
    bool running = false;
    bool returned = false;  // from run
    bool aborted = false;
    pid_t kernelId = 0;
    std::thread::id id;
    std::thread thread;
    std::thread killer;           // of an aborted thread's commands
    std::unique_ptr<Thread> own;  // the object of a thread that was left
    Interruption interruption;

    void body(Thread& object, void* argument);
    void end();
    void kill();
    void startKiller() noexcept;
    bool waitForEnd(std::unique_lock<std::mutex>& lock, std::chrono::nanoseconds longest);
    bool isCurrent() const { return running && id == std::this_thread::get_id(); }
};

void Thread::State::body(Thread& object, void* argument) {
    {
        const std::lock_guard lock(guard);
        kernelId = gettid();
        id = std::this_thread::get_id();
    }
    Interruption::setForThisThread(&interruption);
    try {
        object.run(argument);
    } catch (const std::exception& error) {
        logEndByException(error.what());
    } catch (...) {
        logEndByException("unknown");
    }
    end();
    Interruption::setForThisThread(nullptr);
}

void Thread::State::end() {
    std::unique_lock lock(guard);
    returned = true;
    changed.notify_all();
    if (killer.joinable()) {
        lock.unlock();  // it looks whether run has returned
        killer.join();
        lock.lock();
    }
    running = false;
    changed.notify_all();
    const std::unique_ptr<Thread> object = std::move(own);
    lock.unlock();
}

/// The killer's work, as long as the aborted thread runs.
void Thread::State::kill() {
    std::unique_lock lock(guard);
    for (auto look = kFirstLook; !changed.wait_for(lock, look, [this] { return returned; });
         look = std::min(2 * look, kSlowestLook)) {
        killCommandsOf(kernelId);  // under the lock: the thread cannot end and leave its id to another
    }
}

void Thread::State::startKiller() noexcept {
    try {
        killer = std::thread([this] { kill(); });
    } catch (...) {
        // The system gives no more threads: whoever waits for the thread does the killer's work.
    }
}

bool Thread::State::waitForEnd(std::unique_lock<std::mutex>& lock, std::chrono::nanoseconds longest) {
    interruption.endSleeps();
    for (const auto end = Clock::now() + longest; running && Clock::now() < end;) {
        if (aborted && !killer.joinable() && !returned) {
            killCommandsOf(kernelId);
            changed.wait_until(lock, std::min(end, Clock::now() + kFirstLook));
        } else {
            changed.wait_until(lock, end);
        }
    }
    if (!running && thread.joinable()) {
        thread.join();
    }
    return !running;
}

Thread::Thread() : state_(std::make_shared<State>()) {}

Thread::~Thread() {
    join();
    const std::lock_guard lock(state_->guard);
    if (state_->thread.joinable()) {  // destroyed by its own run
        state_->thread.detach();
    }
}

void Thread::stop() {}

void* Thread::run(void* /*argument*/) {
    return nullptr;
}

bool Thread::start(void* argument) {
    const std::lock_guard lock(state_->guard);
    if (state_->running) {
        return false;
    }
    if (state_->thread.joinable()) {
        state_->thread.join();
    }
    state_->interruption.reset();
    state_->aborted = false;
    state_->returned = false;
    state_->kernelId = 0;
    try {
        state_->thread = std::thread([this, argument, state = state_] { state->body(*this, argument); });
    } catch (const std::exception&) {
        return false;
    }
    state_->running = true;
    return true;
}

void Thread::join() {
    std::unique_lock lock(state_->guard);
    if (!state_->isCurrent()) {
        state_->waitForEnd(lock, kForEver);
    }
}

bool Thread::joinWithin(unsigned int milliseconds) {
    const auto longest = scaled(std::chrono::milliseconds(milliseconds));
    std::unique_lock lock(state_->guard);
    return !state_->isCurrent() && state_->waitForEnd(lock, longest);
}

void Thread::abort() {
    const std::lock_guard lock(state_->guard);
    if (!state_->running || state_->returned) {
        return;
    }
    state_->aborted = true;
    state_->changed.notify_all();
    state_->interruption.abort();
    killCommandsOf(state_->kernelId);
    if (!state_->killer.joinable()) {
        state_->startKiller();
    }
}

void Thread::leave(std::unique_ptr<Thread> thread) {
    const std::shared_ptr<State> state = thread->state_;
    const std::lock_guard lock(state->guard);
    if (state->running) {
        state->interruption.leave();
        state->thread.detach();
        state->own = std::move(thread);
    }
}

bool Thread::isThisThread() const {
    const std::lock_guard lock(state_->guard);
    return state_->isCurrent();
}

bool Thread::isAborted() {
    const Interruption* const interruption = Interruption::ofThisThread();
    return interruption != nullptr && interruption->aborted();
}

bool Thread::isLeft() {
    const Interruption* const interruption = Interruption::ofThisThread();
    return interruption != nullptr && interruption->left();
}

void Thread::sleep(unsigned int milliseconds) {
    const auto duration = scaled(std::chrono::milliseconds(milliseconds));
    if (Interruption* const interruption = Interruption::ofThisThread()) {
        interruption->sleep(duration);
    } else {
        std::this_thread::sleep_for(duration);
    }
}

}  // namespace QX
