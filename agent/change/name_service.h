#pragma once

#include <string>
#include <string_view>

namespace cvagent::change {

/// From here on names are looked up in files alone: a copy of the network leads to no name server, and
/// whoever asked one would wait for it. To be called once /etc is covered. Throws Cannot.
void askNoNameServer();

/// The settings of the name service without everything that asks others.
std::string withoutServers(std::string_view settings);

}  // namespace cvagent::change
