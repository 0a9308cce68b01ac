// Stands in for the calls that set the clock: they are noted for the test and change nothing. Linked into
// every test program and, as a library of its own, loaded ahead into the programs that a test starts. C
// library only.
#include <fcntl.h>
#include <sys/time.h>
#include <sys/timex.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <ctime>

#include "tests/support/tool_files.h"

namespace {

int answer() {
    int file = open(fake_host::clockErrorFile, O_RDONLY | O_CLOEXEC);
    if (file < 0) return 0;
    char digits[16] = {};
    ssize_t got = read(file, digits, sizeof digits - 1);
    close(file);
    errno = got > 0 ? std::atoi(digits) : EIO;
    return -1;
}

int record(const char* function, long long seconds, long long microseconds, bool timeZone) {
    int file = open(fake_host::clockFile, O_WRONLY | O_APPEND | O_CLOEXEC);
    if (file < 0) {  // not on a fake host: refuse
        errno = EPERM;
        return -1;
    }
    char line[128];
    int size =
        std::snprintf(line, sizeof line, "%s %lld %lld %d\n", function, seconds, microseconds, timeZone);
    ssize_t put = write(file, line, static_cast<size_t>(size));
    close(file);
    if (put != size) {
        errno = EIO;
        return -1;
    }
    return answer();
}

int recordAdjustment(const char* function, const timex* change) {
    if (change->modes == 0) {  // only asks
        errno = EPERM;
        return -1;
    }
    return record(function, change->time.tv_sec, change->time.tv_usec, false);
}

#ifdef CLOCK_RECORDER_PRELOADED
// What the program starts is recorded as a tool; it need not load this, and of another word size it could
// not.
__attribute__((constructor)) void stayInThisProgram() {
    unsetenv("LD_PRELOAD");
}
#endif

}  // namespace

#define RECORDED extern "C" __attribute__((visibility("default")))

RECORDED int settimeofday(const timeval* time, const struct timezone* zone) noexcept {
    return record("settimeofday", time ? time->tv_sec : 0, time ? time->tv_usec : 0, zone != nullptr);
}

RECORDED int clock_settime(clockid_t, const timespec* time) noexcept {
    return record("clock_settime", time->tv_sec, time->tv_nsec / 1000, false);
}

RECORDED int adjtime(const timeval* change, timeval*) noexcept {
    return change ? record("adjtime", change->tv_sec, change->tv_usec, false) : 0;
}

RECORDED int adjtimex(timex* change) noexcept {
    return recordAdjustment("adjtimex", change);
}

RECORDED int ntp_adjtime(timex* change) noexcept {
    return recordAdjustment("ntp_adjtime", change);
}

RECORDED int clock_adjtime(clockid_t, timex* change) noexcept {
    return recordAdjustment("clock_adjtime", change);
}
