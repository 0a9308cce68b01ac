#include "framework/qx/process_tree.h"

#include <dirent.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <csignal>
#include <fstream>
#include <functional>
#include <iterator>
#include <memory>
#include <sstream>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "framework/qx/whole_number.h"

namespace QX {
namespace {

/// A process by a descriptor, so that a signal cannot hit another one that got its number meanwhile.
class Process {
public:
    explicit Process(pid_t id) : id_(id), descriptor_(static_cast<int>(syscall(SYS_pidfd_open, id, 0))) {}
    Process(Process&& other) noexcept : id_(other.id_), descriptor_(std::exchange(other.descriptor_, -1)) {}
    Process(const Process&) = delete;
    Process& operator=(const Process&) = delete;
    Process& operator=(Process&&) = delete;
    ~Process() {
        if (descriptor_ >= 0) {
            close(descriptor_);
        }
    }

    pid_t id() const { return id_; }
    bool isOpen() const { return descriptor_ >= 0; }
    void send(int signal) const { syscall(SYS_pidfd_send_signal, descriptor_, signal, nullptr, 0); }

private:
    pid_t id_;
    int descriptor_;
};

std::vector<pid_t> readIds(const std::string& listing) {
    std::ifstream in(listing);
    std::vector<pid_t> ids;
    for (pid_t id = 0; in >> id;) {
        ids.push_back(id);
    }
    return ids;
}

/// What the kernel tells of a process.
struct Status {
    char state = 'X';  ///< as it is when there is no such process
    pid_t parent = 0;
    unsigned long long started = 0;  ///< clock ticks since the machine's start
};

Status statusOf(pid_t process) {
    constexpr int kFieldsBetween = 17;  // of parent and start
    std::ifstream in("/proc/" + std::to_string(process) + "/stat");
    std::string text;
    std::getline(in, text, '\0');  // the program's name can hold anything else
    const auto afterName = text.rfind(')');
    std::istringstream fields(afterName == std::string::npos ? "" : text.substr(afterName + 1));
    Status status;
    std::string passedOver;
    fields >> status.state >> status.parent;
    for (int i = 0; i < kFieldsBetween; ++i) {
        fields >> passedOver;
    }
    fields >> status.started;
    return status;
}

bool isRunning(pid_t process) {
    return std::string("RSD").find(statusOf(process).state) != std::string::npos;
}

bool hasEnded(const Status& status) {
    return std::string("ZXx").find(status.state) != std::string::npos;
}

/// Processes that belong together.
struct Group {
    std::vector<pid_t> members;
    std::function<bool(pid_t)> has;  ///< whether it still does: its number may be another's by now
};

/// Those that the kernel lists as a thread's children.
Group listedIn(const std::string& listing) {
    return {readIds(listing), [listing](pid_t id) {
                const auto now = readIds(listing);
                return std::find(now.begin(), now.end(), id) != now.end();
            }};
}

/// Those processes of the host of which something is true.
Group allThat(const std::function<bool(pid_t)>& are) {
    Group group{numbersIn("/proc/"), are};
    std::erase_if(group.members, [&are](pid_t id) { return !are(id); });
    return group;
}

/// A kernel can be built without lists of children.
bool isListed(const std::string& listing) {
    return std::ifstream(listing).is_open();
}

/// The children of a process, in one group a thread where the kernel lists them.
std::vector<Group> childrenOfProcess(pid_t process) {
    std::vector<Group> groups;
    const std::string tasks = "/proc/" + std::to_string(process) + "/task/";
    for (const int task : numbersIn(tasks)) {
        if (const std::string listing = tasks + std::to_string(task) + "/children"; isListed(listing)) {
            groups.push_back(listedIn(listing));
        }
    }
    if (groups.empty()) {
        groups.push_back(allThat([process](pid_t id) { return statusOf(id).parent == process; }));
    }
    return groups;
}

/// Whether a process, not ourselves, can write to a pipe. Who only reads from it has it by inheritance: the
/// C library keeps the reader's end open in programs that are started while it is read.
bool writesTo(pid_t process, const struct stat& pipe) {
    const std::string directory = "/proc/" + std::to_string(process) + "/fd/";
    const auto isThePipe = [&](int descriptor) {
        const std::string path = directory + std::to_string(descriptor);
        struct stat link {};
        struct stat file {};
        return stat(path.c_str(), &file) == 0 && file.st_dev == pipe.st_dev && file.st_ino == pipe.st_ino &&
               lstat(path.c_str(), &link) == 0 && (link.st_mode & S_IWUSR) != 0;
    };
    return process != getpid() && std::ranges::any_of(numbersIn(directory), isThePipe);
}

/// The system call in which a thread of this process is blocked.
struct Call {
    long number = -1;  ///< none
    unsigned long argument = 0;

