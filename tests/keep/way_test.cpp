// How each system is made to keep something, and the way back.
#include "agent/keep/way.h"

#include <gmock/gmock.h>
#include <sys/stat.h>

#include "tests/support/fake_host.h"

namespace {

using cvagent::keep::CannotKeep;
using cvagent::keep::Claim;
using cvagent::keep::go;
using cvagent::keep::Keeper;
using cvagent::keep::Way;
using cvagent::keep::wayToKeep;
using cvagent::keep::Wish;
using testing::HasSubstr;

const cvagent::keep::Link kLink{"eth0", 3};
constexpr const char* kInterfaces = "/etc/network/interfaces";
constexpr const char* kStanza = "iface home inet static\n\taddress 192.0.2.10/24\n";
constexpr const char* kChangedStanza = "iface home inet static\n\taddress 192.0.2.77/24\n";
constexpr const char* kNetwork = "/etc/systemd/network/20-lan.network";
constexpr const char* kOurs = "/etc/systemd/network/0-cvagent-eth0.network";

Keeper keptBy(const std::string& system, const std::string& source = {}) {
    return {"eth0", {{system, "it says so", source}}, {}};
}

Wish newAddress() {
    Wish wish;
    wish.ipv4.address = "192.0.2.77";
    return wish;
}

std::string refusalOf(const std::function<void()>& act) {
    try {
        act();
        return "";
    } catch (const CannotKeep& cannot) {
        return cannot.what();
    }
}

class KeptByIfupdown : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        host.file("/run/network/ifstate", "lo=lo\neth0=home\n");
        host.file(kInterfaces, kStanza);
        host.tool("ifdown eth0", "");
        host.tool("ifup eth0=home", "");
    }
    static Way way() { return wayToKeep(kLink, keptBy("ifupdown", kInterfaces), newAddress()); }
};

HOST_TEST_F(KeptByIfupdown, ChangesTheStanzaBetweenDownAndUp) {
    const Way way = KeptByIfupdown::way();
    EXPECT_EQ(host.read(kInterfaces), kStanza);  // nothing is done yet
    EXPECT_TRUE(host.calls().empty());
    host.tool("ifdown eth0", {"", 0, "", 0, "grep -q 192.0.2.10/24 /etc/network/interfaces || exit 3"});
    host.tool("ifup eth0=home", {"", 0, "", 0, "grep -q 192.0.2.77/24 /etc/network/interfaces || exit 3"});
    go(way);
    EXPECT_EQ(host.read(kInterfaces), kChangedStanza);
    EXPECT_THAT(host.calls(), TextsAre("ifdown eth0", "ifup eth0=home"));
    EXPECT_TRUE(KeptByIfupdown::way().isEmpty());
}

HOST_TEST_F(KeptByIfupdown, ComesBackByteForByte) {
    const Way way = KeptByIfupdown::way();
    go(way);
    go(way.back());
    EXPECT_EQ(host.read(kInterfaces), kStanza);
    EXPECT_THAT(host.calls(), TextsAre("ifdown eth0", "ifup eth0=home", "ifdown eth0", "ifup eth0=home"));
}

HOST_TEST_F(KeptByIfupdown, LeavesALinkALinkAndAModeAMode) {
    host.file("/srv/interfaces", kStanza, 0600);
    host.remove(kInterfaces);
    host.symlink(kInterfaces, "/srv/interfaces");
    go(way());
    struct stat found {};
    ASSERT_EQ(lstat(kInterfaces, &found), 0);
    EXPECT_TRUE(S_ISLNK(found.st_mode));
    ASSERT_EQ(lstat("/srv/interfaces", &found), 0);
    EXPECT_EQ(found.st_mode & 07777U, 0600U);
    EXPECT_EQ(host.read("/srv/interfaces"), kChangedStanza);
}

