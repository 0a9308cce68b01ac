#pragma once

#include <string>

#include "agent/keep/way.h"

namespace cvagent::keep {

inline constexpr const char* kHostNameFile = "/etc/hostname";
inline constexpr const char* kOldHostNameFile = "/etc/HOSTNAME";  ///< of SUSE's day
inline constexpr const char* kZoneLink = "/etc/localtime";
inline constexpr const char* kZoneNameFile = "/etc/timezone";  ///< of Debian's
inline constexpr const char* kResolverFile = "/etc/resolv.conf";

// What is the host's and not an interface's: how it is kept over a restart. Nothing is done yet; see go().
// Each throws CannotKeep.

/// The host's own name, as the kernel has it: /etc/hostname, which systemd-hostnamed is asked to write where
/// systemd runs, for it tells others of the name.
/// @param name may have the domain behind it
Way wayOfHostName(const std::string& name);

/// Whether systemd-hostnamed can be asked.
bool isHostnamedThere();
/// Whether the host has its name in the file of SUSE's day and in no other: to be asked before the plug-in
/// writes, which makes that file anywhere.
bool isNameInOldFile();
/// @return its path, when it has the name
std::string oldNameFileWith(const std::string& name);

/// The time zone: the file of Debian's that has its name, where there is one. What everybody reads is the
/// link /etc/localtime, which is the plug-in's to write.
/// @param zone below /usr/share/zoneinfo; the link leads there
Way wayOfZone(const std::string& zone);

/// Who makes what the C library reads of name servers and search domains.
struct Resolver {
    std::string system;    ///< "systemd-resolved", "resolvconf", "openresolv"; "" for the file itself
    std::string evidence;  ///< what tells it, for people; it may hold names from the host
    std::string obstacle;  ///< why it cannot be made to keep anything; "" when it can

    bool isFileItself() const { return system.empty() && obstacle.empty(); }
    /// It has them with the interfaces that it keeps.
    bool isWithInterface() const { return system == "NetworkManager"; }
};
Resolver resolverOfHost();

/// How it keeps what the wish has of name servers and search domains. For an empty wish: its files as they
/// are, and the calls. Nothing to do for the file itself.
Way wayOfResolver(const Resolver& resolver, const Wish& wish);

/// Whether name servers and search domains are what the resolver uses first, whatever it has besides.
bool hasInForce(const Resolver& resolver, const Wish& wish);

}  // namespace cvagent::keep
