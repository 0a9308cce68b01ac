#include "agent/keep/keeper.h"

#include <net/if.h>

#include <algorithm>
#include <array>

#include "agent/keep/daemons.h"
#include "agent/keep/systems.h"
#include "hosttools/interfaces.h"

namespace cvagent::keep {

namespace {

using Ask = std::optional<Claim> (*)(const Link&, Daemons&);
constexpr std::array<Ask, 4> kSystems = {claimOfNetworkManager, claimOfNetworkd, claimOfWicked,
                                         claimOfIfupdown};

}  // namespace

Keeper keeperOf(const Link& link, Daemons& daemons) {
    Keeper keeper{link.name, {}, {}};
    for (const Ask ask : kSystems) {
        try {
            if (auto claim = ask(link, daemons)) {
                keeper.claims.push_back(*std::move(claim));
            }
        } catch (const NoAnswer& none) {
            const bool isKnown = std::ranges::find(keeper.unknown, none.what()) != keeper.unknown.end();
            if (!isKnown) {
                keeper.unknown.emplace_back(none.what());
            }
        }
    }
    return keeper;
}

Keeper keeperOf(const Link& link) {
    Daemons daemons;
    return keeperOf(link, daemons);
}

std::vector<Keeper> keepers() {
    hosttools::Interfaces interfaces;
    std::vector<Keeper> found;
    if (hosttools::readInterfaces("", interfaces) != 0) {
        return found;
    }
    Daemons daemons;
    for (const hosttools::Link& link : interfaces.links) {
        if ((link.flags & IFF_LOOPBACK) == 0) {
            found.push_back(keeperOf({link.name, static_cast<unsigned>(link.index)}, daemons));
        }
    }
    std::ranges::sort(found, {}, &Keeper::interface);
    return found;
}

}  // namespace cvagent::keep
