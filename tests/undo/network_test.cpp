// The kernel's network is put back as it was, and what others have done since stays.
#include <gmock/gmock.h>
#include <linux/rtnetlink.h>

#include <chrono>
#include <filesystem>
#include <sstream>

#include "agent/undo/keeper_calls.h"
#include "agent/undo/saved_state.h"
#include "hosttools/netlink.h"
#include "tests/support/fake_host.h"
#include "tests/support/waiting.h"
#include "tests/undo/killed_at.h"

namespace {

using cvagent::undo::SavedState;
using cvagent::undo::savedStateFrom;
using cvagent::undo::takeBack;
using cvagent::undo::textOf;
using testing::Contains;
using testing::HasSubstr;
using testing::IsEmpty;
using Lines = std::vector<std::string>;

class Network : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        host.realTool("ip");
        host.useKernelNetwork();
        ip(host, "link add eth0 address 02:00:00:00:00:10 type veth peer name sw0");
        ip(host, "link add eth1 address 02:00:00:00:00:11 type veth peer name sw1");
        for (const char* each : {"eth0", "sw0", "eth1", "sw1"}) {
            // The addresses that the kernel makes by itself take their time.
            ip(host, std::string("link set ") + each + " addrgenmode none");
            ip(host, std::string("link set ") + each + " up");
        }
        for (const char* each : {"eth0", "sw0", "eth1", "sw1"}) {
            ASSERT_TRUE(carrierComes(each));
        }
        for (const char* each :
             {"address add 192.0.2.10/24 broadcast + dev eth0",
              "address add 192.0.2.11/24 dev eth0",
              "address add 192.0.2.12/24 label eth0:1 dev eth0",
              "address add 10.0.0.1/8 dev eth0",
              "address add 10.9.0.1 peer 10.9.0.2 dev eth1",
              "address add 203.0.113.9/28 dev eth1 noprefixroute",
              "route add 203.0.113.0/28 dev eth1 proto kernel src 203.0.113.9 metric 100",
              "-6 address add 2001:db8:2::1/60 dev eth1 nodad noprefixroute",
              "-6 route add 2001:db8:2::/60 dev eth1 proto kernel metric 100",
              "-6 address add 2001:db8::1/64 dev eth0 nodad",
              "-6 address add 2001:db8::2/64 dev eth0 nodad",
              "-6 address add 2001:db8:1::1/56 dev eth1 nodad",
              "address add 198.51.100.3/24 dev eth1 valid_lft 3000 preferred_lft 2000",
              "route add default via 192.0.2.1 metric 100",
              "route add 172.16.0.0/12 dev eth1 scope link",
              "route add 172.31.0.0/16 via 172.16.0.9 dev eth1 onlink src 10.9.0.1 metric 5 table 77",
              "route append 172.31.0.0/16 via 192.0.2.9 metric 5 table 77",
              "route add blackhole 192.168.0.0/16",
              "route add 100.64.0.0/10 mtu 1300 nexthop via 192.0.2.2 "
              "weight 2 nexthop via 10.0.0.7 weight 1",
              "-6 route add default via 2001:db8::ff dev eth0 metric 50",
              "-6 route add 2001:db8:9::/48 via 2001:db8::fe src 2001:db8::2",
              "-6 route add 2001:db8:a::/48 nexthop via 2001:db8::fd nexthop via 2001:db8::fc",
              "rule add from 192.0.2.12 lookup 77 priority 500",
              "-6 rule add fwmark 7 lookup 77 priority 600",
              "neighbour add 192.0.2.99 lladdr 02:00:00:00:00:99 dev eth0 nud permanent",
              "nexthop add id 5 via 192.0.2.3 dev eth0",
              "nexthop add id 6 via 10.0.0.3 dev eth0",
              "nexthop add id 9 group 5,2/6,1",
              "route add 100.127.0.0/16 nhid 9"}) {
            ip(host, each);
        }
        ASSERT_TRUE(eventually([&host] {
            return testing::Value(ip(host, "-6 route show table local"),
                                  testing::AllOf(HasSubstr("2001:db8::1 "), HasSubstr("2001:db8::2 "),
                                                 HasSubstr("2001:db8:1::1 ")));
        }));
    }

    static std::string ip(FakeHost& host, const std::string& words) {
        const Finished done = host.run({"sh", "-c", "ip " + words});
        EXPECT_EQ(done.status, 0) << words << ": " << done.err;
        return done.out;
    }

    /// All that can be put back, as the tool tells it; without what goes by itself.
    static std::string all(FakeHost& host) {
        std::string text;
        for (const char* each : {"-d link show", "-4 address show", "-6 address show scope global",
                                 "-d -4 route show table all", "-d -6 route show table all", "-4 rule",
                                 "-6 rule", "nexthop", "neighbour show nud permanent"}) {
            text += std::string("== ") + each + "\n" + ip(host, each);
        }
        std::istringstream in(text);
        std::string kept;
        for (std::string line; std::getline(in, line);) {
            const std::size_t lease = line.find("sec preferred_lft");
            line = lease == std::string::npos ? line : "leased";
            const bool isNear = line.find("fe80::") != line.npos || line.find("ff00::") != line.npos;
            kept += isNear ? "" : line + "\n";
        }
        return kept;
    }
    /// The same at last: the kernel takes note of carriers, and makes the routes to its own addresses, a
    /// while after it was told what they come from.
    static std::string allAtLast(FakeHost& host, const std::string& wanted) {
        std::string now;
        eventually([&] { return (now = all(host)) == wanted; });
        return now;
    }
};

