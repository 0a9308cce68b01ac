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
    /// Kills it when it has not ended, and waits for its end no longer than wait() does; not at all when that
    /// was in vain.
    ~Child();

    /// Why it could not be started, as an errno; 0 when it was.
    int error() const { return error_; }
    /// Writes the text to its standard input and closes that; as much as it takes until the time is over.
    void feed(const std::string& text, const std::function<bool()>& isOver);
    enum class End {
        byItself,   ///< its status is known
        killed,     ///< the time was over
        unkillable  ///< so it was, and the kernel does not let it go: it waits for a device
    };
    /// Waits for its end; when the time is over it is killed with what it has started, and waited for a
    /// moment longer. A descendant that has left both its parent and its session lives on.
    End wait(const std::function<bool()>& isOver);
    /// What went wrong with one that has ended by itself; empty when it ended with status 0.
    std::string complaint() const;
    /// Whether it has ended, at last.
    bool hasEnded() const;

private:
    void spawn(const std::string& program, int input, int output);
    void kill() const;
    bool endsInTime() const;

    pid_t process_ = -1;  // until its end was taken
    int input_ = -1;
    int error_ = 0;
    int status_ = 0;       // as waitpid gives it
    bool isLeft_ = false;  // it could not be killed
};

}  // namespace cvagent
