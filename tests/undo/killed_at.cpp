#include "tests/undo/killed_at.h"

#include <fcntl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <ctime>

namespace {

long moved = 0;
std::atomic<long> passed = 0;
int done = 0;
int last = 0;

void step() {
    if (++done == last) {
        raise(SIGKILL);
    }
}

}  // namespace

void dieAtStep(int number) {
    done = 0;
    last = number;
}

void moveTimeOfDay(long seconds) {
    moved = seconds;
}

void passTime(std::chrono::milliseconds time) {
    passed += std::chrono::ceil<std::chrono::seconds>(time).count();
}

int stepsDone() {
    return done;
}

// In place of the C library's, for the code under test that is linked into this program.
extern "C" {

int clock_gettime(clockid_t clock, timespec* now) noexcept {
    const int result = static_cast<int>(syscall(SYS_clock_gettime, clock, now));
    now->tv_sec += clock == CLOCK_REALTIME ? moved : clock == CLOCK_BOOTTIME ? passed.load() : 0;
    return result;
}

int fsync(int file) {
    step();
    return static_cast<int>(syscall(SYS_fsync, file));
}

int renameat(int oldDirectory, const char* oldName, int newDirectory, const char* newName) noexcept {
    step();
    return static_cast<int>(syscall(SYS_renameat, oldDirectory, oldName, newDirectory, newName));
}

int unlinkat(int directory, const char* name, int flags) noexcept {
    step();
    return static_cast<int>(syscall(SYS_unlinkat, directory, name, flags));
}
}
