#include "agent/keep/netplan_file.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <string_view>

#include "agent/core/text.h"
#include "agent/keep/interfaces_file.h"
#include "agent/keep/yaml_line.h"

namespace cvagent::keep {

namespace {

constexpr const char* kMainTable = "254";
constexpr std::array kKinds = {"ethernets", "bonds", "bridges", "vlans", "tunnels", "dummy-devices"};

/// What separates the words of a list.
constexpr std::string_view kBetweenWords = " []{},\"'";

/// Where something stands: from its first line to behind its last one.
struct Span {
    std::size_t first = 0;
    std::size_t end = 0;
};

class NetplanFile {
public:
    explicit NetplanFile(const std::string& text) : lines_(splitLines(text)) {
        bool isBegun = false;
        for (const std::string& line : lines_) {
            parsed_.push_back(parsed(line));
            if (isBegun && line.starts_with("---")) {
                refuseYaml(line);
            }
            isBegun = isBegun || !parsed_.back().text.empty();
        }
    }

    const std::vector<std::string>& lines() const { return lines_; }

    /// @return the lines of the interface; nothing when the file has none of that name
    std::optional<Span> find(const std::string& id) const {
        std::optional<Span> found;
        const auto network = childOf({0, lines_.size()}, std::nullopt, "network");
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
        } else if (parsed_[line->first].value.empty()) {
            refuseYaml(lines_[line->first]);
        } else {
            replace(valueOf(line->first), value);
        }
    }

