#include "agent/verify/verify.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <ctime>
#include <iterator>
#include <sstream>

#include "agent/core/host_tools.h"
#include "agent/core/problem.h"
#include "agent/core/text.h"
#include "agent/verify/kernel.h"
#include "framework/ic/link_state.h"
#include "framework/qx/whole_number.h"
#include "hosttools/addresses.h"
#include "hosttools/files.h"

namespace cvagent::verify {

namespace {

/// A fact of the tree in question.
struct Fact {
    std::string name;   ///< of the node: the interface, the device
    std::string shown;  ///< the value as text
};

constexpr const char* kNone = "(none)";

bool isNone(const std::string& address) {
    return address.empty() || address == "0.0.0.0" || address == "::";
}

// What the kernel says of a fact: the text that is shown when it agrees.

using KernelSays = std::string (*)(const Kernel& kernel, const Fact& fact);

std::string linkName(const Kernel& kernel, const Fact& fact) {
    return kernel.link(fact.name) != nullptr ? fact.shown : "there is no such link";
}

std::string linkState(const Kernel& kernel, const Fact& fact) {
    return std::to_string(kernel.hasCarrier(fact.name) ? IC::LinkState::up : IC::LinkState::down);
}

std::string linkSpeed(const Kernel& /*kernel*/, const Fact& fact) {
    return std::to_string(Kernel::modeOf(fact.name).megabits * 1000ULL);
}

std::string fullDuplex(const Kernel& /*kernel*/, const Fact& fact) {
    return Kernel::modeOf(fact.name).isFullDuplex ? "true" : "false";
}

std::string ipv4Address(const Kernel& kernel, const Fact& fact) {
    const auto* address = kernel.inet(fact.name);
    if (address == nullptr) {
        return isNone(fact.shown) ? fact.shown : kNone;
    }
    return hosttools::textOf(address->local);
}

std::string subnetMask(const Kernel& kernel, const Fact& fact) {
    const auto* address = kernel.inet(fact.name);
    if (address == nullptr) {
        return isNone(fact.shown) ? fact.shown : kNone;
    }
    constexpr unsigned kBits = 32;
    const std::uint32_t mask = address->prefix == 0 ? 0 : ~std::uint32_t{0} << (kBits - address->prefix);
    return hosttools::textOf(in_addr{htonl(mask)});
}

/// Any of several is right.
std::string ipv6Address(const Kernel& kernel, const Fact& fact) {
    const auto all = kernel.inet6(fact.name);
    const auto found = std::ranges::find(all, fact.shown, &std::pair<std::string, unsigned>::first);
    if (found != all.end() || (all.empty() && isNone(fact.shown))) {
        return fact.shown;
    }
    return all.empty() ? kNone : all.front().first;
}

std::string prefixLength(const Kernel& kernel, const Fact& fact) {
    const auto all = kernel.inet6(fact.name);
    const auto matches = [&fact](const auto& address) {
        return std::to_string(address.second) == fact.shown;
    };
    if (std::ranges::any_of(all, matches)) {
        return fact.shown;
    }
    return all.empty() ? "0" : std::to_string(all.front().second);
}

/// An interface without a way out of its own shows the host's.
std::string ipv4Gateway(const Kernel& /*kernel*/, const Fact& fact) {
    const auto own = Kernel::gateways(fact.name);
    const auto all = Kernel::gateways("");
    const auto& right = own.empty() ? all : own;
    if ((own.empty() && isNone(fact.shown)) || std::ranges::find(right, fact.shown) != right.end()) {
        return fact.shown;
    }
    return right.empty() ? kNone : right.front();
}

std::string hostName(const Kernel& /*kernel*/, const Fact& /*fact*/) {
    std::array<char, 256> name{};
    gethostname(name.data(), name.size() - 1);
    return name.data();
}

std::string shortHostName(const Kernel& kernel, const Fact& fact) {
    const std::string whole = hostName(kernel, fact);
    return whole.substr(0, whole.find('.'));
}

/// What is shown has been read a moment ago.
std::string currentTime(const Kernel& /*kernel*/, const Fact& fact) {
    constexpr long long kMoment = 30;
    const long long now = std::time(nullptr);
    const auto shown = QX::wholeNumber<long long>(fact.shown);
    return shown && *shown <= now && *shown > now - kMoment ? fact.shown : std::to_string(now);
}

/// In bytes; nothing when the kernel knows no such device.
std::optional<unsigned long long> deviceSize(const std::string& device) {
    constexpr unsigned long long kSector = 512;
    std::string name = device.starts_with("/dev/") ? device.substr(std::strlen("/dev/")) : device;
    std::ranges::replace(name, '/', '!');
    const auto size = hosttools::readFile("/sys/class/block/" + name + "/size");
    const auto sectors = size ? hosttools::parseNumber(*size) : std::nullopt;
    return sectors ? std::optional(*sectors * kSector) : std::nullopt;
}

template <unsigned unit>
std::string sizeIn(const Kernel& /*kernel*/, const Fact& fact) {
    const auto size = deviceSize(fact.name);
    return size ? std::to_string(*size / unit) : "there is no such device";
}

/// The kernel shows an extended partition as a stub of at most two sectors.
std::string partitionSize(const Kernel& kernel, const Fact& fact) {
    constexpr unsigned kKibi = 1024;
    const bool isExtended = deviceSize(fact.name).value_or(kKibi + 1) <= kKibi;
    return isExtended ? fact.shown : sizeIn<kKibi>(kernel, fact);
}

std::vector<std::string> sortedWords(std::string text) {
    std::ranges::replace(text, ',', ' ');
    std::istringstream words(text);
    std::vector<std::string> all{std::istream_iterator<std::string>(words), {}};
    std::ranges::sort(all);
    return all;
}

std::string teamMembers(const Kernel& /*kernel*/, const Fact& fact) {
    const std::string members =
        hosttools::readFile("/sys/class/net/" + fact.name + "/bonding/slaves").value_or("");
    return sortedWords(members) == sortedWords(fact.shown) ? fact.shown : members;
}

struct Check {
    NodeType type;
    unsigned int id;
    unsigned int nameProperty;  ///< of the node
    KernelSays says;
};

constexpr unsigned kThousand = 1000;

constexpr Check kChecks[] = {
    {NodeType::networkPort, 108, 108, linkName},
    {NodeType::networkPort, 123, 108, linkState},
    {NodeType::networkPort, 57, 108, linkSpeed},
    {NodeType::networkPort, 82, 108, fullDuplex},
    {NodeType::ipConfig, 108, 108, linkName},
    {NodeType::ipConfig, 123, 108, linkState},
    {NodeType::ipConfig, 25, 108, ipv4Address},
    {NodeType::ipConfig, 26, 108, subnetMask},
    {NodeType::ipConfig, 27, 108, ipv6Address},
    {NodeType::ipConfig, 102, 108, prefixLength},
    {NodeType::ipConfig, 100, 108, ipv4Gateway},
    {NodeType::ipConfig, 97, 108, shortHostName},
    {NodeType::team, 197, 197, linkName},
    {NodeType::team, 165, 197, teamMembers},
    {NodeType::hardDrive, 37, 89, sizeIn<kThousand>},
    {NodeType::partition, 112, 89, partitionSize},
    {NodeType::computer, 108, 108, hostName},
    {NodeType::computer, 126, 108, currentTime},
};

/// The plug-in's commands look for names anywhere in a line.
std::string namePartOf(const Kernel& kernel, const std::string& name) {
    for (const hosttools::Link& link : kernel.links()) {
        if (link.name != name && !name.empty() && link.name.find(name) != std::string::npos) {
            return "the name is part of " + inQuotes(link.name) + ", of which this may be";
        }
    }
    return {};
}

std::string reasonFor(const Kernel& kernel, const Check& check, const Fact& fact,
                      const std::string& property) {
    for (const MissingTool& missing : missingTools()) {
        if ((", " + missing.costs + ",").find(", " + property + ",") != std::string::npos) {
            return "there is no " + missing.tool + " (package " + missing.package + ")";
        }
    }
    const bool isOfLink = check.type == NodeType::networkPort || check.type == NodeType::ipConfig;
    if (std::string other = isOfLink ? namePartOf(kernel, fact.name) : ""; !other.empty()) {
        return other;
    }
    if (isOfLink && fact.name.find("bond") != std::string::npos && check.says == linkState) {
        return "a bond counts as up while all its members are";
    }
    return "it has changed meanwhile, or the host's tool tells it otherwise: see cvagent doctor";
}

const Reading* readingOf(const std::vector<Reading>& readings, unsigned int id) {
    const auto found = std::ranges::find(readings, id, &Reading::id);
    return found == readings.end() || found->failed() ? nullptr : &*found;
}

void compare(const Kernel& kernel, const Check& check, const IC::MutableNode& node,
             const std::vector<Reading>& readings, Result& result) {
    const Reading* reading = readingOf(readings, check.id);
    const Reading* name = readingOf(readings, check.nameProperty);
    if (reading == nullptr || name == nullptr || static_cast<unsigned int>(check.type) != node.nodeType()) {
        return;
    }
    const Fact fact{static_cast<std::string>(name->value), static_cast<std::string>(reading->value)};
    if (fact.name.find(':') != std::string::npos) {
        return;  // an alias has no link of its own
    }
    ++result.compared;
    const std::string says = check.says(kernel, fact);
    if (says != fact.shown) {
        result.differences.push_back({node.getPath(), reading->name(), fact.shown, says,
                                      reasonFor(kernel, check, fact, reading->name())});
    }
}

void compareProcessors(const std::vector<NodeRef>& nodes, Result& result) {
    const auto shown = std::ranges::count_if(nodes, [](const NodeRef& node) {
        return node->nodeType() == static_cast<unsigned int>(NodeType::processor);
    });
    const long online = sysconf(_SC_NPROCESSORS_ONLN);
    ++result.compared;
    if (shown != online) {
        result.differences.push_back({"/oshw", "processors", std::to_string(shown), std::to_string(online),
                                      "/proc/cpuinfo of this machine has not one entry for each"});
    }
}

}  // namespace

Result verify(const std::vector<NodeRef>& nodes, const std::vector<std::vector<Reading>>& readings) {
    const Kernel kernel;
    if (kernel.problem() != 0) {
        throw Problem(Problem::failed,
                      std::string("the kernel tells no links: ") + std::strerror(kernel.problem()));
    }
    Result result;
    for (std::size_t i = 0; i < nodes.size(); ++i) {
        for (const Check& check : kChecks) {
            compare(kernel, check, *nodes[i], readings[i], result);
        }
    }
    compareProcessors(nodes, result);
    return result;
}

}  // namespace cvagent::verify