/// What changes do, and more than they do.
const std::vector<const char*> kChanges{
    "address del 192.0.2.10/24 dev eth0",
    "address flush dev eth0",
    "address add 192.0.2.77/24 dev eth0",
    "-6 address del 2001:db8::1/64 dev eth0",
    "-6 address add 2001:db8::7/64 dev eth0 nodad",
    "-6 address flush dev eth1",
    "address del 198.51.100.3/24 dev eth1",
    "address del 203.0.113.9/28 dev eth1",
    "-6 route del 2001:db8:2::/60 dev eth1",
    "link set eth0 down",
    "link set eth1 mtu 1400",
    "link set eth1 mtu 1200",
    "link set eth0 name lan0",
    "link set eth0 promisc on arp off",
    "route del default",
    "route replace default via 192.0.2.254 metric 100",
    "route add default via 192.0.2.254",
    "route flush table 77",
    "route del 172.31.0.0/16 via 172.16.0.9 dev eth1 table 77",
    "route flush table all scope link dev eth1 proto boot",
    "route del 100.64.0.0/10",
    "route replace 100.64.0.0/10 via 192.0.2.2",
    "-6 route flush dev eth0 table main proto boot",
    "-6 route add 2001:db8:a::/48 via 2001:db8::fb dev eth0 metric 7",
    "rule del priority 500",
    "rule add from 192.0.2.10 lookup 77 priority 400",
    "-6 rule del priority 600",
    "neighbour del 192.0.2.99 dev eth0",
    "neighbour replace 192.0.2.99 lladdr 02:00:00:00:00:98 dev eth0 nud permanent",
    "nexthop del id 9",
    "nexthop del id 5",
    "nexthop replace id 6 via 10.0.0.4 dev eth0",
    "nexthop add id 12 via 10.0.0.4 dev eth0",
};

HOST_TEST_F(Network, ComesBackLineForLine) {
    const std::string old = all(host);
    for (const char* change : kChanges) {
        for (const bool wasCutOff : {false, true}) {
            const SavedState before = SavedState::of({});
            ip(host, change);
            EXPECT_NE(all(host), old) << change;
            const SavedState left = before.again();
            EXPECT_THAT(takeBack(before, wasCutOff ? nullptr : &left, left).notes, IsEmpty()) << change;
            EXPECT_EQ(allAtLast(host, old), old) << change;
        }
    }
}

HOST_TEST_F(Network, ComesBackFromAllAtOnce) {
    const std::string old = all(host);
    const SavedState before = SavedState::of({});
    for (const char* each :
         {"link set eth0 down", "link set eth1 down", "nexthop flush", "address flush dev eth0",
          "address flush dev eth1", "link set eth0 mtu 9000", "link set eth0 up",
          "address add 192.0.2.11/25 dev eth0", "route add default via 192.0.2.3",
          "neighbour flush all nud permanent", "rule flush"}) {
        ip(host, each);
    }
    const SavedState left = before.again();
    EXPECT_THAT(takeBack(before, &left, left).notes, IsEmpty());
    EXPECT_EQ(allAtLast(host, old), old);
}

