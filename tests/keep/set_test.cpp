// A change that is kept by the system that keeps the interface: with the program, on links of a real kernel.
#include <gmock/gmock.h>
#include <sys/mount.h>

#include "tests/support/fake_host.h"
#include "tests/support/waiting.h"

namespace {

class SetAndKept : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        for (const char* tool : {"ip", "ifconfig", "hostname"}) {
            host.realTool(tool);
        }
        host.useKernelNetwork();
        ip(host, "link add eth0 type veth peer name sw0");
        ip(host, "address add 192.0.2.10/24 dev eth0");
        ip(host, "link set eth0 up");
        ip(host, "link set sw0 up");
    }
    static std::string ip(FakeHost& host, const std::string& words) {
        const Finished done = host.run({"sh", "-c", "ip " + words});
        EXPECT_EQ(done.status, 0) << words << ": " << done.err;
        return done.out;
    }
    static Finished cvagent(FakeHost& host, std::vector<std::string> words) {
        words.insert(words.begin(), CVAGENT_PROGRAM);
        return host.run(words);
    }
};

/// ifupdown, as far as a test needs it: it sets the interface up from the one stanza.
class SetAndKeptByIfupdown : public SetAndKept {
protected:
    void setUpHost(FakeHost& host) override {
        SetAndKept::setUpHost(host);
        host.file("/run/network/ifstate", "lo=lo\neth0=eth0\n");
        host.file("/etc/network/interfaces", kStanza);
        host.tool("ifdown eth0", {"", 0, "", 0, "ip address flush dev eth0"});
        host.tool("ifup eth0", {"", 0, "", 0,
                                "set -- $(grep address /etc/network/interfaces); "
                                "ip address add $2 dev eth0; ip link set eth0 up"});
    }
    static constexpr const char* kStanza = "iface eth0 inet static\n  address 192.0.2.10/24\n";
};

HOST_TEST_F(SetAndKeptByIfupdown, AnAddressIsInItsFileAndInForce) {
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "192.0.2.77"});
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, testing::HasSubstr("kept over a restart by ifupdown, in /etc/network/interfaces"));
    EXPECT_EQ(host.read("/etc/network/interfaces"), "iface eth0 inet static\n  address 192.0.2.77/24\n");
    EXPECT_THAT(host.callsOf("ifdown"), TextsAre("ifdown eth0"));
    EXPECT_THAT(host.callsOf("ifup"), TextsAre("ifup eth0"));
    const std::string addresses = ip(host, "-4 -o address show dev eth0");
    EXPECT_THAT(addresses, testing::HasSubstr("inet 192.0.2.77/24"));
    EXPECT_THAT(addresses, testing::Not(testing::HasSubstr("192.0.2.10/24")));
}

HOST_TEST_F(SetAndKeptByIfupdown, AnAddressOfAnotherHandIsPutBack) {
    ip(host, "address add 198.51.100.1/24 dev eth0");
    EXPECT_EQ(cvagent(host, {"set", "ip-config:eth0", "SubnetMask", "255.255.255.128"}).status, 0);
    const std::string addresses = ip(host, "-4 -o address show dev eth0");
    EXPECT_THAT(addresses, testing::HasSubstr("inet 192.0.2.10/25"));
    EXPECT_THAT(addresses, testing::HasSubstr("inet 198.51.100.1/24"));
}

/// An interface of both families, whose gateway of IPv6 comes a moment after ifup.
class SetAndKeptOfIpv6 : public SetAndKeptByIfupdown {
protected:
    void setUpHost(FakeHost& host) override {
        SetAndKeptByIfupdown::setUpHost(host);
        host.file("/etc/network/interfaces", std::string(kStanza) + kIpv6);
        ip(host, "address add 2001:db8::10/64 dev eth0 nodad");
        host.realTool("sleep");
    }
    static void bringGateway(FakeHost& host, const std::string& gateway) {
        host.tool("ifdown eth0", "");
        host.tool("ifup eth0", {"", 0, "", 0,
                                "(sleep 0.3; exec ip -6 route add default via " + gateway +
                                    " dev eth0) >/dev/null 2>&1 &"});
    }
    static constexpr const char* kIpv6 = "iface eth0 inet6 static\n  address 2001:db8::10/64\n";
};

HOST_TEST_F(SetAndKeptOfIpv6, AGatewayIsInTheStanzaOfItsFamily) {
    bringGateway(host, "2001:db8::1");
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPv6Gateway", "2001:DB8:0::1"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.err, testing::HasSubstr("kept over a restart by ifupdown"));
    EXPECT_EQ(host.read("/etc/network/interfaces"), std::string(kStanza) + kIpv6 + "  gateway 2001:db8::1\n");
}

