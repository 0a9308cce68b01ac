#include "agent/cli/event_program.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>

#include "agent/cli/child.h"
#include "agent/cli/failure.h"
#include "agent/cli/json.h"
#include "agent/cli/print.h"
#include "agent/core/command_deadline.h"
#include "agent/core/signals.h"
#include "agent/core/surroundings.h"

namespace cvagent {

namespace {

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
            run(event, std::min(last, now + longest_));
        }
    }
    if (missed > 0) {
        complain(inQuotes(program_) + " was not run for " + std::to_string(missed) + " events");
    }
}

void EventProgram::run(const Event& event, Clock::time_point deadline) {
    const std::string what = inQuotes(program_) + " for event " + std::to_string(event.number);
    Child child(program_, messageDescriptor());
    if (child.error() != 0) {
        complain("cannot run " + what + ": " + std::strerror(child.error()));
        return;
    }
    const auto isOver = [deadline] { return Clock::now() >= deadline || StopSignals::received() != 0; };
    child.feed(json::event(event), isOver);
    const std::string end = child.wait(isOver);
    if (!end.empty()) {
        complain(what + " " + end);
    }
}

}  // namespace cvagent
