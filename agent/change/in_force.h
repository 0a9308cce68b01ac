#pragma once

#include "agent/core/writer.h"

namespace cvagent::change {

/// What a plug-in writes to files only is brought into the running host: an address, its mask or prefix
/// length, the IPv4 gateway. To be given to an agent (AgentSettings::bringIntoForce). Nothing is done for a
/// link that the kernel does not have, and nothing when the plug-in has not written the file. The new address
/// comes before the old one goes; other addresses and routes that go with the old one are put back as far as
/// they still can be, and the rest is told.
/// @param neighbours whether it is waited for what the other hosts of a link say of a new IPv6 address, which
///                   takes a second or two; one that another host has is told, and the old one stays
enum class Neighbours { awaited, notAsked };
BringIntoForce bringingIntoForce(Neighbours neighbours = Neighbours::awaited);

}  // namespace cvagent::change
