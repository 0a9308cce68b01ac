#pragma once

#include <string>
#include <vector>

#include "agent/keep/wish.h"

namespace cvagent::keep {

/// What a resolv.conf says; of several lines with search domains the last one, which is the one that counts.
struct ResolverLists {
    std::vector<std::string> nameServers;
    std::vector<std::string> searchDomains;
};
ResolverLists resolverListsIn(const std::string& text);

/// A drop-in for systemd-resolved with the name servers and search domains of the wish in place of all others
/// that its files have; what the wish leaves open stays.
/// @param text that of before; "" for none
std::string editedResolvedDropIn(const std::string& text, const Wish& wish);

/// A resolv.conf, or a part of one, whose lines of one keyword give way to these. They are marked as ours and
/// stand where the first one stood, else at the end.
std::string editedResolverLines(const std::string& text, const std::string& keyword,
                                const std::vector<std::string>& lines);

}  // namespace cvagent::keep