HOST_TEST_F(SetAndKeptOfIpv6, AGatewayThatIsKeptAndDoesNotComeIsNotDone) {
    bringGateway(host, "2001:db8::2");
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPv6Gateway", "2001:db8::1"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, testing::HasSubstr("kept over a restart by ifupdown"));
    EXPECT_THAT(run.err, testing::HasSubstr("it is kept for the next start, but the host has another value"));
}

/// Who brings it into the running host cannot be reached where it is tried.
HOST_TEST_F(SetAndKeptOfIpv6, APlanOfAGatewayShowsWhereItIsKept) {
    const Finished run = cvagent(host, {"plan", "ip-config:eth0", "IPv6Gateway", "2001:db8::1"});
    EXPECT_EQ(run.status, 0) << run.out << run.err;
    EXPECT_THAT(run.out, testing::HasSubstr("+  gateway 2001:db8::1\n"));
    EXPECT_THAT(run.out, testing::HasSubstr("ifup eth0"));
}

HOST_TEST_F(SetAndKeptByIfupdown, APlanShowsIt) {
    const Finished run = cvagent(host, {"plan", "ip-config:eth0", "IPv4Address", "192.0.2.77"});
    EXPECT_THAT(run.out, testing::HasSubstr("--- /etc/network/interfaces\n"));
    EXPECT_THAT(run.out, testing::HasSubstr("+  address 192.0.2.77/24\n"));
    EXPECT_THAT(run.out, testing::HasSubstr("ifdown eth0"));
    EXPECT_THAT(run.out, testing::HasSubstr("+ address eth0 192.0.2.77/24\n"));
    EXPECT_EQ(host.read("/etc/network/interfaces"), kStanza);
    EXPECT_THAT(host.callsOf("ifdown"), testing::IsEmpty());
}

HOST_TEST_F(SetAndKeptByIfupdown, WhatIsNotKeptIsTold) {
    host.file("/etc/network/interfaces", "iface eth0 inet manual\n");
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "192.0.2.77"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, testing::HasSubstr("not kept over a restart: the stanza's method is 'manual'"));
    EXPECT_THAT(host.callsOf("ifdown"), testing::IsEmpty());
}

HOST_TEST_F(SetAndKeptByIfupdown, AnInterfaceThatDoesNotComeUpHasItsOldFile) {
    host.tool("ifup eth0", "", 1);
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "192.0.2.77"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, testing::HasSubstr("not kept over a restart: ifup eth0 has failed"));
    EXPECT_EQ(host.read("/etc/network/interfaces"), kStanza);
}

HOST_TEST_F(SetAndKeptByIfupdown, AnAddressInsteadOfALeaseHasItsGateway) {
    host.file("/etc/network/interfaces", "iface eth0 inet dhcp\n");
    ip(host, "route add default via 192.0.2.1 dev eth0");
    ASSERT_EQ(cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "192.0.2.77"}).status, 0);
    EXPECT_EQ(host.read("/etc/network/interfaces"),
              "iface eth0 inet static\n    address 192.0.2.77/24\n    gateway 192.0.2.1\n");
}

HOST_TEST_F(SetAndKeptByIfupdown, AGatewayThatIsOutOfReachIsNotWritten) {
    host.file("/etc/network/interfaces", "iface eth0 inet dhcp\n");
    ip(host, "route add default via 192.0.2.1 dev eth0");
    cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "198.51.100.7"});
    EXPECT_EQ(host.read("/etc/network/interfaces"), "iface eth0 inet static\n    address 198.51.100.7/24\n");
}

/// An interface with a lease, and a daemon that answers before it has set the interface up.
class SetAndKeptInsteadOfALease : public SetAndKeptByIfupdown {
protected:
    void setUpHost(FakeHost& host) override {
        SetAndKept::setUpHost(host);
        host.realTool("sleep");
        host.file("/run/network/ifstate", "eth0=eth0\n");
        host.file("/etc/network/interfaces", "iface eth0 inet dhcp\n");
        ip(host, "address flush dev eth0");
        ip(host, kLease);
        ip(host, "route add default via 192.0.2.1 dev eth0 proto dhcp src 192.0.2.100 metric 1024");
        ip(host, "route add 192.0.2.53 dev eth0 proto dhcp scope link src 192.0.2.100 metric 1024");
        host.tool("ifdown eth0", "");
        host.tool("ifup eth0", behind("ip address flush dev eth0; "
                                      "set -- $(grep address /etc/network/interfaces); "
                                      "ip address add $2 dev eth0; ip route add default via 192.0.2.1"));
    }
    static ToolAnswer behind(const std::string& script) {
        return {"", 0, "", 0, "(sleep 0.3; " + script + ") >/dev/null 2>&1 &"};
    }
    static constexpr const char* kLease =
        "address add 192.0.2.100/24 dev eth0 valid_lft 3000 preferred_lft 3000";
};

