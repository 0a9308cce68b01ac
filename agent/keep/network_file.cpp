#include "agent/keep/network_file.h"

#include <algorithm>
#include <array>

#include "agent/core/text.h"
#include "agent/keep/host_files.h"
#include "agent/keep/interfaces_file.h"

namespace cvagent::keep {

namespace {

std::string trimmed(const std::string& text) {
    const std::size_t begin = std::min(text.find_first_not_of(" \t\r"), text.size());
    return text.substr(begin, text.find_last_not_of(" \t\r") + 1 - begin);
}

/// A line of the file, with what it means.
struct Entry {
    std::string line;
    std::string section;  ///< "Network"; of a head as well
    std::string key;      ///< "" for heads, comments and empty lines
    std::string value;
    unsigned block = 0;  ///< sections of one name are many
};

Entry entryOf(const std::string& line) {
    Entry entry{line, "", "", "", 0};
    const std::string text = trimmed(line);
    if (text.ends_with('\\')) {
        throw CannotKeep("a line of the file goes on in the next: " + inQuotes(text));
    }
    if (text.empty() || text[0] == '#' || text[0] == ';') {
        return entry;
    }
    if (text.starts_with('[') && text.ends_with(']')) {
        entry.section = text.substr(1, text.size() - 2);
        return entry;
    }
    const std::size_t equals = text.find('=');
    if (equals == std::string::npos) {
        throw CannotKeep("a line of the file is not understood: " + inQuotes(text));
    }
    entry.key = trimmed(text.substr(0, equals));
    entry.value = trimmed(text.substr(equals + 1));
    return entry;
}

/// How the file says whether IPv4 and IPv6 come by DHCP.
struct Dhcp {
    const char* text;
    bool ipv4;
    bool ipv6;
};
constexpr std::array kDhcp = {
    Dhcp{"no", false, false},  Dhcp{"ipv4", true, false},   Dhcp{"ipv6", false, true},
    Dhcp{"yes", true, true},   Dhcp{"false", false, false}, Dhcp{"true", true, true},
    Dhcp{"off", false, false}, Dhcp{"on", true, true},      Dhcp{"0", false, false},
    Dhcp{"1", true, true},     Dhcp{"none", false, false},  Dhcp{"both", true, true},
    Dhcp{"v4", true, false},   Dhcp{"v6", false, true}};

class NetworkFile {
public:
    explicit NetworkFile(const std::string& text) {
        std::string section;
        unsigned block = 0;
        for (const std::string& line : splitLines(text)) {
            Entry entry = entryOf(line);
            if (!entry.section.empty()) {
                section = entry.section;
                ++block;
            }
            entry.section = section;
            entry.block = block;
            // What stands in front of all sections means nothing.
            if (section == "Match") {
                addCondition(entry);
            } else if (section == "Network" && takesAway(entry)) {
                throw CannotKeep(inQuotes(entry.key + "=") + " takes away what stands before it");
            } else if (!section.empty()) {
                entries_.push_back(std::move(entry));
            }
        }
    }

    /// What else the link has to be, a line each: a name can be another link's after a restart.
    const std::string& conditions() const { return conditions_; }

    bool isByDhcp() const { return currentDhcp().ipv4; }

    void setOrigin(bool dhcp) {
        const Dhcp old = currentDhcp();
        if (old.ipv4 == dhcp) {
            return;
        }
        const auto* fitting = std::ranges::find_if(
            kDhcp, [&](const Dhcp& each) { return each.ipv4 == dhcp && each.ipv6 == old.ipv6; });
        drop("Network", "DHCP");
        add("DHCP", fitting->text);
        if (dhcp) {
            dropAddresses();
        }
    }

    void setFamily(const FamilyWish& wish, bool isIpv6) {
        if (wish.isEmpty()) {
            return;
        }
        if (!isIpv6 && currentDhcp().ipv4) {
            throw CannotKeep("the address comes by DHCP");
        }
        if (wish.address || wish.prefix) {
            setAddress(wish, isIpv6);
        }
        if (wish.gateway) {
            setGateway(*wish.gateway, isIpv6);
        }
    }

