#pragma once

#include <map>
#include <memory>
#include <string>
#include <string_view>

namespace cvagent::service {

/// A link as the kernel has it; what decides whether a plug-in shows it, and as what.
struct HostLink {
    std::string name;
    int master = 0;            ///< the index of the link that it is part of, 0 for none
    bool ofBridge = false;     ///< that one is a bridge
    bool zeroAddress = false;  ///< its hardware address is nothing but zeros
    bool isLoopback = false;
    bool isBond = false;
    bool isUp = false;  ///< it is switched on, whether or not it has a signal

    bool operator==(const HostLink&) const = default;
};

/// What kernel news are about; a mask.
enum Concern : unsigned int {
    concernsLink = 1,
    concernsAddress = 2,
    concernsRoute = 4,
    concernsAll = concernsLink | concernsAddress | concernsRoute,
    concernsHost = 8,  ///< what host_files.h is about: all nodes tell the same
};

/// By the links' indices.
using HostLinks = std::map<int, HostLink>;
/// By the links' names; an index is never given twice.
using LinkIndices = std::map<std::string, int>;
/// Those of the host now, asked for.
LinkIndices linkIndices();

/// What some news have come to.
struct HeardNews {
    std::map<int, unsigned int> concerned;   ///< indices of links: what of them; 0 for all links
    std::map<int, std::string> formerNames;  ///< of links that are gone or called otherwise now
    bool linksDiffer = false;                ///< one has come, gone, or is another kind of link now
};

/// What is not known any more of the host, for who looks at it.
struct HostChange {
    std::map<std::string, unsigned int> names;  ///< of links: what of them; "" for all links
    bool linksDiffer = false;                   ///< as in HeardNews
    bool drives = false;                        ///< drives have come, gone or changed
    std::shared_ptr<const HostLinks> links;     ///< as they are now

    bool any() const { return !names.empty() || linksDiffer || drives; }
    /// What there is of one link, those that concern all of them included.
    unsigned int concernOf(const std::string& name) const;
    /// Takes in a later one.
    void add(const HostChange& later);
};

/// Takes a message of the kernel's (rtnetlink): several announcements, of links, addresses and routes.
void takeRouteNews(std::string_view message, HostLinks& links, HeardNews& heard);

/// The subsystem that a message of the kernel's device news (uevent) names; "" for none.
std::string subsystemOfDevice(std::string_view message);

}  // namespace cvagent::service
