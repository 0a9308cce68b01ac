// What the host's sysfs tells about its links: on made-up trees and on links of a real kernel.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include "framework/netinfo/ip_interface_info.h"
#include "framework/netinfo/network_info.h"
#include "tests/support/fake_host.h"
#include "tests/support/texts_are.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;
using testing::UnorderedElementsAre;

constexpr const char* kNoAddress = "00:00:00:00:00:00";

/// A link as the kernel shows it: an Ethernet one that is up, with nothing special about it.
class Link {
public:
    Link(FakeHost& host, const std::string& name) : host_(host), path_("/sys/class/net/" + name) {
        static int lastIndex = 1;
        const std::string index = std::to_string(++lastIndex) + "\n";
        with("type", "1\n").with("flags", "0x1003\n").with("uevent", "INTERFACE=" + name + "\n");
        with("ifindex", index).with("iflink", index).with("addr_assign_type", "3\n");
        with("address", "02:00:00:00:00:01\n");
    }
    Link& with(const std::string& attribute, const std::string& content) {
        host_.file(path_ + "/" + attribute, content);
        return *this;
    }
    Link& withDirectory(const std::string& name) {
        host_.directory(path_ + "/" + name);
        return *this;
    }
    Link& withDevice(const std::string& busAddress) {
        host_.symlink(path_ + "/device", "../../../" + busAddress);
        return *this;
    }
    Link& withType(const std::string& deviceType) {
        return with("uevent", "DEVTYPE=" + deviceType + "\nINTERFACE=x\nIFINDEX=9\n");
    }

private:
    FakeHost& host_;
    std::string path_;
};

/// The names of the ports by controller.
std::map<std::string, std::vector<std::string>> portNames(const CNetworkInfo& info) {
    std::map<std::string, std::vector<std::string>> names;
    for (const auto& [controller, ports] : *info.getNICInfo()) {
        for (const CEthernetPort* port : *ports) {
            EXPECT_EQ(port->controller, controller);
            EXPECT_EQ(port->nodeId, 0U);
            names[controller].push_back(port->name);
        }
    }
    return names;
}

std::vector<std::string> vlanNames(const CNetworkInfo& info) {
    std::vector<std::string> names;
    for (const auto& [name, port] : *info.getVLANInfo()) {
        EXPECT_EQ(port->name, name);
        names.push_back(name);
    }
    return names;
}

HOST_TEST(NetworkInfo, WithoutSysfsThereIsNothingToHandOut) {
    const CNetworkInfo info(true);
    EXPECT_EQ(info.getNICInfo(), nullptr);
    EXPECT_EQ(info.getVLANInfo(), nullptr);
    EXPECT_THAT(info.getVNICNames(), IsEmpty());
}

HOST_TEST(NetworkInfo, AHostWithoutLinksHasEmptyLists) {
    host.directory("/sys/class/net");
    host.file("/sys/class/net/bonding_masters", "bond0\n");
    const CNetworkInfo info(true);
    ASSERT_NE(info.getNICInfo(), nullptr);
    EXPECT_THAT(*info.getNICInfo(), IsEmpty());
    ASSERT_NE(info.getVLANInfo(), nullptr);
    EXPECT_THAT(*info.getVLANInfo(), IsEmpty());
}

HOST_TEST(NetworkInfo, PortsStandUnderTheirController) {
    Link(host, "eth1").withDevice("0000:00:03.1");
    Link(host, "eth0").withDevice("0000:00:03.0");
    Link(host, "p2p2").withDevice("0000:04:00.0");
    Link(host, "p2p1").withDevice("0000:04:00.0");
    const CNetworkInfo info(true);
    EXPECT_THAT(portNames(info),
                ElementsAre(Pair("0000:00:03.0", TextsAre("eth0")), Pair("0000:00:03.1", TextsAre("eth1")),
                            Pair("0000:04:00.0", TextsAre("p2p1", "p2p2"))));
    EXPECT_THAT(info.getVNICNames(), IsEmpty());
}

