#pragma once

#include <sys/types.h>

#include <chrono>
#include <string>
#include <vector>

/// How a program ended: its exit status, or 128 and the signal that killed it.
struct Finished {
    int status;
    std::string out;
    std::string err;
};

/// A program started on the fake host, with the clock recorder loaded into it. Killed when it goes out of
/// scope.
class RunningProgram {
public:
    /// Output goes to files named after the prefix. Throws when the program cannot be started.
    RunningProgram(const std::vector<std::string>& words, const std::string& outputPrefix);
    ~RunningProgram();
    RunningProgram(const RunningProgram&) = delete;
    RunningProgram& operator=(const RunningProgram&) = delete;

    pid_t pid() const { return pid_; }
    void signal(int number) const;
    std::string out() const;  ///< what it has printed so far
    std::string err() const;
    /// Waits until the text stands in the standard output; false when the program ended or time ran out
    /// before.
    bool waitForOutput(const std::string& text, std::chrono::seconds limit = std::chrono::seconds(120)) const;
    /// Waits for its end; throws when it is still running at the limit. To be called once.
    Finished wait(std::chrono::seconds limit = std::chrono::seconds(120));

private:
    bool endsWithin(std::chrono::milliseconds time) const;

    std::string prefix_;
    pid_t pid_ = -1;
    int handle_ = -1;
};
