#include "agent/keep/netplan_file.h"

#include <algorithm>
#include <array>
#include <cctype>

#include "agent/core/text.h"
#include "agent/keep/interfaces_file.h"
#include "agent/keep/yaml_file.h"

namespace cvagent::keep {

namespace {

constexpr const char* kMainTable = "254";
constexpr std::array kKinds = {"ethernets", "bonds", "bridges", "vlans", "tunnels", "dummy-devices"};

class NetplanFile : private YamlFile {
public:
    using YamlFile::lines;
    using YamlFile::YamlFile;

    /// @return the lines of the interface; nothing when the file has none of that name
    std::optional<Span> find(const std::string& id) const {
        std::optional<Span> found;
        const auto network = childOf({0, lines().size()}, std::nullopt, "network");
        for (const char* kind : kKinds) {
            const auto group = network ? childOf(*network, network->first, kind) : std::nullopt;
            const auto one = group ? childOf(*group, group->first, id) : std::nullopt;
            if (one && found) {
                throw CannotKeep("the file has more than one interface " + inQuotes(id));
            }
            found = one ? one : found;
        }
        return found;
    }

    void setScalar(const std::string& id, const std::string& key, const std::string& value) {
        const Span place = *find(id);
        const auto line = childOf(place, place.first, key);
        if (!line) {
            add(id, {key + ": " + value});
        } else if (at(line->first).value.empty()) {
            refuse(line->first);
        } else {
            replace(valueOf(line->first), value);
        }
    }

    bool isByDhcp(const std::string& id) const {
        const Span place = *find(id);
        const auto line = childOf(place, place.first, "dhcp4");
        std::string value = line ? unquoted(at(line->first).value) : "";
        std::ranges::transform(value, value.begin(),
                               [](unsigned char letter) { return static_cast<char>(std::tolower(letter)); });
        return value == "true" || value == "yes" || value == "on" || value == "y";
    }

    /// What is fixed of IPv4 would stand beside the lease.
    void dropFixed(const std::string& id) {
        while (const auto list = childOf(*find(id), find(id)->first, "addresses")) {
            const auto address = firstIn(*list, false);
            if (!address) {
                break;
            }
            eraseItem(*list, *address);
        }
        while (const auto routes = childOf(*find(id), find(id)->first, "routes")) {
            const auto via = defaultVia(*routes, false);
            if (!via) {
                break;
            }
            eraseItem(*routes, *via);
        }
        if (const auto gateway = childOf(*find(id), find(id)->first, "gateway4")) {
            erase(*gateway);
        }
    }

    /// A fixed one of IPv4.
    bool hasAddress(const std::string& id) const {
        const Span place = *find(id);
        const auto list = childOf(place, place.first, "addresses");
        return list && firstIn(*list, false);
    }

    void setAddress(const std::string& id, const FamilyWish& wish, bool isIpv6) {
        const Span place = *find(id);
        const auto list = childOf(place, place.first, "addresses");
        const auto old = list ? firstIn(*list, isIpv6) : std::nullopt;
        const auto told = old ? addressIn(old->text, isIpv6) : std::nullopt;
        const std::string address = wish.address.value_or(told ? told->address : "");
        const auto known = told ? told->prefix : std::nullopt;
        const auto prefix = wish.prefix ? wish.prefix : (known ? known : wish.likelyPrefix);
        if (address.empty() || !prefix) {
            throw CannotKeep(address.empty() ? "the file has no address of this kind"
                                             : "no mask or prefix length of the address is known");
        }
        const std::string value = address + "/" + std::to_string(*prefix);
        if (old) {
            replace(*old, value);
        } else {
            addToList(id, list, "\"" + value + "\"");
        }
    }

    void setGateway(const std::string& id, const std::string& gateway, bool isIpv6) {
        const std::string oldKey = isIpv6 ? "gateway6" : "gateway4";
        const Span place = *find(id);
        if (gateway.empty()) {
            throw CannotKeep("a gateway is not taken out of the file");
        }
        if (childOf(place, place.first, oldKey)) {
            setScalar(id, oldKey, isIpv6 ? "\"" + gateway + "\"" : gateway);
            return;
        }
        const auto routes = childOf(place, place.first, "routes");
        const auto via = routes ? defaultVia(*routes, isIpv6) : std::nullopt;
        if (via) {
            replace(*via, gateway);
            return;
        }
        if (routes && !at(routes->first).value.empty()) {
            refuse(routes->first);
        }
        const std::string indent(routes ? itemIndent(*routes) : 2, ' ');
        std::vector<std::string> item = {indent + "- to: default", indent + "  via: \"" + gateway + "\""};
        if (routes) {
            insert(routes->end, item);
        } else {
            item.insert(item.begin(), "routes:");
            add(id, item);
        }
    }

private:
    std::optional<Word> firstIn(const Span& list, bool isIpv6) const {
        for (const Word& word : wordsIn(list)) {
            const bool isLocal = word.text.starts_with("fe80:");
            if (word.text.find('/') != std::string::npos && addressIn(word.text, isIpv6) && !isLocal) {
                return word;
            }
        }
        return std::nullopt;
    }

