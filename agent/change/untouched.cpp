#include "agent/change/untouched.h"

#include <linux/rtnetlink.h>

#include <cstring>

namespace cvagent::change {

namespace {

bool isUntouched(const KernelAddress& address, Touched touched) {
    const bool lasts = address.isGlobal && address.isPermanent;
    return lasts && (touched.isGateway || address.ip.isIpv6 != touched.isIpv6);
}

bool isUntouched(const KernelRoute& route, Touched touched) {
    const bool isMade = route.protocol == RTPROT_KERNEL || route.protocol == RTPROT_RA;
    const bool isOfOther = route.destination.isIpv6 != touched.isIpv6;
    return route.table != RT_TABLE_LOCAL && !isMade &&
           (isOfOther || (touched.isGateway && !route.isDefault()));
}

}  // namespace

void putBackUntouched(const KernelNetwork& before, unsigned link, Touched touched,
                      std::vector<std::string>& notes) {
    const auto noteIf = [&notes](int problem, const std::string& what) {
        if (problem != 0) {
            notes.push_back(what + " is gone: " + std::strerror(problem));
        }
    };
    const KernelNetwork now = KernelNetwork::read();
    for (const KernelAddress& each : before.addresses) {
        const bool isThere = now.find(each.link, each.ip, each.prefix) != nullptr;
        if (each.link == link && !isThere && isUntouched(each, touched)) {
            noteIf(addAgain(each), "the address " + each.ip.text());
        }
    }
    for (const KernelRoute& each : before.routes) {
        if (each.link == link && !now.has(each) && isUntouched(each, touched)) {
            noteIf(addAgain(each, std::nullopt), "the route " + textOf(each, before));
        }
    }
}

}  // namespace cvagent::change
