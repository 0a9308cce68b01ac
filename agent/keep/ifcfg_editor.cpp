#include "agent/keep/ifcfg_editor.h"

#include <algorithm>

#include "agent/core/text.h"
#include "agent/keep/interfaces_file.h"

namespace cvagent::keep {

namespace {

constexpr const char* kAddressKey = "IPADDR";

/// "IPADDR='192.0.2.10/24'"
struct Assignment {
    std::string key;
    std::string value;
};

/// The shell reads these files, so what is more than a plain value is not touched.
std::optional<Assignment> assignmentIn(const std::string& line) {
    const std::size_t equals = line.find('=');
    const std::vector<std::string> before = wordsOf(line.substr(0, equals));
    if (equals == std::string::npos || before.size() != 1 || before[0].starts_with('#')) {
        return std::nullopt;
    }
    Assignment found{before[0], line.substr(equals + 1)};
    const std::size_t last = found.value.find_last_not_of(" \t\r");
    found.value.resize(last == std::string::npos ? 0 : last + 1);
    if (found.value.size() >= 2 && (found.value[0] == '\'' || found.value[0] == '"') &&
        found.value.back() == found.value[0]) {
        found.value = found.value.substr(1, found.value.size() - 2);
    }
    return found;
}

class IfcfgEditor {
public:
    explicit IfcfgEditor(std::vector<std::string>& lines) : lines_(lines) {}

    void setOrigin(bool dhcp) {
        const std::string old = valueOf("BOOTPROTO").value_or("");
        const bool isSo = dhcp ? old == "dhcp" || old == "dhcp4" : old.empty() || old == "static";
        if (isSo) {
            return;
        }
        if (old == "dhcp4+static" || old == "dhcp6" || old == "dhcp+autoip") {
            throw CannotKeep("BOOTPROTO=" + inQuotes(old) + " is not understood");
        }
        write("BOOTPROTO", dhcp ? "dhcp" : "static");
    }

    bool isByDhcp() const {
        const std::string origin = valueOf("BOOTPROTO").value_or("");
        return origin.starts_with("dhcp") && origin != "dhcp6";
    }

    bool hasIpv4Address() const {
        return std::ranges::any_of(lines_, [](const std::string& line) {
            const auto found = assignmentIn(line);
            return found && found->key.starts_with(kAddressKey) && addressIn(found->value, false);
        });
    }

    void setAddress(const FamilyWish& wish, bool isIpv6) {
        if (!wish.address && !wish.prefix) {
            return;
        }
        const std::string suffix = suffixOf(isIpv6);
        const std::string told = valueOf(kAddressKey + suffix).value_or("");
        const auto old = addressIn(told, isIpv6);
        const std::string address = wish.address.value_or(old ? old->address : "");
        const auto known = knownPrefix(old, suffix, isIpv6);
        const auto prefix = wish.prefix ? wish.prefix : (known ? known : wish.likelyPrefix);
        if (address.empty() || !prefix) {
            throw CannotKeep(address.empty() ? "the file has no address of this kind"
                                             : "no mask or prefix length of the address is known");
        }
        const bool hasLength = valueOf("PREFIXLEN" + suffix).has_value();
        const bool hasMask = valueOf("NETMASK" + suffix).has_value();
        if (hasLength) {
            write("PREFIXLEN" + suffix, std::to_string(*prefix));
        }
        if (hasMask && !isIpv6) {
            write("NETMASK" + suffix, maskOf(*prefix));
        }
        const bool isApart = (hasLength || (hasMask && !isIpv6)) && !(old && old->prefix);
        write(kAddressKey + suffix, isApart ? address : address + "/" + std::to_string(*prefix));
        drop("BROADCAST" + suffix);
        drop("NETWORK" + suffix);
    }

private:
    /// Of the key that has an address of the family; else of a key that is free.
    std::string suffixOf(bool isIpv6) const {
        for (const std::string& line : lines_) {
            const auto found = assignmentIn(line);
            if (!found || !found->key.starts_with(kAddressKey) || found->value.empty()) {
                continue;
            }
            if (addressIn(found->value, isIpv6)) {
                return found->key.substr(std::string(kAddressKey).size());
            }
            if (!addressIn(found->value, !isIpv6)) {
                throw CannotKeep(inQuotes(found->key + "=" + found->value) + " is not understood");
            }
        }
        for (const char* suffix : {"", "_1", "_cvagent"}) {
            const bool isFitting = isIpv6 ? *suffix != '\0' : true;
            if (isFitting && valueOf(kAddressKey + std::string(suffix)).value_or("").empty()) {
                return suffix;
            }
        }
        throw CannotKeep("the file has no place for an address of this kind");
    }