    bool operator==(const Call&) const = default;
};

Call callOf(pid_t thread) {
    std::ifstream in("/proc/self/task/" + std::to_string(thread) + "/syscall");
    Call call;
    return in >> call.number >> std::hex >> call.argument ? call : Call{};
}

/// Whether a process of our group, not ourselves, has the entry in its environment.
bool isMarked(pid_t process, const std::string& entry, unsigned long long since) {
    if (process == getpid() || getpgid(process) != getpgrp()) {
        return false;
    }
    if (const Status status = statusOf(process); hasEnded(status) || status.started < since) {
        return false;
    }
    std::ifstream in("/proc/" + std::to_string(process) + "/environ");
    for (std::string variable; std::getline(in, variable, '\0');) {
        if (variable == entry) {
            return true;
        }
    }
    return false;
}

/// For want of a list: what the thread waits for at this moment, be it the end of a child or somebody to
/// write to its pipe. A command that does neither keeps it from nothing.
Group waitedForBy(pid_t thread) {
    const Call call = callOf(thread);
    if (call.number == SYS_wait4) {
        const auto child = static_cast<pid_t>(call.argument);
        const auto isChild = [child](pid_t id) { return id == child && statusOf(id).parent == getpid(); };
        return {{child}, isChild};
    }
    // By its name: the descriptor itself is the thread's own business.
    const std::string descriptor = "/proc/self/fd/" + std::to_string(call.argument);
    struct stat pipe {};
    if (call.number == SYS_read && stat(descriptor.c_str(), &pipe) == 0 && S_ISFIFO(pipe.st_mode) &&
        callOf(thread) == call) {
        return allThat([pipe](pid_t id) { return writesTo(id, pipe); });
    }
    return {};
}

Group commandsOf(pid_t thread) {
    const std::string listing = "/proc/self/task/" + std::to_string(thread) + "/children";
    return isListed(listing) ? listedIn(listing) : waitedForBy(thread);
}

/// Stops a process and waits, though not for ever, until it has: only then is its list of children final.
void freeze(const Process& process) {
    constexpr int kPatience = 100;
    process.send(SIGSTOP);
    for (int tries = 0; tries < kPatience && isRunning(process.id()); ++tries) {
        std::this_thread::sleep_for(std::chrono::microseconds(100));
    }
}

std::atomic<void (*)(pid_t)> killCallBack = nullptr;

/// Processes that are stopped first, all of them, and killed then. When the search ends half-way they go on
/// instead: whoever kills a shell alone sets its tools free, and they keep the pipe open.
class Condemned {
public:
    Condemned() = default;
    Condemned(const Condemned&) = delete;
    Condemned& operator=(const Condemned&) = delete;
    ~Condemned() {
        for (const Process& process : frozen_) {
            if (auto* const callBack = killCallBack.load(); complete_ && callBack != nullptr) {
                callBack(process.id());
            }
            process.send(complete_ ? SIGKILL : SIGCONT);
        }
    }

    /// Stops a process; its own children are still to be added.
    /// @param group what it was found in: where it no longer is, it is another process by now
    /// @return whether it was stopped
    bool add(pid_t id, const Group& group) {
        Process process(id);
        if (!process.isOpen() || !group.has(id)) {
            return false;
        }
        frozen_.push_back(std::move(process));
        freeze(frozen_.back());
        return true;
    }

    /// The same for all of these groups and for their descendants.
    void addAll(std::vector<Group> groups) {
        while (!groups.empty()) {
            const Group group = std::move(groups.back());
            groups.pop_back();
            for (const pid_t id : group.members) {
                if (add(id, group)) {
                    std::ranges::move(childrenOfProcess(id), std::back_inserter(groups));
                }
            }
        }
        complete_ = true;
    }

private:
    bool complete_ = false;
    std::vector<Process> frozen_;
};

}  // namespace

void setKillCallBack(void (*callBack)(pid_t)) {
    killCallBack = callBack;
}

void killChildrenOf(pid_t thread) {
    killChildrenOf(thread, {});
}

void killChildrenOf(pid_t thread, const std::vector<ChildProcess>& spared) {
    Group commands = commandsOf(thread);
    std::erase_if(commands.members, [&spared](pid_t id) {
        return std::ranges::any_of(spared, [id](const ChildProcess& child) { return child.id == id; });
    });
    Condemned().addAll({std::move(commands)});
}

bool killMarked(const std::string& entry, std::chrono::nanoseconds since) {
    const auto aTick = std::chrono::nanoseconds(std::chrono::seconds(1)) / sysconf(_SC_CLK_TCK);
    const auto first = static_cast<unsigned long long>(since / aTick);
    Group marked = allThat([=](pid_t id) { return isMarked(id, entry, first); });
    const bool any = !marked.members.empty();
    Condemned().addAll({std::move(marked)});
    return any;
}

std::vector<ChildProcess> childrenOf(pid_t thread) {
    std::vector<ChildProcess> children;
    for (const pid_t id : commandsOf(thread).members) {
        if (const Status status = statusOf(id); !hasEnded(status) && status.parent == getpid()) {
            children.push_back({id, status.started});
        }
    }
    return children;
}

bool killChild(pid_t thread, const ChildProcess& child) {
    Condemned condemned;
    const Status status = statusOf(child.id);
    if (hasEnded(status) || status.started != child.started || !condemned.add(child.id, commandsOf(thread))) {
        return false;
    }
    condemned.addAll(childrenOfProcess(child.id));
    return true;
}

std::vector<int> numbersIn(const std::string& directory) {
    std::vector<int> numbers;
    // Not by the iterators of libstdc++: those end the program when they find no memory.
    const std::unique_ptr<DIR, int (*)(DIR*)> listing(opendir(directory.c_str()), closedir);
    while (const dirent* entry = listing != nullptr ? readdir(listing.get()) : nullptr) {
        if (const auto number = wholeNumber<int>(entry->d_name)) {
            numbers.push_back(*number);
        }
    }
    return numbers;
}

}  // namespace QX
