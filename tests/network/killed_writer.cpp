#include "tests/network/killed_writer.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <ctime>

namespace {

/// A read lease: the kernel tells its holder of whoever opens the file for writing, and keeps him waiting.
class Lease {
public:
    explicit Lease(const std::string& path) : file_(open(path.c_str(), O_RDONLY | O_CLOEXEC)) {
        sigemptyset(&broken_);
        sigaddset(&broken_, SIGIO);
        sigprocmask(SIG_BLOCK, &broken_, nullptr);
        taken_ = fcntl(file_, F_SETLEASE, F_RDLCK) == 0;
    }
    Lease(const Lease&) = delete;
    Lease& operator=(const Lease&) = delete;
    ~Lease() { close(file_); }

    bool taken() const { return taken_; }
    bool someoneWaitsToWrite() const {
        const timespec limit{30, 0};
        int got = -1;
        do {  // one that was stopped meanwhile is interrupted
            got = sigtimedwait(&broken_, nullptr, &limit);
        } while (got < 0 && errno == EINTR);
        return got == SIGIO;
    }

private:
    int file_;
    bool taken_;
    sigset_t broken_;
};

}  // namespace

void killBeforeItWrites(const std::string& path, const std::function<void()>& writer) {
    const Lease lease(path);
    ASSERT_TRUE(lease.taken());
    const pid_t process = fork();
    if (process == 0) {
        writer();
        _exit(0);
    }
    EXPECT_TRUE(lease.someoneWaitsToWrite());
    kill(process, SIGKILL);
    int status = 0;
    waitpid(process, &status, 0);
    EXPECT_TRUE(WIFSIGNALED(status)) << "the writer was through before it could be killed";
}
