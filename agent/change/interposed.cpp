// What the plug-in finds in this program before it looks in the libraries: the clock cannot be set, and its
// monitors do not run. In a rehearsal the host is not watched, and what they write belongs to no change.
#include <sys/time.h>
#include <sys/timex.h>

#include <cerrno>
#include <ctime>
#include <string>

#include "agent/change/record.h"
#include "framework/qx/thread.h"

namespace {

/// The caller goes on as if it were done.
int note(const std::string& call) {
    cvagent::change::Record::only().command(call, true);
    return 0;
}

int noteAdjustment(const char* name, timex* change) {
    if (change == nullptr || change->modes == 0) {
        errno = EPERM;
        return -1;
    }
    return note(name);
}

}  // namespace

#define CORVISTA_INTERPOSED extern "C" __attribute__((visibility("default")))

CORVISTA_INTERPOSED int settimeofday(const timeval* time, const struct timezone* /*zone*/) noexcept {
    return note("settimeofday" + (time != nullptr ? " " + std::to_string(time->tv_sec) : std::string()));
}

CORVISTA_INTERPOSED int clock_settime(clockid_t /*clock*/, const timespec* time) noexcept {
    return note("clock_settime " + std::to_string(time->tv_sec));
}

CORVISTA_INTERPOSED int adjtime(const timeval* change, timeval* /*left*/) noexcept {
    return change != nullptr ? note("adjtime " + std::to_string(change->tv_sec)) : 0;
}

CORVISTA_INTERPOSED int adjtimex(timex* change) noexcept {
    return noteAdjustment("adjtimex", change);
}

CORVISTA_INTERPOSED int clock_adjtime(clockid_t /*clock*/, timex* change) noexcept {
    return noteAdjustment("clock_adjtime", change);
}

bool QX::Thread::start(void* /*argument*/) {
    return true;
}