    bool hasIpv4Address() { return findAddress(false) != entries_.end(); }

    void setNameServers(const std::vector<std::string>& servers) {
        drop("Network", "DNS");
        if (!servers.empty()) {
            add("DNS", joinedWords(servers));
        }
    }

    /// Those that only tell which names go where ("~corp") stay.
    void setDomains(const std::vector<std::string>& domains) {
        std::vector<std::string> words = domains;
        for (const Entry& each : entries_) {
            if (each.section == "Network" && each.key == "Domains") {
                std::ranges::copy_if(wordsOf(each.value), std::back_inserter(words),
                                     [](const std::string& word) { return word.starts_with('~'); });
            }
        }
        drop("Network", "Domains");
        if (!words.empty()) {
            add("Domains", joinedWords(words));
        }
    }

    std::string text() const {
        std::string text;
        for (const Entry& each : entries_) {
            text += each.line + '\n';
        }
        return text;
    }

private:
    bool takesAway(const Entry& entry) const {
        return entry.value.empty() && (entry.key == "Address" || entry.key == "Gateway") &&
               std::ranges::find(entries_, entry.key, &Entry::key) != entries_.end();
    }

    Dhcp currentDhcp() const {
        Dhcp current = kDhcp[0];
        for (const Entry& each : entries_) {
            if (each.section == "Network" && each.key == "DHCP") {
                const auto* found =
                    std::ranges::find_if(kDhcp, [&](const Dhcp& known) { return each.value == known.text; });
                if (found == kDhcp.end()) {
                    throw CannotKeep("DHCP=" + inQuotes(each.value) + " is not understood");
                }
                current = *found;
            }
        }
        return current;
    }

    static bool isAddress(const Entry& entry) {
        return (entry.section == "Network" || entry.section == "Address") && entry.key == "Address";
    }

    /// The first one of the family; the link's local ones are not what a host is known by.
    std::vector<Entry>::iterator findAddress(bool isIpv6) {
        return std::ranges::find_if(entries_, [isIpv6](const Entry& each) {
            return isAddress(each) && addressIn(each.value, isIpv6) && !each.value.starts_with("fe80:");
        });
    }

    void setAddress(const FamilyWish& wish, bool isIpv6) {
        const auto found = findAddress(isIpv6);
        const auto old = found == entries_.end() ? std::nullopt : addressIn(found->value, isIpv6);
        const std::string address = wish.address.value_or(old ? old->address : "");
        const auto known = old ? old->prefix : std::nullopt;
        const auto prefix = wish.prefix ? wish.prefix : (known ? known : wish.likelyPrefix);
        if (address.empty() || !prefix) {
            throw CannotKeep(address.empty() ? "the file has no address of this kind"
                                             : "no mask or prefix length of the address is known");
        }
        const std::string value = address + "/" + std::to_string(*prefix);
        if (found == entries_.end()) {
            add("Address", value);
        } else if (found->value != value) {
            set(*found, value);
            dropWhatFollowsFrom(found->block);
        }
    }

    /// What stands beside an address in its section and would be that of the old one.
    void dropWhatFollowsFrom(unsigned block) {
        std::erase_if(entries_, [block](const Entry& each) {
            const bool isBeside = each.block == block && each.section == "Address";
            if (isBeside && each.key == "Peer") {
                throw CannotKeep("the address has a Peer");
            }
            return isBeside && each.key == "Broadcast" && isIpv4(each.value);
        });
    }

    /// Whether a section of a route is about all destinations, for everybody.
    bool isDefaultRoute(unsigned block, bool isIpv6) const {
        return std::ranges::none_of(entries_, [&](const Entry& each) {
            const bool isElsewhere = each.key == "Destination" && !each.value.empty() &&
                                     each.value != (isIpv6 ? "::/0" : "0.0.0.0/0");
            return each.block == block && (isElsewhere || each.key == "Table");
        });
    }

