#include "framework/qx/thread.h"

#include <unistd.h>

#include <condition_variable>
#include <exception>
#include <mutex>
#include <string>
#include <system_error>
#include <thread>

#include "framework/cvlog/logger.h"
#include "framework/qx/clock.h"
#include "framework/qx/interruption.h"
#include "framework/qx/process_tree.h"

namespace QX {
namespace {

void logEndByException(const std::string& what) {
    CVLog::CVLogger::logLevelMessage("run", "thread", 0, "Corvista.QX.Thread", 6000, nullptr, 0, 0,
                                     "thread ended by an exception: " + what);
}

/// Whoever stops a thread goes on to free what the thread uses: it must not be kept from waiting for it.
void killCommandsOf(pid_t thread) noexcept {
    try {
        killChildrenOf(thread);
    } catch (...) {
        // No memory to look for them: join looks again.
    }
}

}  // namespace

/// Shared with the running thread, which outlives an object that is destroyed in its own run.
struct Thread::State {
    std::mutex guard;  // guards everything below but the interruption, which guards itself
    std::condition_variable changed;
    bool running = false;
    bool aborted = false;
    pid_t kernelId = 0;
    std::thread thread;
    Interruption interruption;

    void body(Thread& object, void* argument);
    bool isCurrent() const { return thread.get_id() == std::this_thread::get_id(); }
};

void Thread::State::body(Thread& object, void* argument) {
    {
        const std::lock_guard lock(guard);
        kernelId = gettid();
    }
    Interruption::setForThisThread(&interruption);
    try {
        object.run(argument);
    } catch (const std::exception& error) {
        logEndByException(error.what());
    } catch (...) {
        logEndByException("unknown");
    }
    Interruption::setForThisThread(nullptr);
    const std::lock_guard lock(guard);
    running = false;
    changed.notify_all();
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
    state_->kernelId = 0;
    try {
        state_->thread = std::thread([this, argument, state = state_] { state->body(*this, argument); });
    } catch (const std::system_error&) {
        return false;
    }
    state_->running = true;
    return true;
}

void Thread::join() {
    // How often to look for commands that an aborted thread has still started.
    constexpr std::chrono::milliseconds kLookAgain{20};
    std::unique_lock lock(state_->guard);
    if (state_->isCurrent()) {
        return;
    }
    state_->interruption.endSleeps();
    while (state_->running) {
        if (!state_->aborted) {
            state_->changed.wait(lock);
        } else if (state_->changed.wait_for(lock, kLookAgain) == std::cv_status::timeout && state_->running) {
            killCommandsOf(
                state_->kernelId);  // under the lock: the thread cannot end and leave its id to another
        }
    }
    if (state_->thread.joinable()) {
        state_->thread.join();
    }
}

void Thread::abort() {
    const std::lock_guard lock(state_->guard);
    if (!state_->running) {
        return;
    }
    state_->aborted = true;
    state_->changed.notify_all();
    state_->interruption.abort();
    killCommandsOf(state_->kernelId);
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