    bool isByDhcp(const std::string& id) const {
        const Span place = *find(id);
        const auto line = childOf(place, place.first, "dhcp4");
        std::string value = line ? unquoted(parsed_[line->first].value) : "";
        std::ranges::transform(value, value.begin(),
                               [](unsigned char letter) { return static_cast<char>(std::tolower(letter)); });
        return value == "true" || value == "yes" || value == "on" || value == "y";
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
        if (routes && !parsed_[routes->first].value.empty()) {
            refuseYaml(lines_[routes->first]);
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
    /// A word of a list or a value, and where it stands.
    struct Word {
        std::size_t line = 0;
        std::size_t column = 0;
        std::string text;
    };

    Word valueOf(std::size_t line) const {
        const YamlLine& told = parsed_[line];
        return {line, told.indent + told.text.size() - told.value.size(), told.value};
    }

    /// The lines below a key, with it: what is indented more, and items of a list that are not.
    Span blockAt(std::size_t first, std::size_t limit) const {
        const std::size_t indent = parsed_[first].indent;
        Span block{first, first + 1};
        for (std::size_t at = first + 1; at < limit; ++at) {
            const YamlLine& line = parsed_[at];
            const bool isItem = line.text.starts_with('-');
            if (line.text.empty()) {
                continue;
            }
            if (line.indent < indent || (line.indent == indent && !isItem)) {
                break;
            }
            block.end = at + 1;
        }
        return block;
    }

    /// @param parent the line of the mapping's key; none for the whole file
    std::optional<Span> childOf(const Span& within, std::optional<std::size_t> parent,
                                const std::string& key) const {
        if (parent && !parsed_[*parent].value.empty()) {
            refuseYaml(lines_[*parent]);
        }
        std::optional<Span> found;
        std::optional<std::size_t> indent;
        for (std::size_t at = parent ? *parent + 1 : within.first; at < within.end; ++at) {
            const YamlLine& line = parsed_[at];
            if (line.text.empty()) {
                continue;
            }
            const bool isListInstead = parent && !indent && line.text.starts_with('-');
            indent = indent.value_or(line.indent);
            if (line.indent < *indent || isListInstead) {
                refuseYaml(lines_[at]);
            }
            if (line.indent == *indent && line.key == key) {
                if (found) {
                    throw CannotKeep("the file says " + inQuotes(key) + " more than once");
                }
                found = blockAt(at, within.end);
            }
        }
        return found;
    }

    /// The words of a list and its items, without quotes and brackets.
    std::vector<Word> wordsIn(const Span& list) const {
        std::vector<Word> words;
        for (std::size_t at = list.first; at < list.end; ++at) {
            const Word whole =
                at == list.first ? valueOf(at) : Word{at, parsed_[at].indent, parsed_[at].text};
            std::size_t begin = 0;
            while ((begin = whole.text.find_first_not_of(kBetweenWords, begin)) != std::string::npos) {
                const std::size_t end =
                    std::min(whole.text.find_first_of(kBetweenWords, begin), whole.text.size());
                const std::string word = whole.text.substr(begin, end - begin);
                words.push_back({at, whole.column + begin, word.substr(0, word.find_last_not_of(':') + 1)});
                begin = end;
            }
        }
        return words;
    }

    std::optional<Word> firstIn(const Span& list, bool isIpv6) const {
        for (const Word& word : wordsIn(list)) {
            const bool isLocal = word.text.starts_with("fe80:");
            if (word.text.find('/') != std::string::npos && addressIn(word.text, isIpv6) && !isLocal) {
                return word;
            }
        }
        return std::nullopt;
    }

    std::size_t itemIndent(const Span& list) const {
        for (std::size_t at = list.first + 1; at < list.end; ++at) {
            if (parsed_[at].text.starts_with('-')) {
                return parsed_[at].indent;
            }
        }
        return parsed_[list.first].indent + 2;
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
            for (std::size_t at = 0; at + 1 < item.size(); ++at) {
                const std::string& value = item[at + 1].text;
                isDefault = isDefault || (item[at].text == "to" &&
                                          (value == "default" || value == (isIpv6 ? "::/0" : "0.0.0.0/0")));
                isInOtherTable = isInOtherTable || (item[at].text == "table" && value != kMainTable);
                via = item[at].text == "via" ? std::optional(item[at + 1]) : via;
            }
            if (isDefault && !isInOtherTable && via && (isIpv6 ? keep::isIpv6 : isIpv4)(via->text) &&
                !found) {
                found = via;
            }
            item.clear();
        };
        for (const Word& word : wordsIn(routes)) {
            if (word.text == "-" && parsed_[word.line].indent == indent) {
                look();
            }
            item.push_back(word);
        }
        look();
        return found;
    }

    void replace(const Word& old, const std::string& value) {
        lines_[old.line].replace(old.column, old.text.size(), value);
        parsed_[old.line] = parsed(lines_[old.line]);
    }

    void insert(std::size_t place, const std::vector<std::string>& lines) {
        for (std::size_t at = 0; at < lines.size(); ++at) {
            lines_.insert(lines_.begin() + static_cast<std::ptrdiff_t>(place + at), lines[at]);
            parsed_.insert(parsed_.begin() + static_cast<std::ptrdiff_t>(place + at), parsed(lines[at]));
        }
    }

    void addToList(const std::string& id, const std::optional<Span>& list, const std::string& value) {
        if (!list) {
            add(id, {"addresses: [" + value + "]"});
            return;
        }
        const std::string& told = parsed_[list->first].value;
        if (told.empty()) {
            insert(list->end, {std::string(itemIndent(*list), ' ') + "- " + value});
        } else if (told.ends_with(']')) {
            const bool isEmpty = wordsIn(*list).empty();
            replace(valueOf(list->first),
                    told.substr(0, told.size() - 1) + (isEmpty ? "" : ", ") + value + "]");
        } else {
            refuseYaml(lines_[list->first]);
        }
    }

    /// To the end of the interface.
    void add(const std::string& id, const std::vector<std::string>& lines) {
        const Span place = *find(id);
        std::string indent(parsed_[place.first].indent + 2, ' ');
        for (std::size_t at = place.first + 1; at < place.end; ++at) {
            if (!parsed_[at].text.empty()) {
                indent = std::string(parsed_[at].indent, ' ');
                break;
            }
        }
        std::vector<std::string> indented = lines;
        std::ranges::for_each(indented, [&indent](std::string& line) { line.insert(0, indent); });
        insert(place.end, indented);
    }

    std::vector<std::string> lines_;
    std::vector<YamlLine> parsed_;
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

}  // namespace

bool definesInNetplan(const std::string& text, const std::string& id) {
    return NetplanFile(text).find(id).has_value();
}

std::string editedNetplan(const std::string& text, const std::string& id, const Wish& wish) {
    check(wish);
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
    }
    setFamily(file, id, wasByDhcp && !file.isByDhcp(id) ? wish.ipv4.behindDhcp() : wish.ipv4, false);
    setFamily(file, id, wish.ipv6, true);
    if (wish.dhcp && *wish.dhcp == file.hasAddress(id)) {
        throw CannotKeep(*wish.dhcp ? "the file has a fixed address" : "no address would be left");
    }
    return joined(file.lines(), text);
}

}  // namespace cvagent::keep
