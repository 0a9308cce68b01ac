// Makes the time of day jump while a program runs; loaded ahead into it. CLOCK_JUMP="MILLISECONDS SECONDS":
// that long after the start the clock is set forward by so many seconds, back when they are negative. The
// machine's clock is not touched. C library only.
#include <dlfcn.h>
#include <sys/time.h>

#include <cstdio>
#include <cstdlib>
#include <ctime>

namespace {

using ClockGettime = int (*)(clockid_t, timespec*);

long long jumpAt = 0;  // milliseconds of the steady clock
long long jumpBy = 0;  // seconds
ClockGettime machine = nullptr;

long long steadyMilliseconds() {
    timespec now{};
    machine(CLOCK_MONOTONIC, &now);
    return now.tv_sec * 1000LL + now.tv_nsec / 1000000;
}

__attribute__((constructor)) void begin() {
    machine = reinterpret_cast<ClockGettime>(dlsym(RTLD_NEXT, "clock_gettime"));
    const char* setting = std::getenv("CLOCK_JUMP");
    if (setting != nullptr && std::sscanf(setting, "%lld %lld", &jumpAt, &jumpBy) == 2) {
        jumpAt += steadyMilliseconds();
    }
    unsetenv("LD_PRELOAD");  // the host's tools keep their time
}

}  // namespace

#define REPLACED extern "C" __attribute__((visibility("default")))

REPLACED int clock_gettime(clockid_t clock, timespec* now) noexcept {
    if (machine == nullptr) {
        machine = reinterpret_cast<ClockGettime>(dlsym(RTLD_NEXT, "clock_gettime"));
    }
    const int result = machine(clock, now);
    if (clock == CLOCK_REALTIME && jumpAt != 0 && steadyMilliseconds() >= jumpAt) {
        now->tv_sec += static_cast<time_t>(jumpBy);
    }
    return result;
}

REPLACED time_t time(time_t* place) noexcept {
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    if (place != nullptr) {
        *place = now.tv_sec;
    }
    return now.tv_sec;
}

REPLACED int gettimeofday(timeval* place, void*) noexcept {
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    *place = {now.tv_sec, static_cast<suseconds_t>(now.tv_nsec / 1000)};
    return 0;
}
