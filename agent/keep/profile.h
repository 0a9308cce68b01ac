#pragma once

#include <string>
#include <vector>

#include "agent/keep/wish.h"

namespace cvagent::keep {

/// What a connection profile of NetworkManager's says of one family of addresses, as far as that is changed.
struct ProfileFamily {
    struct Address {
        std::string text{};
        unsigned prefix = 0;
        std::string label{};

        bool operator==(const Address&) const = default;
    };

    std::string method{};  ///< "auto", "manual", ...; "" where the profile says nothing of the family
    std::vector<Address> addresses{};
    std::string gateway{};
    std::vector<std::string> nameServers{};
    std::vector<std::string> searchDomains{};
    bool hasDefaultRoute = false;  ///< among its routes, beside the gateway

    bool operator==(const ProfileFamily&) const = default;
};

struct ProfileIp {
    ProfileFamily ipv4{};
    ProfileFamily ipv6{};

    bool operator==(const ProfileIp&) const = default;
};

/// The profile with the wish in it. Throws CannotKeep for what does not go with its method.
ProfileIp editedProfile(const ProfileIp& profile, const Wish& wish);

/// "ipv4.addresses '192.0.2.10/24' -> '192.0.2.77/24'", one for each that differs.
std::vector<std::string> differencesOf(const ProfileIp& before, const ProfileIp& after);

/// An address as NetworkManager writes it; the text as it is where it is none.
std::string canonicalAddress(const std::string& text);

}  // namespace cvagent::keep