HOST_TEST_F(KeptByIfupdown, IsAsBeforeWhenItDoesNotComeUp) {
    host.toolInTurn("ifup eth0=home", {{"", 1, "ifup: a\nRTNETLINK answers: no\n"}, {}});
    EXPECT_EQ(refusalOf([] { go(way()); }), "ifup eth0=home has failed: 'RTNETLINK answers: no'");
    EXPECT_EQ(host.read(kInterfaces), kStanza);
    EXPECT_THAT(host.calls(), TextsAre("ifdown eth0", "ifup eth0=home", "ifup eth0=home"));
    host.tool("ifup eth0=home", "", 1);
    EXPECT_THAT(refusalOf([] { go(way()); }), HasSubstr("and taking it back: ifup eth0=home has failed"));
}

HOST_TEST_F(KeptByIfupdown, DoesNotOverwriteWhatAnotherHasWritten) {
    const Way way = KeptByIfupdown::way();
    host.file(kInterfaces, "# new\n");
    EXPECT_THAT(refusalOf([&way] { go(way); }), HasSubstr("changed meanwhile"));
    EXPECT_EQ(host.read(kInterfaces), "# new\n");
    EXPECT_THAT(host.callsOf("ifup"), TextsAre("ifup eth0=home"));
}

HOST_TEST_F(KeptByIfupdown, TellsWhatCannotBeWritten) {
    host.readOnly("/etc");
    EXPECT_THAT(refusalOf([] { go(way()); }), HasSubstr("cannot write /etc/network/interfaces: Read-only"));
    EXPECT_THAT(host.callsOf("ifup"), TextsAre("ifup eth0=home"));
    host.restore("/etc");
    host.fullDisk("/etc");
    EXPECT_THAT(refusalOf([] { go(way()); }), HasSubstr("No space left"));
    EXPECT_EQ(host.read(kInterfaces), kStanza);
}

HOST_TEST_F(KeptByIfupdown, HasTheFamiliesWhereTheyStand) {
    host.file(kInterfaces, std::string("source /etc/six\n") + kStanza);
    host.file("/etc/six", "iface home inet6 static\n\taddress 2001:db8::1/64\n");
    Wish wish = newAddress();
    wish.ipv6.prefix = 48;
    go(wayToKeep(kLink, keptBy("ifupdown", kInterfaces), wish));
    EXPECT_EQ(host.read(kInterfaces), std::string("source /etc/six\n") + kChangedStanza);
    EXPECT_EQ(host.read("/etc/six"), "iface home inet6 static\n\taddress 2001:db8::1/48\n");
    host.file("/etc/six", kStanza);
    EXPECT_THAT(refusalOf([] { way(); }), HasSubstr("more than one file"));
}

HOST_TEST_F(KeptByIfupdown, GivesNoCommandANameThatAShellWouldRead) {
    for (const char* name : {"$(touch /tmp/x)", "-a", "a;b", "a b"}) {
        host.file("/run/network/ifstate", std::string("eth0=") + name + "\n");
        EXPECT_NE(refusalOf([] { way(); }), "") << name;
        EXPECT_THAT(refusalOf([name] {
                        wayToKeep({name, 3}, keptBy("ifupdown", kInterfaces), newAddress());
                    }),
                    HasSubstr("written to no file"));
    }
}

HOST_TEST(KeptByNetworkd, HasAFileOfOursInFront) {
    host.file(kNetwork, "[Match]\nMACAddress=02:00:00:aa:bb:01\n[Network]\nAddress=192.0.2.10/24\n");
    host.tool("networkctl reload", "");
    const Keeper keeper = keptBy("systemd-networkd", kNetwork);
    const Way way = wayToKeep(kLink, keeper, newAddress());
    go(way);
    EXPECT_EQ(host.read(kOurs),
              "# Written by cvagent; taken back with the change that made it.\n"
              "[Match]\nName=eth0\nMACAddress=02:00:00:aa:bb:01\n\n[Network]\nAddress=192.0.2.77/24\n");
    struct stat found {};
    ASSERT_EQ(lstat(kOurs, &found), 0);
    EXPECT_EQ(found.st_mode & 07777U, 0644U);  // networkd is another user
    EXPECT_THAT(host.calls(), TextsAre("networkctl reload"));
    EXPECT_TRUE(wayToKeep(kLink, keptBy("systemd-networkd", kOurs), newAddress()).isEmpty());
    go(way.back());
    EXPECT_THAT(host.listDirectory("/etc/systemd/network"), testing::ElementsAre("20-lan.network"));
}

