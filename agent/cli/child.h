#pragma once

#include <sys/types.h>

#include <functional>
#include <string>

namespace cvagent {

/// A program of the administrator's that was started. To be used by the thread that made it.
class Child {
public:
    /// @param program whole path
    /// @param output  gets what it prints and what it complains
    Child(const std::string& program, int output);
    Child(const Child&) = delete;
    Child& operator=(const Child&) = delete;
    /// Ends it when nobody has waited.
    ~Child();

    /// Why it could not be started, as an errno; 0 when it was.
    int error() const { return error_; }
    /// Writes the text to its standard input and closes that; as much as it takes until the time is over.
    void feed(const std::string& text, const std::function<bool()>& isOver);
    /// Waits for its end; when the time is over it is killed with what it has started. A descendant that has
    /// left both its parent and its session lives on.
    /// @return what went wrong; empty when it ended with status 0
    std::string wait(const std::function<bool()>& isOver);

private:
    void spawn(const std::string& program, int input, int output);
    bool hasEnded() const;
    void kill() const;

    pid_t process_ = -1;
    int input_ = -1;
    int error_ = 0;
};

}  // namespace cvagent
