#include "network/interface_lists.h"

#include <gmock/gmock.h>

#include "network/link_queries.h"
#include "network/port_type.h"
#include "tests/support/command_lines.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"
#include "tests/support/texts_are.h"

namespace {

using testing::IsEmpty;
using Names = std::vector<std::string>;

HOST_TEST(NicString, LogsEntryAndExit) {
    const LogCapture capture;
    std::string name = "before";
    EXPECT_TRUE(IC::getNICString("  eth0: 1 2", name));
    EXPECT_EQ(name, "  eth0");
    EXPECT_FALSE(IC::getNICString("br0\t8000.00", name));
    EXPECT_EQ(name, "br0");
    EXPECT_THAT(capture.messages(), TextsAre("getNICString: entry", "getNICString: exit",
                                             "getNICString: entry", "getNICString: exit"));
}

HOST_TEST(BridgeInterfaces, AreTheLastColumn) {
    host.tool("brctl show",
              "bridge name\tbridge id\tSTP enabled\tinterfaces\nbr0\t8000.00\tno\teth0\n\t\t\teth1\n");
    const CommandLines commands;
    const LogCapture capture;
    Names members = {"before"};
    EXPECT_TRUE(IC::getbridgeInterfaces(members));
    EXPECT_THAT(members, TextsAre("before", "eth0", "eth1"));
    EXPECT_THAT(commands.all(), TextsAre("brctl show | awk '{print $NF}' | grep -v interfaces"));
    EXPECT_THAT(capture.messages(), TextsAre("getbridgeInterfaces: entry", "getbridgeInterfaces: aftereth0",
                                             "getbridgeInterfaces: aftereth1", "getbridgeInterfaces: exit"));
    EXPECT_EQ(capture.messages(3000).size(), 4U);
}

HOST_TEST(BridgeInterfaces, WithoutAShellThereAreNone) {
    const LogCapture capture;
    Names members;
    {
        const NoDescriptors none;
        EXPECT_FALSE(IC::getbridgeInterfaces(members));
    }
    EXPECT_THAT(members, IsEmpty());
    EXPECT_THAT(capture.messages(6000), IsEmpty());
}

HOST_TEST(SlaveInterfaces, AreListedInTheOrderOfTheFile) {
    host.file("/proc/net/bonding/bond0", "Slave Interface: eth1\nMII Status: up\nSlave Interface: eth0  \n");
    const CommandLines commands;
    const LogCapture capture;
    Names members = {"before"};
    EXPECT_TRUE(IC::getSlaveInterfaces("bond0", members));
    EXPECT_THAT(members, TextsAre("before", "eth1", "eth0"));
    EXPECT_THAT(commands.all(),
                TextsAre("cat /proc/net/bonding/bond0 2> /dev/null | grep \"Slave Interface:\""));
    EXPECT_EQ(capture.messages().front(), "Entering getSlaveInterfaces");
    EXPECT_THAT(capture.messages(3000), testing::IsSupersetOf({"Slave Found:eth1", "Slave Found:eth0"}));
    EXPECT_EQ(capture.messages().back(), "Exiting getSlaveInterfaces");
}

HOST_TEST(SlaveInterfaces, TakeTheBlankBehindTheLabelForGrantedAndTheProbeDoesNot) {
    host.file("/proc/net/bonding/bond0", "MII Status: up\nSlave Interface:eth0\n");
    host.tool("ethtool eth0", "\tLink detected: yes\n");
    Names members;
    EXPECT_TRUE(IC::getSlaveInterfaces("bond0", members));
    EXPECT_THAT(members, TextsAre("th0"));
    EXPECT_TRUE(IC::isNICUp("bond0"));
}

HOST_TEST(SlaveInterfaces, OfAMissingBondAreNone) {
    Names members;
    EXPECT_TRUE(IC::getSlaveInterfaces("bond0", members));
    EXPECT_THAT(members, IsEmpty());
}

HOST_TEST(SlaveInterfaces, WithoutAShellFails) {
    const LogCapture capture;
    Names members = {"before"};
    {
        const NoDescriptors none;
        EXPECT_FALSE(IC::getSlaveInterfaces("bond0", members));
    }
    EXPECT_FALSE(IC::getSlaveInterfaces("bond;0", members));
    EXPECT_THAT(members, TextsAre("before"));
    EXPECT_THAT(capture.messages(6000), testing::Contains("isNICUp - grepping slave device error").Times(2));
}

CEthernetPort portOf(const char* name) {
    CEthernetPort port;
    port.name = name;
    return port;
}

TEST(VlanInterface, IsFoundByItsExactName) {
    const LogCapture capture;
    CEthernetPort ten = portOf("eth0.10");
    CEthernetPort one = portOf("eth0.1");
    const EthernetPortsByName vlans = {{"eth0.10", &ten}, {"eth0.1", &one}};
    EXPECT_EQ(IC::getVLANInterface(&vlans, "eth0.1"), &one);
    EXPECT_EQ(IC::getVLANInterface(&vlans, "eth0.10"), &ten);
    for (const char* name : {"", "eth0", "eth0.", "eth0.100", "ETH0.1", " eth0.1", "eth0.1 ", "eth0.1\n"}) {
        EXPECT_EQ(IC::getVLANInterface(&vlans, name), nullptr) << name;
    }
    EXPECT_EQ(IC::getVLANInterface(nullptr, "eth0.1"), nullptr);
    EXPECT_EQ(capture.messages()[0], "getVLANInterface: entry");
    EXPECT_EQ(capture.messages()[1], "getVLANInterface: exit");
}

TEST(PhysicalPort, IsTheFirstOfItsExactNameInTheOrderOfTheControllers) {
    const LogCapture capture;
    CEthernetPort eth0 = portOf("eth0");
    CEthernetPort eth1 = portOf("eth1");
    CEthernetPort secondEth1 = portOf("eth1");
    std::vector<CEthernetPort*> first = {&eth0, &eth1};
    std::vector<CEthernetPort*> second = {&secondEth1};
    std::vector<CEthernetPort*> none;
    const EthernetPortsByController ports = {
        {"0000:02:00.0", &second}, {"0000:01:00.0", &first}, {"", &none}};
    EXPECT_EQ(IC::isPhysicalPort(&ports, "eth0"), &eth0);
    EXPECT_EQ(IC::isPhysicalPort(&ports, "eth1"), &eth1);
    for (const char* name : {"", "eth", "eth10", "ETH0", " eth0", "0000:01:00.0"}) {
        EXPECT_EQ(IC::isPhysicalPort(&ports, name), nullptr) << name;
    }
    EXPECT_EQ(capture.messages()[0], "isPhysicalPort: entry");
    EXPECT_EQ(capture.messages()[1], "isPhysicalPort: exit");
}

struct PortType {
    const char* text;
    unsigned int code;
};

constexpr PortType kPortTypes[] = {
    {"10BaseT", 50},
    {"10-100BaseT", 51},
    {"100BaseT", 52},
    {"1000BaseT", 53},
    {"2500BaseT", 54},
    {"10GBaseT", 55},
    {"10GBase-CX4", 56},
    {"100Base-FX", 100},
    {"100Base-SX", 101},
    {"1000Base-LX", 103},
    {"1000Base-CX", 104},
    {"10GBase-SR", 105},
    {"10GBase-SW", 106},
    {"10GBase-LX4", 107},
    {"10GBase-LR", 108},
    {"10GBase-LW", 109},
    {"10GBase-ER", 110},
    {"10GBase-EW", 111},
    {"Vendor Reserved", 16000},
    {"Other", 1},
    {"1000base-lx", 103},
    {"other", 1},
    {"OTHER", 1},
    {"vendor reserved", 16000},
    {"1000baset", 53},
    {"10gbase-cx4", 56},
    {"1000baseT", 53},
};

TEST(PortTypes, AreComparedWithoutRegardToCase) {
    const LogCapture silent;
    for (const PortType& type : kPortTypes) {
        EXPECT_EQ(IC::getPortType(type.text), type.code) << type.text;
    }
}

TEST(PortTypes, EveryOtherTextHasNone) {
    const LogCapture silent;
    for (const char* text :
         {"",        "1000Base-SX", "1000Base-T",     "1000baseT/Full", "1000BaseT ",   " 1000BaseT",
          "100Base", "100BaseTX",   "10BaseT\n",      "10GBase-LX",     "10GBase-LX44", "Others",
          "Othe",    "Vendor",      "VendorReserved", "5000BaseT",      "40GBase-SR4",  "102",
          "Not",     "10GBase-SR4", "1000Base_LX",    "1000Base-KX",    "100GBaseT",    "0"}) {
        EXPECT_EQ(IC::getPortType(text), 0U) << text;
    }
}

TEST(PortTypes, NoTextHasTheCode102) {
    const LogCapture silent;
    for (const PortType& type : kPortTypes) {
        EXPECT_NE(IC::getPortType(type.text), 102U);
    }
    EXPECT_EQ(IC::getPortType("1000Base-SX"), 0U);
}

TEST(PortTypes, LogEntryAndExit) {
    const LogCapture capture;
    IC::getPortType("Other");
    EXPECT_THAT(capture.messages(3000), TextsAre("getPortType: entry", "getPortType: exit"));
}

}  // namespace