/// A lease that comes late, and that the system which keeps the interface ends when it has its old file back.
class LateLease : public Network {
protected:
    void setUpHost(FakeHost& host) override {
        Network::setUpHost(host);
        host.file(kFile, "static\n");
        host.tool("/usr/sbin/ifup eth0", {"", 0, "", 0, endOf("192.0.2.100") + "; " + kStatic});
    }
    static std::string endOf(const std::string& lease) {
        return "ip address del " + lease + "/24 dev eth0; ip route del default metric 100";
    }
    static void changeToLease(FakeHost& host) {
        host.file(kFile, "dhcp\n");
        ip(host, "address flush dev eth0");
    }
    static void lease(FakeHost& host) {
        ip(host, "address add 192.0.2.100/24 dev eth0 valid_lft 3000 preferred_lft 3000 noprefixroute");
        ip(host, "route replace 192.0.2.0/24 dev eth0 src 192.0.2.100 metric 100");
        ip(host, "route replace default via 192.0.2.200 dev eth0 proto dhcp src 192.0.2.100 metric 100");
    }
    static SavedState before() {
        SavedState saved = SavedState::of({kFile});
        saved.calls = {{kFile}, {}, {"ifup eth0"}};
        return saved;
    }
    static constexpr const char* kFile = "/etc/network/interfaces";
    static constexpr const char* kStatic =
        "ip address add 192.0.2.10/24 broadcast + dev eth0; "
        "ip route add default via 192.0.2.1 metric 100";
};

HOST_TEST_F(LateLease, DoesNotStayBesideWhatComesBack) {
    const std::string old = all(host);
    const SavedState saved = before();
    changeToLease(host);
    const SavedState left = saved.again();
    lease(host);
    EXPECT_THAT(takeBack(saved, &left, saved.again()).notes, IsEmpty());
    EXPECT_EQ(allAtLast(host, old), old);
}

/// The daemon has answered, and is at it.
HOST_TEST_F(LateLease, IsWaitedForUntilItHasEnded) {
    host.realTool("sleep");
    host.tool("/usr/sbin/ifup eth0",
              {"", 0, "", 0, "(sleep 0.3; " + endOf("192.0.2.100") + ") >/dev/null 2>&1 &"});
    const std::string old = all(host);
    const SavedState saved = before();
    changeToLease(host);
    const SavedState left = saved.again();
    lease(host);
    EXPECT_THAT(takeBack(saved, &left, saved.again()).notes, IsEmpty());
    EXPECT_EQ(allAtLast(host, old), old);
}

/// Whoever has it has not been told of anything.
HOST_TEST_F(LateLease, OfAnotherHandStays) {
    const SavedState saved = before();
    ip(host, "address add 192.0.2.77/24 dev eth0");
    const SavedState left = saved.again();
    lease(host);
    EXPECT_THAT(takeBack(saved, &left, saved.again()).notes, IsEmpty());
    const std::string now = all(host);
    EXPECT_THAT(now, HasSubstr("192.0.2.100/24"));
    EXPECT_THAT(now, HasSubstr("default via 192.0.2.200"));
    EXPECT_THAT(now, testing::Not(HasSubstr("192.0.2.77")));
}

/// It asks for the lease anew, and would take one of the same second for no news.
HOST_TEST_F(Network, ALeaseIsAsOldAsNetworkManagerWantsIt) {
    host.realTool("sleep");
    host.tool("/usr/bin/nmcli device reapply eth1",
              {"", 0, "", 0,
               "(sleep 0.3; ip address change 198.51.100.3/24 dev eth1 valid_lft 2500 preferred_lft 2500) "
               ">/dev/null 2>&1 &"});
    ip(host, "address change 198.51.100.3/24 dev eth1 valid_lft 3000 preferred_lft 3000");
    const auto begin = std::chrono::steady_clock::now();
    std::vector<std::string> notes;
    cvagent::undo::runCalls({"nmcli device reapply eth1"}, notes);
    EXPECT_THAT(notes, IsEmpty());
    EXPECT_GE(std::chrono::steady_clock::now() - begin, std::chrono::milliseconds(1000));
    const std::string addresses = ip(host, "-4 -o address show dev eth1");
    EXPECT_THAT(addresses, testing::Not(HasSubstr("valid_lft 30"))) << "it was not waited for";
}

