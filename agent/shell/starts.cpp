#include "agent/shell/starts.h"

#include <unistd.h>

#include <atomic>
#include <ctime>

namespace cvagent::shell {

namespace {

// A start counts itself, then looks for the stop; a stop declares itself, then looks for starts. In this
// order one of the two sees the other.
std::atomic<bool> stopped{false};
std::atomic<int> underWay{0};

std::atomic<unsigned long> failures{0};
std::atomic<int> lastError{0};

std::atomic<int> running{0};
std::atomic<std::chrono::nanoseconds> runningSince{std::chrono::nanoseconds(0)};

static_assert(std::atomic<bool>::is_always_lock_free, "a signal handler writes it");

}  // namespace

void declareStop() {
    stopped = true;
}

bool isStopped() {
    return stopped;
}

int startsUnderWay() {
    return underWay;
}

void holdWhenStopped() {
    while (stopped) {
        pause();
    }
}

Start::Start() {
    ++underWay;
    if (stopped) {
        --underWay;
        holdWhenStopped();
    }
}

Start::~Start() {
    --underWay;
    holdWhenStopped();
}

void countBegun() {
    if (running++ == 0) {
        timespec now{};
        clock_gettime(CLOCK_BOOTTIME, &now);
        runningSince = std::chrono::seconds(now.tv_sec) + std::chrono::nanoseconds(now.tv_nsec);
    }
}

void countEnded() {
    --running;
}

std::chrono::nanoseconds busySince() {
    return runningSince;
}

NotStarted notStarted() {
    return {failures, lastError};
}

void countNotStarted(int error) {
    lastError = error;
    ++failures;
}

}  // namespace cvagent::shell
