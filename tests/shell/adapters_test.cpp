// Our own host tools as calls: the same listings as from the program, and as current.
#include <gmock/gmock.h>
#include <linux/rtnetlink.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <fstream>
#include <regex>
#include <thread>

#include "agent/shell/kernel_news.h"
#include "agent/shell/programs.h"
#include "agent/shell/runner.h"
#include "tests/shell/both_ways.h"
#include "tests/support/fake_host.h"
#include "tests/support/waiting.h"

namespace {

using both_ways::Complaints;
using both_ways::direct;
using both_ways::inShell;

constexpr const char* kListings[] = {"ifconfig",
                                     "ifconfig -a",
                                     "ifconfig lo",
                                     "ifconfig one",
                                     "ifconfig one:a",
                                     "ifconfig nosuch",
                                     "ifconfig -a | grep two",
                                     "route -n",
                                     "route -A inet6 -n | grep one | tr -s ' ' | cut -d ' ' -f2",
                                     "fdisk -ls",
                                     "ethtool lo",
                                     "ethtool one | grep \"Link detected\"",
                                     "ethtool one 2> /dev/null | grep Speed | tr -s ' ' | cut -d ' ' -f2",
                                     "egrep 'eth|bond|usb' /proc/net/dev | tr -s ' ' | cut -d ' ' -f2",
                                     "brctl show"};

constexpr const char* kChanges[] = {"link add one type veth peer name two",
                                    "link set one up",
                                    "link set two up",
                                    "address add 192.0.2.7/24 broadcast + dev one",
                                    "address add 192.0.2.9/24 dev one label one:a",
                                    "-6 address add 2001:db8::7/64 dev one nodad",
                                    "route add default via 192.0.2.1",
                                    "-6 route add default via 2001:db8::1",
                                    "-6 address delete 2001:db8::7/64 dev one",
                                    "nexthop add id 7 via 192.0.2.1 dev one",
                                    "route add 198.51.100.0/24 nhid 7",
                                    "nexthop delete id 7",
                                    "link set one mtu 1400",
                                    "link set one address 02:00:5e:00:00:07",
                                    "link set two down",
                                    "route delete default",
                                    "link delete one"};

/// What is counted changes without news, and is not what anybody asks for.
std::string withoutCounts(const std::string& text) {
    static const std::regex counts(
        "(packets|bytes|errors|dropped|overruns|frame|carrier|collisions):[0-9]+( \\([^)]*\\))?");
    return std::regex_replace(text, counts, "$1");
}

std::size_t processesStarted() {
    std::ifstream in("/proc/self/task/" + std::to_string(gettid()) + "/children");
    return static_cast<std::size_t>(std::distance(std::istream_iterator<pid_t>(in), {}));
}

void useAdapters() {
    setenv("LC_ALL", "C", 1);
    std::string path;
    for (const std::string tool : {"brctl", "egrep", "ethtool", "fdisk", "ifconfig", "route"}) {
        path += std::string(HOSTTOOLS_LINKS) + "/" + tool + ":";
    }
    setenv("PATH", (path + std::getenv("PATH")).c_str(), 1);
    cvagent::shell::setHostTools(HOSTTOOLS_PROGRAM);
}

/// A link settles, and the news of it come, a moment after the change.
void compareListings(const std::string& change) {
    for (const std::string listing : kListings) {
        auto ours = direct(listing, Complaints::unseen);
        auto theirs = inShell(listing, Complaints::unseen);
        const auto alike = [&] {
            ours = direct(listing, Complaints::unseen);
            theirs = inShell(listing, Complaints::unseen);
            return withoutCounts(ours.out) == withoutCounts(theirs.out);
        };
        EXPECT_TRUE(eventually(alike)) << listing << " after " << change << ":\n" << ours.out << theirs.out;
        EXPECT_FALSE(ours.inShell) << listing;
        EXPECT_EQ(ours.status, theirs.status) << listing << " after " << change;
    }
}

HOST_TEST(Adapters, ListWhatTheKernelHasNow) {
    host.useKernelNetwork();
    host.realTool("ip");
    useAdapters();
    compareListings("the start");
    for (const std::string change : kChanges) {
        EXPECT_EQ(inShell("ip " + change, Complaints::seen).err, "");
        compareListings(change);
    }
}

HOST_TEST(Adapters, AreAskedAnewAtOnceWhenARouteGoesWithItsNextHop) {
    host.useKernelNetwork();
    host.realTool("ip");
    useAdapters();
    for (const std::string change :
         {"link add one type veth peer name two", "link set one up", "link set two up",
          "address add 192.0.2.7/24 dev one", "nexthop add id 7 via 192.0.2.1 dev one",
          "route add 198.51.100.0/24 nhid 7"}) {
        ASSERT_EQ(inShell("ip " + change, Complaints::seen).err, "");
    }
    const auto shown = [] { return direct("route -n", Complaints::unseen).out; };
    ASSERT_TRUE(eventually([&] { return shown().find("198.51.100.0") != std::string::npos; }));
    std::this_thread::sleep_for(std::chrono::milliseconds(200));  // until what is told is kept
    shown();
    inShell("ip nexthop delete id 7", Complaints::seen);
    EXPECT_EQ(shown().find("198.51.100.0"), std::string::npos);
}

/// Is told of links like the runner, and has as much room for what is told.
int openListener() {
    const int listener = socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, NETLINK_ROUTE);
    sockaddr_nl address{};
    address.nl_family = AF_NETLINK;
    address.nl_groups = RTMGRP_LINK;
    bind(listener, reinterpret_cast<const sockaddr*>(&address), sizeof address);
    return listener;
}