HOST_TEST(NetworkInfo, ParavirtualLinksArePorts) {
    Link(host, "eth0").withDevice("virtio2");
    Link(host, "veth0").with("ifindex", "7\n").with("iflink", "8\n");
    const CNetworkInfo info(true);
    EXPECT_THAT(portNames(info),
                ElementsAre(Pair("veth0", TextsAre("veth0")), Pair("virtio2", TextsAre("eth0"))));
    EXPECT_THAT(info.getVNICNames(), TextsAre("veth0"));
}

HOST_TEST(NetworkInfo, APortKeepsItsPlaceInABondOrABridge) {
    Link(host, "eth0").withDevice("0000:00:03.0").withDirectory("bonding_slave").withDirectory("upper_bond0");
    Link(host, "eth1").withDevice("0000:00:03.1").withDirectory("brport").withDirectory("upper_br0");
    // A port of a built-in switch hangs on the processor's port, but is one that a cable goes into.
    Link(host, "lan1").withDevice("mdio.0:1e").withType("dsa").withDirectory("lower_eth0");
    const CNetworkInfo info(true);
    EXPECT_EQ(portNames(info).size(), 3U);
}

HOST_TEST(NetworkInfo, LinksOfAnUpperKindAreNoPorts) {
    for (const char* const type : {"bond", "bridge", "vlan", "wlan", "wwan", "macvlan", "vxlan"}) {
        Link(host, std::string("t_") + type).withType(type).withDevice("0000:00:09.0");
    }
    for (const char* const mark : {"bonding", "bridge", "phy80211", "wireless"}) {
        Link(host, std::string("d_") + mark).withDirectory(mark).withDevice("0000:00:09.0");
    }
    Link(host, "tap0").with("tun_flags", "0x1002\n").with("iflink", "99\n");
    Link(host, "eth0.5").withDirectory("lower_eth0").with("iflink", "2\n");
    Link(host, "team0").withDirectory("lower_eth1");
    const CNetworkInfo info(true);
    EXPECT_THAT(*info.getNICInfo(), IsEmpty());
}

HOST_TEST(NetworkInfo, LinksThatLeadNowhereAreNoPorts) {
    Link(host, "dummy0");
    Link(host, "ifb0");
    Link(host, "gretap0").with("iflink", "0\n");
    const CNetworkInfo info(true);
    EXPECT_THAT(*info.getNICInfo(), IsEmpty());
    EXPECT_THAT(info.getVNICNames(), TextsAre("dummy0", "gretap0", "ifb0"));
}

HOST_TEST(NetworkInfo, AWireToAnotherComputerIsNoPortAndAnAdapterOnTheSameBusIsOne) {
    Link(host, "usb0").withDevice("1-1:1.0");
    Link(host, "usb1").withDevice("gadget.0").withType("gadget");
    Link(host, "eth1").withDevice("1-2:1.0");
    const CNetworkInfo info(true);
    EXPECT_THAT(portNames(info), ElementsAre(Pair("1-2:1.0", TextsAre("eth1"))));
    EXPECT_THAT(*info.getVLANInfo(), IsEmpty());
}

HOST_TEST(NetworkInfo, LinksThatAreNotEthernetAreNotSeen) {
    Link(host, "lo").with("type", "772\n");
    Link(host, "ib0").with("type", "32\n").withDevice("0000:05:00.0");
    Link(host, "tun0").with("type", "65534\n").with("tun_flags", "0x1001\n");
    Link(host, "odd0").with("type", "").withDevice("0000:06:00.0");
    Link(host, "odd1").with("type", "11\n").withDevice("0000:06:00.1");
    const CNetworkInfo info(true);
    EXPECT_THAT(*info.getNICInfo(), IsEmpty());
    EXPECT_THAT(info.getVNICNames(), IsEmpty());
}

