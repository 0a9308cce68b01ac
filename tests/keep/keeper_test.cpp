// Who keeps an interface over a restart, as what runs tells it.
#include "agent/keep/keeper.h"

#include <gmock/gmock.h>
#include <sys/stat.h>

#include <chrono>

#include "agent/keep/daemons.h"
#include "agent/keep/systems.h"
#include "tests/support/fake_host.h"

namespace {

using cvagent::keep::Daemons;
using cvagent::keep::Keeper;
using cvagent::keep::keeperOf;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr const char* kNoBus = "unix:path=/run/there/is/none";

Keeper eth0() {
    Daemons daemons(kNoBus);
    return keeperOf({"eth0", 3}, daemons);
}

/// What is said of eth0, each with its file.
std::vector<std::string> saidOfEth0() {
    std::vector<std::string> said;
    for (const auto& claim : eth0().claims) {
        said.push_back(claim.system + ": " + claim.evidence + " [" + claim.source + "]");
    }
    return said;
}

void runUnit(FakeHost& host, const std::string& unit) {
    host.file("/sys/fs/cgroup/system.slice/" + unit + ".service/cgroup.procs", "812\n");
}

void networkdSays(FakeHost& host, const std::string& state, const std::string& file) {
    host.file("/run/systemd/netif/links/3", "# This is private data. Do not parse.\nADMIN_STATE=" + state +
                                                "\nOPER_STATE=routable\nNETWORK_FILE=" + file +
                                                "\nDNS=192.0.2.53\n");
}

HOST_TEST(Keeper, IsNobodyOnABareHost) {
    EXPECT_THAT(saidOfEth0(), IsEmpty());
    EXPECT_EQ(eth0().system(), "");
    EXPECT_THAT(eth0().unknown, IsEmpty());
}

HOST_TEST(Keeper, IsNetworkdWhereItRunsAndHasConfiguredTheLink) {
    networkdSays(host, "configured", "/etc/systemd/network/20-lan.network");
    EXPECT_THAT(saidOfEth0(), IsEmpty());  // what it noted outlives it
    runUnit(host, "systemd-networkd");
    EXPECT_THAT(saidOfEth0(),
                ElementsAre("systemd-networkd: systemd-networkd says 'configured', by "
                            "/etc/systemd/network/20-lan.network [/etc/systemd/network/20-lan.network]"));
    EXPECT_EQ(eth0().system(), "systemd-networkd");
    for (const char* other : {"unmanaged", "pending", "initialized", ""}) {
        networkdSays(host, other, "/etc/systemd/network/20-lan.network");
        EXPECT_THAT(saidOfEth0(), IsEmpty()) << other;
    }
    networkdSays(host, "configured", "");
    EXPECT_THAT(saidOfEth0(), IsEmpty());
    host.file("/sys/fs/cgroup/system.slice/systemd-networkd.service/cgroup.procs", "");
    networkdSays(host, "configured", "/etc/systemd/network/20-lan.network");
    EXPECT_THAT(saidOfEth0(), IsEmpty());
}

HOST_TEST(Keeper, IsNetplanWhereNetworkdsFileIsMadeByIt) {
    runUnit(host, "systemd-networkd");
    networkdSays(host, "configured", "/run/systemd/network/10-netplan-eth0.network");
    EXPECT_THAT(saidOfEth0(),
                ElementsAre("netplan: systemd-networkd says 'configured', by "
                            "/run/systemd/network/10-netplan-eth0.network that netplan has made "
                            "[/run/systemd/network/10-netplan-eth0.network]"));
    // One of that name that somebody has written is networkd's own.
    networkdSays(host, "configured", "/etc/systemd/network/10-netplan-eth0.network");
    EXPECT_EQ(eth0().system(), "systemd-networkd");
}

HOST_TEST(Keeper, IsWickedWhereItRunsAndHasSetTheLinkUp) {
    host.file("/run/wicked/state-3.xml",
              "<client-state>\n  <control><persistent>false</persistent></control>\n  <config>\n"
              "    <uuid>a1b2</uuid>\n    <origin>compat:suse:/etc/sysconfig/network/ifcfg-eth0</origin>\n"
              "  </config>\n</client-state>\n");
    EXPECT_THAT(saidOfEth0(), IsEmpty());
    runUnit(host, "wickedd");
    EXPECT_THAT(saidOfEth0(),
                ElementsAre("wicked: wicked has set it up from compat:suse:/etc/sysconfig/network/ifcfg-eth0 "
                            "[/etc/sysconfig/network/ifcfg-eth0]"));
    for (const char* damaged :
         {"", "<origin>", "<origin>compat:", "<origin></origin>", "</origin><origin>"}) {
        host.file("/run/wicked/state-3.xml", damaged);
        EXPECT_THAT(saidOfEth0(), IsEmpty()) << damaged;
    }
}

HOST_TEST(Keeper, IsIfupdownWhereItHasTheLinkUpByAStanza) {
    host.file("/run/network/ifstate", "lo=lo\neth00=eth0\neth0=home\n");
    host.file("/etc/network/interfaces", "auto lo\niface lo inet loopback\nsource interfaces.d/*\n");
    EXPECT_THAT(saidOfEth0(), IsEmpty());
    host.file("/etc/network/interfaces.d/lan", "iface home inet static\n    address 192.0.2.10/24\n");
    EXPECT_THAT(saidOfEth0(), ElementsAre("ifupdown: ifupdown has it up as 'home', by the stanza in "
                                          "/etc/network/interfaces.d/lan [/etc/network/interfaces.d/lan]"));
    host.file("/run/network/ifstate", "lo=lo\neth00=home\n");
    EXPECT_THAT(saidOfEth0(), IsEmpty());
}

HOST_TEST(Keeper, IsNotKnownWhereTwoClaimTheLink) {
    runUnit(host, "systemd-networkd");
    networkdSays(host, "configured", "/etc/systemd/network/20-lan.network");
    host.file("/run/network/ifstate", "eth0=eth0\n");
    host.file("/etc/network/interfaces", "iface eth0 inet dhcp\n");
    EXPECT_EQ(eth0().claims.size(), 2U);
    EXPECT_EQ(eth0().system(), "");
}

/// A mebibyte is more than any such file has, a FIFO would keep the reader waiting, a file can name itself.
HOST_TEST(Keeper, IsLookedForInNoFileThatWouldHoldItUp) {
    host.file("/run/network/ifstate", "eth0=eth0\n");
    host.file("/etc/network/interfaces",
              "source /etc/network/interfaces\nsource /etc/network/*\nsource-directory interfaces.d\n"
              "source /etc/network/large /etc/network/fifo\n");
    host.file("/etc/network/large", std::string(3U << 20U, '\n') + "iface eth0 inet dhcp\n");
    host.file("/etc/network/interfaces.d/lan.dpkg-old", "iface eth0 inet dhcp\n");
    ASSERT_EQ(mkfifo("/etc/network/fifo", 0666), 0);
    EXPECT_THAT(saidOfEth0(), IsEmpty());
    host.file("/etc/network/interfaces.d/lan", "iface eth0 inet dhcp\n");
    EXPECT_EQ(eth0().system(), "ifupdown");
}

HOST_TEST(Keeper, OfNetworkManagersIsNotKnownWithoutABus) {
    runUnit(host, "NetworkManager");
    EXPECT_THAT(eth0().unknown, ElementsAre(testing::HasSubstr("NetworkManager runs, but")));
}

HOST_TEST(Keeper, IsToldByTheDoctorOfEachInterface) {
    host.realTool("ip");
    host.useKernelNetwork();
    ASSERT_EQ(host.run({"ip", "link", "add", "eth1", "type", "veth", "peer", "name", "eth0"}).status, 0);
    ASSERT_EQ(host.run({"ip", "link", "add", "sw", "type", "veth", "peer", "name", "a\033b"}).status, 0);
    host.file("/run/network/ifstate", "eth0=eth0\n");
    host.file("/etc/network/interfaces", "iface eth0 inet dhcp\n");
    EXPECT_THAT(host.run({CVAGENT_PROGRAM, "doctor", "--host-tools", "native"}).out,
                testing::HasSubstr("KEPT OVER A RESTART BY\n"
                                   "  a\\x1bb        nobody: what is changed holds until restart\n"
                                   "  eth0          ifupdown\n"
                                   "    ifupdown has it up as 'eth0', by the stanza in "
                                   "/etc/network/interfaces\n"
                                   "  eth1          nobody: what is changed holds until restart\n"
                                   "  sw            nobody: what is changed holds until restart\n"
                                   "  host name "));
    const std::string json = host.run({CVAGENT_PROGRAM, "doctor", "--host-tools", "native", "--json"}).out;
    EXPECT_THAT(json, testing::HasSubstr("\"keeper\": \"ifupdown\""));
    EXPECT_THAT(json, testing::HasSubstr("\"interface\": \"a\\u001bb\""));
}

}  // namespace
