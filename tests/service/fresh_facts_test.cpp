// Facts of which no news come by themselves: what is written is followed at once, what the plug-in asks for
// at its start is asked for again.
#include "tests/service/fresh_tree.h"
#include "tests/support/waiting.h"

namespace {

constexpr const char* kConfiguration =
    "/com/vantrel/Corvista1/oshw/root/computer/chassis/network_2dcontroller/network_2dport_3aeth0/"
    "ip_2dconfig_3aeth0";
constexpr std::uint32_t kDnsServers = 94;
constexpr std::uint32_t kHostName = 97;
constexpr std::uint32_t kDomainName = 98;

class FreshFacts : public Freshness {
protected:
    void setUpHost(FakeHost& host) override {
        Freshness::setUpHost(host);
        host.file("/etc/HOSTNAME", "linux-k.example.com\n");
        ip(host, cable("eth0", "sw0"));
        ip(host, cable("eth1", "sw1"));
    }
    /// What the service knows by now, at the path's end.
    static std::string fact(ServiceRun& run, const std::string& path, const std::string& property) {
        return known(run)["/oshw/root/computer" + path][property];
    }
    static void write(ServiceRun& run, std::uint32_t property, const std::string& value) {
        call::ask(run.bus(), kConfiguration, call::kNode, "Write", call::write(property, value));
    }
};

HOST_TEST_F(FreshFacts, OfTheHostFollowAWriteAtOnce) {
    ServiceRun run(host);
    run.config("look-every = 0\n");
    start(host, run);
    ASSERT_EQ(awaitFresh(host, run), "");
    for (const auto& [property, value] :
         {std::pair(kHostName, "linux-m"), std::pair(kDomainName, "example.org"),
          std::pair(kDnsServers, "192.0.2.77")}) {
        write(run, property, value);
        EXPECT_EQ(awaitFresh(host, run), "") << property;
    }
    EXPECT_EQ(fact(run, "", "108"), "linux-m.example.org");
    const std::string other = "/chassis/network-controller/network-port:eth1/ip-config:eth1";
    EXPECT_EQ(fact(run, other, "97"), "linux-m");
    EXPECT_EQ(fact(run, other, "98"), "example.org");
    EXPECT_EQ(fact(run, other, "94"), "192.0.2.77");
    // A node that is made now stores the name that the host had when the plug-in was started.
    ip(host, cable("enp9s0", "sw2"));
    EXPECT_EQ(awaitFresh(host, run), "");
    EXPECT_EQ(fact(run, "/chassis/network-controller/network-port:enp9s0/ip-config:enp9s0", "97"), "linux-m");
}

HOST_TEST_F(FreshFacts, OfALeaseFollowItsAddress) {
    host.file("/var/lib/dhcpcd/dhcpcd-eth0.info", "DHCPSID='192.0.2.1'\n");
    ServiceRun run(host);
    start(host, run);
    ASSERT_EQ(awaitFresh(host, run), "");
    const std::string path = "/chassis/network-controller/network-port:eth0/ip-config:eth0";
    ASSERT_EQ(fact(run, path, "93"), "192.0.2.1");
    host.file("/var/lib/dhcpcd/dhcpcd-eth0.info", "DHCPSID=\"192.0.2.2\"\n");
    host.file("/var/lib/dhcpv6/client6.leases", "# SDUID 00:01:aa;\n");
    host.file("/etc/resolv.conf", "search example.net\nnameserver 192.0.2.54\n");
    ip(host, {"address add 10.1.2.3/20 dev eth0"});
    EXPECT_EQ(awaitFresh(host, run), "");
    EXPECT_EQ(fact(run, path, "93"), "192.0.2.2 00:01:aa");
    host.remove("/var/lib/dhcpcd/dhcpcd-eth0.info");
    host.remove("/var/lib/dhcpv6");
    ip(host, {"address del 10.1.2.3/20 dev eth0"});
    EXPECT_EQ(awaitFresh(host, run), "");
    EXPECT_EQ(fact(run, path, "93"), "");
}

/// Another transceiver can do other things.
HOST_TEST_F(FreshFacts, OfAPortFollowItsLink) {
    host.tool("ethtool %any", "");
    const auto plug = [&host](const std::string& mode, const std::string& wake) {
        host.tool("ethtool eth0",
                  "Settings for eth0:\n\tSupported link modes:   " + mode + "/Half 1000baseT/Full\n" + wake);
    };
    plug("100baseT", "");
    ServiceRun run(host);
    run.hostTools("auto").plugin(CORVISTA_PLUGIN_FILE).start();
    const auto facts = [&run] {
        std::string text;
        for (const char* property : {"38", "182", "183", "185"}) {
            text += fact(run, "/chassis/network-controller/network-port:eth0", property) + ",";
        }
        return text;
    };
    EXPECT_EQ(facts(), "100,,,52,");
    struct Row {
        const char* mode;
        const char* wake;
        const char* told;
    };
    for (const Row& row :
         {Row{"10GBase-SR", "\tSupports Wake-on: pg\n", "0,3,,105,"},
          Row{"2500baseT", "\tSupports Wake-on: pg\n\tWake-on: g\n", "2500,3,3,54,"},
          Row{"VENDOR reserved", "", "0,,,0,"}, Row{"unknown", "\tWake-on: g\n", "0,,3,0,"}}) {
        plug(row.mode, row.wake);
        ip(host, {"link set sw0 down", "link set sw0 up"});
        EXPECT_TRUE(eventually([&] { return facts() == row.told; })) << row.mode << ": " << facts();
    }
}

/// Nothing more is heard of what came too late.
HOST_TEST_F(FreshFacts, ThatCameTooLateAreAskedForAgain) {
    host.tool("hostname %any", "linux-k.example.com\n");
    host.tool("hostname -s", {"", 0, "", 0, "[ ! -e /is-slow ] || exec sleep 60; cat /name"});
    host.file("/name", "linux-k\n");
    ServiceRun run(host);
    run.config("look-every = 0\ncommand-timeout = 1\n");
    start(host, run);
    const auto becomes = [&run](const std::string& name) {
        return eventually([&] {
            return fact(run, "/chassis/network-controller/network-port:eth0/ip-config:eth0", "97") == name;
        });
    };
    const auto change = [&host](const std::string& name) {
        host.file("/name", name + "\n");
        host.file("/etc/hosts", "127.0.0.1 " + name + "\n");
        ip(host, {"link set sw1 down", "link set sw1 up"});
    };
    change("linux-m");
    ASSERT_TRUE(becomes("linux-m"));
    host.file("/is-slow", "");
    change("linux-n");
    ASSERT_TRUE(becomes("failed"));
    host.remove("/is-slow");
    EXPECT_TRUE(becomes("linux-n"));
}

class FreshRoutes : public FreshFacts {
protected:
    void setUpHost(FakeHost& host) override { Freshness::setUpHost(host); }
};

/// A list of routes that is read while others come and go may lack one, of which nothing more is heard.
HOST_TEST_F(FreshRoutes, AreReadOnceMoreWhenTheyHaveSettled) {
    host.tool("route %any", "");
    host.tool("route -n", {"Kernel IP routing table\n", 0, "", 0,
                           "if ip -4 route show default | grep -q via; then "
                           "[ ! -e /was-left-out ] || echo '0.0.0.0  10.1.0.1  0.0.0.0  UG  0  0  0  eth0'; "
                           "touch /was-left-out; fi"});
    ip(host, {"link add eth0 type veth peer name sw0"});
    for (const char* link : {"eth0", "sw0"}) {  // no address that the kernel makes later, which would be news
        host.run({"ip", "link", "set", link, "addrgenmode", "none"});
        ip(host, {std::string("link set ") + link + " up"});
    }
    ServiceRun run(host);
    run.config("look-every = 0\n");
    start(host, run);
    const auto becomes = [&run](const std::string& property, const std::string& value) {
        return eventually([&] {
            return fact(run, "/chassis/network-controller/network-port:eth0/ip-config:eth0", property) ==
                   value;
        });
    };
    ip(host, {"address add 10.1.2.3/20 dev eth0"});
    ASSERT_TRUE(becomes("25", "10.1.2.3"));
    ip(host, {"route add default via 10.1.0.1"});
    EXPECT_TRUE(becomes("100", "10.1.0.1"));
    EXPECT_TRUE(host.exists("/was-left-out"));
}

/// A name can be more than a name to a shell.
HOST_TEST_F(FreshFacts, OfALinkWithAHostileNameAreNotAskedFor) {
    ip(host, {"link add 'eth$(>m)' type veth peer name sw2", "link set sw2 up"});
    ServiceRun run(host);
    start(host, run);
    ASSERT_EQ(awaitFresh(host, run), "");
    ip(host, {"link set 'eth$(>m)' up", "address add 10.1.2.3/20 dev 'eth$(>m)'"});
    EXPECT_EQ(awaitFresh(host, run), "");
    EXPECT_FALSE(host.exists("/m"));
}

}  // namespace
