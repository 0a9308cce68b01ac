#include "network/port_walk.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <utility>

#include "mi/command.h"
#include "mi/log.h"
#include "mi/text.h"
#include "network/interface_lists.h"
#include "network/link_queries.h"

namespace IC {

namespace {

// The interfaces named vmnic…, as VMware hosts call theirs.
constexpr char kListVMware[] = "grep ^v[a-z0-9] /proc/net/dev 2> /dev/null";
// Ethernet, bonding and USB interfaces, then the rows of the bridge listing.
constexpr char kListInterfaces[] =
    "egrep 'eth|bond|usb' /proc/net/dev > /tmp/__tmp; brctl show |grep -vw 'bridge name' >>/tmp/__tmp 2> "
    "/dev/null; cat /tmp/__tmp; rm /tmp/__tmp";
constinit TemporaryFile listingFile("/tmp/__tmp");
constexpr char kZeroAddress[] = "00:00:00:00:00:00";

/// Only /proc/net/dev prints colons; in the name of an interface there is none.
bool isOfBridgeListing(const std::string& line) {
    return !contains(line, ":");
}

/// What stands before the first blank or tab.
std::string firstColumn(const std::string& line) {
    return line.substr(0, line.find_first_of(" \t\n"));
}

bool isVMware() {
    struct stat release {};
    return stat("/etc/vmware-release", &release) == 0;
}

}  // namespace

IfconfigSnapshot::IfconfigSnapshot() {
    // Without it isInterfaceUP asks ifconfig itself.
    if (ifconfigSnapshot.removeAndCreate()) {
        runToEnd(formatCommand("ifconfig > %s", ifconfigSnapshotPath));
    }
}

IfconfigSnapshot::~IfconfigSnapshot() {
    try {
        runToEnd(formatCommand("rm -rf %s", ifconfigSnapshotPath));
    } catch (const std::exception& failure) {
        logPortFailure(failure);
    }
}

PortWalk::PortWalk(HostFacts host, std::vector<std::string> bridgeMembers)
    : host_(std::move(host)), bridgeMembers_(std::move(bridgeMembers)) {}

void PortWalk::logIPv6() {
    log(kProgress) << "IPv6 configured: " << (access("/proc/net/if_inet6", R_OK) == 0);
}

std::vector<std::string> PortWalk::list() {
    const bool vmware = isVMware();
    if (vmware) {
        log(kProgress) << "Machine has vmware";
    }
    if (!vmware && !listingFile.removeAndCreate()) {
        log(kError) << "Could not create /tmp/__tmp: no interface is listed";
        return {};
    }
    HostCommand listing(vmware ? Command(kListVMware) : Command(kListInterfaces));
    std::vector<std::string> lines;
    while (auto line = listing.nextLine()) {
        lines.push_back(std::move(*line));
    }
    return lines;
}

std::set<std::string> PortWalk::bridgesOf(const std::vector<std::string>& listing) {
    std::set<std::string> bridges;
    for (const std::string& line : listing) {
        if (isOfBridgeListing(line)) {
            // The rows of a bridge's further members begin with a tab: their "" is no interface's name.
            bridges.insert(firstColumn(line));
        }
    }
    return bridges;
}

ListedInterface PortWalk::interfaceOf(const std::string& line, const std::set<std::string>& bridges) {
    ListedInterface found;
    getNICString(trimStart(trimStart(line), '\t'), found.name);
    if (isOfBridgeListing(line)) {
        // getNICString cuts a row of the bridge listing only when it holds "br".
        found.name = firstColumn(found.name);
    }
    found.isBridge = bridges.contains(found.name);
    return found;
}

bool PortWalk::isBridgeMember(const std::string& name) const {
    return std::ranges::find(bridgeMembers_, name) != bridgeMembers_.end();
}

bool PortWalk::hasZeroAddress(const std::string& name) const {
    if (interfaces_.getMACAddress(name) != kZeroAddress) {
        return false;
    }
    log(kProgress) << "Permanent_address compare";
    log(kProgress) << "Passed over without a hardware address: " << name;
    return true;
}

bool PortWalk::isPort(const std::string& name) const {
    const EthernetPortsByController* ports = network_.getNICInfo();
    return (ports != nullptr && isPhysicalPort(ports, name) != nullptr) ||
           getVLANInterface(network_.getVLANInfo(), name) != nullptr || contains(name, "vmnic");
}

bool PortWalk::hasIPConfig(const std::string& name) {
    return firstLine(formatCommand("ifconfig -a | grep %s 2> /dev/null", name)).line.has_value();
}

void logPortFailure(const std::exception& failure) {
    log(kError) << "NetworkPort error";
    log(kError) << failure.what();
}

}  // namespace IC
