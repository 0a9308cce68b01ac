// Whatever the code does that makes a change beforehand, nothing of the host is reached.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <linux/capability.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstring>

#include "agent/change/kernel_state.h"
#include "tests/change/rehearsed.h"

namespace {

using cvagent::change::Change;
using cvagent::change::Plan;
using testing::Contains;
using testing::HasSubstr;

/// A daemon's socket that takes calls.
int listening(const char* path) {
    sockaddr_un place{};
    place.sun_family = AF_UNIX;
    std::strcpy(place.sun_path, path);
    const int handle = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    EXPECT_EQ(bind(handle, reinterpret_cast<const sockaddr*>(&place), sizeof place), 0);
    EXPECT_EQ(listen(handle, 1), 0);
    return handle;
}

Change reaching(const std::string& text) {
    return {"computer", 115, {text}};
}

/// Should the fence not hold, the clock and the power are out of reach all the same.
void giveUpClockAndPower() {
    for (const int right : {CAP_SYS_TIME, CAP_SYS_BOOT}) {
        ASSERT_EQ(prctl(PR_CAPBSET_DROP, right, 0, 0, 0), 0);
    }
}

volatile std::sig_atomic_t isSignalled = 0;

/// @return the plan of what the plug-in did to its own
Plan reachForTheHost(FakeHost& host) {
    giveUpClockAndPower();
    host.useKernelNetwork();
    host.realTool("ip");
    host.run({"ip", "link", "add", "veth0", "type", "veth", "peer", "name", "veth1"});
    host.run({"ip", "link", "set", "veth0", "up"});
    host.file("/etc/hosts", "127.0.0.1 localhost\n");
    host.file("/var/precious", "kept");
    host.directory("/run/dbus");
    EXPECT_EQ(mkfifo("/run/initctl", 0600), 0);
    host.file("/var/network of the host", "");
    EXPECT_EQ(mount("/.proc/self/ns/net", "/var/network of the host", nullptr, MS_BIND, nullptr), 0);
    host.directory("/var/a daemon");
    const std::vector<int> daemons{listening("/run/dbus/system_bus_socket"),
                                   listening("/var/a daemon/its socket")};
    // As a caller has a file open that he hands down without a thought, and belongs to a group of processes.
    const int precious = open("/var/precious", O_WRONLY);
    std::signal(SIGURG, [](int) { isSignalled = 1; });
    moveRecords(host);
    const auto files = writtenPart(host);
    const auto kernel = cvagent::change::readKernelState();

    Plan plan = rehearsed({reaching("now")}, REACHING_PLUGIN_FILE);

    EXPECT_THAT(plan.answers.at(0).problem, HasSubstr("reached: ."));
    for (const int daemon : daemons) {
        EXPECT_EQ(accept(daemon, nullptr, nullptr), -1);
        EXPECT_EQ(errno, EAGAIN);
        close(daemon);
    }
    close(precious);
    EXPECT_EQ(isSignalled, 0) << "the whole process group of the caller";
    EXPECT_EQ(writtenPart(host), files);
    EXPECT_EQ(cvagent::change::readKernelState(), kernel);
    EXPECT_EQ(host.read("/var/precious"), "kept");
    EXPECT_FALSE(host.exists("/usr/reached") || host.exists("/reached"));
    EXPECT_TRUE(host.clockCalls().empty());
    EXPECT_THAT(plan.kernelAfter, Contains(HasSubstr("link veth0 mtu 1500 down")));
    EXPECT_THAT(kernel, Contains(HasSubstr("link veth0 mtu 1500 up")));
    umount2("/var/network of the host", MNT_DETACH);
    return plan;
}

HOST_TEST(Fence, HoldsAgainstCodeThatReachesForTheHost) {
    const Plan plan = reachForTheHost(host);
    EXPECT_THAT(plan.kernelAfter, Contains("host name reached"));
    ASSERT_EQ(plan.files.size(), 2U);
    EXPECT_EQ(plan.files[0].path, "/etc/hosts");
    EXPECT_EQ(plan.files[0].after, std::nullopt);
    EXPECT_EQ(plan.files[1].path, "/etc/reached");
    EXPECT_EQ(plan.files[1].before, std::nullopt);
}

/// Where root gets no user namespace, the rights that it gives up have to do.
HOST_TEST(Fence, HoldsWithoutAUserNamespace) {
    enterJail(host);
    const Plan plan = reachForTheHost(host);
    EXPECT_THAT(plan.unforeseen, Contains(HasSubstr("no user namespace")));
    EXPECT_EQ(plan.files.size(), 2U);
}

/// All processes of the host, with their names.
std::vector<std::string> processes(const FakeHost& host) {
    std::vector<std::string> found;
    for (const std::string& name : host.listDirectory("/.proc")) {
        if (name.find_first_not_of("0123456789") == std::string::npos) {
            const std::string stat = host.read("/.proc/" + name + "/stat").value_or("");
            found.push_back(stat.substr(0, stat.find(')') + 1));
        }
    }
    return found;
}

void expectProcesses(const FakeHost& host, const std::vector<std::string>& wanted) {
    const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
    while (processes(host) != wanted && std::chrono::steady_clock::now() < end) {
        usleep(10'000);
    }
    EXPECT_EQ(processes(host), wanted);
}

HOST_TEST(Fence, LeavesNothingBehindWhenTimeIsOver) {
    moveRecords(host);
    const auto before = processes(host);
    cvagent::change::RehearsalSettings settings;
    settings.plugins = {REACHING_PLUGIN_FILE};
    settings.program = REHEARSAL_PROGRAM;
    settings.longest = std::chrono::seconds(2);
    EXPECT_THROW(rehearse(settings, {reaching("hang")}), cvagent::change::CannotRehearse);
    expectProcesses(host, before);
}

HOST_TEST(Fence, EndsWithItsCaller) {
    moveRecords(host);
    const auto before = processes(host);
    const pid_t caller = fork();
    if (caller == 0) {
        rehearsed({reaching("hang")}, REACHING_PLUGIN_FILE);
        _exit(1);
    }
    const auto hangs = [&host] {
        return std::ranges::any_of(processes(host),
                                   [](const std::string& each) { return each.ends_with("(hanging)"); });
    };
    const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
    while (!hangs() && std::chrono::steady_clock::now() < end) {
        usleep(10'000);
    }
    EXPECT_TRUE(hangs());
    kill(caller, SIGKILL);
    waitpid(caller, nullptr, 0);
    expectProcesses(host, before);
}

}  // namespace
