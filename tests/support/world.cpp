#include "tests/support/world.h"

#include <fcntl.h>
#include <linux/capability.h>
#include <poll.h>
#include <sched.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <exception>

#include "tests/support/files.h"
#include "tests/support/report.h"
#include "tests/support/system_call.h"

namespace fake_host {
namespace {

constexpr int namespaces = CLONE_NEWNS | CLONE_NEWUTS | CLONE_NEWNET | CLONE_NEWIPC | CLONE_NEWPID;

// What would reach the machine from a root process that has no user namespace around it.
constexpr int dangerous[] = {CAP_SYS_TIME, CAP_SYS_BOOT,   CAP_SYS_MODULE,  CAP_SYS_RAWIO, CAP_MKNOD,
                             CAP_SYSLOG,   CAP_WAKE_ALARM, CAP_MAC_ADMIN,   CAP_SYS_PACCT, CAP_SYS_TTY_CONFIG,
                             CAP_BPF,      CAP_PERFMON,    CAP_MAC_OVERRIDE};

struct Owner {
    uid_t user;
    gid_t group;
};

void put(const char* path, const std::string& text) {
    int file = must(open(path, O_WRONLY | O_CLOEXEC), std::string("open ") + path);
    ssize_t written = write(file, text.data(), text.size());
    close(file);
    must(written, std::string("write ") + path);
}

/// Makes the owner root in there, and if he is root here also lets the stranger be.
void mapUsers(const std::string& process, const Owner& owner, bool withStranger) {
    const std::string other = std::to_string(stranger);
    const std::string more = withStranger ? "\n" + other + " " + other + " 1" : "";
    put((process + "/setgroups").c_str(), "deny");
    put((process + "/uid_map").c_str(), "0 " + std::to_string(owner.user) + " 1" + more);
    put((process + "/gid_map").c_str(), "0 " + std::to_string(owner.group) + " 1" + more);
}

/// What a new process and its starter agree on: who writes down the users. Only root may write two, and only
/// from outside.
class Handshake {
public:
    Handshake() { must(pipe2(ends_, O_CLOEXEC), "make a pipe"); }
    ~Handshake() {
        close(ends_[0]);
        close(ends_[1]);
    }
    Handshake(const Handshake&) = delete;
    Handshake& operator=(const Handshake&) = delete;

    void mapFromOutside(pid_t process, const Owner& owner) const {
        bool mapped = false;
        try {
            if (owner.user == 0) {
                mapUsers("/proc/" + std::to_string(process), owner, true);
                mapped = true;
            }
        } catch (const std::exception&) {
            // A root without that right here; the process maps itself alone.
        }
        must(write(ends_[1], &mapped, sizeof mapped), "tell who maps the users");
    }
    void mapFromInside(const Owner& owner) const {
        bool mapped = false;
        must(read(ends_[0], &mapped, sizeof mapped), "hear who maps the users");
        if (!mapped) mapUsers("/proc/self", owner, false);
    }

private:
    int ends_[2];
};

void dropDangerousCapabilities() {
    __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
    __user_cap_data_struct sets[_LINUX_CAPABILITY_U32S_3];
    must(syscall(SYS_capget, &header, sets), "read the capabilities");
    for (int capability : dangerous) {
        must(prctl(PR_CAPBSET_DROP, capability, 0, 0, 0), "drop a capability");
        auto& set = sets[CAP_TO_INDEX(capability)];
        set.effective &= ~CAP_TO_MASK(capability);
        set.permitted &= ~CAP_TO_MASK(capability);
        set.inheritable &= ~CAP_TO_MASK(capability);
    }
    must(syscall(SYS_capset, &header, sets), "drop the capabilities");
}

// Opened before the kernel's settings become read-only; none without the kernel's help: then they just grow.
int lastProcess = -1;

// Takes in the processes that lose their parent, as the first process of a host must.
int waitForBody(pid_t body) {
    pollfd ended{static_cast<int>(must(syscall(SYS_pidfd_open, body, 0), "watch the body")), POLLIN, 0};
    while (poll(&ended, 1, 20) <= 0) {
        keepProcessNumbersLow();
        siginfo_t next{};
        while (waitid(P_ALL, 0, &next, WEXITED | WNOHANG | WNOWAIT) == 0 && next.si_pid > 0 &&
               next.si_pid != body) {
            waitpid(next.si_pid, nullptr, 0);
            next.si_pid = 0;
        }
    }
    int status = 0;
    must(waitpid(body, &status, 0), "wait for the body");
    return status;
}

[[noreturn]] void runInit(int report, const std::function<void()>& body, const Owner& owner,
                          const Handshake* mapping) {
    try {
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        if (mapping) mapping->mapFromInside(owner);
        lastProcess = open("/proc/sys/kernel/ns_last_pid", O_RDWR | O_CLOEXEC);
        buildRoot();
        if (!mapping) dropDangerousCapabilities();
        must(sethostname("localhost", 9), "set the host name");
        pid_t child = must(fork(), "start the body");
        if (child == 0) {
            body();
            std::exit(0);
        }
        send(report, {Report::ended, waitForBody(child), 0, "", ""});
    } catch (const std::exception& error) {
        send(report, {Report::problem, 0, 0, "", error.what()});
    }
    _exit(0);
}

// The plain system call, unlike fork and unshare, works beside a sanitizer's background thread. The child has
// the thread library's idea of its parent's thread id; it does nothing that needs it and forks again
// properly.
pid_t cloneInto(int flags) {
    return static_cast<pid_t>(syscall(SYS_clone, flags | SIGCHLD, nullptr, nullptr, nullptr, nullptr));
}

bool userNamespaceWanted() {
    const char* wanted = std::getenv("CORVISTA_TEST_USER_NAMESPACE");
    return geteuid() != 0 || !wanted || std::string(wanted) != "0";
}

}  // namespace

void keepProcessNumbersLow() {
    char digits[16] = {};
    if (lastProcess < 0 || pread(lastProcess, digits, sizeof digits - 1, 0) <= 0) return;
    if (std::atoi(digits) < highestProcess / 4) return;
    [[maybe_unused]] ssize_t put = pwrite(lastProcess, "2", 1, 0);
}

pid_t startWorld(int report, const std::function<void()>& body) {
    Owner owner{geteuid(), getegid()};
    prepareRoot();
    pid_t init = -1;
    if (userNamespaceWanted()) {
        const Handshake mapping;
        init = cloneInto(namespaces | CLONE_NEWUSER);
        if (init == 0) runInit(report, body, owner, &mapping);
        if (init > 0) mapping.mapFromOutside(init, owner);
    }
    if (init < 0 && owner.user == 0) {
        init = cloneInto(namespaces);
        if (init == 0) runInit(report, body, owner, nullptr);
    }
    return must(init,
                "create the namespaces of a fake host (as a user this needs unprivileged user namespaces: "
                "kernel.unprivileged_userns_clone=1, user.max_user_namespaces>0)");
}

}  // namespace fake_host
