#include "framework/qx/process_tree.h"

#include <dirent.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <csignal>
#include <fstream>
#include <memory>
#include <sstream>
#include <string>
#include <thread>
#include <utility>
#include <vector>

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

/// The lists of children that the kernel keeps for a process, one a thread.
std::vector<std::string> childListings(pid_t process) {
    std::vector<std::string> listings;
    const std::string tasks = "/proc/" + std::to_string(process) + "/task/";
    // Not by the iterators of libstdc++: those end the program when they find no memory.
    const std::unique_ptr<DIR, int (*)(DIR*)> directory(opendir(tasks.c_str()), closedir);
    // A process that has just gone has no children left to find.
    while (const dirent* task = directory != nullptr ? readdir(directory.get()) : nullptr) {
        if (task->d_name[0] != '.') {
            listings.push_back(tasks + task->d_name + "/children");
        }
    }
    return listings;
}

/// What the kernel tells of a process.
struct Status {
    char state = 'X';                ///< as it is when there is no such process
    unsigned long long started = 0;  ///< clock ticks since the machine's start
};

Status statusOf(pid_t process) {
    constexpr int kFieldsBetween = 18;  // of state and start
    std::ifstream in("/proc/" + std::to_string(process) + "/stat");
    std::string text;
    std::getline(in, text, '\0');  // the program's name can hold anything else
    const auto afterName = text.rfind(')');
    std::istringstream fields(afterName == std::string::npos ? "" : text.substr(afterName + 1));
    Status status;
    std::string passedOver;
    fields >> status.state;
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

std::string listingOf(pid_t thread) {
    return "/proc/self/task/" + std::to_string(thread) + "/children";
}

/// Stops a process and waits, though not for ever, until it has: only then is its list of children final.
void freeze(const Process& process) {
    constexpr int kPatience = 100;
    process.send(SIGSTOP);
    for (int tries = 0; tries < kPatience && isRunning(process.id()); ++tries) {
        std::this_thread::sleep_for(std::chrono::microseconds(100));
    }
}

std::atomic<void (*)(pid_t)> killWitness = nullptr;

/// Processes that are stopped first, all of them, and killed then. When the search ends half-way they go on
/// instead: whoever kills a shell alone sets its tools free, and they keep the pipe open.
class Condemned {
public:
    Condemned() = default;
    Condemned(const Condemned&) = delete;
    Condemned& operator=(const Condemned&) = delete;
    ~Condemned() {
        for (const Process& process : frozen_) {
            if (auto* const witness = killWitness.load(); complete_ && witness != nullptr) {
                witness(process.id());
            }
            process.send(complete_ ? SIGKILL : SIGCONT);
        }
    }

    /// Stops a process; its own children are still to be added.
    /// @param listing where it stands as a child: one that no longer does is another's by now
    /// @return whether it was stopped
    bool add(pid_t id, const std::string& listing) {
        Process process(id);
        const auto now = readIds(listing);  // still the same child, now that we hold it?
        if (!process.isOpen() || std::find(now.begin(), now.end(), id) == now.end()) {
            return false;
        }
        frozen_.push_back(std::move(process));
        freeze(frozen_.back());
        return true;
    }

    /// The same for all that these listings tell and for their descendants.
    void addAll(std::vector<std::string> listings) {
        while (!listings.empty()) {
            const std::string listing = std::move(listings.back());
            listings.pop_back();
            for (const pid_t id : readIds(listing)) {
                if (add(id, listing)) {
                    std::ranges::move(childListings(id), std::back_inserter(listings));
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

void setKillWitness(void (*witness)(pid_t)) {
    killWitness = witness;
}

void killChildrenOf(pid_t thread) {
    Condemned().addAll({listingOf(thread)});
}

std::vector<ChildProcess> childrenOf(pid_t thread) {
    std::vector<ChildProcess> children;
    for (const pid_t id : readIds(listingOf(thread))) {
        if (const Status status = statusOf(id); !hasEnded(status)) {
            children.push_back({id, status.started});
        }
    }
    return children;
}

bool killChild(pid_t thread, const ChildProcess& child) {
    Condemned condemned;
    const Status status = statusOf(child.id);
    if (hasEnded(status) || status.started != child.started || !condemned.add(child.id, listingOf(thread))) {
        return false;
    }
    condemned.addAll(childListings(child.id));
    return true;
}

}  // namespace QX
