#pragma once

#include <atomic>
#include <cstdio>
#include <string>

namespace IC {

/// One command pipe for the length of a scope: closed on every way out of it.
class MyProcess {
public:
    /// Pipes opened and not yet closed, in the whole plug-in, for the log. One that could not be opened is
    /// never counted down, as readers of the log know it.
    static std::atomic<int> cnt;

    MyProcess() = default;
    MyProcess(const MyProcess&) = delete;
    MyProcess& operator=(const MyProcess&) = delete;
    ~MyProcess();

    /// Runs the command in the shell.
    /// @param command null for one that was refused: it counts as one that could not be started
    /// @param mode "r" to read its output
    /// @return the pipe, owned by this object; null when the shell could not be started
    FILE* mypopen(const char* command, const char* mode);
    /// The same; the number of open pipes is logged.
    FILE* mypopen(std::string command, const char* mode);

    /// Logs the number of open pipes.
    static void logOpenPipes();

private:
    FILE* pipe_ = nullptr;
};

/// Starts a command whose output is read. An aborted thread starts none; that counts as a command cut off.
FILE* openPipe(const char* command, const char* mode);

/// Ends a command's output and waits for the command; a null pipe is fine.
void closePipe(FILE* pipe);

/// How many commands of the calling thread have been cut off so far: their shell was ended by SIGKILL, as by
/// an agent's deadline or an abort. What such a command has printed is no answer.
unsigned int commandsCutOff();

}  // namespace IC
