#pragma once

#include <sys/types.h>

#include <chrono>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "agent/cli/child.h"
#include "agent/core/event_log.h"

namespace cvagent {

/// The administrator's program: run for each event of a subscription, one at a time, with the event as JSON
/// on its standard input. It runs in "/" with the environment of the plug-in's commands, in a session of its
/// own, with every signal at its default; what it prints goes to standard error. One that takes too long is
/// killed with what it has started; one that cannot even be killed is left behind. Whatever goes wrong with
/// it is told and stops nothing.
class EventProgram {
public:
    using Seconds = std::chrono::duration<double>;

    /// @param program whole path; no shell looks at it. Throws Failure when it is no program.
    /// @param longest how long it may take
    EventProgram(std::string program, Seconds longest, std::shared_ptr<Subscription> events);
    EventProgram(const EventProgram&) = delete;
    EventProgram& operator=(const EventProgram&) = delete;
    /// Runs it for what waits, as far as that is done in the time of one more run. A signal to stop ends it
    /// at once.
    ~EventProgram();

private:
    using Clock = std::chrono::steady_clock;

    void serve();
    void runAll(Clock::time_point last);
    bool run(const Event& event, Clock::time_point deadline);
    std::string outcome(std::unique_ptr<Child> child, Child::End end);

    std::string program_;
    Clock::duration longest_;
    std::shared_ptr<Subscription> events_;
    int stop_;                                  ///< readable when no more events come
    std::vector<std::unique_ptr<Child>> left_;  // runs that could not be killed; the server's
    std::thread server_;
};

}  // namespace cvagent
