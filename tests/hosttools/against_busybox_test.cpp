// What the adapters print and change beside what busybox prints and changes, which keeps the classic formats.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/if.h>
#include <linux/if_tun.h>
#include <net/if_arp.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <cstring>

#include "tests/hosttools/network_namespace.h"

namespace {

constexpr int kMostAttempts = 40;

class AgainstBusybox : public testing::Test {
protected:
    void SetUp() override {
        if (!hasProgram("busybox")) GTEST_SKIP() << "busybox is not installed";
        if (!hasProgram("ip")) GTEST_SKIP() << "ip is not installed";
        if (!canUnshare()) GTEST_SKIP() << "namespaces are not available";
        network_.emplace();
    }

    NetworkNamespace& network() { return *network_; }

    /// Carries out ip commands, one a line. The first says whether this kernel has that kind of link.
    bool setUp(const std::string& commands) {
        const std::size_t end = commands.find('\n');
        if (network().shell(commands.substr(0, end)).status != 0) return false;
        const Outcome rest = network().shell("set -e\n" + commands.substr(end + 1));
        EXPECT_EQ(rest.status, 0) << rest.errors;
        return true;
    }

    /// Counters run on while addresses are announced: only two equal listings around busybox's count.
    void expectSame(const Words& words) {
        Words ours = words;
        ours[0] = adapter(words[0]);
        Words theirs = words;
        theirs.insert(theirs.begin(), "busybox");
        Outcome before, expected;
        for (int attempt = 0; attempt < kMostAttempts; ++attempt) {
            before = network().run(ours);
            expected = network().run(theirs);
            if (before.output == expected.output || before.output == network().run(ours).output) break;
            usleep(50000);
        }
        EXPECT_EQ(before.output, expected.output) << testing::PrintToString(words);
        EXPECT_EQ(before.status, expected.status) << testing::PrintToString(words);
    }

