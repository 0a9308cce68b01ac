#include "tests/computer/failing_calls.h"

#include <fcntl.h>
#include <sys/syscall.h>
#include <sys/utsname.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#define INSTEAD extern "C" __attribute__((visibility("default")))

INSTEAD int gethostname(char* name, size_t size) noexcept {
    utsname host;
    if (FailingCalls::getHostName || uname(&host) != 0) {
        errno = EFAULT;
        return -1;
    }
    std::strncpy(name, host.nodename, size);
    return 0;
}

INSTEAD int symlink(const char* target, const char* path) noexcept {
    if (FailingCalls::symbolicLink) {
        errno = ENOSPC;
        return -1;
    }
    return static_cast<int>(syscall(SYS_symlinkat, target, AT_FDCWD, path));
}
