// The walk over the host's interfaces: what it runs, which interfaces get which nodes.
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <functional>

#include "network/link_queries.h"
#include "network/port_walk.h"
#include "tests/network/port_host.h"
#include "tests/support/command_lines.h"
#include "tests/support/failing_new.h"
#include "tests/support/log_capture.h"
#include "tests/support/shell_stub.h"
#include "tests/support/texts_are.h"

namespace {

using testing::Contains;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using Lines = std::vector<std::string>;

constexpr char kSnapshot[] = "/tmp/CVIfconfig.txt";
constexpr char kListingFile[] = "/tmp/__tmp";
constexpr char kListing[] =
    "egrep 'eth|bond|usb' /proc/net/dev > /tmp/__tmp; brctl show |grep -vw 'bridge name' >>/tmp/__tmp 2> "
    "/dev/null; cat /tmp/__tmp; rm /tmp/__tmp";
constexpr char kOrigin[] =
    "cat /etc/sysconfig/network/ifcfg-eth-id-`ifconfig eth0 2> /dev/null |grep HWaddr |awk '{print $5}'|tr "
    "'[A-Z]' '[a-z]'` | grep BOOTPROTO | cut -d '=' -f2 2> /dev/null";
constexpr char kHardwareAddress[] =
    "ifconfig eth0 2> /dev/null |grep HWaddr |awk '{print $5}'|tr '[A-Z]' '[a-z]' 2> /dev/null";
constexpr char kDevicesHead[] = "Inter-|   Receive\n face |bytes\n";

/// The commands without the two that begin every write to an IP configuration.
Lines withoutWrites(const Lines& all) {
    Lines kept;
    for (const std::string& command : all) {
        if (command == kHardwareAddress) {
            EXPECT_EQ(kept.back(), kOrigin);
            kept.pop_back();
        } else {
            kept.push_back(command);
        }
    }
    return kept;
}

std::string roleCommand(const std::string& key) {
    return "cat /etc/sysconfig/network/ifcfg-eth-id-`ifconfig eth0 2> /dev/null |grep HWaddr |awk '{print "
           "$5}'|tr '[A-Z]' '[a-z]'` | grep " +
           key + " | cut -d '=' -f2 2> /dev/null";
}

const std::string kAddress =
    "ifconfig eth0 2> /dev/null | grep \"inet addr:\" | tr -s ' ' | cut -d: -f2 | cut -d ' ' -f1 2> "
    "/dev/null";
const std::string kMask =
    "ifconfig eth0 2> /dev/null | grep \"inet addr:\" | tr -s ' ' | cut -d: -f4 2> /dev/null";
const std::string kIPv6 = "ip -6 address show dev eth0 | grep \"global\"";
const std::string kIPv6Fields =
    "echo \"    inet6 2001:db8::10/64 scope global \n\" | tr -s ' ' | cut -d ' ' -f3 2> /dev/null";
const std::string kMiiStatus =
    "cat /proc/net/bonding/ 2> /dev/null | grep -P \"Slave Interface: eth0\\nMII Status\" 2> /dev/null | "
    "grep \"MII Status: \" 2> /dev/null | cut -d' ' -f3 2> /dev/null";

const Lines kOfThePort = {
    "ethtool eth0 2> /dev/null | grep \"Link detected\"",
    "ethtool eth0 2> /dev/null | grep Speed | tr -s ' ' | cut -d ' ' -f2 2> /dev/null",
    "ethtool eth0 2> /dev/null | grep Duplex",
    "ethtool eth0 2> /dev/null | grep Auto-negotiation",
    "ethtool eth0 2> /dev/null | grep \"Supported link modes\" | tr -s ' ' | cut -d ' ' -f4",
    "ethtool eth0 2> /dev/null | grep \"Wake-on\"",
    roleCommand("SLAVE"),
    roleCommand("MASTER"),
    kMiiStatus,
    kMiiStatus,
    "cat /proc/net/bonding/ 2> /dev/null | grep -P \"Slave Interface: eth0\\nMII Status: \\n\" 2> /dev/null "
    "| grep \"Link Failure Count: \" 2> /dev/null | cut -d ' ' -f4 2> /dev/null",
};

const Lines kOfTheConfig = {
    "cat /tmp/CVIfconfig.txt | grep eth0 ",
    kAddress,
    kMask,
    kIPv6,
    kIPv6Fields,
    kAddress,
    kMask,
    kIPv6,
    kIPv6Fields,
    "echo 2001:db8::10 | cut -d: -f4 2> /dev/null",
    kIPv6,
    kIPv6Fields,
    kAddress,
    kMask,
    kOrigin,
    "cat /var/lib/dhcpcd/dhcpcd-eth0.info 2> /dev/null",
    "cat /var/lib/dhcpcd/dhcpcd-eth0.info 2> /dev/null | grep DHCPSID | cut -d '=' -f2 2> /dev/null",
    "cat /var/lib/dhcpv6/client6.leases* 2> /dev/null | grep SDUID | cut -d ' ' -f3 2> /dev/null",
    "route -n | grep eth0 | tr -s ' ' 2> /dev/null",
    "route -A inet6 -n 2> /dev/null | grep eth0 | grep UG | grep -v UGDA | tr -s ' ' | cut -d ' ' -f2 2> "
    "/dev/null",
};

HOST_TEST(PortWalk, RunsItsCommandsInThisOrder) {
    PortHost plugin(host, "suse-two-nics");
    host.file("/proc/net/dev", std::string(kDevicesHead) + "  eth0:120 1\n");
    host.tool("ip -6 address show dev eth0", "    inet6 2001:db8::10/64 scope global \n");
    const CommandLines commands;
    plugin.build();
    Lines expected = {kListing, "brctl show | awk '{print $NF}' | grep -v interfaces"};
    expected.insert(expected.end(), kOfThePort.begin(), kOfThePort.end());
    expected.emplace_back("ifconfig -a | grep eth0 2> /dev/null");
    expected.insert(expected.end(), kOfTheConfig.begin(), kOfTheConfig.end());
    const Lines all = withoutWrites(commands.all());
    EXPECT_EQ(all, expected);
}

HOST_TEST(PortWalk, KeepsTheListingOfIfconfigWhileItVisits) {
    PortHost plugin(host, "suse-two-nics");
    std::string seen;
    shell_stub::beforeEach([&](const std::string& command) {
        if (command == kListing) {
            seen = host.exists(kSnapshot) ? "too early" : "not yet, ";
        } else if (command == "cat /tmp/CVIfconfig.txt | grep eth1 ") {
            seen += host.read(kSnapshot).value_or("missing").substr(0, 5);
        }
    });
    plugin.build();
    shell_stub::beforeEach({});
    EXPECT_EQ(seen, "not yet, eth0 ");
    EXPECT_FALSE(host.exists(kSnapshot));
}

// Whoever can write into /tmp was there first.
HOST_TEST(PortWalk, MakesWayForItsFilesWhateverStandsThere) {
    PortHost plugin(host, "suse-two-nics");
    host.file("/etc/secret", "root's");
    const std::function<void(const char*)> places[] = {
        [&](const char* path) { host.symlink(path, "/etc/secret"); },
        [](const char* path) { EXPECT_EQ(mkfifo(path, 0666), 0); },
        [](const char* path) { EXPECT_EQ(link("/etc/secret", path), 0); },
        [&](const char* path) { host.directory(path); },
        [&](const char* path) {
            host.file(path, "  eth9:1 1\n", 0444);
            [[maybe_unused]] const bool isHis = host.giveToStranger(path);
        },
    };
    for (const auto& prepare : places) {
        for (const char* path : {kSnapshot, kListingFile}) {
            prepare(path);
        }
        EXPECT_THAT(IC::PortWalk::list(), SizeIs(2));
        {
            const IC::IfconfigSnapshot snapshot;
            EXPECT_TRUE(host.read(kSnapshot).value_or("").starts_with("eth0 "));
        }
        EXPECT_FALSE(host.exists(kSnapshot));
        EXPECT_FALSE(host.exists(kListingFile));
        EXPECT_EQ(host.read("/etc/secret"), "root's");
    }
}

HOST_TEST(PortWalk, ListsNoInterfaceFromWhatAnEarlierRunLeft) {
    PortHost plugin(host, "suse-two-nics");
    host.file(kListingFile, "  eth1:1 1\n");
    host.file(kSnapshot, "eth9      Link encap:Ethernet\n");
    host.readOnly("/tmp");
    const CommandLines commands;
    LogCapture capture;
    plugin.build();
    EXPECT_THAT(plugin.names(12), IsEmpty());
    EXPECT_THAT(commands.all(), Not(Contains(kListing)));
    EXPECT_THAT(commands.all(), Not(Contains("ifconfig > /tmp/CVIfconfig.txt")));
    EXPECT_THAT(capture.ownMessages(6000), TextsAre("Could not create /tmp/__tmp: no interface is listed"));
    EXPECT_FALSE(IC::isInterfaceUP("eth9")) << "there is none";
    EXPECT_EQ(commands.all().back(), "ifconfig | grep eth9 ");
}

HOST_TEST(PortWalk, GoesOnWithoutASnapshotThatHasNoPlace) {
    PortHost plugin(host, "suse-two-nics");
    host.file(std::string(kSnapshot) + "/in-the-way", "");
    const CommandLines commands;
    plugin.build();
    EXPECT_THAT(plugin.names(29), TextsAre("eth0", "eth1"));
    EXPECT_EQ(plugin.config("eth0")->getStatus(), 1U);
    EXPECT_THAT(commands.all(), Contains("ifconfig | grep eth0 "));
    EXPECT_THAT(commands.all(), Not(Contains("ifconfig > /tmp/CVIfconfig.txt")));
}

HOST_TEST(PortWalk, TakesItsStepsInThisOrder) {
    PortHost plugin(host, "suse-two-nics");
    LogCapture capture;
    plugin.build();
    Lines steps = capture.ownMessages();
    std::erase_if(steps, [](const std::string& text) {
        return !text.ends_with(": entry") && !text.starts_with("IPv6 configured: ");
    });
    steps.resize(7);
    EXPECT_THAT(steps, TextsAre("createNetworkPortNodes: entry", "getbridgeInterfaces: entry",
                                "getDNSDetails: entry", "stringFormatForDNSServersAndSuffixes: entry",
                                "IPv6 configured: 1", "getNICString: entry", "findNetworkPort: entry"));
}

HOST_TEST(PortWalk, ReadsTheKernelsPortsBehindTheListingOfIfconfig) {
    PortHost plugin(host, "suse-two-nics");
    host.file("/sys/class/net/eth1/type", "772\n");
    host.tool("ifconfig", ToolAnswer{.out = "", .action = "echo 1 > /sys/class/net/eth1/type"});
    plugin.build();
    EXPECT_THAT(plugin.names(12), TextsAre("eth0", "eth1"));
}

HOST_TEST(PortWalk, VisitsALineThatComesAgainLikeAnyOther) {
    PortHost plugin(host, "suse-two-nics");
    host.file("/proc/net/dev", std::string(kDevicesHead) + "  eth1:1\n  usb0:1\n  eth1:1\n  usb0:1\n");
    host.file("/sys/class/net/eth1/address", "00:00:00:00:00:00\n");
    host.toolInTurn("ifconfig -a", {{""}, {"usb0      Link encap:Ethernet\n"}});
    host.tool("ifconfig usb0", "usb0      Link encap:Ethernet\n");
    host.tool("ip -6 address show dev usb0", "");
    const LogCapture capture;
    plugin.build();
    EXPECT_THAT(capture.ownMessages(), Contains("Permanent_address compare").Times(2));
    EXPECT_THAT(plugin.names(29), TextsAre("usb0")) << "ifconfig lists it the second time it is asked";
}

HOST_TEST(PortWalk, LogsAnInterfaceThatFailsAndGoesOn) {
    PortHost plugin(host, "suse-two-nics");
    shell_stub::beforeEach([](const std::string& command) {
        if (command.starts_with("ethtool eth0")) {
            throw std::runtime_error("out of luck");
        }
    });
    LogCapture capture;
    plugin.build();
    shell_stub::beforeEach({});
    EXPECT_THAT(capture.ownMessages(6000), TextsAre("NetworkPort error", "out of luck"));
    EXPECT_THAT(plugin.names(29), TextsAre("eth1"));
    EXPECT_FALSE(host.exists(kSnapshot));
    IC::MutableNode* known = nullptr;
    EXPECT_FALSE(plugin.mi().findNetworkPort("eth0", &known)) << "the next walk tries again";
}

HOST_TEST(PortWalk, ThatFailsAsAWholeIsLoggedAndTheRequestForItIsNotStored) {
    PortHost plugin(host, "suse-two-nics");
    const auto config = plugin.build().config("eth0");
    shell_stub::beforeEach([](const std::string& command) {
        if (command.starts_with("brctl show")) {
            throw std::runtime_error("out of luck");
        }
    });
    LogCapture capture;
    EXPECT_EQ(config->setProperty(74, number(1)).getStatus(), 0);
    shell_stub::beforeEach({});
    EXPECT_THAT(capture.ownMessages(6000), TextsAre("NetworkPort error", "out of luck"));
    EXPECT_THAT(capture.ownMessages(), Contains("createNetworkPortNodes: exit"));
    EXPECT_TRUE(PortHost::stored(*config, 74).empty());
}

HOST_TEST(PortWalk, ThatFindsNoMemoryAtItsEndIsLogged) {
    const PortHost plugin(host, "suse-two-nics");
    auto walk = std::make_unique<IC::PortWalk>(IC::HostFacts(), Lines());
    const LogCapture capture;
    {
        const FailingOnce once(0);
        walk.reset();
    }
    EXPECT_THAT(capture.messages(6000), TextsAre("NetworkPort error", "std::bad_alloc"));
}

HOST_TEST(PortWalk, GivesEveryVLANAPort) {
    PortHost plugin(host, "vlans");
    plugin.build();
    EXPECT_THAT(plugin.names(12), TextsAre("eth0", "eth0.10", "eth0.20"));
    EXPECT_EQ(plugin.port("eth0.10")->getLinkedId(), plugin.controller());
    EXPECT_EQ(plugin.config("eth0.10")->getLinkedId(), plugin.port("eth0.10")->getNodeId());
}

HOST_TEST(PortWalk, KnowsAVMwareNICByItsNameAlone) {
    PortHost plugin(host, "vmware");
    host.file("/proc/net/dev", std::string(kDevicesHead) + "vmnic0:1\nvswif0:1\n");
    host.remove("/sys/class/net/vmnic0");
    plugin.build();
    EXPECT_THAT(plugin.names(12), TextsAre("vmnic0"));
    EXPECT_EQ(plugin.config("vswif0")->getLinkedId(), plugin.controller()) << "no port";
}

HOST_TEST(PortWalk, SavesWhatAllShareForAnInterfaceWithoutAnyNode) {
    PortHost plugin(host, "suse-two-nics");
    host.file("/proc/net/dev", std::string(kDevicesHead) + "  usb0:1\n");
    LogCapture capture;
    plugin.build();
    EXPECT_THAT(plugin.names(12), IsEmpty());
    EXPECT_THAT(plugin.names(29), IsEmpty());
    EXPECT_THAT(capture.ownMessages(), Not(Contains("Inserting the interface in the Map usb0")));
    EXPECT_EQ(host.read("/opt/vantrel/corvista/data/ifcfg-usb0"),
              "CONFIG_NAME=usb0\nDNSSERVERS=192.0.2.53 192.0.2.54 \nDNSSUFFIXES=example.com \n"
              "DOMAINNAME=example.com\nHOSTNAME=linux-a\n");
}

HOST_TEST(PortWalk, GivesAUSBInterfaceAConfigurationUnderTheController) {
    PortHost plugin(host, "suse-two-nics");
    host.file("/proc/net/dev", std::string(kDevicesHead) + "  usb0:1\n");
    const std::string link = "/sys/class/net/usb0/";
    host.file(link + "type", "1\n");
    host.file(link + "flags", "0x1003\n");
    host.file(link + "uevent", "INTERFACE=usb0\n");
    host.file(link + "address", "02:00:5e:00:00:09\n");
    host.symlink(link + "device", "../../../1-1:1.0");
    host.tool("ifconfig -a", "usb0      Link encap:Ethernet\n");
    host.tool("ifconfig usb0", "usb0      Link encap:Ethernet\n");
    host.tool("ip -6 address show dev usb0", "");
    plugin.build();
    EXPECT_THAT(plugin.names(12), IsEmpty());
    ASSERT_NE(plugin.config("usb0"), nullptr);
    EXPECT_EQ(plugin.config("usb0")->getLinkedId(), plugin.controller());
    EXPECT_EQ(plugin.config("usb0")->getDescription(), "IP Configuration");
    EXPECT_EQ(plugin.config("usb0")->getStatus(), 12U) << "not listed by ifconfig alone";
}

}  // namespace