    void expectSameListings() {
        expectSame({"ifconfig"});
        expectSame({"ifconfig", "-a"});
        const Outcome names = network().shell("busybox ifconfig -a | grep '^[^ ]' | cut -d ' ' -f1");
        std::istringstream lines(names.output);
        for (std::string name; std::getline(lines, name);) {
            expectSame({"ifconfig", name});
            expectSame({"ifconfig", "-a", name});
        }
        expectSame({"route", "-n"});
        expectSame({"route", "-A", "inet6", "-n"});
    }

private:
    std::optional<NetworkNamespace> network_;
};

struct Kind {
    const char* name;
    const char* commands;
};

class LinksAgainstBusybox : public AgainstBusybox, public testing::WithParamInterface<Kind> {};

TEST_P(LinksAgainstBusybox, ListedAlike) {
    if (!setUp(GetParam().commands))
        GTEST_SKIP() << "this kernel makes no link of the kind " << GetParam().name;
    expectSameListings();
}

constexpr Kind kKinds[] = {
    {"nothing", "true"},
    {"loopback", "ip link set lo up\nip address add 127.0.0.2/8 dev lo label lo:1"},
    {"veth",
     "ip link add v0 type veth peer name v1\n"
     "ip address add 10.1.2.3/24 brd + dev v0\nip link set v0 up\nip link set v1 up\n"
     "ip address add 2001:db8::1/64 dev v0 nodad\nip address add fec0::1/64 dev v0 nodad\n"
     "ip address add ::10.1.1.1/96 dev v0 nodad\nip address add ff05::99 dev v1 2>/dev/null || true"},
    {"one_end_down",
     "ip link add v0 type veth peer name v1\nip link set v0 up\nip address add 10.0.0.1/32 dev v0"},
    {"mtu_and_queue",
     "ip link add v0 type veth peer name v1\nip link set v0 mtu 9000 txqueuelen 0 up\n"
     "ip link set v0 promisc on\nip link set v1 allmulticast on multicast off up\nip link set v1 arp off"},
    {"aliases",
     "ip link add eth0 type veth peer name eth10\n"
     "ip address add 10.1.2.3/24 brd + dev eth0\nip address add 10.1.2.4/24 dev eth0\n"
     "ip address add 10.1.2.5/24 brd + dev eth0 label eth0:1\nip address add 10.2.0.1/16 dev eth0 label "
     "eth0:backup\n"
     "ip address add 10.2.0.2/16 dev eth0 label eth0:backup\nip address add 10.3.0.1/8 dev eth10 label "
     "eth10:0\n"
     "ip link set eth0 up"},
    {"long_names",
     "ip link add averylongname01 type veth peer name exactly9c\nip link set averylongname01 up\n"
     "ip link set exactly9c up\n"
     "ip link add averylongname type ifb\nip address add 10.1.0.1/24 dev averylongname label "
     "averylongname:1"},
    {"bridge",
     "ip link add br0 type bridge\nip link add v0 type veth peer name v1\nip link set v0 master br0\n"
     "ip link set br0 up\nip link set v0 up\nip link set v1 up\nip address add 192.168.5.1/24 brd + dev br0"},
    {"bond",
     "ip link add bond0 type bond\nip link add v0 type veth peer name v1\nip link set v0 master bond0\n"
     "ip link set bond0 up"},
    {"vlan",
     "ip link add v0 type veth peer name v1 && ip link add link v0 name v0.10 type vlan id 10\n"
     "ip link set v0 up\nip link set v0.10 up\nip address add 10.5.5.5/24 dev v0.10"},
    {"macvlan",
     "ip link add v0 type veth peer name v1 && ip link add link v0 name m0 type macvlan mode bridge\n"
     "ip link set v0 up\nip link set m0 up\nip address add 10.5.5.5/24 dev m0"},
    {"dummy", "ip link add d0 type dummy\nip link set d0 up\nip address add 10.5.5.5/24 dev d0"},
    {"ifb", "ip link add f0 type ifb\nip link set f0 up"},
    {"vxlan", "ip link add x0 type vxlan id 5 dstport 4789 remote 10.0.0.1\nip link set x0 up"},
    {"sit", "ip link add s0 type sit remote 10.0.0.1\nip link set s0 up"},
    {"point_to_point",
     "ip tuntap add tun0 mode tun\nip address add 192.168.9.1 peer 192.168.9.2/32 dev tun0\nip link set tun0 "
     "up\n"
     "ip tuntap add tun1 mode tun\nip address add 192.168.8.1/24 dev tun1"},
    {"tap", "ip tuntap add tap0 mode tap\nip address add 192.168.9.1/24 dev tap0\nip link set tap0 up"},
    {"many_inet6",
     "ip link add v0 type veth peer name v1\nip link set v0 up\nip link set v1 up\n"
     "for n in 1 2 3 4 5 6 7 8 9; do ip address add 2001:db8:$n::$n/6$n dev v0 nodad; "
     "ip address add fd00:$n::1/128 dev v1 nodad; done"},
    {"routes",
     "ip link add v0 type veth peer name v1\nip link set v0 up\nip link set v1 up\n"
     "ip address add 10.1.2.3/24 dev v0\nip address add 10.1.3.3/24 dev v1\n"
     "ip route add default via 10.1.2.1\nip route add default via 10.1.2.2 metric 5\n"
     "ip route add default via 10.1.3.1 metric 4294967295\nip route add blackhole 10.99.0.0/16\n"
     "ip route add unreachable 10.98.0.0/16\nip route add prohibit 10.97.0.0/16 metric 3\n"
     "ip route add throw 10.93.0.0/16\nip route add 10.96.0.1 via 10.1.2.9\nip route add 10.96.0.2 dev v1\n"
     "ip route add 10.95.0.0/16 via inet6 fe80::1 dev v0\n"
     "ip route add 10.94.0.0/16 nexthop via 10.1.2.1 nexthop via 10.1.3.1\n"
     "ip route add 10.92.0.0/16 via 10.1.2.1 table 200\nip route add 0.0.0.0/1 dev v0\nip route add "
     "128.0.0.0/1 dev v1"},
    {"inet6_routes",
     "ip link add v0 type veth peer name v1\nip link set v0 up\nip link set v1 up\n"
     "ip address add 2001:db8::1/64 dev v0 nodad\nip address add 2001:db8:1::1/64 dev v1 nodad\n"
     "ip -6 route add default via fe80::1 dev v0\nip -6 route add default via fe80::2 dev v1 metric 7\n"
     "ip -6 route add 2001:dba::/32 via 2001:db8::9\nip -6 route add 2001:dbb::5/128 dev v0\n"
     "ip -6 route add blackhole 2001:dbc::/32\nip -6 route add unreachable 2001:dbd::/32 metric 4294967295\n"
     "ip -6 route add prohibit 2001:dbe::/32\nip -6 route add 2001:dbf::/32 proto ra via fe80::3 dev v1 "
     "expires 600\n"
     "ip -6 route add 2001:dc0::/32 nexthop via fe80::4 dev v0 nexthop via fe80::5 dev v1\n"
     "ip -6 route add 2001:dc1::/32 dev v1 table 200"},
};

void PrintTo(const Kind& kind, std::ostream* out) {
    *out << kind.name;
}

INSTANTIATE_TEST_SUITE_P(Kinds, LinksAgainstBusybox, testing::ValuesIn(kKinds),
                         [](const auto& kind) { return kind.param.name; });

TEST_F(AgainstBusybox, UnknownInterfaces) {
    setUp("ip link add v0 type veth peer name v1\nip address add 10.0.0.1/24 dev v0");
    for (const char* name : {"nope", "v0:77", "v", "v00", "nope:1", "averylongname01", "v0:averylongali"}) {
        expectSame({"ifconfig", name});
        EXPECT_EQ(network().run({adapter("ifconfig"), name}).errors,
                  network().run({"busybox", "ifconfig", name}).errors);
    }
}

int openTun(const char* name) {
    const int tun = open("/dev/net/tun", O_RDWR | O_CLOEXEC);
    ifreq request{};
    std::strcpy(request.ifr_name, name);
    request.ifr_flags = IFF_TUN | IFF_NO_PI;
    return ioctl(tun, TUNSETIFF, &request) == 0 ? tun : -1;
}

TEST_F(AgainstBusybox, LinkTypesOfEveryKind) {
    if (!setUp("ip tuntap add tun0 mode tun\nip link set tun0 mtu 1400")) GTEST_SKIP() << "no tun links";
    // Not among them: types with addresses shorter than the classic call's field, whose rest busybox does not
    // set.
    const unsigned types[] = {ARPHRD_ETHER,    ARPHRD_IEEE1394, ARPHRD_INFINIBAND, ARPHRD_SLIP,
                              ARPHRD_CSLIP,    ARPHRD_CSLIP6,   ARPHRD_PPP,        ARPHRD_TUNNEL6,
                              ARPHRD_LOOPBACK, ARPHRD_SIT,      ARPHRD_NONE,       ARPHRD_VOID};
    for (const unsigned type : types) {
        const bool changed = network().inside([&] {
            const int tun = openTun("tun0");
            return tun >= 0 && ioctl(tun, TUNSETLINK, type) == 0;
        });
        EXPECT_TRUE(changed) << type;
        expectSame({"ifconfig", "tun0"});
    }
}

TEST_F(AgainstBusybox, CountersOfEverySize) {
    if (!setUp("ip tuntap add tun0 mode tun\nip link set tun0 up")) GTEST_SKIP() << "no tun links";
    const auto receive = [&](int packets, std::size_t bytes) {
        return network().inside([=] {
            const int tun = openTun("tun0");
            std::string packet(bytes, '\0');
            packet[0] = 0x45;
            for (int count = 0; count < packets; ++count) {
                if (write(tun, packet.data(), packet.size()) < 0) return false;
            }
            return true;
        });
    };
    for (const auto& [packets, bytes] :
         {std::pair(1, 20), {40, 25}, {50, 1500}, {700, 1500}, {20000, 60000}}) {
        ASSERT_TRUE(receive(packets, static_cast<std::size_t>(bytes)));
        expectSame({"ifconfig", "tun0"});
    }
    EXPECT_THAT(network().run({adapter("ifconfig"), "tun0"}).output, testing::HasSubstr(" GiB)"));
}

/// Two networks that begin alike; in one busybox does the work, in the other the adapters.
class ChangesAgainstBusybox : public AgainstBusybox, public testing::WithParamInterface<const char*> {
protected:
    static constexpr const char* kStart =
        "ip link add v0 address 02:00:00:00:00:01 type veth peer name v1 address 02:00:00:00:00:02\n"
        "ip link set v0 addrgenmode none; ip link set v1 addrgenmode none; ip link set v1 up\n"
        "ip link add v2 address 02:00:00:00:00:03 type veth peer name v3 address 02:00:00:00:00:04\n"
        "ip link set v2 addrgenmode none; ip link set v3 addrgenmode none; ip address add 10.7.0.1/16 brd + "
        "dev v2; ip link set v2 up\n"
        "ip link set v3 up; ip route add default via 10.7.0.9; ip route add 10.8.8.8 via 10.7.0.8\n";