HOST_TEST(KeptByNetworkd, NeedsNoFileForWhatIsSo) {
    host.file(kNetwork, "[Match]\nName=eth0\n[Network]\nAddress=192.0.2.77/24\n");
    EXPECT_TRUE(wayToKeep(kLink, keptBy("systemd-networkd", kNetwork), newAddress()).isEmpty());
}

/// It says so itself, in a file of a user with few rights.
HOST_TEST(KeptByNetworkd, IsNotMadeOfAnythingButItsFiles) {
    for (const char* each : {"/etc/secrets/x.network", "/etc/systemd/network/../secret.network",
                             "/etc/systemd/network/x.conf", "/root/x", ""}) {
        host.file("/etc/secrets/x.network", "[wifi]\npsk=secret\n", 0600);
        EXPECT_THAT(refusalOf([&] { wayToKeep(kLink, keptBy("systemd-networkd", each), newAddress()); }),
                    HasSubstr("no file of systemd-networkd's"))
            << each;
    }
}

HOST_TEST(KeptByNetworkd, IsNotReadByWhoCouldNotReadItBefore) {
    host.tool("networkctl reload", "");
    host.file(kNetwork, "[Match]\nName=eth0\n[Network]\nAddress=192.0.2.10/24\n", 0640);
    go(wayToKeep(kLink, keptBy("systemd-networkd", kNetwork), newAddress()));
    struct stat found {};
    ASSERT_EQ(stat(kOurs, &found), 0);
    EXPECT_EQ(found.st_mode & 07777U, 0640U);
}

/// Of two of one name the first place counts, one that leads nowhere is none, and each begins without a
/// section.
HOST_TEST(KeptByNetworkd, HasWhatOthersAddToTheFile) {
    const Keeper keeper = keptBy("systemd-networkd", kNetwork);
    EXPECT_THAT(refusalOf([&] { wayToKeep(kLink, keeper, newAddress()); }), HasSubstr("cannot read"));
    host.file(kNetwork, "[Match]\nName=e*\n[Network]\nAddress=192.0.2.10/24\n");
    host.file("/etc/systemd/network/20-lan.network.d/b.conf", "DNS=192.0.2.1\n[Network]\nDNS=192.0.2.53\n");
    host.file("/run/systemd/network/20-lan.network.d/b.conf", "[Network]\nDNS=192.0.2.54\n");
    host.file("/run/systemd/network/20-lan.network.d/a.conf",
              "[Match]\nHost=moon\n[Route]\nGateway=192.0.2.1\n");
    host.file("/run/systemd/network/20-lan.network.d/c.conf", "[Network]\nDNS=192.0.2.55\n");
    host.symlink("/etc/systemd/network/20-lan.network.d/c.conf", "/dev/null");
    host.file("/etc/systemd/network/20-lan.network.d/note", "[Network]\nDNS=192.0.2.56\n");
    const Way way = wayToKeep(kLink, keeper, newAddress());
    ASSERT_EQ(way.files.size(), 1U);
    EXPECT_EQ(
        way.files[0].after,
        "# Written by cvagent; taken back with the change that made it.\n"
        "[Match]\nName=eth0\nHost=moon\n\n[Network]\nAddress=192.0.2.77/24\n\n[X-Added]\n"
        "[Route]\nGateway=192.0.2.1\n\n[X-Added]\nDNS=192.0.2.1\n[Network]\nDNS=192.0.2.53\n\n[X-Added]\n");
}