    std::vector<Entry>::iterator findGateway(bool isIpv6) {
        return std::ranges::find_if(entries_, [&](const Entry& each) {
            const bool isHere =
                each.section == "Network" || (each.section == "Route" && isDefaultRoute(each.block, isIpv6));
            return isHere && each.key == "Gateway" && (isIpv6 ? keep::isIpv6 : isIpv4)(each.value);
        });
    }

    void setGateway(const std::string& gateway, bool isIpv6) {
        const auto found = findGateway(isIpv6);
        if (gateway.empty()) {
            dropGateways(isIpv6);
        } else if (found == entries_.end()) {
            add("Gateway", gateway);
        } else {
            set(*found, gateway);
        }
    }

    void dropGateways(bool isIpv6) {
        for (auto found = findGateway(isIpv6); found != entries_.end(); found = findGateway(isIpv6)) {
            if (found->section == "Network") {
                entries_.erase(found);
            } else {
                dropBlock(found->block);
            }
        }
    }

    void dropAddresses() {
        for (auto found = findAddress(false); found != entries_.end(); found = findAddress(false)) {
            if (found->section == "Address") {
                dropBlock(found->block);
            } else {
                entries_.erase(found);
            }
        }
        setGateway("", false);
    }

    void dropBlock(unsigned block) {
        std::erase_if(entries_, [block](const Entry& each) { return each.block == block; });
    }

    static void set(Entry& entry, const std::string& value) {
        entry.value = value;
        entry.line = entry.key + "=" + value;
    }

    void drop(const std::string& section, const std::string& key) {
        std::erase_if(entries_,
                      [&](const Entry& each) { return each.section == section && each.key == key; });
    }

    /// To the end of the first section of its kind.
    void add(const std::string& key, const std::string& value) {
        auto head = std::ranges::find(entries_, std::string("Network"), &Entry::section);
        if (head == entries_.end()) {
            const unsigned block = entries_.empty() ? 1 : entries_.back().block + 1;
            head = entries_.insert(entries_.end(), {"[Network]", "Network", "", "", block});
        }
        const unsigned block = head->block;
        auto end = head;
        for (auto at = head; at != entries_.end() && at->block == block; ++at) {
            end = at->key.empty() && at != head ? end : at;
        }
        entries_.insert(end + 1, {key + "=" + value, "Network", key, value, block});
    }

    void addCondition(const Entry& entry) {
        if (!entry.key.empty() && entry.key != "Name") {
            conditions_ += entry.key + "=" + entry.value + "\n";
        }
    }

    std::string conditions_;
    std::vector<Entry> entries_;
};

}  // namespace

std::string ownNetworkFile(const std::string& text, const std::string& link, const Wish& wish) {
    check(wish);
    checkName(link);
    NetworkFile file(text);
    const bool wasByDhcp = file.isByDhcp();
    if (wish.dhcp) {
        file.setOrigin(*wish.dhcp);
    }
    file.setFamily(wasByDhcp && !file.isByDhcp() ? wish.ipv4.behindDhcp() : wish.ipv4, false);
    file.setFamily(wish.ipv6, true);
    if (wish.dhcp && !*wish.dhcp && !file.hasIpv4Address()) {
        throw CannotKeep("no address would be left");
    }
    if (wish.nameServers) {
        file.setNameServers(*wish.nameServers);
    }
    if (wish.searchDomains) {
        file.setDomains(*wish.searchDomains);
    }
    return kOurMark + ("[Match]\nName=" + link + "\n" + file.conditions() + "\n") + file.text();
}

std::string ownNetworkPath(const std::string& source, const std::string& link) {
    checkName(link);
    const std::string name = "0-cvagent-" + link + ".network";
    if (lastPart(source) < name) {
        throw CannotKeep(inQuotes(source) + " sorts before any file of ours");
    }
    return "/etc/systemd/network/" + name;
}

}  // namespace cvagent::keep
