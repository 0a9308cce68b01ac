#include "framework/qx/process_tree.h"

#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace QX {
namespace {

namespace fs = std::filesystem;

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

std::vector<pid_t> readIds(const fs::path& listing) {
    std::ifstream in(listing);
    std::vector<pid_t> ids;
    for (pid_t id = 0; in >> id;) {
        ids.push_back(id);
    }
    return ids;
}

/// The lists of children that the kernel keeps for a process, one a thread.
std::vector<fs::path> childListings(pid_t process) {
    std::vector<fs::path> listings;
    std::error_code ignored;  // a process that has just gone has no children left to find
    const fs::path tasks = "/proc/" + std::to_string(process) + "/task";
    for (fs::directory_iterator task(tasks, ignored), end; task != end; task.increment(ignored)) {
        listings.push_back(task->path() / "children");
    }
    return listings;
}

bool isRunning(pid_t process) {
    std::ifstream in("/proc/" + std::to_string(process) + "/stat");
    std::string text;
    std::getline(in, text);
    const auto afterName = text.rfind(')');
    return afterName != std::string::npos && afterName + 2 < text.size() &&
           std::string("RSD").find(text[afterName + 2]) != std::string::npos;
}

/// Stops a process and waits, though not for ever, until it has: only then is its list of children final.
void freeze(const Process& process) {
    constexpr int kPatience = 100;
    process.send(SIGSTOP);
    for (int tries = 0; tries < kPatience && isRunning(process.id()); ++tries) {
        std::this_thread::sleep_for(std::chrono::microseconds(100));
    }
}

}  // namespace

void killChildrenOf(pid_t thread) {
    std::vector<fs::path> listings{"/proc/self/task/" + std::to_string(thread) + "/children"};
    std::vector<Process> frozen;
    while (!listings.empty()) {
        const fs::path listing = std::move(listings.back());
        listings.pop_back();
        for (const pid_t id : readIds(listing)) {
            Process process(id);
            const auto now = readIds(listing);  // still the same child, now that we hold it?
            if (!process.isOpen() || std::find(now.begin(), now.end(), id) == now.end()) {
                continue;
            }
            freeze(process);
            std::ranges::move(childListings(id), std::back_inserter(listings));
            frozen.push_back(std::move(process));
        }
    }
    for (const Process& process : frozen) {
        process.send(SIGKILL);
    }
}

}  // namespace QX