    /// Where the default route of a family goes by.
    std::optional<Word> defaultVia(const Span& routes, bool isIpv6) const {
        const std::size_t indent = itemIndent(routes);
        std::vector<Word> item;
        std::optional<Word> found;
        const auto look = [&] {
            std::optional<Word> via;
            bool isDefault = false;
            bool isInOtherTable = false;
            for (std::size_t i = 0; i + 1 < item.size(); ++i) {
                const std::string& value = item[i + 1].text;
                isDefault = isDefault || (item[i].text == "to" &&
                                          (value == "default" || value == (isIpv6 ? "::/0" : "0.0.0.0/0")));
                isInOtherTable = isInOtherTable || (item[i].text == "table" && value != kMainTable);
                via = item[i].text == "via" ? std::optional(item[i + 1]) : via;
            }
            if (isDefault && !isInOtherTable && via && (isIpv6 ? keep::isIpv6 : isIpv4)(via->text) &&
                !found) {
                found = via;
            }
            item.clear();
        };
        for (const Word& word : wordsIn(routes)) {
            if (word.text == "-" && at(word.line).indent == indent) {
                look();
            }
            item.push_back(word);
        }
        look();
        return found;
    }

    void addToList(const std::string& id, const std::optional<Span>& list, const std::string& value) {
        if (!list) {
            add(id, {"addresses: [" + value + "]"});
            return;
        }
        const std::string& told = at(list->first).value;
        if (told.empty()) {
            insert(list->end, {std::string(itemIndent(*list), ' ') + "- " + value});
        } else if (told.ends_with(']')) {
            const bool isEmpty = wordsIn(*list).empty();
            replace(valueOf(list->first),
                    told.substr(0, told.size() - 1) + (isEmpty ? "" : ", ") + value + "]");
        } else {
            refuse(list->first);
        }
    }

    /// To the end of the interface.
    void add(const std::string& id, const std::vector<std::string>& lines) {
        const Span place = *find(id);
        std::string indent(at(place.first).indent + 2, ' ');
        for (std::size_t line = place.first + 1; line < place.end; ++line) {
            if (!at(line).text.empty()) {
                indent = std::string(at(line).indent, ' ');
                break;
            }
        }
        std::vector<std::string> indented = lines;
        std::ranges::for_each(indented, [&indent](std::string& line) { line.insert(0, indent); });
        insert(place.end, indented);
    }
};

void setFamily(NetplanFile& file, const std::string& id, const FamilyWish& wish, bool isIpv6) {
    if (wish.isEmpty()) {
        return;
    }
    if (!isIpv6 && file.isByDhcp(id)) {
        throw CannotKeep("the address comes by DHCP");
    }
    if (wish.address || wish.prefix) {
        file.setAddress(id, wish, isIpv6);
    }
    if (wish.gateway) {
        file.setGateway(id, *wish.gateway, isIpv6);
    }
}

std::string editedOnce(const std::string& text, const std::string& id, const Wish& wish) {
    NetplanFile file(text);
    if (!file.find(id)) {
        throw CannotKeep("the file has no interface " + inQuotes(id));
    }
    if (wish.nameServers || wish.searchDomains) {
        throw CannotKeep("name servers and domains are not written there");
    }
    const bool wasByDhcp = file.isByDhcp(id);
    if (wish.dhcp && wasByDhcp != *wish.dhcp) {
        file.setScalar(id, "dhcp4", *wish.dhcp ? "true" : "false");
        if (*wish.dhcp) {
            file.dropFixed(id);
        }
    }
    setFamily(file, id, wasByDhcp && !file.isByDhcp(id) ? wish.ipv4.behindDhcp() : wish.ipv4, false);
    setFamily(file, id, wish.ipv6, true);
    if (wish.dhcp && *wish.dhcp == file.hasAddress(id)) {
        throw CannotKeep(*wish.dhcp ? "the file has a fixed address" : "no address would be left");
    }
    return joined(file.lines(), text);
}

}  // namespace

bool definesInNetplan(const std::string& text, const std::string& id) {
    return NetplanFile(text).find(id).has_value();
}

std::string editedNetplan(const std::string& text, const std::string& id, const Wish& wish) {
    check(wish);
    std::string edited = editedOnce(text, id, wish);
    if (editedOnce(edited, id, wish) != edited) {
        throw CannotKeep("the file means something else than it seems to");
    }
    return edited;
}

}  // namespace cvagent::keep
