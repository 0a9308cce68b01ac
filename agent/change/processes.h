#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace cvagent::change {

struct Process {
    pid_t id = 0;
    std::string name;  ///< as the kernel has it, at most 15 letters; any program can choose its own
};

/// Those of this PID namespace that the caller can see.
std::vector<Process> runningProcesses();

/// Programs that hold a socket on which the kernel tells of addresses, those that are known to keep
/// interfaces first: "NetworkManager (pid 812)"; this process is not among them.
std::vector<std::string> listenersToAddresses();

}  // namespace cvagent::change
