#include "agent/change/order.h"

#include <algorithm>
#include <iterator>
#include <numeric>

namespace cvagent::change {

namespace {

// EnumeratePorts, which can make nodes; IPOrigin, IPv4Address, SubnetMask, IPv6Address, IPv6PrefixLength, the
// gateways; HostName, DomainName, DNSServers, DNSSuffixes.
constexpr unsigned int kOfInterface[] = {74, 24, 25, 26, 27, 102, 100, 101, 97, 98, 94, 99};
// OwnerContact, OwnerName, TimeZoneOffset, CurrentTime, PowerAction.
constexpr unsigned int kOfComputer[] = {115, 116, 127, 126, 123};

constexpr unsigned int kState = 123;  // of an interface
constexpr int kUp = 3;                // behind the origin, in steps of ten: 20 is the address
constexpr int kDown = 400;

bool bringsUp(const Wanted& wanted) {
    const std::string& word = wanted.words.front();
    return word == "1" || word == "9" || word == "up";
}

int stepOf(const Wanted& wanted) {
    constexpr int kComputers = 200;
    constexpr int kLast = 500;
    if (!wanted.isComputer && wanted.property == kState) {
        return bringsUp(wanted) ? 10 + kUp : kDown;
    }
    const auto place = [&wanted](const auto& table) {
        return static_cast<int>(std::ranges::find(table, wanted.property) - std::begin(table));
    };
    if (!wanted.isComputer) {
        return 10 * place(kOfInterface);
    }
    return wanted.property == kState ? kLast : kComputers + place(kOfComputer);
}

}  // namespace

std::vector<std::size_t> orderOf(const std::vector<Wanted>& changes) {
    std::vector<std::size_t> order(changes.size());
    std::iota(order.begin(), order.end(), std::size_t{0});
    std::ranges::stable_sort(order, {}, [&changes](std::size_t i) { return stepOf(changes[i]); });
    return order;
}

}  // namespace cvagent::change
