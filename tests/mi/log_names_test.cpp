// Every log line carries the name of its operation, as the headers have it, and the source of that
// operation's component.
#include <gmock/gmock.h>

#include <atomic>
#include <filesystem>
#include <regex>

#include "computer/calendar.h"
#include "computer/system_data.h"
#include "computer/time_zone.h"
#include "indications/globals.h"
#include "network/address_queries.h"
#include "network/esx.h"
#include "network/interface_lists.h"
#include "network/ipv4_writer.h"
#include "network/lan_endpoint_node.h"
#include "network/link_queries.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/mi/operation_names.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/plugin_access.h"
#include "tests/support/shell_stub.h"

namespace {

using IC::Number;
using IC::PropertyValue;
using Access = IC::OsHwMITestAccess;

/// Read at the start of the program: a fake host does not show the tree.
const std::map<std::string, std::set<std::string>> kOperations =
    operationNames(std::filesystem::path(testsDirectory()).parent_path());

struct LoggedText {
    const char* start;  ///< of the message
    std::set<std::string> operations;
};

/// Lines that helpers, templates and closures write, or operations without an entry line, and whose they are.
const std::vector<LoggedText> kTexts = {
    {"disable Hard Drive updates: waiting for HardDriveUpdateMonitor Termination ", {"unload"}},
    {"disable Hard Drive updates: HardDriveUpdateMonitor terminated.", {"unload"}},
    {"createDiskControllerNodes failed: out of luck", {"initialize"}},
    {"mypopen():  Count value ", {"mypopen"}},
    {"Could not write all of '", {"createSettingData"}},
    {"ComputerNode::getProperty Name Inside Case", {"getProperty"}},
    {"ComputerNode::getProperty : OwnerContact/OwnerName - Cannot read", {"getProperty"}},
    {"ComputerNode::setProperty : OwnerContact/OwnerName - Cannot write", {"setProperty"}},
    {"setTimezone: enter", {"setTimezone"}},
    {"tz_file: ", {"setTimezone"}},
    {"rename /etc/localtime.bak to /etc/localtime failed", {"setTimezone"}},
    {"command: hostname ", {"executeDomainandHostnameChanges"}},
    {"Could not set HostName !!", {"executeDomainandHostnameChanges"}},
    {"Can not open '/etc/hosts' in Read mode.", {"executeDomainandHostnameChanges"}},
    {"fdisk command cat /tmp/fdisk_tmp | grep ^Disk", {"createHardDriveNodes"}},
    {"fdisk command cat /tmp/fdisk_tmp | grep ^/dev", {"createPartitionNodes"}},
    {"Command : echo ", {"createHardDriveNodes", "createPartitionNodes"}},
    {"New Hard Drive Node created ", {"createHardDriveNodes"}},
    {"Hard Drive Node::Normal ", {"createHardDriveNodes"}},
    {"Delete a Hrad Drive entry: ", {"createHardDriveNodes"}},
    {"Updated Hard Drive Node Published", {"createHardDriveNodes"}},
    {"Delete a Partition entry: ", {"createPartitionNodes"}},
    {"Partition Node Published", {"createPartitionNodes"}},
    {"Partition blocksize", {"createPartitionNodes"}},
    {"cond ::Hard Drive Check Sum : ", {"HardDrive_Checksum"}},
    {"cond ::Partition Check Sum : ", {"Partition_Checksum"}},
    {"Hard Drive Check Sum found Different", {"HDDThreadProcess"}},
    {"Partition Check Sum found Different", {"HDDThreadProcess"}},
    {"HardDriveUpdateMonitor::const: entry", {"HardDriveUpdateMonitor"}},
    {"HardDriveUpdateMonitor::run: entry", {"run"}},
    {"IPv6 configured: ", {"createNetworkPortNodes"}},
    {"Inserting the interface in the Map ", {"createNetworkPortNodes"}},
    {"Creating an IPConfigNode for ", {"createNetworkPortNodes"}},
    {"Size of Inteface  ", {"createNetworkPortNodes"}},
    {"Machine has vmware", {"createNetworkPortNodes"}},
    {"Permanent_address compare", {"createNetworkPortNodes"}},
    {"NetworkPort error", {"createNetworkPortNodes"}},
    {"createSettingData: buffer", {"createSettingData"}},
    {"NetworkPort getProperty - ethtool error", {"getNetworkSpeed", "getNetworkDuplex", "getAutoSense"}},
    {"isNICUp - cat /proc/net/bonding/bond* error", {"isNICUp"}},
    {"isNICUp - grepping slave device error", {"isNICUp", "getSlaveInterfaces"}},
    {"isNICUp - ethtool error", {"isNICUp"}},
    {"buffer = ", {"isNICUp", "getIPv6AddressType"}},
    {"Buff :", {"getIPV4Gateway"}},
    {"IPConfigNode::setProperty : IPOrigin Value :", {"setProperty"}},
    {"IPConfigNode::setProperty: property 102: ", {"setProperty"}},
    {"IPConfigNode::setProperty: Invalid status request.", {"setProperty"}},
    {"Status Value : ", {"setProperty"}},
    {"Status updation for bonded interface. New status is: ", {"setProperty"}},
    {"Gateway :: ", {"setProperty"}},
    {"IPConfigNode::CreateUser :", {"setProperty"}},
    {"HostName :", {"setProperty"}},
    {"HostName : ", {"executeDomainandHostnameChanges"}},
    {"DomainName :", {"setProperty"}},
    {"DomainName : ", {"executeDomainandHostnameChanges"}},
    {"bootproto: ", {"disableNetConfigDNSPolicy"}},
    {"buffer: NETCONFIG_DNS_POLICY=", {"disableNetConfigDNSPolicy"}},
    {"Static: ", {"disableNetConfigDNSPolicy"}},
    {"File open '/etc/sysconfig/network' in write mode.", {"setIPOrigin", "setIPv6PrefixLength"}},
    {"Writing Subnet to File", {"setSubnetMask"}},
    {"Writing IP Address", {"setIPv6Address"}},
    {"setIPv6GatewayForSuSe: entry", {"setIPv6GatewayForSuSe10"}},
    {"Either NIC or gateway is null", {"setIPv4GatewayForSuSe10"}},
    {"Entering enableIPv6ForESX", {"enableIPv6ForESX"}},
    {"enableIPv6ForESX Returned : ", {"enableIPv6ForESX"}},
    {"Invalid format: buffer = ", {"getAddressDetails", "createCpuNodeAndMap"}},
    {"In getParentLANEndPointNode ", {"getParentLANEndPointNode"}},
    {"Creating NetworkMonitor thread.", {"enableIndications"}},
    {"NetworkMonitor thread created.", {"enableIndications"}},
    {"eventThreadNetIndications: Stopping thread...", {"disableIndications"}},
    {"NetworkMonitor: run entry", {"run"}},
    {"NetworkMonitor: run exit", {"run"}},
    {"bondedNetNodeStatus: entry", {"bondedNetNodeStatus"}},
    {"OsHwMI::bondedNetNodeStatus - ", {"bondedNetNodeStatus"}},
    {"Returning from bondedNetNodeStatus(). Status: ", {"bondedNetNodeStatus"}},
    {"Calling bondedNetNodeStatus() for bonded interface: ", {"createCurNetNodeMap"}},
    {"Slaves Map Size : ", {"checkAndSendNetAlert"}},
    {"Slaves Found in the Map", {"checkAndSendNetAlert"}},
    {"OsHwMI::checkAndSendNetAlert() entering switch case", {"checkAndSendNetAlert"}},
    {"checkAndSendNetAlert: _alerthandler return code", {"checkAndSendNetAlert"}},
    {"OsHwMIInd Caught ", {"checkAndSendNetAlert"}},
    {"OSHWMI_NET_IND_DAT_FILE: Not available", {"readPrevNetNodeMap"}},
    {"OSHWMI_NET_IND_DAT_FILE: Exception in writing file", {"writePrevNetNodeMap"}},
};

/// The row whose text begins like the message, the longest of several.
const LoggedText* rowOf(const std::string& message) {
    const LoggedText* found = nullptr;
    for (const LoggedText& row : kTexts) {
        const std::string start = row.start;
        if (message.starts_with(start) &&
            (found == nullptr || start.size() > std::string(found->start).size())) {
            found = &row;
        }
    }
    return found;
}

/// The name that the line of an entry or exit gives itself: "unload: exit", "ComputerNode::getProperty:
/// entry".
std::string nameInText(const std::string& message) {
    static const std::regex scope(R"re((\w+::)?(~?\w+) ?: (entry|exit|Entry|Exit))re");
    std::smatch match;
    return std::regex_match(message, match, scope) ? match[2].str() : "";
}

void expectNames(const std::vector<LogLine>& lines) {
    std::map<const LoggedText*, std::set<std::string>> seen;
    for (const LogLine& line : lines) {
        const std::string whole = line.function + ", " + line.source + ": " + line.message;
        const auto operation = kOperations.find(line.function);
        ASSERT_NE(operation, kOperations.end()) << whole;
        EXPECT_TRUE(operation->second.contains(line.source)) << whole;
        const LoggedText* row = rowOf(line.message);
        if (row != nullptr) {
            seen[row].insert(line.function);
            EXPECT_TRUE(row->operations.contains(line.function)) << whole;
        } else if (const std::string name = nameInText(line.message); kOperations.contains(name)) {
            EXPECT_EQ(line.function, name) << whole;
        }
    }
    for (const LoggedText& row : kTexts) {
        EXPECT_EQ(seen[&row], row.operations) << row.start << ": not all of them were played";
    }
}

// --- The whole life of the plug-in on a host with a bond, every command working at first.

/// Which commands cannot be started; the monitors' threads ask, too.
enum class Failing { none, all, slaves, echo };
std::atomic<Failing> failing{Failing::none};

bool fails(const std::string& command) {
    switch (failing.load()) {
        case Failing::all:
            return true;
        case Failing::slaves:
            return command.find("Slave Interface:") != command.npos;
        case Failing::echo:
            return command.starts_with("echo");
        default:
            return false;
    }
}

void readAll(IC::OsHwMI& mi) {
    for (const auto& node : mi.holdAll()) {
        for (unsigned int id = 0; id <= 200; ++id) {
            PropertyValue value;
            node->getProperty(id, value);
        }
    }
}

void writeConfig(IC::MutableNode& config) {
    const auto list = [](const char* text) { return PropertyValue(std::vector<std::string>{text}, true); };
    const std::pair<unsigned int, PropertyValue> writes[] = {
        {24, {IC::EnumValue(3), true}}, {25, {"192.0.2.7", true}},  {26, {"255.255.0.0", true}},
        {27, {"2001:db8::7", true}},    {94, list("192.0.2.53")},   {97, {"alpha", true}},
        {98, {"example.org", true}},    {99, list("example.org")},  {100, {"192.0.2.9", true}},
        {101, {"2001:db8::9", true}},   {102, {Number(64U), true}}, {102, {"no number", true}},
        {123, {Number(1U), true}},      {123, {Number(2U), true}},  {123, {Number(33U), true}},
        {74, {Number(1U), true}},       {100, {"", true}},
    };
    for (const auto& [id, value] : writes) {
        config.setProperty(id, value);
    }
}

void writeAll(IC::OsHwMI& mi) {
    for (const auto& node : mi.holdAll()) {
        if (node->nodeType() == 29) {
            writeConfig(*node);
        } else if (node->nodeType() == 40) {
            node->setProperty(115, {"owner", true});
            node->setProperty(123, {Number(9U), true});
            node->setProperty(127, {Number(330U), true});
        } else {
            node->setProperty(125, {"kept", true});
        }
    }
}

void callUtilities(IC::OsHwMI& mi) {
    IC::setAutoDSTEnabled(true);
    IC::ito_time_t(2026, 1, 2, 3, 4, 5, 6, 0);
    std::array<char, 14> version{};
    std::array<char, 10> digits{"123456789"};
    IC::formatHostFirmwareVersion(digits.data(), 9, version.data(), 14);
    IC::getSystemName();
    IC::enableIPv6ForESX();
    IC::checkESX4_1Release();
    IC::restartNetwork();
    IC::disableNMControlled("eth0");
    IC::isIPv6StackActive();
    std::vector<std::string> members;
    IC::getSlaveInterfaces("bond0", members);
    mi.vpdUpdate();
    mi.createLANEndPointNodes();
    unsigned int id = 0;
    IC::getParentLANEndPointNode("eth0#1", id);
}

IC::Error refuse(const std::vector<IC::Alert>&, const void*) {
    return {7, Number(), "no"};
}
IC::Error breakDown(const std::vector<IC::Alert>&, const void*) {
    throw std::runtime_error("broken");
}

/// The monitors' passes, on this thread.
void pass(IC::OsHwMI& mi, IC::Error (*handler)(const std::vector<IC::Alert>&, const void*),
          unsigned int before) {
    mi.registerForAlerts(handler, nullptr);
    mi.readPrevNetNodeMap();
    IC::OsHwMITestAccess::pass().previous = {{"bond0", before}, {"eth0", before}, {"eth1", before}};
    mi.createCurNetNodeMap();
    mi.checkAndSendNetAlert();
    mi.writePrevNetNodeMap();
    mi.HDDThreadProcess();
}

/// A start of which every step that runs a command fails as a whole.
void startWithoutLuck(FakeHost& host, IC::OsHwMI& mi) {
    host.file("/etc/vmware-release", "");
    shell_stub::beforeEach([](const std::string&) { throw std::runtime_error("out of luck"); });
    mi.initialize(1, Number(1U), Number(2U));
    mi.unload();
    shell_stub::beforeEach({});
}

HOST_TEST(LogNames, AreTheOperationsNamesInAWholeStartReadWritePassAndStop) {
    const std::string data = "/opt/vantrel/corvista/data/";
    host.copyTree("bond-two-members");
    host.expectUnrecorded();
    host.directory(data + "asset.dat");
    host.symlink(data + "ifcfg-eth1", "/dev/full");
    host.directory("/etc/localtime.bak/in-the-way");
    host.file("/proc/net/dev", *host.read("/proc/net/dev") + "  ethz:1\n");
    host.file("/sys/class/net/ethz/address", "00:00:00:00:00:00\n");
    host.file("/etc/sysconfig/network/config", "NETCONFIG_DNS_POLICY=\"auto\"\n");
    host.file("/proc/cpuinfo", "processor\t: 0\nno processor\n");
    host.tool("ip -6 address show dev eth0", "    inet6 2001:db8::1 scope global \n");
    host.tool("ip -6 address show dev v6", "    inet6 2001:db8::6/64 scope global \n");
    host.tool("ifconfig v6", "          inet6 addr: 2001:db8::6/64 Scope:Global\n");
    shell_stub::failWhen(fails);
    const LogCapture capture;
    IC::OsHwMI& mi = IC::myoshwmi;
    mi.initialize(1, Number(1U), Number(2U));
    mi.createCpuNodes();
    readAll(mi);
    writeAll(mi);
    callUtilities(mi);
    unsigned int kind = 0;
    IC::getIPv6AddressType("v6", kind);
    mi.disableIndications();  // from here on the passes are this thread's
    pass(mi, refuse, 12);
    failing = Failing::echo;
    mi.createHardDriveNodes(true);
    mi.createPartitionNodes(true);
    failing = Failing::all;
    readAll(mi);
    writeAll(mi);
    IC::isNICUp("bond0");
    host.remove(data + "oshwminetind.dat");
    host.directory(data + "oshwminetind.dat");
    pass(mi, breakDown, 1);
    mi.createHardDriveNodes(true);
    mi.createPartitionNodes(true);
    failing = Failing::slaves;
    IC::isNICUp("bond0");
    callUtilities(mi);
    mi.bondedNetNodeStatus("bond0");
    failing = Failing::none;
    mi.unload();
    startWithoutLuck(host, mi);
    shell_stub::failWhen({});
    expectNames(capture.lines());
}

}  // namespace
