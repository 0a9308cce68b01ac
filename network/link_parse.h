#pragma once

#include <string>

namespace IC::parse {

// Each takes one line as the command printed it, line break included, and asks nobody.

/// The number at the start of a text, 0 when there is none; what does not fit 32 bits is the nearest that
/// does, on every machine.
int leadingNumber(const std::string& text);

/// Kilobits a second of ethtool's "1000Mb/s".
unsigned long long networkSpeed(const std::string& line);
/// ethtool's "Duplex: Full".
bool isFullDuplex(const std::string& line);
/// ethtool's "Auto-negotiation: on".
bool isAutoSense(const std::string& line);
/// ethtool's "Link detected: yes".
bool isLinkDetected(const std::string& line);
/// The bonding file's "MII Status: up".
bool isMiiUp(const std::string& line);

/// The member of the bonding file's "Slave Interface: eth0" as it is put into a command: the blank before
/// the name stays.
std::string bondMemberToProbe(const std::string& line);
/// The member of the same line as it is listed: without the blank before and those behind.
std::string bondMember(const std::string& line);

/// What a line of an interface listing names.
struct NICName {
    std::string name;
    bool ofBridge;
};
NICName nicName(const std::string& line);

/// The name in a line cut down to the last column of `brctl show`.
std::string bridgeMember(const std::string& line);

}  // namespace IC::parse
