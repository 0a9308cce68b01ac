#pragma once

#include <sys/types.h>

#include <chrono>
#include <string>
#include <vector>

namespace cvagent {

/// A program that was started to see what it prints. Its complaints are dropped and it has no input.
class Probe {
public:
    /// @param words the program's path and its arguments
    explicit Probe(std::vector<std::string> words);
    Probe(const Probe&) = delete;
    Probe& operator=(const Probe&) = delete;
    Probe(Probe&& other) noexcept;
    Probe& operator=(Probe&&) = delete;
    /// Ends the program when it is still running.
    ~Probe();

    /// Waits for the program's end; one that takes longer is killed.
    /// @return whether it ended by itself with status 0
    bool finish(std::chrono::milliseconds longest);
    const std::string& output() const { return output_; }

private:
    int collect();

    pid_t process_ = -1;
    int pipe_ = -1;
    std::string output_;
};

}  // namespace cvagent
