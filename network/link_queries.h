#pragma once

#include <string>

#include "mi/temporary_file.h"

namespace IC {

// What one interface's link says, asked anew at each call. A tool that is missing, refuses or prints nothing
// gives the same answer as an interface without the fact; only a shell that cannot be started is logged.

/// Where the port builder keeps the output of `ifconfig` while it walks the interfaces.
inline constexpr char ifconfigSnapshotPath[] = "/tmp/CVIfconfig.txt";
inline constinit TemporaryFile ifconfigSnapshot(ifconfigSnapshotPath);

/// Speed from `ethtool`.
/// @param speed receives kilobits a second, 0 for a speed the driver does not know; untouched on failure
/// @return whether the tool told a speed
bool getNetworkSpeed(const std::string& name, unsigned long long& speed);

/// Whether `ethtool` reports full duplex.
bool getNetworkDuplex(const std::string& name);

/// Whether `ethtool` reports auto-negotiation. Every line that `ethtool` prints for it counts as "on": its
/// label holds those letters too.
bool getAutoSense(const std::string& name);

/// The hardware address from `ifconfig`, lower-case with colons.
/// @param address emptied when the interface has none; untouched when the shell could not be started
void getHardwareAddress(std::string name, std::string& address);

/// Whether `ifconfig` lists an interface whose line holds the name: eth1 is up when only eth10 is. Read from
/// the snapshot when there is one of ours.
bool isInterfaceUP(std::string name);

/// Whether `ethtool` detects a link. A bond (a name with "bond" in it) is up when its MII status is and it
/// has members and all of them are up.
bool isNICUp(std::string name);

}  // namespace IC