    std::optional<unsigned> knownPrefix(const std::optional<AddressText>& old, const std::string& suffix,
                                        bool isIpv6) const {
        if (old && old->prefix) {
            return old->prefix;
        }
        if (const auto length = prefixOf(valueOf("PREFIXLEN" + suffix).value_or(""), isIpv6 ? 128 : 32)) {
            return length;
        }
        return isIpv6 ? std::nullopt : prefixOf(valueOf("NETMASK" + suffix).value_or(""), 32);
    }

    /// The last one counts.
    std::optional<std::string> valueOf(const std::string& key) const {
        std::optional<std::string> value;
        for (const std::string& line : lines_) {
            const auto found = assignmentIn(line);
            if (found && found->key == key) {
                value = found->value;
            }
        }
        return value;
    }

    void write(const std::string& key, const std::string& value) {
        if (valueOf(key) == value) {
            return;
        }
        const std::string line = key + "='" + value + "'";
        const auto place = std::ranges::find_if(lines_, [&key](const std::string& each) {
            const auto found = assignmentIn(each);
            return found && found->key == key;
        });
        if (place == lines_.end()) {
            lines_.push_back(line);
            return;
        }
        *place = line;
        const std::size_t kept = static_cast<std::size_t>(place - lines_.begin());
        dropFrom(kept + 1, key);
    }

    void drop(const std::string& key) { dropFrom(0, key); }
    void dropFrom(std::size_t first, const std::string& key) {
        const auto begin = lines_.begin() + static_cast<std::ptrdiff_t>(first);
        lines_.erase(std::remove_if(begin, lines_.end(),
                                    [&key](const std::string& line) {
                                        const auto found = assignmentIn(line);
                                        return found && found->key == key;
                                    }),
                     lines_.end());
    }

    std::vector<std::string>& lines_;
};

/// The gateway of a line that is a default route of the family.
std::optional<std::string> defaultGatewayIn(const std::string& line, bool isIpv6) {
    const std::vector<std::string> words = wordsOf(line);
    const bool isDefault =
        words.size() >= 2 && (words[0] == "default" || words[0] == (isIpv6 ? "::/0" : "0.0.0.0/0"));
    return isDefault && (isIpv6 ? keep::isIpv6 : isIpv4)(words[1]) ? std::optional(words[1]) : std::nullopt;
}

/// The first one gets the gateway and keeps what stands behind it; without a gateway all go.
void setDefaultRoute(std::vector<std::string>& lines, const std::string& gateway, bool isIpv6) {
    const auto isOurs = [isIpv6](const std::string& line) {
        return defaultGatewayIn(line, isIpv6).has_value();
    };
    const auto place = std::ranges::find_if(lines, isOurs);
    if (gateway.empty()) {
        std::erase_if(lines, isOurs);
    } else if (place == lines.end()) {
        lines.push_back("default " + gateway + " - -");
    } else {
        const std::string old = *defaultGatewayIn(*place, isIpv6);
        place->replace(place->find(old), old.size(), gateway);
    }
}

}  // namespace

std::string editedIfcfg(const std::string& text, const Wish& wish) {
    check(wish);
    std::vector<std::string> lines = splitLines(text);
    IfcfgEditor editor(lines);
    if (wish.dhcp) {
        editor.setOrigin(*wish.dhcp);
    }
    editor.setAddress(wish.ipv4, false);
    editor.setAddress(wish.ipv6, true);
    if (wish.dhcp && !*wish.dhcp && !editor.hasIpv4Address()) {
        throw CannotKeep("no address would be left");
    }
    return joined(lines, text);
}

bool isIfcfgByDhcp(const std::string& text) {
    std::vector<std::string> lines = splitLines(text);
    return IfcfgEditor(lines).isByDhcp();
}

std::string editedIfroute(const std::string& text, const Wish& wish) {
    check(wish);
    std::vector<std::string> lines = splitLines(text);
    if (wish.ipv4.gateway) {
        setDefaultRoute(lines, *wish.ipv4.gateway, false);
    }
    if (wish.ipv6.gateway) {
        setDefaultRoute(lines, *wish.ipv6.gateway, true);
    }
    return joined(lines, text);
}

}  // namespace cvagent::keep