HOST_TEST(NetworkInfo, NoDriverIsAskedForANameThatTheKernelCannotHold) {
    Link(host, "a-name-of-20-letters").with("ifindex", "7\n").with("iflink", "8\n");
    const CNetworkInfo info(true);
    const auto ports = info.getNICInfo()->begin()->second;
    ASSERT_EQ(ports->size(), 1U);
    EXPECT_EQ(ports->front()->name, "a-name-of-20-letters");
    EXPECT_EQ(ports->front()->permanentAddress, kNoAddress);
}

HOST_TEST(NetworkInfo, VlansAreThoseTheKernelMarks) {
    Link(host, "eth0").withDevice("0000:00:03.0");
    Link(host, "eth0.5").withType("vlan").withDirectory("lower_eth0");
    Link(host, "office").withType("vlan").withDirectory("lower_eth0");
    Link(host, "vlan7").withType("macvlan");
    const CNetworkInfo info(true);
    EXPECT_THAT(vlanNames(info), TextsAre("eth0.5", "office"));
    EXPECT_EQ(info.getVLANInfo()->at("office")->controller, "office");
    EXPECT_THAT(info.getVNICNames(), TextsAre("eth0.5", "office", "vlan7"));
}

HOST_TEST(NetworkInfo, PortsThatAreDownAreLeftOutWhenNotAskedFor) {
    Link(host, "eth0").withDevice("0000:00:03.0").with("flags", "0x1003\n");
    Link(host, "eth1").withDevice("0000:00:03.1").with("flags", "0x1002\n");
    Link(host, "eth2").withDevice("0000:00:03.2").with("flags", "garbage\n");
    Link(host, "eth0.5").withType("vlan").with("flags", "0x1002\n");
    const CNetworkInfo everything(true);
    EXPECT_EQ(everything.getNICInfo()->size(), 3U);
    EXPECT_EQ(everything.getVLANInfo()->size(), 1U);
    const CNetworkInfo running(false);
    EXPECT_THAT(portNames(running), ElementsAre(Pair("0000:00:03.0", TextsAre("eth0"))));
    EXPECT_THAT(*running.getVLANInfo(), IsEmpty());
}

HOST_TEST(NetworkInfo, ThePermanentAddressIsTheOneBeforeAnyoneChangedIt) {
    Link(host, "eth0")
        .withDevice("0000:00:03.0")
        .with("addr_assign_type", "0\n")
        .with("address", "52:54:00:aa:bb:01\n");
    Link(host, "eth1")
        .withDevice("0000:00:03.1")
        .with("addr_assign_type", "2\n")
        .with("bonding_slave/perm_hwaddr", "52:54:00:aa:bb:02\n");
    Link(host, "eth2").withDevice("0000:00:03.2").with("addr_assign_type", "3\n");
    const CNetworkInfo info(true);
    const auto address = [&](const char* controller) {
        return info.getNICInfo()->at(controller)->at(0)->permanentAddress;
    };
    EXPECT_EQ(address("0000:00:03.0"), "52:54:00:aa:bb:01");
    EXPECT_EQ(address("0000:00:03.1"), "52:54:00:aa:bb:02");
    EXPECT_EQ(address("0000:00:03.2"), kNoAddress);
}

HOST_TEST(IPInterfaceInfo, TheHardwareAddressIsTheOneInUse) {
    Link(host, "eth0").with("address", "52:54:00:aa:bb:01\n");
    host.file("/sys/class/secret/address", "no link\n");
    const CIPInterfaceInfo info;
    EXPECT_EQ(info.getMACAddress("eth0"), "52:54:00:aa:bb:01");
    for (const char* const name :
         {"eth9", "", ".", "..", "../secret", "eth0/../eth0", "/sys/class/net/eth0"}) {
        EXPECT_EQ(info.getMACAddress(name), "") << name;
    }
}

