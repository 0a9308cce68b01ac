// A plug-in whose one write reaches for the host in every way that the fence has to hold against. It asks the
// kernel itself, past whatever stands in for a library's function. What it could do comes back as the error.
#include <fcntl.h>
#include <linux/if_link.h>
#include <linux/reboot.h>
#include <linux/rtnetlink.h>
#include <net/if.h>
#include <sched.h>
#include <sys/ioctl.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <sys/time.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <syscall.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <fstream>
#include <string>

#include "framework/ic/management_interface.h"

namespace {

using IC::Error;
using IC::Number;
using IC::PropertyValue;

std::string done;

void tried(const char* what, bool could) {
    done += could ? std::string(done.empty() ? "" : ", ") + what : "";
}

bool canWrite(const char* path, int flags = 0) {
    const int file = open(path, O_WRONLY | O_NONBLOCK | flags, 0600);
    if (file >= 0) {
        close(file);
    }
    return file >= 0;
}

void reachForClock() {
    timeval time{};
    tried("settimeofday", syscall(SYS_settimeofday, &time, nullptr) == 0);
    timespec moment{};
    tried("clock_settime", syscall(SYS_clock_settime, CLOCK_REALTIME, &moment) == 0);
}

void reachForPower() {
    tried("reboot", syscall(SYS_reboot, LINUX_REBOOT_MAGIC1, LINUX_REBOOT_MAGIC2, LINUX_REBOOT_CMD_CAD_ON,
                            nullptr) == 0);
    tried("sysrq", canWrite("/proc/sysrq-trigger") || canWrite("/.proc/sysrq-trigger"));
}

void reachForFiles() {
    tried("a new file in /usr", canWrite("/usr/reached", O_CREAT));
    tried("a new file in /", canWrite("/reached", O_CREAT));
    tried("a file of the host", canWrite("/var/precious"));
    tried("kernel settings", canWrite("/proc/sys/kernel/hostname") || canWrite("/.proc/sys/kernel/hostname"));
    tried("a pipe of a daemon", canWrite("/run/initctl") || access("/run/initctl", F_OK) == 0);
    tried("a file made writable", mount(nullptr, "/", nullptr, MS_REMOUNT | MS_BIND, nullptr) == 0 ||
                                      mount(nullptr, "/usr", nullptr, MS_REMOUNT | MS_BIND, nullptr) == 0);
    tried("the file below", umount2("/etc", MNT_DETACH) == 0);
    tried("a device", mknod("/etc/disk", S_IFBLK | 0600, makedev(7, 0)) == 0);
}

void reachForDaemons() {
    tried("a daemon's socket in sight", access("/run/dbus/system_bus_socket", F_OK) == 0);
    for (const char* name : {"/run/dbus/system_bus_socket", "/var/a daemon/its socket"}) {
        sockaddr_un place{};
        place.sun_family = AF_UNIX;
        std::strcpy(place.sun_path, name);
        const int handle = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
        tried(name, connect(handle, reinterpret_cast<const sockaddr*>(&place), sizeof place) == 0);
        close(handle);
    }
}

/// A link that is made from here in the network that a file stands for.
bool canMakeLinkIn(int network) {
    struct Request {
        nlmsghdr head{};
        ifinfomsg link{};
        rtattr networkHead{RTA_LENGTH(sizeof(int)), IFLA_NET_NS_FD};
        int network = -1;
        rtattr infoHead{RTA_LENGTH(sizeof(rtattr) + 8), IFLA_LINKINFO};
        rtattr kindHead{RTA_LENGTH(7), IFLA_INFO_KIND};
        char kind[8] = "bridge";
    } request;
    request.network = network;
    request.head.nlmsg_len = sizeof request;
    request.head.nlmsg_type = RTM_NEWLINK;
    request.head.nlmsg_flags = NLM_F_REQUEST | NLM_F_CREATE | NLM_F_ACK;
    const int handle = socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_ROUTE);
    struct {
        nlmsghdr head;
        nlmsgerr error;
        char rest[512];
    } answer{};
    const bool isAnswered =
        send(handle, &request, sizeof request, 0) > 0 && recv(handle, &answer, sizeof answer, 0) > 0;
    close(handle);
    return isAnswered && answer.head.nlmsg_type == NLMSG_ERROR && answer.error.error == 0;
}

