#include "agent/keep/stanza_editor.h"

#include <algorithm>
#include <array>

#include "agent/core/text.h"
#include "agent/keep/interfaces_file.h"

namespace cvagent::keep {

namespace {

constexpr unsigned kBits[] = {32, 128};

class StanzaEditor {
public:
    StanzaEditor(std::vector<std::string>& lines, const std::string& name, bool isIpv6)
        : lines_(lines), isIpv6_(isIpv6), family_(isIpv6 ? "inet6" : "inet") {
        std::vector<Stanza> found = stanzasIn(lines);
        std::erase_if(found, [&](const Stanza& each) { return each.name != name || each.family != family_; });
        if (found.size() != 1) {
            throw CannotKeep(std::string(found.empty() ? "no" : "more than one") + " stanza of " +
                             inQuotes(name) + " for " + family_);
        }
        stanza_ = found[0];
        if (stanza_.inherits) {
            throw CannotKeep("parts of the stanza of " + inQuotes(name) + " stand elsewhere");
        }
        if (lines[stanza_.end - 1].ends_with('\\')) {
            throw CannotKeep("the file ends in the middle of a line of the stanza of " + inQuotes(name));
        }
    }

    bool isByDhcp() const { return stanza_.method == "dhcp"; }

    void setOrigin(bool dhcp) {
        const std::string method = dhcp ? "dhcp" : "static";
        if (stanza_.method == method) {
            return;
        }
        if (stanza_.method != "dhcp" && stanza_.method != "static") {
            throw CannotKeep("the stanza's method is " + inQuotes(stanza_.method));
        }
        replaceMethod(method);
        if (dhcp) {
            for (const char* option : {"address", "netmask", "broadcast", "network", "gateway"}) {
                drop(option);
            }
        }
    }

    void setAddress(const FamilyWish& wish) {
        if (wish.isEmpty()) {
            return;
        }
        if (stanza_.method != "static") {
            throw CannotKeep("the stanza's method is " + inQuotes(stanza_.method) + ", not static");
        }
        if (wish.address || wish.prefix) {
            writeAddress(wish);
        }
        if (wish.gateway) {
            write("gateway", *wish.gateway);
        }
    }

    void writeList(const char* option, const std::vector<std::string>& words) {
        write(option, joinedWords(words));
    }

    /// A stanza that is static needs an address.
    void finish() const {
        if (stanza_.method == "static" && valueOf("address").empty()) {
            throw CannotKeep("the stanza has no address, and none is to be written");
        }
    }

private:
    /// The line of an option; the stanza's end for none.
    std::size_t lineOf(const std::string& option) const {
        std::size_t found = stanza_.end;
        bool isRest = false;
        for (std::size_t number = stanza_.first + 1; number < stanza_.end; ++number) {
            const std::string keyword = isRest ? "" : keywordOf(lines_[number]);
            const bool goesOn = lines_[number].ends_with('\\');
            isRest = goesOn && (isRest || !keyword.empty());
            if (keyword != option) {
                continue;
            }
            if (found != stanza_.end || goesOn) {
                throw CannotKeep("the stanza's option " + option + " is not one line");
            }
            found = number;
        }
        return found;
    }

    std::string valueOf(const std::string& option) const {
        const std::size_t line = lineOf(option);
        if (line == stanza_.end) {
            return "";
        }
        std::vector<std::string> words = wordsOf(lines_[line]);
        words.erase(words.begin());
        return joinedWords(words);
    }

