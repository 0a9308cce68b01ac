#pragma once

#include <map>
#include <string>

#include "agent/bus/message.h"
#include "agent/keep/profile.h"

// The settings of a connection profile as they go over the bus: "a{sa{sv}}".
namespace cvagent::keep {

/// What the answer says of addresses. Throws bus::Error where it is of other types, CannotKeep where it says
/// more than is understood.
ProfileIp ipIn(const bus::Message& settings);

/// All values, "connection.id" and so on, in a form that can be compared: the same for the same value.
std::map<std::string, std::string> flatSettings(const bus::Message& settings);

/// Whether it is one of those that writeSettings() writes itself, or NetworkManager counts on by itself.
bool isWrittenOtherwise(const std::string& name);

/// Appends the settings as they are, but for what differs between the two. Throws bus::Error.
void writeSettings(const bus::Message& settings, const ProfileIp& before, const ProfileIp& wanted,
                   const bus::Message& call);

}  // namespace cvagent::keep