HOST_TEST(KeptByNetworkd, IsRefusedWhereWhatOthersAddIsNotForEverybodyOrNotUnderstood) {
    const Keeper keeper = keptBy("systemd-networkd", kNetwork);
    const std::string more = "/etc/systemd/network/20-lan.network.d/more.conf";
    host.file(kNetwork, "[Match]\nName=eth0\n[Network]\nAddress=192.0.2.10/24\n");
    host.file(more, "[Network]\nDNS=192.0.2.53\n", 0640);
    EXPECT_THAT(refusalOf([&] { wayToKeep(kLink, keeper, newAddress()); }),
                HasSubstr("another owner or mode"));
    host.file(more, "[Network]\nAddress=\nAddress=192.0.2.11/24\n", 0644);
    EXPECT_THAT(refusalOf([&] { wayToKeep(kLink, keeper, newAddress()); }),
                HasSubstr("'Address=' takes away what stands before it"));
    host.remove(more);
    host.directory(more);
    EXPECT_THAT(refusalOf([&] { wayToKeep(kLink, keeper, newAddress()); }), HasSubstr("cannot read"));
}

/// All would be added once more.
HOST_TEST(KeptByNetworkd, IsRefusedWhereOthersAddToOurFile) {
    host.file(kOurs, "[Match]\nName=eth0\n[Network]\nAddress=192.0.2.10/24\n");
    host.file(std::string(kOurs) + ".d/more.conf", "[Network]\nDNS=192.0.2.53\n");
    EXPECT_THAT(refusalOf([] { wayToKeep(kLink, keptBy("systemd-networkd", kOurs), newAddress()); }),
                HasSubstr("more.conf' adds to the file of the interface, which is ours"));
}

/// A reload that fails leaves no file for the next one to find.
HOST_TEST(KeptByNetworkd, IsAsBeforeWhenTheReloadFails) {
    host.file(kNetwork, "[Match]\nName=eth0\n[Network]\nAddress=192.0.2.10/24\n");
    host.tool("networkctl reload", "", 1);
    EXPECT_THAT(refusalOf([] { go(wayToKeep(kLink, keptBy("systemd-networkd", kNetwork), newAddress())); }),
                HasSubstr("networkctl reload has failed"));
    EXPECT_FALSE(host.exists(kOurs));
}

HOST_TEST(KeptByWicked, HasTheInterfacesOwnFiles) {
    const std::string file = "/etc/sysconfig/network/ifcfg-eth0";
    const std::string text = "BOOTPROTO='static'\nIPADDR='192.0.2.10/24'\n";
    host.file(file, text);
    host.tool("wicked ifreload eth0", "");
    Wish wish = newAddress();
    wish.ipv4.gateway = "192.0.2.1";
    const Way way = wayToKeep(kLink, keptBy("wicked", file), wish);
    go(way);
    EXPECT_EQ(host.read(file), "BOOTPROTO='static'\nIPADDR='192.0.2.77/24'\n");
    EXPECT_EQ(host.read("/etc/sysconfig/network/ifroute-eth0"), "default 192.0.2.1 - -\n");
    go(way.back());
    EXPECT_EQ(host.read(file), text);
    EXPECT_FALSE(host.exists("/etc/sysconfig/network/ifroute-eth0"));
    EXPECT_THAT(host.calls(), TextsAre("wicked ifreload eth0", "wicked ifreload eth0"));
    EXPECT_THAT(refusalOf([&] { wayToKeep(kLink, keptBy("wicked", "/etc/wicked/x.xml"), wish); }),
                HasSubstr("not from a file of its own"));
}

class KeptByNetplan : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        host.file("/etc/netplan/10-other.yaml", "network:\n  ethernets:\n    eth1:\n      dhcp4: true\n");
        host.file("/etc/netplan/50-host.yaml", kText, 0600);
        for (const char* call : {"netplan generate", "networkctl reload", "nmcli connection reload",
                                 "nmcli device reapply eth0"}) {
            host.tool(call, "");
        }
    }
    static constexpr const char* kText =
        "network:\n  ethernets:\n    lan:\n      match: {name: eth0}\n      addresses: [192.0.2.10/24]\n";
    static constexpr const char* kForNetworkd = "/run/systemd/network/10-netplan-lan.network";
    static Way way(const std::string& source) {
        return wayToKeep(kLink, keptBy("netplan", source), newAddress());
    }
};

