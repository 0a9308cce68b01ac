#pragma once

#include <chrono>

namespace cvagent::shell {

/// From here on no command begins in this process, and there is no way back. Who asks for one, or for the end
/// of one, is held for ever: the silence of a command that was killed must not be taken for what the host
/// says. A signal handler may call it.
void declareStop();
bool isStopped();

/// How many starts have passed the gate and are not over. Once it was 0 after declareStop, no further process
/// can come.
int startsUnderWay();

/// The start of one process, from before the fork until it can be found among the children. Holds the thread
/// when a stop was declared, before the start or during it.
class Start {
public:
    Start();
    Start(const Start&) = delete;
    Start& operator=(const Start&) = delete;
    ~Start();
};

/// A command from its start until its end was waited for.
void countBegun();
void countEnded();
/// Since when there has always been a command under way, by CLOCK_BOOTTIME; when there is none, since the
/// last time. What a command before left behind is not of those that run.
std::chrono::nanoseconds busySince();

/// Holds the calling thread for ever once a stop was declared.
void holdWhenStopped();

/// Commands that the system could not start since the program began.
struct NotStarted {
    unsigned long count = 0;
    int error = 0;  ///< errno of the last one
};
NotStarted notStarted();
void countNotStarted(int error);

}  // namespace cvagent::shell
