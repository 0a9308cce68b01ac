#pragma once

#include <optional>
#include <string>
#include <vector>

namespace netinfo {

/// What sysfs tells about one Ethernet link.
struct Link {
    std::string name;
    std::string permanentAddress;  ///< "" when sysfs does not tell
    std::string controller;  ///< the bus address of the device, or the link's name when there is no device
    bool up = false;
    bool vlan = false;
    bool upper =
        false;  ///< a kind of its own on top of others: bond, bridge, VLAN, tun/tap, wireless, macvlan…
    bool hardware = false;  ///< a device stands behind it
    bool paired = false;    ///< looks like one end of a veth pair
};

constexpr const char* kClassDirectory = "/sys/class/net";

/// All Ethernet links, by name; nothing when the directory cannot be read.
/// @param directory kClassDirectory, or a copy of it
std::optional<std::vector<Link>> readLinks(const std::string& directory);

/// The first line of one attribute file of a link, "" when it cannot be read or the name is none.
std::string readAttribute(const std::string& directory, const std::string& link,
                          const std::string& attribute);

}  // namespace netinfo
