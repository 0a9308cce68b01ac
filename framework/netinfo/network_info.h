#pragma once

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "framework/export.h"
#include "framework/netinfo/records.h"

using EthernetPortsByController = std::map<std::string, std::vector<CEthernetPort*>*>;
using EthernetPortsByName = std::map<std::string, CEthernetPort*>;

/// The host's ports as the kernel's /sys/class/net tells them, read once at construction. What is handed out
/// lives as long as the object. One object belongs to one thread.
class CORVISTA_API CNetworkInfo {
public:
    /// @param includeDown also ports whose interface is down
    explicit CNetworkInfo(bool includeDown);
    CNetworkInfo(const CNetworkInfo&) = delete;
    CNetworkInfo& operator=(const CNetworkInfo&) = delete;
    ~CNetworkInfo();

    /// Physical ports by controller: Ethernet links with no upper kind of their own (no bond, bridge, VLAN,
    /// tun/tap, wireless) that are no wires to another computer (usb0). Paravirtual links (virtio, veth)
    /// count. Null when /sys/class/net cannot be read.
    const EthernetPortsByController* getNICInfo() const;
    /// The names of the virtual NICs: Ethernet links that no hardware stands behind (veth, macvlan, dummy).
    const std::vector<std::string>& getVNICNames() const;
    /// VLAN interfaces by name, as the kernel marks them (DEVTYPE=vlan in uevent).
    const EthernetPortsByName* getVLANInfo() const;

private:
    struct Data;
    std::unique_ptr<Data> data_;
};
