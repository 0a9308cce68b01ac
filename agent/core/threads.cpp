#include "agent/core/threads.h"

#include <dirent.h>
#include <unistd.h>

#include <algorithm>
#include <charconv>
#include <memory>
#include <string_view>

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
    std::vector<pid_t> ids;
    // Not by the iterators of libstdc++: those end the program when they find no memory.
    const std::unique_ptr<DIR, int (*)(DIR*)> directory(opendir("/proc/self/task"), closedir);
    while (const dirent* task = directory != nullptr ? readdir(directory.get()) : nullptr) {
        const std::string_view name = task->d_name;
        pid_t id = 0;
        if (std::from_chars(name.data(), name.data() + name.size(), id).ec == std::errc()) {
            ids.push_back(id);
        }
    }
    return ids;
}

}  // namespace cvagent