/// Links of a real kernel, on a network of the test's own.
class KernelLinks : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        host.realTool("ip");
        host.useKernelNetwork();
        ip(host, "link add lan0 type veth peer name lan1");
    }
    static void ip(FakeHost& host, const std::string& arguments) {
        const Finished done = host.run({"sh", "-c", "ip " + arguments});
        ASSERT_EQ(done.status, 0) << arguments << ": " << done.err;
    }
    /// Some kernels come without this kind of link.
    static bool canMake(FakeHost& host, const std::string& arguments) {
        return host.run({"sh", "-c", "ip " + arguments}).status == 0;
    }
};

HOST_TEST_F(KernelLinks, BothEndsOfAPairArePortsAndNothingElseIs) {
    ip(host, "link add br0 type bridge");
    ip(host, "link set lan1 master br0");
    for (const char* const other :
         {"link add dummy0 type dummy", "link add ifb7 type ifb", "link add bond0 type bond",
          "link add mac0 link lan0 type macvlan", "tuntap add tap0 mode tap"}) {
        canMake(host, other);
    }
    const CNetworkInfo info(true);
    EXPECT_THAT(portNames(info), ElementsAre(Pair("lan0", TextsAre("lan0")), Pair("lan1", TextsAre("lan1"))));
    EXPECT_THAT(info.getVNICNames(), testing::IsSupersetOf({"br0", "lan0", "lan1"}));
    EXPECT_THAT(info.getVNICNames(), testing::Not(testing::Contains("lo")));
}

HOST_TEST_F(KernelLinks, TheEndsOfAPairInTwoNetworksMayHaveTheSameIndex) {
    host.realTool("unshare");
    const Finished done = host.run({"sh", "-c",
                                    "unshare -n sleep 60 >/dev/null 2>&1 & other=$!\n"
                                    "until [ \"$(readlink /proc/$other/ns/net)\" != "
                                    "\"$(readlink /proc/$$/ns/net)\" ]; do :; done\n"
                                    "ip link add index 50 name guest type veth peer index 50 netns $other"});
    ASSERT_EQ(done.status, 0) << done.err;
    ASSERT_EQ(host.read("/sys/class/net/guest/iflink"), host.read("/sys/class/net/guest/ifindex"));
    const CNetworkInfo info(true);
    EXPECT_TRUE(info.getNICInfo()->contains("guest"));
}

HOST_TEST_F(KernelLinks, AVlanIsFound) {
    if (!canMake(host, "link add link lan0 name lan0.5 type vlan id 5")) {
        GTEST_SKIP() << "this kernel has no VLANs";
    }
    EXPECT_THAT(vlanNames(CNetworkInfo(true)), TextsAre("lan0.5"));
}

HOST_TEST_F(KernelLinks, AddressesComeByInterface) {
    ip(host, "address add 10.1.2.3/20 dev lan0");
    ip(host, "address add 10.9.0.1/30 dev lan0");
    ip(host, "-6 address add 2001:db8:1::3/56 dev lan0 nodad");
    CIPInterfaceInfo info;
    const IPInfoByInterface* const addresses = info.getInterfaceIPsInfo();
    ASSERT_NE(addresses, nullptr);
    ASSERT_TRUE(addresses->contains("lan0"));
    std::vector<std::string> found;
    for (const CIPInfo* address : addresses->at("lan0")) {
        EXPECT_EQ(address->interfaceName, "lan0");
        found.push_back(address->address + "/" + std::to_string(address->prefixLength) + " " + address->mask +
                        (address->ipv6 ? " six" : " four"));
    }
    EXPECT_THAT(found, UnorderedElementsAre("10.1.2.3/20 255.255.240.0 four",
                                            "10.9.0.1/30 255.255.255.252 four", "2001:db8:1::3/56  six"));
    EXPECT_FALSE(addresses->contains("lan1"));
    EXPECT_EQ(addresses->at("lo").at(0)->address, "127.0.0.1");
    EXPECT_EQ(info.getInterfaceIPsInfo(), addresses);
}

}  // namespace
