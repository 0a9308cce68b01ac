#include "agent/change/namespaces.h"

#include <linux/capability.h>
#include <linux/magic.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/vfs.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "agent/change/cannot.h"
#include "agent/change/mount_calls.h"

namespace cvagent::change {

long must(long result, const std::string& what) {
    if (result < 0) {
        throw Cannot(what + ": " + std::strerror(errno));
    }
    return result;
}

namespace {

constexpr std::array kKeptRights = {CAP_CHOWN,     CAP_DAC_OVERRIDE, CAP_DAC_READ_SEARCH, CAP_FOWNER,
                                    CAP_FSETID,    CAP_KILL,         CAP_SETGID,          CAP_SETUID,
                                    CAP_NET_ADMIN, CAP_NET_RAW};

void put(const std::string& file, const std::string& text) {
    std::ofstream out(file);
    out << text << std::flush;
    if (!out) {
        throw Cannot("the users of a namespace cannot be named (" + file + "): " + std::strerror(errno));
    }
}

/// Each range of numbers led to itself.
std::string sameNumbers(const char* map) {
    std::ifstream ranges(map);
    std::ostringstream same;
    unsigned long inside = 0;
    unsigned long outside = 0;
    unsigned long count = 0;
    while (ranges >> inside >> outside >> count) {
        same << inside << ' ' << inside << ' ' << count << '\n';
    }
    return same.str();
}

/// What people can do about it stands in the text.
[[noreturn]] void failWithoutUserNamespace(int error) {
    const std::string reason = std::strerror(error);
    if (error == ENOSPC || error == EUSERS) {
        throw Cannot("the host allows no further user namespace (user.max_user_namespaces): " + reason);
    }
    throw Cannot("the host allows no user namespace here: " + reason);
}

void newUserNamespace() {
    if (unshare(CLONE_NEWUSER) != 0) {
        failWithoutUserNamespace(errno);
    }
}

/// Names of other networks, through which links could be made there.
void hideNetworks() {
    for (const MountPoint& mount : mountPoints()) {
        struct statfs found {};
        if (mount.type == "nsfs") {
            umount2(mount.path.c_str(), MNT_DETACH);
            const bool isSeen = statfs(mount.path.c_str(), &found) == 0 && found.f_type == NSFS_MAGIC;
            must(isSeen ? -1 : 0, "a network of the host cannot be hidden");
        }
    }
}

}  // namespace

void limitRights(Fence fence) {
    std::vector<int> kept(kKeptRights.begin(), kKeptRights.end());
    if (fence == Fence::userNamespace) {
        kept.push_back(CAP_SYS_ADMIN);
    } else {
        hideNetworks();
    }
    for (int capability = 0; prctl(PR_CAPBSET_READ, capability, 0, 0, 0) >= 0; ++capability) {
        if (std::ranges::find(kept, capability) == kept.end()) {
            must(prctl(PR_CAPBSET_DROP, capability, 0, 0, 0), "a right cannot be given up");
        }
    }
    std::array<__user_cap_data_struct, 2> sets{};
    for (const int capability : kept) {
        auto& set = sets.at(static_cast<std::size_t>(CAP_TO_INDEX(capability)));
        set.effective |= CAP_TO_MASK(capability);
        set.permitted |= CAP_TO_MASK(capability);
    }
    __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
    must(syscall(SYS_capset, &header, sets.data()), "rights cannot be given up");
    must(prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0), "further rights cannot be refused");
}

bool gainRightToIsolate() {
    // Else what /proc has of this process would be root's, as after a start with other rights than the
    // caller's.
    prctl(PR_SET_DUMPABLE, 1, 0, 0, 0);
    const pid_t self = getpid();
    __user_cap_header_struct header{_LINUX_CAPABILITY_VERSION_3, 0};
    std::array<__user_cap_data_struct, 2> sets{};
    must(syscall(SYS_capget, &header, sets.data()), "the rights cannot be read");
    const auto has = [&sets](int capability) {
        return (sets.at(static_cast<std::size_t>(CAP_TO_INDEX(capability))).effective &
                CAP_TO_MASK(capability)) != 0;
    };
    if (has(CAP_SYS_ADMIN) && has(CAP_SETUID) && has(CAP_SETGID)) {
        return false;
    }
    const std::string user = std::to_string(geteuid());
    const std::string group = std::to_string(getegid());
    newUserNamespace();
    const std::string process = "/proc/" + std::to_string(self);
    put(process + "/setgroups", "deny");
    put(process + "/uid_map", "0 " + user + " 1");
    put(process + "/gid_map", "0 " + group + " 1");
    return true;
}

pid_t startFirstProcess(const std::function<int()>& body) {
    if (unshare(CLONE_NEWPID) != 0) {
        throw Cannot(std::string("the host allows no process table of its own here: ") +
                     std::strerror(errno));
    }
    const pid_t process = fork();
    must(process, "no process");
    if (process == 0) {
        prctl(PR_SET_PDEATHSIG, SIGKILL, 0, 0, 0);
        setsid();  // a signal to its own process group would reach those who started it
        _exit(body());
    }
    return process;
}

Fence enterFence(bool asUser, const std::function<void()>& mapUsers) {
    Fence fence = Fence::userNamespace;
    if (asUser) {
        newUserNamespace();
    } else if (unshare(CLONE_NEWUSER) != 0) {
        fence = Fence::droppedRights;
    }
    if (fence == Fence::userNamespace) {
        mapUsers();
    }
    must(unshare(CLONE_NEWUTS | CLONE_NEWIPC), "no host name of its own");
    prctl(PR_SET_PDEATHSIG, SIGKILL, 0, 0, 0);  // a change of rights forgets it
    return fence;
}

void mapUsersOf(pid_t process) {
    const std::string place = "/proc/" + std::to_string(process);
    put(place + "/uid_map", sameNumbers("/proc/self/uid_map"));
    put(place + "/gid_map", sameNumbers("/proc/self/gid_map"));
}

}  // namespace cvagent::change
