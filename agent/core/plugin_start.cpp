#include "agent/core/plugin_start.h"

#include <condition_variable>
#include <exception>
#include <mutex>
#include <system_error>
#include <utility>

#include "agent/core/catalogue_file.h"
#include "agent/core/text.h"

namespace cvagent {

struct PluginStart::State {
    using Clock = std::chrono::steady_clock;

    Tell tell;
    Started started;
    Clock::time_point begun = Clock::now();
    std::mutex guard;  // guards what follows; the plug-in starts without it
    std::condition_variable changed;
    std::unique_ptr<Plugin> plugin;
    std::optional<Problem> problem;
    bool ended = false;
    bool givenUp = false;

    void succeed();
    void fail(const Problem& why);
};

namespace {

std::string inSeconds(std::chrono::milliseconds time) {
    return std::to_string(std::chrono::ceil<std::chrono::seconds>(time).count()) + " s";
}

}  // namespace

/// Under the guard: whoever gives the start up does so before anybody has heard of it, or too late.
void PluginStart::State::succeed() {
    const std::lock_guard lock(guard);
    if (!givenUp) {
        plugin->tellEvents();
        started(*plugin);
        ended = true;
        changed.notify_all();
    }
}

void PluginStart::State::fail(const Problem& why) {
    std::unique_lock lock(guard);
    if (givenUp) {
        return;
    }
    std::unique_ptr<Plugin> useless = std::move(plugin);
    problem = why;
    lock.unlock();
    useless.reset();  // its stop may hang, too
    lock.lock();
    ended = true;
    changed.notify_all();
}

PluginStart::PluginStart(std::string file, Listener* listener, Tell tell, Started started)
    : file_(std::move(file)), state_(std::make_shared<State>()) {
    state_->tell = tell;
    state_->started = std::move(started);
    try {
        state_->plugin = Plugin::loaded(file_, listener, std::move(tell));
    } catch (const Problem& problem) {
        state_->problem = problem;
        state_->ended = true;
    }
}

void PluginStart::run(State& state, const std::string& file, bool processors) {
    Plugin* const plugin = state.plugin.get();  // there for as long as it starts, given up or not
    try {
        loadCatalogueOf(file, state.tell);
        plugin->start(processors);
        state.succeed();
    } catch (const Problem& problem) {
        state.fail(problem);
    } catch (const std::exception& exception) {  // must not leave a thread, nor the first one the others
        state.fail(Problem(Problem::failed, inQuotes(file) + ": " + exception.what()));
    }
}

void PluginStart::here(bool processors) {
    if (state_->plugin != nullptr) {
        run(*state_, file_, processors);
    }
}

bool PluginStart::aside(bool processors) {
    if (state_->plugin == nullptr) {
        return true;
    }
    try {
        state_->begun = State::Clock::now();
        thread_ = std::thread([state = state_, file = file_, processors] { run(*state, file, processors); });
        return true;
    } catch (const std::system_error&) {
        return false;
    }
}

void PluginStart::await(std::chrono::milliseconds longest) {
    if (!thread_.joinable()) {
        return;
    }
    const auto hasEnded = [this] { return state_->ended; };
    std::unique_lock lock(state_->guard);
    if (!state_->changed.wait_until(lock, state_->begun + longest / 6, hasEnded)) {
        state_->tell("waiting for the plug-in " + inQuotes(file_) + ", for up to " + inSeconds(longest));
    }
    if (state_->changed.wait_until(lock, state_->begun + longest, hasEnded)) {
        lock.unlock();
        thread_.join();
        return;
    }
    state_->givenUp = true;
    state_->problem.emplace(Problem::failed, "the plug-in " + inQuotes(file_) + " has not started after " +
                                                 inSeconds(longest) + " and is left out");
    if (state_->plugin != nullptr) {
        state_->plugin->tellNothing();
        static_cast<void>(state_->plugin.release());  // its thread is in it for ever
    }
    thread_.detach();
}

std::unique_ptr<Plugin> PluginStart::take() {
    return std::move(state_->plugin);
}

std::optional<Problem> PluginStart::problem() const {
    return state_->problem;
}

}  // namespace cvagent
