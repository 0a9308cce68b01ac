#include "agent/core/want.h"

#include <fcntl.h>
#include <pthread.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <cstring>
#include <mutex>

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

struct Cause {
    int error;
    const char* text;
};

constexpr std::array<Cause, 4> kCauses = {{{EMFILE, "there are too few descriptors"},
                                           {ENFILE, "the system has too many open files"},
                                           {EAGAIN, "the system gives no more processes or threads"},
                                           {ENOMEM, "the system gives no more memory"}}};

const Cause* findCause(int error) {
    const auto row = std::ranges::find(kCauses, error, &Cause::error);
    return row == kCauses.end() ? nullptr : &*row;
}

std::string causeText(int error) {
    const Cause* cause = findCause(error);
    if (cause == nullptr) {
        return std::string("/bin/sh cannot be started: ") + std::strerror(error);
    }
    rlimit limit{};
    const bool limited = error == EMFILE && getrlimit(RLIMIT_NOFILE, &limit) == 0;
    return cause->text + (limited ? " (limit " + std::to_string(limit.rlim_cur) + ")" : "");
}

}  // namespace

void noteWant(int error) {
    if (findCause(error) != nullptr) {
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

Want findWant() {
    static const int silent = fewDescriptors() ? EMFILE : (fewProcesses() ? EAGAIN : 0);
    const shell::NotStarted commands = shell::notStarted();
    Want want{noted != 0 ? noted.load() : silent, commands.count, {}};
    if (commands.count != 0) {
        want.error = commands.error;
    }
    want.cause = want.error != 0 ? causeText(want.error) : "";
    return want;
}

std::vector<std::string> missingClasses(const std::vector<NodeRef>& nodes, bool processors) {
    std::vector<std::string> missing;
    for (const NodeClass& nodeClass : nodeClasses()) {
        const auto isOfIt = [&nodeClass](const NodeRef& node) {
            return node->nodeType() == static_cast<unsigned int>(nodeClass.type);
        };
        const bool wanted = nodeClass.everywhere && (processors || nodeClass.type != NodeType::processor);
        if (wanted && std::ranges::none_of(nodes, isOfIt)) {
            missing.emplace_back(nodeClass.name);
        }
    }
    return missing;
}

}  // namespace cvagent
