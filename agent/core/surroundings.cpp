#include "agent/core/surroundings.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <filesystem>

#include "agent/core/environment.h"
#include "agent/core/problem.h"
#include "agent/core/text.h"
#include "agent/core/threads.h"

namespace cvagent {

namespace {

namespace fs = std::filesystem;

std::atomic<int> keptStandardError{STDERR_FILENO};
std::atomic<bool> standardOutputClosed{false};

/// The path as it is meant in the directory the program was started in.
fs::path fromHere(const std::string& path) {
    std::error_code error;
    fs::path whole = fs::absolute(path, error);
    if (error) {
        throw Problem(Problem::failed, "cannot tell the current directory (" + error.message() + ")",
                      Problem::currentDirectory, inQuotes(path));
    }
    return whole;
}

/// So that the name holds wherever the links on the way to the file lie.
std::string withoutLinks(const fs::path& file) {
    std::error_code error;
    const fs::path directory = fs::canonical(file.parent_path(), error);
    return error ? file : directory / file.filename();
}

void resolveNames(const std::vector<std::string*>& files) {
    for (std::string* file : files) {
        if (!file->empty()) {
            *file = withoutLinks(fromHere(*file));
        }
    }
    const char* data = std::getenv(kDataVariable);
    if (data != nullptr && *data != '\0') {
        setenv(kDataVariable, fromHere(data).c_str(), 1);
    }
}

/// The memory may hold what is nobody's business. No file is as small as one byte, and where cores go to a
/// program the kernel passes over a limit of 0 but not over this one. Only the soft limit: a service that a
/// command restarts can have its own again.
void forbidCoreDumps() {
    rlimit limit{};
    if (getrlimit(RLIMIT_CORE, &limit) == 0) {
        limit.rlim_cur = std::min<rlim_t>(1, limit.rlim_max);
        setrlimit(RLIMIT_CORE, &limit);
    }
}

/// What ends a program in the middle of a write. Where a limit cannot be lifted it is at least as high as it
/// may be.
void liftDeadlyLimits() {
    for (const auto resource : {RLIMIT_FSIZE, RLIMIT_CPU}) {
        constexpr rlimit kNone{RLIM_INFINITY, RLIM_INFINITY};
        rlimit limit{};
        if (setrlimit(resource, &kNone) != 0 && getrlimit(resource, &limit) == 0) {
            limit.rlim_cur = limit.rlim_max;
            setrlimit(resource, &limit);
        }
    }
}

/// Blocked signals and running timers outlive an exec: the ones would keep SIGTERM from the program and from
/// its commands, the others would end it at a moment of the caller's choice.
void forgetSignalsOfTheCaller() {
    for (const auto timer : {ITIMER_REAL, ITIMER_VIRTUAL, ITIMER_PROF}) {
        constexpr itimerval kNever{};
        setitimer(timer, &kNever, nullptr);
    }
    struct sigaction standard {};
    standard.sa_handler = SIG_DFL;
    sigaction(SIGCHLD, &standard, nullptr);
    sigset_t none;
    sigemptyset(&none);
    sigprocmask(SIG_SETMASK, &none, nullptr);
}

}  // namespace

void openStandardDescriptors() {
    standardOutputClosed = standardOutputClosed || fcntl(STDOUT_FILENO, F_GETFD) < 0;
    int opened = -1;
    do {
        opened = open("/dev/null", O_RDWR);
        if (opened < 0) {
            opened = open("/", O_RDONLY | O_DIRECTORY);
        }
    } while (opened >= 0 && opened < STDERR_FILENO);
    if (opened > STDERR_FILENO) {
        close(opened);
    }
}

bool standardOutputWasClosed() {
    return standardOutputClosed;
}

void prepareSurroundings(const std::vector<std::string*>& files) {
    openStandardDescriptors();
    rememberChildrenOfTheCaller();
    forgetSignalsOfTheCaller();
    umask(S_IWGRP | S_IWOTH);
    resolveNames(files);
    if (chdir("/") != 0) {
        throw Problem(Problem::failed,
                      std::string("cannot enter the directory '/': ") + std::strerror(errno));
    }
    forbidCoreDumps();
    liftDeadlyLimits();
    reduceEnvironment();
}

QuietCommands::QuietCommands() {
    const int nowhere = open("/dev/null", O_WRONLY | O_CLOEXEC);
    const int kept = fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
    if (nowhere >= 0 && kept >= 0) {
        dup2(nowhere, STDERR_FILENO);
        keptStandardError = kept;
    } else if (kept >= 0) {
        close(kept);
    }
    if (nowhere >= 0) {
        close(nowhere);
    }
}

QuietCommands::~QuietCommands() {
    const int kept = keptStandardError.exchange(STDERR_FILENO);
    if (kept != STDERR_FILENO) {
        dup2(kept, STDERR_FILENO);
        close(kept);
    }
}

int messageDescriptor() {
    return keptStandardError;
}

namespace {

/// Why no file can be written below /tmp, as an errno; 0 when one can.
int temporaryFileProblem() {
    std::string name = "/tmp/cvagent-XXXXXX";
    const int file = mkostemp(name.data(), O_CLOEXEC);
    if (file < 0) {
        return errno;
    }
    const std::string page(4096, ' ');
    const int error = write(file, page.data(), page.size()) == static_cast<ssize_t>(page.size()) ? 0 : errno;
    close(file);
    unlink(name.c_str());
    return error;
}

}  // namespace

std::string limitsOfData(const DataDirectory& data) {
    if (access(data.path().c_str(), W_OK) == 0) {
        return {};
    }
    return "cannot write to the data directory " + inQuotes(data.path()) + ": " + std::strerror(errno) +
           "; the owner's data cannot be changed, and a change of a link is told again and again";
}

std::string limitsOfTmp() {
    const int error = temporaryFileProblem();
    return error == 0 ? std::string()
                      : std::string("cannot write to /tmp: ") + std::strerror(error) +
                            "; drives, partitions and network ports can be missing";
}

std::string limitsOfUser(const DataDirectory& data) {
    if (geteuid() == 0) {
        return {};
    }
    return "without root some facts will be missing: partition tables of disks, Wake-on-LAN of network "
           "ports, files that only root reads. Nothing of the host can be changed. Data is kept in " +
           data.path();
}

}  // namespace cvagent