HOST_TEST_F(SetAndKeptInsteadOfALease, NothingOfTheLeaseIsPutBack) {
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "192.0.2.77"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.err,
                testing::HasSubstr("in /etc/network/interfaces; name servers of the lease may go with it\n"));
    const std::string routes = ip(host, "-4 route show dev eth0");
    EXPECT_THAT(routes, testing::HasSubstr("default via 192.0.2.1"));
    EXPECT_THAT(routes, testing::Not(testing::HasSubstr("dhcp")));
    const std::string addresses = ip(host, "-4 -o address show dev eth0");
    EXPECT_THAT(addresses, testing::HasSubstr("inet 192.0.2.77/24"));
    EXPECT_THAT(addresses, testing::Not(testing::HasSubstr("192.0.2.100")));
}

HOST_TEST_F(SetAndKeptInsteadOfALease, ItsOwnAddressIsThereForEver) {
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "192.0.2.100"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(ip(host, "-4 -o address show dev eth0"), testing::HasSubstr("valid_lft forever"));
}

HOST_TEST_F(SetAndKeptByIfupdown, ALeaseIsWaitedFor) {
    host.realTool("sleep");
    host.tool("ifup eth0", {"", 0, "", 0,
                            "(sleep 0.3; ip address add 192.0.2.100/24 dev eth0 valid_lft 3000 preferred_lft "
                            "3000) >/dev/null 2>&1 &"});
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPOrigin", "1"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(ip(host, "-4 -o address show dev eth0"), testing::HasSubstr("inet 192.0.2.100/24"));
}

HOST_TEST_F(SetAndKeptByIfupdown, ThatNoLeaseHasComeIsTold) {
    host.tool("ifup eth0", "");
    ip(host, "link set sw0 down");  // without a carrier nobody waits for one
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPOrigin", "1"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.err, testing::HasSubstr("in /etc/network/interfaces; no address has come by DHCP yet\n"));
}

/// Its stanza comes back with the change, also where nothing has told beforehand that it would be written.
HOST_TEST_F(SetAndKeptByIfupdown, WhatIsTakenBackIsItsStanzaToo) {
    host.remove("/tools/ifdown");
    host.remove("/tools/ifup");
    host.tool("/usr/sbin/ifdown eth0", {"", 0, "", 0, "/tools/ip address flush dev eth0"});
    host.tool("/usr/sbin/ifup eth0", {"", 0, "", 0,
                                      "set -- $(grep address /etc/network/interfaces); "
                                      "/tools/ip address add $2 dev eth0"});
    ASSERT_EQ(mount("/dev/null", REHEARSAL_PROGRAM, nullptr, MS_BIND, nullptr), 0);
    const Finished run = cvagent(
        host, {"set", "ip-config:eth0", "IPv4Address", "192.0.2.77", "--force", "--confirm-within", "600"});
    EXPECT_THAT(run.err, testing::HasSubstr("the changes are not tried out first"));
    EXPECT_THAT(run.err, testing::HasSubstr("kept over a restart by ifupdown"));
    host.clearCalls();
    EXPECT_EQ(cvagent(host, {"rollback"}).out, "change 1 is taken back\n");
    EXPECT_EQ(host.read("/etc/network/interfaces"), kStanza);
    EXPECT_THAT(host.calls(), testing::ElementsAre("/usr/sbin/ifdown eth0", "/usr/sbin/ifup eth0"));
    const std::string addresses = ip(host, "-4 -o address show dev eth0");
    EXPECT_THAT(addresses, testing::HasSubstr("inet 192.0.2.10/24"));
    EXPECT_THAT(addresses, testing::Not(testing::HasSubstr("192.0.2.77")));
}

