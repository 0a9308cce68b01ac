#include "agent/core/want.h"

#include <fcntl.h>
#include <pthread.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <mutex>
#include <new>
#include <set>
#include <string_view>

#include "agent/shell/starts.h"

namespace cvagent {

namespace {

std::atomic<int> noted{0};

/// A shell keeps what it redirects at the descriptors from 10 on, and runs nothing when there is no room, but
/// the plug-in only sees that nothing is printed.
bool fewDescriptors() {
    constexpr int kFirst = 10;
    std::array<int, 3> kept{};  // as many as its commands redirect, and one to spare
    int error = 0;
    for (int& descriptor : kept) {
        descriptor = fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, kFirst);
        error = descriptor < 0 ? errno : error;
    }
    std::for_each(kept.begin(), kept.end(), close);
    return error == EMFILE || error == EINVAL;  // EINVAL: the limit is not above the first of them
}

void* waitForGuard(void* guard) {
    const std::lock_guard lock(*static_cast<std::mutex*>(guard));
    return nullptr;
}

/// A shell that cannot start a stage of its pipeline keeps it to itself as well. Threads count as processes.
bool fewProcesses() {
    std::mutex guard;
    std::array<pthread_t, 8> threads{};  // as many as the stages of the longest pipeline
    std::size_t count = 0;
    int error = 0;
    pthread_attr_t small;
    pthread_attr_init(&small);
    pthread_attr_setstacksize(&small, 256UL * 1024);
    {
        const std::lock_guard lock(guard);
        while (error == 0 && count < threads.size()) {
            error = pthread_create(&threads.at(count), &small, waitForGuard, &guard);
            count += error == 0 ? 1 : 0;
        }
    }
    std::for_each_n(threads.begin(), count, [](pthread_t thread) { pthread_join(thread, nullptr); });
    pthread_attr_destroy(&small);
    return error == EAGAIN;
}

/// What the system does not give, and what to do about it.
struct Want {
    int error;
    const char* text;
    const char* advice;
};

constexpr std::array<Want, 4> kWants = {
    {{EMFILE, "there are too few descriptors", "Raise the limit: ulimit -n 256"},
     {ENFILE, "the system has too many open files", "Raise its limit: sysctl fs.file-max"},
     {EAGAIN, "the system gives no more processes or threads",
      "Raise the limits of processes and memory: ulimit -u, ulimit -v, or TasksMax= and MemoryMax= of the "
      "service"},
     {ENOMEM, "the system gives no more memory",
      "Raise the limit of memory: ulimit -v, or MemoryMax= of the service"}}};

const Want* findWant(int error) {
    const auto row =
        std::find_if(kWants.begin(), kWants.end(), [error](const Want& want) { return want.error == error; });
    return row == kWants.end() ? nullptr : &*row;
}

/// What was wanting, as an errno; 0 for nothing. Looks once for what nobody would tell.
int cause(const shell::NotStarted& commands) {
    static const int silent = fewDescriptors() ? EMFILE : (fewProcesses() ? EAGAIN : 0);
    if (commands.count != 0) {
        return commands.error;
    }
    return noted != 0 ? noted.load() : silent;
}

std::string causeText(int error) {
    const Want* want = findWant(error);
    if (want == nullptr) {
        return std::string("/bin/sh cannot be started: ") + std::strerror(error);
    }
    rlimit limit{};
    const bool limited = error == EMFILE && getrlimit(RLIMIT_NOFILE, &limit) == 0;
    return want->text + (limited ? " (limit " + std::to_string(limit.rlim_cur) + ")" : "") + "\n" +
           want->advice;
}

/// The classes that every host has nodes of and this tree has none of.
std::string gaps(const std::vector<Handle>& tree, bool processors) {
    std::set<unsigned int> present;
    if (!processors) {
        present.insert(static_cast<unsigned int>(NodeType::processor));
    }
    for (const Handle& node : tree) {
        present.insert(node->nodeType());
    }
    std::string text;
    for (const NodeType type :
         {NodeType::hardDrive, NodeType::networkPort, NodeType::ipConfig, NodeType::processor}) {
        if (const auto number = static_cast<unsigned int>(type); !present.contains(number)) {
            text += (text.empty() ? "" : ", ") + className(number);
        }
    }
    return text;
}

}  // namespace

void failPlainlyWithoutMemory(int status) {
    static const int end = status;
    static const std::terminate_handler other = std::set_terminate([] {
        try {
            if (std::current_exception() != nullptr) {
                throw;
            }
        } catch (const std::bad_alloc&) {
        } catch (...) {
            other();
        }
        constexpr std::string_view kText = "cvagent: the system gives no more memory\n";
        [[maybe_unused]] const ssize_t written = write(STDERR_FILENO, kText.data(), kText.size());
        std::_Exit(end);
    });
}

void noteWant(int error) {
    if (findWant(error) != nullptr) {
        noted = error;
    }
}

void noteWant(const std::string& errorLine) {
    if (errorLine.find("std::bad_alloc") != std::string::npos) {
        noteWant(ENOMEM);
    } else if (errorLine.ends_with(" thread failed.")) {
        noteWant(EAGAIN);
    }
}

bool tellWant(const std::vector<Handle>* tree, const std::function<void(const std::string&)>& tell,
              bool processors) {
    static int told = 0;
    const shell::NotStarted commands = shell::notStarted();
    const int error = cause(commands);
    if (error == 0 || error == told) {
        return told != 0;
    }
    told = error;
    std::string text;
    if (const std::string missing = tree != nullptr ? gaps(*tree, processors) : ""; !missing.empty()) {
        text = "the tree has no " + missing + ", and more can be missing: ";
    } else if (tree != nullptr) {
        text = "some of the tree can be missing: ";
    }
    if (commands.count != 0) {
        text += std::to_string(commands.count) + (commands.count == 1 ? " command" : " commands") +
                " could not be started, ";
    }
    tell(text + causeText(error));
    return true;
}

}  // namespace cvagent
