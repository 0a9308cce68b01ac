#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "agent/change/ip.h"

namespace cvagent::change {

/// Whether other hosts have an IPv6 address, which the kernel asks the link for when it is added.
enum class Duplicate { no, beingAsked, yes };

struct KernelLink {
    unsigned index = 0;
    std::string name;
    bool isUp = false;
    bool isRunning = false;  ///< it has a carrier
};

struct KernelAddress {
    unsigned link = 0;
    Ip ip;
    unsigned prefix = 0;
    std::string label;         ///< of IPv4: the link's name, or an alias such as "eth0:1"
    bool isPermanent = false;  ///< no lease and no advertisement limits its life
    bool isGlobal = false;
    bool hasSubnetRoute = true;  ///< that the kernel makes; else who has set it makes it in the kernel's name
    Duplicate duplicate = Duplicate::no;
    unsigned protocol = 0;  ///< IFAPROT_...; 0 where the kernel tells none
    std::string message;    ///< all of it, as the kernel told it
};

struct KernelRoute {
    Ip destination;
    unsigned prefix = 0;
    std::optional<Ip> gateway{};
    std::optional<Ip> source{};  ///< the address that it prefers
    unsigned link = 0;
    unsigned metric = 0;
    unsigned table = 0;
    unsigned protocol = 0;  ///< RTPROT_...
    unsigned type = 0;      ///< RTN_...
    std::string message{};  ///< all of it, as the kernel told it

    bool isDefault() const { return prefix == 0; }
};

/// The addresses and routes of the kernel at one moment, in its order.
struct KernelNetwork {
    std::vector<KernelLink> links;
    std::vector<KernelAddress> addresses;
    std::vector<KernelRoute> routes;  ///< of all tables
    int problem = 0;                  ///< why they are not known, as an errno; 0 when they are

    static KernelNetwork read();

    /// Null when there is none of that name.
    const KernelLink* link(const std::string& name) const;
    std::string nameOf(unsigned link) const;
    /// The address that a link is known by: of IPv4 the first one that is no alias's, of IPv6 the first
    /// global one that stays and that no other host has. Null for none.
    const KernelAddress* mainAddress(unsigned link, bool isIpv6) const;
    const KernelAddress* find(unsigned link, const Ip& ip, unsigned prefix) const;
    /// The same route, whatever its flags are.
    bool has(const KernelRoute& route) const;
};

/// Of one address of a link; "no" for one that it has not. Asks for addresses alone.
Duplicate duplicateOf(const std::string& link, const Ip& ip);

/// "default via 192.0.2.1 dev eth0"
std::string textOf(const KernelRoute& route, const KernelNetwork& network);

// Changes of the running host. Each gives 0 or an errno.
/// @param label of IPv4; "" for the link's own
int addAddress(const KernelLink& link, const Ip& ip, unsigned prefix);
int addAgain(const KernelAddress& address);
int remove(const KernelAddress& address);
/// @param source in place of the one that the route prefers; nothing: as it was
int addAgain(const KernelRoute& route, const std::optional<Ip>& source);
/// A default route of the main table, in place of one with the same metric.
int setDefaultRoute(const Ip& gateway, unsigned link, unsigned metric);

}  // namespace cvagent::change
