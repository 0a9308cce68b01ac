#include "framework/netinfo/network_info.h"

#include <algorithm>
#include <deque>

#include "framework/netinfo/driver.h"
#include "framework/netinfo/sysfs.h"

namespace {

constexpr const char* kNoAddress = "00:00:00:00:00:00";

/// A link of its own that a device stands behind, or one end of a pair, which a guest knows as its network
/// card.
bool isPhysical(const netinfo::Link& link) {
    // usb0 is a wire to another computer or to this one's service processor. An adapter on the USB bus, which
    // is a port, is called eth0 like any other.
    if (link.upper || link.name.starts_with("usb")) {
        return false;
    }
    if (link.hardware) {
        return true;
    }
    // Two ends in different network namespaces can have the same index; then only the driver tells.
    const std::string driver = netinfo::driverName(link.name);
    return driver.empty() ? link.paired : driver == "veth";
}

std::string permanentAddress(const netinfo::Link& link) {
    std::string address = netinfo::driverPermanentAddress(link.name);
    if (address.empty() || address == kNoAddress) {
        address = link.permanentAddress;
    }
    return address.empty() ? kNoAddress : address;
}

}  // namespace

struct CNetworkInfo::Data {
    bool readable = false;
    std::deque<CEthernetPort> ports;  // a deque: the maps below point into it
    std::map<std::string, std::vector<CEthernetPort*>> portsByController;
    EthernetPortsByController controllers;
    EthernetPortsByName vlans;
    std::vector<std::string> virtualNames;

    void add(const netinfo::Link& link);
};

void CNetworkInfo::Data::add(const netinfo::Link& link) {
    if (!link.hardware) {
        virtualNames.push_back(link.name);
    }
    const bool physical = isPhysical(link);
    if (!physical && !link.vlan) {
        return;
    }
    CEthernetPort& port = ports.emplace_back();
    port.name = link.name;
    port.permanentAddress = permanentAddress(link);
    port.controller = link.controller;
    if (link.vlan) {
        vlans[port.name] = &port;
    } else {
        auto& siblings = portsByController[port.controller];
        siblings.push_back(&port);
        controllers[port.controller] = &siblings;
    }
}

CNetworkInfo::CNetworkInfo(bool includeDown) : data_(std::make_unique<Data>()) {
    const auto links = netinfo::readLinks(netinfo::kClassDirectory);
    data_->readable = links.has_value();
    if (!links) {
        return;
    }
    for (const netinfo::Link& link : *links) {
        if (includeDown || link.up) {
            data_->add(link);
        }
    }
}

CNetworkInfo::~CNetworkInfo() = default;

const EthernetPortsByController* CNetworkInfo::getNICInfo() const {
    return data_->readable ? &data_->controllers : nullptr;
}

const std::vector<std::string>& CNetworkInfo::getVNICNames() const {
    return data_->virtualNames;
}

const EthernetPortsByName* CNetworkInfo::getVLANInfo() const {
    return data_->readable ? &data_->vlans : nullptr;
}
