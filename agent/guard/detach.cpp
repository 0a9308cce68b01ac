#include "agent/guard/detach.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>

#include "hosttools/descriptor.h"
#include "hosttools/text.h"

namespace cvagent::guard {

namespace {

constexpr int kMostRuns = 100;  // of one that crashes each time
constexpr unsigned kFirstOfOthers = 3;

void leaveSession() {
    for (const int each : {SIGHUP, SIGINT, SIGQUIT, SIGTERM, SIGTSTP, SIGTTIN, SIGTTOU, SIGPIPE}) {
        static_cast<void>(std::signal(each, SIG_IGN));
    }
    const int nowhere = open("/dev/null", O_RDWR);
    for (const int each : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        dup2(nowhere, each);
    }
    syscall(SYS_close_range, kFirstOfOthers, ~0U, 0);
    [[maybe_unused]] const int stays = chdir("/");
    umask(077);
}

/// @return what the work came to
int runAgainWhenKilled(const std::function<int()>& work) {
    for (int run = 0; run < kMostRuns; ++run) {
        const pid_t worker = fork();
        if (worker <= 0) {
            return work();  // without a second process this one does it
        }
        int status = 0;
        while (waitpid(worker, &status, 0) < 0 && errno == EINTR) {
        }
        if (WIFEXITED(status)) {
            return WEXITSTATUS(status);
        }
    }
    return 1;
}

}  // namespace

int runDetached(const std::function<int()>& work) {
    const pid_t child = fork();
    if (child < 0) {
        return errno;
    }
    if (child > 0) {
        int status = 0;
        while (waitpid(child, &status, 0) < 0 && errno == EINTR) {
        }
        return WIFEXITED(status) ? WEXITSTATUS(status) : ECHILD;
    }
    setsid();
    const pid_t grandchild = fork();
    if (grandchild != 0) {
        _exit(grandchild < 0 ? errno : 0);
    }
    leaveSession();
    _exit(runAgainWhenKilled(work));
}

void stayWhenMemoryIsShort() {
    const hosttools::Descriptor file(open("/proc/self/oom_score_adj", O_WRONLY | O_CLOEXEC));
    if (file.isOpen()) {
        hosttools::writeAll(file.get(), "-1000");
    }
}

}  // namespace cvagent::guard