/// The plug-in's own files are none that this host reads: what it runs with and what is kept counts.
HOST_TEST_F(SetAndKeptByIfupdown, IsChangedOnceAndThenAsItShouldBe) {
    host.file("/tmp/changes", R"([{"node": "ip-config:eth0", "property": "IPOrigin", "value": "static"},
        {"node": "ip-config:eth0", "property": "IPv4Address", "value": "192.0.2.77"},
        {"node": "ip-config:eth0", "property": "SubnetMask", "value": "255.255.255.128"},
        {"node": "ip-config:eth0", "property": "IPv4Gateway", "value": "192.0.2.1"}])");
    const Finished first = cvagent(host, {"apply", "/tmp/changes", "--verify-within", "0.3"});
    EXPECT_EQ(first.status, 0) << first.out << first.err;
    EXPECT_THAT(first.out, testing::Not(testing::HasSubstr("differs")));
    host.clearCalls();
    EXPECT_EQ(cvagent(host, {"diff", "/tmp/changes"}).status, 0);
    const Finished second = cvagent(host, {"apply", "/tmp/changes", "--verify-within", "0.3"});
    EXPECT_EQ(second.status, 0) << second.out << second.err;
    EXPECT_THAT(second.out, testing::Not(testing::HasSubstr("applied")));
    EXPECT_THAT(host.callsOf("ifup"), testing::IsEmpty());
    host.file("/etc/network/interfaces", kStanza);
    EXPECT_EQ(cvagent(host, {"diff", "/tmp/changes"}).status, 1);
}

HOST_TEST_F(SetAndKeptByIfupdown, WhatIsExportedIsNoDrift) {
    const Finished exported = cvagent(host, {"export", "ip-config:eth0"});
    EXPECT_THAT(exported.out, testing::HasSubstr("\"value\": \"192.0.2.10\""));
    host.file("/tmp/changes", exported.out);
    const Finished same = cvagent(host, {"diff", "/tmp/changes"});
    EXPECT_EQ(same.status, 0) << same.out;
    host.file("/etc/network/interfaces", "iface eth0 inet dhcp\n");
    EXPECT_THAT(cvagent(host, {"export", "ip-config:eth0"}).out,
                testing::Not(testing::HasSubstr("192.0.2.10")));
}

/// systemd-networkd, as far as a test needs it: when a reload ends the link has lost its addresses and
/// routes, and a moment later it has what the first file says.
class SetAndKeptByNetworkd : public SetAndKept {
protected:
    void setUpHost(FakeHost& host) override {
        SetAndKept::setUpHost(host);
        for (const char* tool : {"sleep", "mv", "sed"}) {
            host.realTool(tool);
        }
        ip(host, "route add default via 192.0.2.1 dev eth0 proto static");
        const std::string index = host.run({"cat", "/sys/class/net/eth0/ifindex"}).out;
        state_ = "/run/systemd/netif/links/" + index.substr(0, index.find('\n'));
        host.file(state_, saysOf(kNetwork));
        host.file(kNetwork, "[Match]\nName=eth0\n[Network]\nAddress=192.0.2.10/24\nGateway=192.0.2.1\n");
        host.mountOver("/sys/fs/cgroup",
                       [] { ASSERT_EQ(mount("groups", "/sys/fs/cgroup", "tmpfs", 0, nullptr), 0); });
        host.file("/sys/fs/cgroup/system.slice/systemd-networkd.service/cgroup.procs", "812\n");
        host.file("/networkd",
                  "PATH=/tools:/usr/bin:/bin; set -- /etc/systemd/network/*\n"
                  "say() { printf 'ADMIN_STATE=%s\\nNETWORK_FILE=%s\\n' $1 $2 > /run/new; mv /run/new " +
                      state_ +
                      "; }\n"
                      "say configuring $1; ip -4 address flush dev eth0; ip -6 address flush dev eth0 scope "
                      "global\n"
                      "(sleep 0.3; ip address add $(sed -n s/^Address=//p $1) dev eth0\n"
                      "ip route add default via $(sed -n s/^Gateway=//p $1) dev eth0 proto static\n"
                      "say configured $1) >/dev/null 2>&1 &\n");
        for (const char* tool : {"networkctl reload", "/usr/bin/networkctl reload"}) {
            host.tool(tool, {"", 0, "", 0, "sh /networkd"});
        }
    }
    static std::string saysOf(const std::string& file) {
        return "ADMIN_STATE=configured\nNETWORK_FILE=" + file + "\n";
    }
    static std::string networkOf(FakeHost& host) {
        return ip(host, "-4 -o address show dev eth0") + ip(host, "-4 route");
    }
    static constexpr const char* kNetwork = "/etc/systemd/network/20-lan.network";
    static constexpr const char* kOurs = "/etc/systemd/network/0-cvagent-eth0.network";
    std::string state_;
};

