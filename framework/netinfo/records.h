#pragma once

#include <string>
#include <vector>

/// One port of the host.
struct CEthernetPort {
    std::string name;              ///< the interface's name, eth0
    std::string permanentAddress;  ///< lower-case, colon-separated; all zero when the driver gives none
    std::string controller;   ///< the device it belongs to: the bus address, or the name for virtual links
    unsigned int nodeId = 0;  ///< id of the node that stands for it, 0 for none
};

/// One address of an interface.
struct CIPInfo {
    std::string interfaceName;
    std::string address;            ///< IPv4 or IPv6 text
    std::string mask;               ///< dotted mask (IPv4), empty for IPv6
    unsigned int prefixLength = 0;  ///< bits
    bool ipv6 = false;
};
