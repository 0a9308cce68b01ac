#pragma once

#include <sys/types.h>
#include <unistd.h>

#include <atomic>
#include <memory>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "agent/shell/source.h"
#include "hosttools/descriptor.h"

namespace cvagent::shell {

struct ProcessStart {
    std::string path;
    std::vector<std::string> words;  ///< the name it is called by first
    bool silent = false;             ///< standard error goes to /dev/null
    std::string command;             ///< the whole command line it belongs to
};

/// What is known of a process until it was waited for.
struct RunningProcess {
    explicit RunningProcess(std::string line) : command(std::move(line)) {}
    const std::string command;  ///< the whole command line
    const pid_t reader = gettid();
    std::atomic<bool> forced = false;
    std::atomic<bool> cutOff = false;  ///< its output is read no further
    std::mutex guard;
    int output = -1;  ///< where it is read; guarded by guard
};

/// A process that the calling thread has started, so that it stands among that thread's children. It is
/// waited for when the object goes.
class Child {
public:
    /// Starts it with its output going to `output`.
    /// @return 0, or an error number: then there is no process
    int start(const ProcessStart& start, int output);
    Child() = default;
    Child(const Child&) = delete;
    Child& operator=(const Child&) = delete;
    ~Child() { wait(); }

    struct End {
        int status = 0;       ///< as a shell tells it: above 128 the signal that ended it
        bool forced = false;  ///< it was ended through noteKill, or cut off
    };
    /// Waits for its end. Without a process it is that of one that did nothing.
    End wait();
    /// @param output where its output is read, for cutOff; -1 when it is no longer
    void setOutput(int output);
    bool isCutOff() const { return running_ != nullptr && running_->cutOff; }

private:
    pid_t process_ = -1;
    std::shared_ptr<RunningProcess> running_;
    End end_;
};

/// The command line that a running process was started for; "" for a process that is none of ours.
std::string commandOf(pid_t process);

/// To be called right before a process is killed because its command took too long or its thread is to end:
/// the whole command then counts as killed, as a shell would be.
void noteKill(pid_t process);

/// The processes that a thread has started and whose output is still read, ended or not.
std::vector<pid_t> readBy(pid_t thread);

/// Ends the reading of a process's output: what it has left behind may hold the pipe open for ever. The whole
/// command then counts as killed.
/// @return false when it was cut off or killed before, or is not read
bool cutOff(pid_t process);

/// A process whose output is read as it comes.
class ProcessSource : public Source {
public:
    ProcessSource() = default;
    ProcessSource(const ProcessSource&) = delete;
    ProcessSource& operator=(const ProcessSource&) = delete;
    ~ProcessSource() override { finish(); }

    /// @return 0, or an error number: then there is no process
    int start(const ProcessStart& start);
    /// The same with its output going to a file, or to a descriptor of the caller's.
    int startInto(const ProcessStart& start, int output);

    bool pull(std::string& out) override;
    int status() const override { return end_.status; }
    /// Closes its output and waits for its end.
    Child::End finish();

private:
    ssize_t readOutput(char* buffer);

    Child child_;
    hosttools::Descriptor output_;
    Child::End end_;
};

}  // namespace cvagent::shell