    struct Result {
        std::string statuses;
        std::string errors;
        std::string state;
        bool operator==(const Result&) const = default;
        friend void PrintTo(const Result& result, std::ostream* out) {
            *out << result.statuses << result.errors << result.state;
        }
    };

    /// @param by gives the command line that does what a tool's own does
    /// @return what is left, without the counters and the carrier, which settle when they like
    static Result changed(std::string (*by)(const std::string&), const std::string& commands) {
        const NetworkNamespace network;
        EXPECT_EQ(network.shell(std::string("set -e\n") + kStart).status, 0);
        std::istringstream lines(commands);
        Result result;
        for (std::string line; std::getline(lines, line, ';');) {
            const Outcome outcome = network.shell(by(line));
            result.statuses += std::to_string(outcome.status) + "\n";
            result.errors += outcome.errors;
        }
        result.state =
            network
                .shell(
                    "busybox ifconfig -a | grep -vE 'packets|bytes' | sed 's/RUNNING //'; busybox route -n; "
                    "ip -o -4 address")
                .output;
        return result;
    }
};

TEST_P(ChangesAgainstBusybox, LeaveTheSameBehind) {
    const auto busybox = [](const std::string& command) { return "busybox " + command; };
    EXPECT_EQ(changed(adapterAlone, GetParam()), changed(busybox, GetParam()));
}

INSTANTIATE_TEST_SUITE_P(
    Commands, ChangesAgainstBusybox,
    testing::Values(
        "ifconfig v0 up", "ifconfig v0 up;ifconfig v0 down", "ifconfig v2 down", "ifconfig v0 10.1.1.5",
        "ifconfig v0 10.1.1.5 netmask 255.255.255.0 broadcast 10.1.1.255",
        "ifconfig v2 netmask 255.255.255.0", "ifconfig v2 netmask 255.255.0.255",
        "ifconfig v0 netmask 255.255.255.0", "ifconfig nope up", "ifconfig nope down",
        "ifconfig nope 10.1.1.5", "ifconfig nope netmask 255.0.0.0", "ifconfig v0 10.1.1.5 down",
        "ifconfig v0:3 10.1.1.6",
        "ifconfig v0:3 10.1.1.6;ifconfig v0:3 netmask 255.255.0.0;ifconfig v0:3 down", "ifconfig v2 0.0.0.0",
        "ifconfig v2 default", "ifconfig v0 10.1.1.5 up netmask 255.255.255.252",
        "ifconfig v2 broadcast 10.7.7.7", "ifconfig v2 pointopoint 10.7.7.7", "ifconfig v2 dstaddr 10.7.7.7",
        "route del -host 10.8.8.8 gw 10.7.0.8 v2", "route del -host 10.8.8.8 gw 10.7.0.7 v2",
        "route del -host 10.8.8.8", "route del -host 10.8.8.9 gw 10.7.0.8 v2",
        "route del -host 10.8.8.8 gw 10.7.0.8 nope", "route del default", "route del default gw 10.7.0.9 v2",
        "route del default gw 10.7.0.8", "route add default gw 10.7.0.9",
        "route add default gw 10.7.0.7 metric 5 dev v2;route del default metric 5",
        "route add default gw 10.7.0.7 metric 5 dev v2", "route add -host 10.9.9.9 dev v2",
        "route add -host 10.9.9.9 gw 10.7.0.7", "route add -host 10.9.9.9 gw 10.99.0.7",
        "route add default gw 10.7.0.7 metric 0",
        "route add -net 10.9.0.0 netmask 255.255.0.0 gw 10.7.0.7;route del -net 10.9.0.0 netmask 255.255.0.0",
        "route add -net 10.9.0.0 netmask 255.255.0.0 v2", "route add default v2"));

TEST_F(AgainstBusybox, UnreadableChangesChangeNothing) {
    setUp(
        "ip link add v0 type veth peer name v1\nip address add 10.0.0.1/24 dev v0\n"
        "ip link set v0 addrgenmode none; ip link set v0 up");
    const std::string state = network().shell("ip address; ip route").output;
    for (const char* words : {"ifconfig v0 netmask",
                              "ifconfig v0 broadcast",
                              "ifconfig v0 mtu 1400",
                              "route",
                              "route -e",
                              "route add",
                              "route del -host",
                              "route del 10.0.0.5",
                              "route -A inet6 del default",
                              "route -A inet6 add default gw 10.0.0.9",
                              "route -A ipx -n",
                              "route -A",
                              "route change default",
                              "route -n extra",
                              "route add default gw",
                              "route add default metric x v0",
                              "route del default v0 v1",
                              "ifconfig v0 ''",
                              "ifconfig '' up",
                              "ifconfig ''",
                              "ifconfig :1",
                              "ifconfig -x",
                              "ifconfig v0 10.0.0.9 mtu 1400",
                              "ifconfig v0 down hw ether 02:00:00:00:00:09",
                              "ifconfig v0 10.0.0.9 netmask junk..",
                              "ifconfig v0 down 300.1.1.1",
                              "ifconfig v0 down 10.0.0.9/8",
                              "ifconfig v0 10.0.0.8 10.0.0.9",
                              "ifconfig v0 down netmask 255.0.0.0 netmask 255.255.0.0",
                              "ifconfig v0 down broadcast 10.0.0.9 broadcast 10.0.0.8",
                              "ifconfig v0averyverylongname down",
                              "route add default gw 10.0.0.8 gw 10.0.0.9",
                              "route add default gw 10.0.0.8 metric 3x",
                              "route add default gw 10.0.0.8 metric 3 metric 4",
                              "route add default gw 10.0.0.8 metric -1",
                              "route add -net 10.9.0.0 netmask 255.0.0.0 netmask 255.255.0.0 v0",
                              "route add default gw 10.0.0.8 dev",
                              "route add -net 10.9.0.0 netmask 255.255.0.0 reject",
                              "route add -net 10.9.0.0/16 v0",
                              "route add default gw 10.0.0.8 window 8000",
                              "route add default gw ''",
                              "route add ''",
                              "route del ''",
                              "route add default gw 10.0.0.8 dev v0averyverylong",
                              "route add default gw router",
                              "route add -host 10.9.9.9 netmask 255.255.0.0 v0",
                              "route add default gw 10.0.0.8 metric ''"}) {
        const Outcome outcome = network().shell(adapterAlone(words));
        EXPECT_EQ(outcome.status, 1) << words;
        EXPECT_EQ(outcome.output, "") << words;
        EXPECT_NE(outcome.errors, "") << words;
    }
    EXPECT_EQ(network().shell("ip address; ip route").output, state);
}

TEST_F(AgainstBusybox, FamiliesOfRouteListings) {
    setUp("ip link add v0 type veth peer name v1\nip link set v0 up");
    const auto listing = [&](const std::string& words) {
        return network().shell(adapter("route " + words)).output;
    };
    EXPECT_EQ(listing("-6 -n"), listing("-A inet6 -n"));
    EXPECT_EQ(listing("-n -A inet6"), listing("-A inet6 -n"));
    EXPECT_EQ(listing("-4 -n"), listing("-n"));
    EXPECT_EQ(listing("-A inet -n"), listing("-n"));
}

}  // namespace