HOST_TEST(Adapters, ReadTheKernelAnewWhenNewsWereLost) {
    host.useKernelNetwork();
    host.realTool("ip");
    ASSERT_EQ(inShell("ip link add one type veth peer name two", Complaints::seen).err, "");
    cvagent::shell::KernelNews news;
    EXPECT_FALSE(news.isQuiet());
    EXPECT_TRUE(news.isQuiet());
    const int listener = openListener();
    std::string batch;
    for (int mtu = 1000; mtu < 1400; ++mtu) {
        batch += "link set one mtu " + std::to_string(mtu) + '\n';
    }
    host.file("/tmp/batch", batch);
    ASSERT_EQ(inShell("ip -batch /tmp/batch", Complaints::seen).err, "");
    char begin = 0;
    EXPECT_EQ(recv(listener, &begin, 1, 0), -1);
    EXPECT_EQ(errno, ENOBUFS) << "more than there is room for";
    close(listener);
    EXPECT_FALSE(news.isQuiet());
    EXPECT_TRUE(news.isQuiet());
}

HOST_TEST(Adapters, NeedNoProcess) {
    host.useKernelNetwork();
    host.realTool("ip");
    useAdapters();
    for (const char* command : {"ifconfig", "ifconfig lo", "route -n", "ethtool lo", "brctl show"}) {
        const auto stream = cvagent::shell::openCommand(command);
        ASSERT_TRUE(stream.has_value());
        EXPECT_EQ(processesStarted(), 0U) << command;
        cvagent::shell::closeCommand(*stream);
    }
    for (const char* command : {"ifconfig lo up", "route del default", "fdisk -l /dev/sda", "ifconfig nosuch",
                                "ethtool -i lo", "brctl show br0", "egrep lo /proc/net/dev"}) {
        const auto stream = cvagent::shell::openCommand(command);
        ASSERT_TRUE(stream.has_value());
        EXPECT_EQ(processesStarted(), 1U) << command;
        cvagent::shell::closeCommand(*stream);
    }
}

HOST_TEST(Adapters, LeaveADiskThatMustBeOpenedToTheProgram) {
    useAdapters();
    host.file("/sys/block/sda/size", "1000\n");
    host.file("/sys/block/sda/dev", "8:0\n");
    const auto stream = cvagent::shell::openCommand("fdisk -ls 2> /dev/null");
    EXPECT_EQ(processesStarted(), 1U);
    cvagent::shell::closeCommand(*stream);
    host.file("/run/udev/data/b8:0", "E:ID_PART_TABLE_TYPE=dos\n");
    const auto known = cvagent::shell::openCommand("fdisk -ls 2> /dev/null");
    EXPECT_EQ(processesStarted(), 0U);
    cvagent::shell::closeCommand(*known);
}

HOST_TEST(Adapters, AreNotTakenForAnybodyElses) {
    host.useKernelNetwork();
    host.realTool("ip");
    useAdapters();
    host.tool("ifconfig lo", "scripted\n");
    setenv("PATH", (std::string("/tools:") + std::getenv("PATH")).c_str(), 1);
    EXPECT_EQ(direct("ifconfig lo", Complaints::seen).out, "scripted\n");
}

}  // namespace
