// Makes the time of day jump while a program runs; loaded ahead into it. CLOCK_JUMP="FILE SECONDS": as soon
// as there is such a file the clock is set forward by so many seconds, back when they are negative. The
// machine's clock is not touched. C library only.
#include <dlfcn.h>
#include <sys/time.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <ctime>

namespace {

using ClockGettime = int (*)(clockid_t, timespec*);

char jumpFile[256];
long long jumpBy = 0;  // seconds
ClockGettime machine = nullptr;

__attribute__((constructor)) void begin() {
    machine = reinterpret_cast<ClockGettime>(dlsym(RTLD_NEXT, "clock_gettime"));
    const char* setting = std::getenv("CLOCK_JUMP");
    if (setting != nullptr) {
        std::sscanf(setting, "%255s %lld", jumpFile, &jumpBy);
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
    if (clock == CLOCK_REALTIME && jumpBy != 0 && access(jumpFile, F_OK) == 0) {
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
