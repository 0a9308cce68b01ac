#pragma once

#include <optional>
#include <string>

#include "agent/core/node_classes.h"

namespace cvagent::change {

/// The interface that a node of the network is about, as the end of its path names it; "" for an alias, which
/// is no link, and for other nodes.
std::string interfaceNameOf(const IC::MutableNode& node);
std::string interfaceNameOf(const std::string& path);

/// What the interface's file has; "" for what is not in it.
struct InterfaceSettings {
    bool isThere = false;  ///< the file
    std::string origin;    ///< BOOTPROTO
    std::string ipv4Address;
    std::string mask;
    std::string ipv6Address;
    std::string prefixLength;
};
/// All empty where there is no such interface or no file of it that can be read.
InterfaceSettings settingsOf(const std::string& interface);
/// The IPv6 prefix length that a text tells; nothing for one that tells none.
std::optional<unsigned> prefixLengthIn(const std::string& text);
/// That of a file.
std::optional<unsigned> prefixIn(const InterfaceSettings& settings);

/// Whether the routes file has this IPv4 gateway as the default one.
bool isDefaultInRoutesFile(const std::string& gateway);

}  // namespace cvagent::change
