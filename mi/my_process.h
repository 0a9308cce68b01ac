#pragma once

#include <atomic>
#include <cstdio>
#include <string>

namespace IC {

/// One command pipe for the length of a scope: closed on every way out of it.
class MyProcess {
public:
    /// Pipes opened and not yet closed, in the whole plug-in. A pipe that could not be opened counts for
    /// good: the number is read in logs and decides nothing.
    static std::atomic<int> cnt;

    MyProcess();
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

    /// The line of a command that was handed over as a string.
    static void logOpenPipes();

private:
    FILE* pipe_;
};

/// Starts a command whose output is read, or in an aborted thread none: that counts as one cut off.
FILE* openPipe(const char* command, const char* mode);

/// Ends a command's output and waits for the command; a null pipe is fine.
void closePipe(FILE* pipe);

/// How many of the calling thread's commands were ended by force so far, that is, by a SIGKILL that hit the
/// shell itself, as an agent's deadline and an abort send it: what they printed is not what they had to tell.
unsigned int commandsCutOff();

}  // namespace IC
