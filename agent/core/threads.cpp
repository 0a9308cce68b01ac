#include "agent/core/threads.h"

#include <unistd.h>

#include <algorithm>

namespace cvagent {

namespace {

/// Never destroyed: a signal at the very end still asks for it.
std::vector<QX::ChildProcess>& callers() {
    static auto& children = *new std::vector<QX::ChildProcess>;
    return children;
}

}  // namespace

void rememberChildrenOfTheCaller() {
    callers() = QX::childrenOf(getpid());
}

const std::vector<QX::ChildProcess>& childrenOfTheCaller() {
    return callers();
}

std::vector<QX::ChildProcess> commandsOf(pid_t thread) {
    std::vector<QX::ChildProcess> commands = QX::childrenOf(thread);
    std::erase_if(commands, [](const QX::ChildProcess& child) {
        return std::find(callers().begin(), callers().end(), child) != callers().end();
    });
    return commands;
}

std::vector<pid_t> ownThreads() {
    return QX::numbersIn("/proc/self/task");
}

}  // namespace cvagent
