#include "agent/shell/starts.h"

#include <unistd.h>

#include <atomic>

#include "framework/qx/process_tree.h"

namespace cvagent::shell {

namespace {

// A start counts itself, then looks for the stop; a stop declares itself, then looks for starts. In this
// order one of the two sees the other.
std::atomic<bool> stopped{false};
std::atomic<int> underWay{0};

std::atomic<unsigned long> failures{0};
std::atomic<int> lastError{0};

std::atomic<int> running{0};
std::atomic<unsigned long long> runningSince{0};

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
        runningSince = QX::ticksNow();
    }
}

void countEnded() {
    --running;
}

unsigned long long busySince() {
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