/// What it takes away for a moment is neither what the change has left nor somebody else's work.
HOST_TEST_F(SetAndKeptByNetworkd, AGatewayIsTakenBackWhole) {
    const std::string before = networkOf(host);
    const Finished run =
        cvagent(host, {"set", "ip-config:eth0", "IPv4Gateway", "192.0.2.254", "--confirm-within", "600"});
    EXPECT_EQ(run.status, 0) << run.out << run.err;
    EXPECT_THAT(run.err, testing::HasSubstr("kept over a restart by systemd-networkd"));
    std::string wanted = before;
    EXPECT_EQ(networkOf(host), wanted.replace(wanted.find("via 192.0.2.1 "), 13, "via 192.0.2.254"));
    EXPECT_TRUE(eventually([&] { return host.read(state_) == saysOf(kOurs); }));
    const Finished back = cvagent(host, {"rollback"});
    EXPECT_EQ(back.out + back.err, "change 1 is taken back\n");
    EXPECT_EQ(networkOf(host), before);
    EXPECT_TRUE(eventually([&] { return host.read(state_) == saysOf(kNetwork); }));
}

/// A newcomer's machine: the value is in force, and the program says how long.
HOST_TEST_F(SetAndKept, WhatNobodyKeepsHoldsUntilRestart) {
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "192.0.2.77"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.out, testing::HasSubstr("new  192.0.2.77\n"));
    EXPECT_THAT(run.err,
                testing::HasSubstr("cvagent: not kept over a restart: nobody is known who keeps 'eth0'\n"));
    EXPECT_THAT(ip(host, "-4 -o address show dev eth0"), testing::HasSubstr("inet 192.0.2.77/24"));
    host.file("/tmp/changes",
              R"([{"node": "ip-config:eth0", "property": "IPv4Address", "value": "192.0.2.77"}])");
    EXPECT_THAT(cvagent(host, {"apply", "/tmp/changes"}).out, testing::HasSubstr("unchanged"));
    EXPECT_EQ(cvagent(host, {"diff", "/tmp/changes"}).status, 0);
    EXPECT_EQ(cvagent(host, {"rollback"}).out, "change 1 is taken back\n");
    EXPECT_THAT(ip(host, "-4 -o address show dev eth0"), testing::HasSubstr("inet 192.0.2.10/24"));
}

HOST_TEST_F(SetAndKeptByNetworkd, AnAddressLeavesTheOtherFamilyAsItIs) {
    ip(host, "address add 2001:db8:5::5/64 dev eth0 nodad");
    ip(host, "-6 route add 2001:db8:9::/48 via 2001:db8:5::9 dev eth0");
    ip(host, "-6 route add default via 2001:db8:5::1 dev eth0");
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "192.0.2.77"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(networkOf(host), testing::HasSubstr("192.0.2.77/24"));
    EXPECT_THAT(ip(host, "-6 -o address show dev eth0"), testing::HasSubstr("2001:db8:5::5/64"));
    EXPECT_THAT(ip(host, "-6 route"), testing::AllOf(testing::HasSubstr("2001:db8:9::/48 via 2001:db8:5::9"),
                                                     testing::HasSubstr("default via 2001:db8:5::1")));
}

HOST_TEST_F(SetAndKept, NothingIsKeptWhereTwoClaimTheInterface) {
    const std::string index = host.run({"cat", "/sys/class/net/eth0/ifindex"}).out;
    host.file("/run/network/ifstate", "eth0=eth0\n");
    host.file("/etc/network/interfaces", "iface eth0 inet static\n  address 192.0.2.10/24\n");
    host.file("/run/wicked/state-" + index.substr(0, index.find('\n')) + ".xml",
              "<origin>compat:suse:/etc/sysconfig/network/ifcfg-eth0</origin>");
    host.mountOver("/sys/fs/cgroup",
                   [] { ASSERT_EQ(mount("groups", "/sys/fs/cgroup", "tmpfs", 0, nullptr), 0); });
    host.file("/sys/fs/cgroup/system.slice/wickedd.service/cgroup.procs", "812\n");
    const Finished run = cvagent(host, {"set", "ip-config:eth0", "IPv4Address", "192.0.2.77"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, testing::HasSubstr("not kept over a restart: wicked and ifupdown both have 'eth0'"));
    EXPECT_EQ(host.callsOf("ifdown"), std::vector<std::string>());
}

}  // namespace
