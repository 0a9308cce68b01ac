#include "agent/cli/event_program.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>

#include "agent/cli/failure.h"
#include "agent/cli/json.h"
#include "agent/cli/print.h"
#include "agent/core/command_deadline.h"
#include "agent/core/signals.h"
#include "agent/core/surroundings.h"

namespace cvagent {

namespace {

constexpr std::size_t kMostLeft = 8;  // runs that could not be killed; with more, none is begun

/// As an errno; 0 when nothing speaks against it.
int whyNotRun(const std::string& program) {
    if (access(program.c_str(), X_OK) != 0) {
        return errno;
    }
    return std::filesystem::is_directory(program) ? EISDIR : 0;
}

}  // namespace

EventProgram::EventProgram(std::string program, Seconds longest, std::shared_ptr<Subscription> events)
    : program_(std::move(program)),
      longest_(std::chrono::duration_cast<Clock::duration>(longest)),
      events_(std::move(events)),
      stop_(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    if (stop_ < 0) {
        throw Failure(ExitStatus::failed, std::string("cannot wait for events: ") + std::strerror(errno));
    }
    if (const int error = whyNotRun(program_); error != 0) {
        close(stop_);
        throw Failure(ExitStatus::usage, "cannot run " + inQuotes(program_) + ": " + std::strerror(error));
    }
    server_ = std::thread([this] { serve(); });
}

EventProgram::~EventProgram() {
    eventfd_write(stop_, 1);
    server_.join();
    close(stop_);
}

void EventProgram::serve() {
    const CommandScope ours(CommandScope::ours);
    for (bool more = true; more;) {
        pollfd ready[] = {{events_->descriptor(), POLLIN, 0}, {stop_, POLLIN, 0}};
        if (poll(ready, 2, -1) < 0) {
            continue;
        }
        more = ready[1].revents == 0;
        runAll(more ? Clock::time_point::max() : Clock::now() + longest_);
    }
}

/// @param last when the last run has to be over
void EventProgram::runAll(Clock::time_point last) {
    const Subscription::Taken taken = events_->take();
    std::size_t missed = taken.dropped;
    for (const Event& event : taken.events) {
        const auto now = Clock::now();
        if (now >= last || StopSignals::received() != 0) {
            ++missed;
        } else {
            missed += run(event, std::min(last, now + longest_)) ? 0 : 1;
        }
    }
    if (missed > 0) {
        complain(inQuotes(program_) + " was not run for " + std::to_string(missed) + " events");
    }
}

/// @return false when it was not tried
bool EventProgram::run(const Event& event, Clock::time_point deadline) {
    std::erase_if(left_, [](const auto& child) { return child->hasEnded(); });
    if (left_.size() >= kMostLeft) {
        return false;
    }
    const std::string what = inQuotes(program_) + " for event " + std::to_string(event.number);
    auto child = std::make_unique<Child>(program_, messageDescriptor());
    if (child->error() != 0) {
        complain("cannot run " + what + ": " + std::strerror(child->error()));
        return true;
    }
    const auto isOver = [deadline] { return Clock::now() >= deadline || StopSignals::received() != 0; };
    child->feed(json::event(event), isOver);
    const Child::End end = child->wait(isOver);
    if (const std::string told = outcome(std::move(child), end); !told.empty()) {
        complain(what + " " + told);
    }
    return true;
}

/// What there is to tell of a run.
std::string EventProgram::outcome(std::unique_ptr<Child> child, Child::End end) {
    if (end == Child::End::byItself) {
        return child->complaint();
    }
    const bool stopping = StopSignals::received() != 0;
    if (end == Child::End::killed) {
        return stopping ? "was ended, for cvagent was told to stop" : "took too long and was ended";
    }
    left_.push_back(std::move(child));
    return std::string(stopping ? "" : "took too long and ") + "cannot be killed; it is left behind";
}

}  // namespace cvagent