/// Some servers give one for two seconds.
HOST_TEST_F(Network, NoLeaseIsWaitedForWithoutAnEnd) {
    host.realTool("sleep");
    host.tool("/usr/bin/nmcli device reapply eth1", ToolAnswer{});
    host.file("/renew",
              "for i in $(seq 1 400); do ip address change 198.51.100.3/24 dev eth1 valid_lft 2 "
              "preferred_lft 2; sleep 0.05; done");
    ip(host, "address change 198.51.100.3/24 dev eth1 valid_lft 2 preferred_lft 2");
    host.run({"sh", "-c", "sh /renew >/dev/null 2>&1 & echo $! >/renewing"});
    std::vector<std::string> notes;
    cvagent::undo::runCalls({"nmcli device reapply eth1"}, notes);
    const std::string renewing = "/proc/" + host.read("/renewing").value_or("");
    EXPECT_TRUE(std::filesystem::exists(renewing.substr(0, renewing.find('\n'))))
        << "it has not waited for the end";
    EXPECT_THAT(notes, IsEmpty());
}

HOST_TEST_F(Network, KeepsWhatOthersHaveDoneSince) {
    const SavedState before = SavedState::of({});
    ip(host, "route replace default via 192.0.2.254 metric 100");
    ip(host, "address add 192.0.2.77/24 dev eth0");
    const SavedState left = before.again();
    for (const char* each : {"link add his0 type veth peer name his1", "link set his0 up",
                             "address add 203.0.113.65/28 dev his0", "address add 192.0.2.88/24 dev eth0",
                             "route add 198.18.0.0/15 via 192.0.2.5", "route del 192.168.0.0/16",
                             "route replace default via 192.0.2.253 metric 100",
                             "rule add priority 9 lookup 9", "link set eth1 mtu 1450"}) {
        ip(host, each);
    }
    EXPECT_THAT(takeBack(before, &left, before.again()).notes,
                testing::ElementsAre("the route default via 192.0.2.1 dev eth0 has been changed by somebody "
                                     "else since and is not put back"));
    const std::string now = all(host);
    for (const char* his : {"203.0.113.65/28", "192.0.2.88/24", "198.18.0.0/15 via 192.0.2.5",
                            "9:\tfrom all lookup 9", "mtu 1450", "default via 192.0.2.253"}) {
        EXPECT_THAT(now, HasSubstr(his));
    }
    EXPECT_THAT(now, testing::Not(HasSubstr("192.0.2.77")));
    EXPECT_THAT(now, testing::Not(HasSubstr("192.168.0.0/16"))) << "he has taken it away";
}

HOST_TEST_F(Network, KeepsWhatOthersDoWhileItIsPutBack) {
    const SavedState before = SavedState::of({});
    ip(host, "route replace default via 192.0.2.254 metric 100");
    const SavedState left = before.again();
    ip(host, "address add 192.0.2.88/24 dev eth0");
    ip(host, "route add 198.18.0.0/15 via 192.0.2.5");
    for (const bool wasCutOff : {false, true}) {
        EXPECT_THAT(takeBack(before, wasCutOff ? nullptr : &left, left).notes, IsEmpty());
        EXPECT_THAT(all(host), testing::AllOf(HasSubstr("192.0.2.88/24"), HasSubstr("198.18.0.0/15 via"),
                                              HasSubstr("default via 192.0.2.1 ")));
    }
}