void reachForNetwork() {
    const int network = open("/var/network of the host", O_RDONLY | O_CLOEXEC);
    tried("a link in the host's network", canMakeLinkIn(network));
    tried("the host's network", setns(network, CLONE_NEWNET) == 0);
    close(network);
}

void reachForOpenFiles() {
    for (int file = 0; file < 1024; ++file) {
        char name[64] = {};
        static_cast<void>(readlink(("/proc/self/fd/" + std::to_string(file)).c_str(), name, sizeof name - 1));
        tried("an open file of the caller",
              std::strcmp(name, "/var/precious") == 0 && write(file, "!", 1) == 1);
    }
}

bool isChild(pid_t process) {
    std::ifstream stat("/proc/" + std::to_string(process) + "/stat");
    std::string skipped;
    pid_t parent = -1;
    stat >> skipped >> skipped >> skipped >> parent;
    return parent == getpid();
}

/// Every process that it can name, but itself and what it has started.
void reachForProcesses() {
    for (pid_t process = 1; process < 40000; ++process) {
        const bool isOwnThread = access(("/proc/self/task/" + std::to_string(process)).c_str(), F_OK) == 0;
        tried("a process of the host", !isOwnThread && kill(process, 0) == 0 && !isChild(process));
    }
    kill(0, SIGURG);  // whoever is in its process group
    tried("the parent", ptrace(PTRACE_ATTACH, getppid(), nullptr, nullptr) == 0);
}

/// These do take place, in what the process has of its own.
void reachForNames() {
    static_cast<void>(sethostname("reached", 7));
    ifreq request{};
    std::strcpy(request.ifr_name, "lo");
    const int handle = socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    ioctl(handle, SIOCSIFFLAGS, &request);
    std::strcpy(request.ifr_name, "veth0");
    ioctl(handle, SIOCSIFFLAGS, &request);
    close(handle);
    static_cast<void>(canWrite("/etc/reached", O_CREAT));
    static_cast<void>(unlink("/etc/hosts"));
}

bool ready = false;

class ReachingNode : public IC::MutableNode {
public:
    using MutableNode::MutableNode;
    Error setProperty(const unsigned int& id, const PropertyValue& value) override {
        if (!ready) {
            return MutableNode::setProperty(id, value);
        }
        if (value == PropertyValue("hang", true)) {
            if (fork() == 0) {
                prctl(PR_SET_NAME, "hanging");
            }
            for (;;) {
                pause();
            }
        }
        reachForClock();
        reachForPower();
        reachForFiles();
        reachForDaemons();
        reachForNetwork();
        reachForOpenFiles();
        reachForProcesses();
        reachForNames();
        return {Error::failure, Number(), "reached: " + done + "."};
    }
};

class ReachingInterface : public IC::ManagementInterface {
public:
    Error initialize(unsigned int miId, const Number& own, const Number& first) override {
        Error result = ManagementInterface::initialize(miId, own, first);
        add(ownNodeId(), 0, 38);
        const unsigned int root = add(takeNodeId(), ownNodeId(), 59);
        add(takeNodeId(), root, 40);
        ready = true;
        return result;
    }

private:
    unsigned int add(unsigned int id, unsigned int parent, unsigned int type) {
        auto* node = new ReachingNode(id, parent, miIds(), type, 0);
        node->MutableNode::setProperty(115, PropertyValue("nobody", true));
        appendNode(node);
        return id;
    }
};

ReachingInterface interface;
Error error;

}  // namespace

extern "C" __attribute__((visibility("default"))) int OpenMI(IC::ManagementInterface** mi, Error** last) {
    *mi = &interface;
    *last = &error;
    return 0;
}
