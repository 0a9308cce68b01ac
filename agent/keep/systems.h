#pragma once

#include <optional>
#include <string>

#include "agent/keep/keeper.h"

namespace cvagent::keep {

class Daemons;

// One function a system: whether it keeps a link. Throws NoAnswer where that cannot be found out.
std::optional<Claim> claimOfNetworkManager(const Link& link, Daemons& daemons);
std::optional<Claim> claimOfNetworkd(const Link& link, Daemons& daemons);
std::optional<Claim> claimOfWicked(const Link& link, Daemons& daemons);
std::optional<Claim> claimOfIfupdown(const Link& link, Daemons& daemons);

/// What all of them say of one link.
Keeper keeperOf(const Link& link, Daemons& daemons);

}  // namespace cvagent::keep