/// It stays in the kernel when the address goes by which its gateway was near, and nobody can add it then.
HOST_TEST_F(Network, BringsARouteBackWhoseGatewayIsNowhere) {
    for (const char* each :
         {"address add 198.18.1.1/24 dev eth1", "route add 198.19.0.0/16 via 198.18.1.9 dev eth1",
          "address del 198.18.1.1/24 dev eth1", "-6 address add 2001:db8:5::1/64 dev eth1 nodad",
          "-6 route add 2001:db8:6::/48 via 2001:db8:5::9 dev eth1",
          "-6 address del 2001:db8:5::1/64 dev eth1"}) {
        ip(host, each);
    }
    const std::string old = all(host);
    EXPECT_THAT(old, HasSubstr("198.19.0.0/16 via 198.18.1.9"));
    const SavedState before = SavedState::of({});
    ip(host, "route del 198.19.0.0/16");
    ip(host, "-6 route del 2001:db8:6::/48");
    const SavedState left = before.again();
    EXPECT_THAT(takeBack(before, &left, left).notes, IsEmpty());
    EXPECT_EQ(allAtLast(host, old), old);
}

/// They come and go with the addresses.
HOST_TEST_F(Network, IsReadWithoutTheRoutesThatTheKernelKeepsItself) {
    EXPECT_THAT(ip(host, "route show table local"), HasSubstr("local 192.0.2.10"));
    const auto routes = SavedState::of({}).network.network.routes;
    EXPECT_THAT(routes, testing::Not(IsEmpty()));
    for (const auto& route : routes) {
        const auto head = hosttools::readPlain<rtmsg>(route.body);
        EXPECT_TRUE(head && head->rtm_table != RT_TABLE_LOCAL);
    }
}

HOST_TEST_F(Network, LeavesAloneWhatTheChangeHasNotTouched) {
    const std::string old = all(host);
    const SavedState before = SavedState::of({});
    const SavedState left = before.again();
    ip(host, "address add 192.0.2.88/24 dev eth0");
    const std::string his = all(host);
    EXPECT_THAT(takeBack(before, &left, before.again()).notes, IsEmpty());
    EXPECT_EQ(all(host), his);
    EXPECT_NE(his, old);
}

HOST_TEST_F(Network, SaysWhatItCannotBringBack) {
    ip(host, "-6 route add 2001:db8:77::/48 via 2001:db8::fe proto ra");
    ip(host, "address add 198.18.0.1/32 dev eth1 valid_lft 1000 preferred_lft 500");
    const SavedState before = SavedState::of({});
    passTime(std::chrono::seconds(1000));
    ip(host, "-6 route del 2001:db8:77::/48");
    ip(host, "address del 198.18.0.1/32 dev eth1");
    ip(host, "address del 10.9.0.1 peer 10.9.0.2 dev eth1");
    ip(host, "link del eth1");
    const SavedState left = before.again();
    const Lines notes = takeBack(before, &left, left).notes;
    EXPECT_THAT(notes, Contains("the address 198.18.0.1/32 of eth1 is not put back: its time is over"));
    EXPECT_THAT(notes, Contains("the route 2001:db8:77::/48 via 2001:db8::fe dev eth0 is not put back: "
                                "the kernel, a router or a routing program makes it"));
    EXPECT_THAT(notes, Contains("the address 10.9.0.1/32 of eth1 is not put back: No such device"));
}

HOST_TEST_F(Network, OfAnotherStartOfTheHostStays) {
    SavedState before = SavedState::of({"/etc/x"});
    before.boot = "another one";
    ip(host, "route del default");
    host.file("/etc/x", "new\n");
    host.setHostName("new");
    const SavedState left = before.again();
    const std::string now = all(host);
    EXPECT_THAT(takeBack(before, &left, before.again()).notes, IsEmpty());
    EXPECT_FALSE(host.exists("/etc/x"));
    EXPECT_EQ(all(host), now);
    EXPECT_EQ(SavedState::of({}).hostName, "new");
}

HOST_TEST_F(Network, OutlivesItsText) {
    const std::string old = all(host);
    const SavedState before = savedStateFrom(textOf(SavedState::of({})));
    ip(host, "address flush dev eth0");
    const SavedState left = savedStateFrom(textOf(before.again()));
    EXPECT_THAT(takeBack(before, &left, left).notes, IsEmpty());
    EXPECT_EQ(allAtLast(host, old), old);
}

}  // namespace