HOST_TEST_F(KeptByNetplan, HasItInTheFileThatDefinesIt) {
    const Way way = KeptByNetplan::way(kForNetworkd);
    go(way);
    EXPECT_EQ(
        host.read("/etc/netplan/50-host.yaml"),
        "network:\n  ethernets:\n    lan:\n      match: {name: eth0}\n      addresses: [192.0.2.77/24]\n");
    struct stat found {};
    ASSERT_EQ(lstat("/etc/netplan/50-host.yaml", &found), 0);
    EXPECT_EQ(found.st_mode & 07777U, 0600U);  // there can be passwords in it
    EXPECT_THAT(host.calls(), TextsAre("netplan generate", "networkctl reload"));
    go(way.back());
    EXPECT_EQ(host.read("/etc/netplan/50-host.yaml"), kText);
}

HOST_TEST_F(KeptByNetplan, TellsTheRendererThatHasIt) {
    go(way("/run/NetworkManager/system-connections/netplan-lan.nmconnection"));
    EXPECT_THAT(host.calls(),
                TextsAre("netplan generate", "nmcli connection reload", "nmcli device reapply eth0"));
}

HOST_TEST_F(KeptByNetplan, IsAsBeforeWhenItsFileIsNotTaken) {
    host.toolInTurn("netplan generate", {{"", 78, "Error in network definition\n"}, {}});
    EXPECT_THAT(refusalOf([] { go(way(kForNetworkd)); }), HasSubstr("Error in network definition"));
    EXPECT_EQ(host.read("/etc/netplan/50-host.yaml"), kText);
    EXPECT_THAT(host.calls(), TextsAre("netplan generate", "netplan generate", "networkctl reload"));
}

/// Of many files, most are not the host's administrator's own.
HOST_TEST_F(KeptByNetplan, TellsWhichFileIsNotUnderstood) {
    host.file("/etc/netplan/50-host.yaml", "network:\n  ethernets:\n    lan:\n      dhcp4: true\n");
    Wish wish;
    wish.ipv4.gateway = "192.0.2.1";
    EXPECT_EQ(refusalOf([&] { wayToKeep(kLink, keptBy("netplan", kForNetworkd), wish); }),
              "'/etc/netplan/50-host.yaml': the address comes by DHCP");
    host.file("/etc/netplan/60-strange.yaml", "network: &all\n");
    EXPECT_EQ(refusalOf([] { way(kForNetworkd); }),
              "'/etc/netplan/60-strange.yaml': a line of the file is not understood: 'network'");
    ASSERT_EQ(mkfifo("/etc/netplan/20-pipe.yaml", 0600), 0);
    EXPECT_EQ(refusalOf([] { way(kForNetworkd); }), "cannot read '/etc/netplan/20-pipe.yaml'");
}

HOST_TEST_F(KeptByNetplan, IsRefusedWhereNotOneFileDefinesIt) {
    host.file("/run/netplan/60-more.yaml", "network:\n  ethernets:\n    lan:\n      mtu: 1400\n");
    EXPECT_THAT(refusalOf([] { way(kForNetworkd); }), HasSubstr("both define 'lan'"));
    host.remove("/etc/netplan/50-host.yaml");
    EXPECT_THAT(refusalOf([] { way(kForNetworkd); }), HasSubstr("no file in /etc/netplan defines 'lan'"));
    for (const char* source : {"", "/run/systemd/network/10-netplan-.network", "/etc/x"}) {
        EXPECT_THAT(refusalOf([source] { way(source); }), HasSubstr("netplan's name")) << source;
    }
}

HOST_TEST(Keeping, IsRefusedWhereItIsNotKnownWhoKeeps) {
    const auto refused = [](const Keeper& keeper) {
        return refusalOf([&keeper] { wayToKeep(kLink, keeper, newAddress()); });
    };
    EXPECT_EQ(refused({"eth0", {}, {}}), "no system keeps 'eth0'");
    EXPECT_EQ(refused({"eth0", {{"systemd-networkd", "", kNetwork}, {"ifupdown", "", ""}}, {}}),
              "systemd-networkd and ifupdown both have 'eth0'");
    EXPECT_EQ(refused({"eth0", {{"ifupdown", "", ""}}, {"nobody answers"}}), "nobody answers");
    EXPECT_EQ(refused(keptBy("another")), "another is not known");
}

}  // namespace