    void writeAddress(const FamilyWish& wish) {
        const std::string told = valueOf("address");
        const auto old = addressIn(told, isIpv6_);
        if (!old && !told.empty()) {
            throw CannotKeep("the stanza's address " + inQuotes(told) + " is not understood");
        }
        const std::string mask = valueOf("netmask");
        const auto apart = prefixOf(mask, kBits[isIpv6_ ? 1 : 0]);
        const auto known = old && old->prefix ? old->prefix : apart;
        const auto prefix = wish.prefix ? wish.prefix : (known ? known : wish.likelyPrefix);
        const std::string address = wish.address.value_or(old ? old->address : "");
        if (!prefix || address.empty()) {
            throw CannotKeep(address.empty() ? "the stanza has no address"
                                             : "no mask or prefix length of the address is known");
        }
        const bool isApart = apart && !(old && old->prefix);
        if (apart) {
            const bool isDotted = mask.find('.') != std::string::npos;
            write("netmask", isDotted ? maskOf(*prefix) : std::to_string(*prefix));
        }
        write("address", isApart ? address : address + "/" + std::to_string(*prefix));
        // They follow from the address, and would be those of the old one.
        drop("broadcast");
        drop("network");
    }

    void replaceMethod(const std::string& method) {
        std::string& head = lines_[stanza_.first];
        const std::size_t end = head.find_last_not_of(" \t\r") + 1;
        const std::size_t begin = head.find_last_of(" \t", end - 1) + 1;
        constexpr std::size_t kWords = 4;  // "iface eth0 inet static"
        if (wordsOf(head).size() != kWords || head.substr(begin, end - begin) != stanza_.method) {
            throw CannotKeep("the stanza's first line is not understood");
        }
        head.replace(begin, end - begin, method);
        stanza_.method = method;
    }

    /// An option that has this value already keeps its line as it is.
    void write(const std::string& option, const std::string& value) {
        const std::size_t line = lineOf(option);
        if (valueOf(option) == value) {
            return;
        }
        if (value.empty()) {
            drop(option);
        } else if (line == stanza_.end) {
            lines_.insert(lines_.begin() + static_cast<std::ptrdiff_t>(stanza_.end),
                          indentation() + option + " " + value);
            ++stanza_.end;
        } else {
            const std::size_t word = lines_[line].find(option);
            const std::size_t blank = lines_[line].find_first_not_of(" \t\v\f\r", word + option.size());
            lines_[line] = lines_[line].substr(0, std::min(blank, lines_[line].size()));
            lines_[line] += (blank == std::string::npos ? " " : "") + value;
        }
    }

    void drop(const std::string& option) {
        const std::size_t line = lineOf(option);
        if (line != stanza_.end) {
            lines_.erase(lines_.begin() + static_cast<std::ptrdiff_t>(line));
            --stanza_.end;
        }
    }

    /// That of the stanza's first option.
    std::string indentation() const {
        for (std::size_t number = stanza_.first + 1; number < stanza_.end; ++number) {
            if (!keywordOf(lines_[number]).empty()) {
                return lines_[number].substr(0, lines_[number].find_first_not_of(" \t"));
            }
        }
        return "    ";
    }

    std::vector<std::string>& lines_;
    bool isIpv6_;
    std::string family_;
    Stanza stanza_;
};

void setIpv4(std::vector<std::string>& lines, const std::string& name, const Wish& wish) {
    StanzaEditor editor(lines, name, false);
    const bool wasByDhcp = editor.isByDhcp();
    if (wish.dhcp) {
        editor.setOrigin(*wish.dhcp);
    }
    editor.setAddress(wasByDhcp && !editor.isByDhcp() ? wish.ipv4.behindDhcp() : wish.ipv4);
    if (wish.nameServers) {
        editor.writeList("dns-nameservers", *wish.nameServers);
    }
    if (wish.searchDomains) {
        editor.writeList("dns-search", *wish.searchDomains);
    }
    editor.finish();
}

}  // namespace

std::string editedStanza(const std::string& text, const std::string& name, const Wish& wish) {
    check(wish);
    std::vector<std::string> lines = splitLines(text);
    if (wish.dhcp || !wish.ipv4.isEmpty() || wish.nameServers || wish.searchDomains) {
        setIpv4(lines, name, wish);
    }
    if (!wish.ipv6.isEmpty()) {
        StanzaEditor editor(lines, name, true);
        editor.setAddress(wish.ipv6);
        editor.finish();
    }
    return joined(lines, text);
}

}  // namespace cvagent::keep
