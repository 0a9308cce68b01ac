#include "tests/hosttools/network_namespace.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <fstream>

namespace {

/// Namespaces in which this user is root. Where user namespaces are switched off, root does without.
bool unshareAsRoot(int kinds) {
    const uid_t user = geteuid();
    const gid_t group = getegid();
    if (unshare(CLONE_NEWUSER | kinds) != 0) return unshare(kinds) == 0;
    std::ofstream("/proc/self/setgroups") << "deny";
    std::ofstream("/proc/self/uid_map") << "0 " << user << " 1";
    std::ofstream("/proc/self/gid_map") << "0 " << group << " 1";
    return true;
}

void enter(pid_t process, const char* kind, int flag) {
    const std::string path = "/proc/" + std::to_string(process) + "/ns/" + kind;
    const int space = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    // The own user namespace cannot be entered again: the keeper did without one.
    if (setns(space, flag) != 0 && flag != CLONE_NEWUSER) _exit(126);
    close(space);
}

bool succeeds(const std::function<bool()>& function) {
    std::fflush(nullptr);  // or the child prints what waits in the buffers once more
    const pid_t child = fork();
    if (child == 0) std::exit(function() ? 0 : 1);
    int status = 1;
    waitpid(child, &status, 0);
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

}  // namespace

bool canUnshare() {
    return succeeds([] { return unshareAsRoot(CLONE_NEWNET | CLONE_NEWNS); });
}

void enterPrivate(const std::map<std::string, std::string>& directories) {
    if (!unshareAsRoot(CLONE_NEWNS | CLONE_NEWNET) || mount("", "/", "", MS_REC | MS_PRIVATE, nullptr) != 0) {
        _exit(126);
    }
    for (const auto& [place, directory] : directories) {
        if (mount(directory.c_str(), place.c_str(), "", MS_BIND, nullptr) != 0) _exit(126);
    }
}

NetworkNamespace::NetworkNamespace() {
    std::array<int, 2> leash{};
    std::array<int, 2> ready{};
    EXPECT_EQ(pipe2(leash.data(), O_CLOEXEC), 0);
    EXPECT_EQ(pipe2(ready.data(), O_CLOEXEC), 0);
    keeper_ = fork();
    if (keeper_ == 0) {
        close(leash[1]);
        const char word = unshareAsRoot(CLONE_NEWNET) ? 'y' : 'n';
        char end = 0;
        if (write(ready[1], &word, 1) == 1) (void)!read(leash[0], &end, 1);
        _exit(0);
    }
    close(leash[0]);
    close(ready[1]);
    leash_ = leash[1];
    char word = 'n';
    EXPECT_EQ(read(ready[0], &word, 1), 1);
    EXPECT_EQ(word, 'y') << "no network namespace";
    close(ready[0]);
}

NetworkNamespace::~NetworkNamespace() {
    close(leash_);
    waitpid(keeper_, nullptr, 0);
}

void NetworkNamespace::join() const {
    enter(keeper_, "user", CLONE_NEWUSER);
    enter(keeper_, "net", CLONE_NEWNET);
}

Outcome NetworkNamespace::run(const Words& words) const {
    return ::run(words, [this] { join(); });
}

Outcome NetworkNamespace::shell(const std::string& command) const {
    return run({"/bin/sh", "-c", command});
}

bool NetworkNamespace::inside(const std::function<bool()>& function) const {
    return succeeds([&] {
        join();
        return function();
    });
}
