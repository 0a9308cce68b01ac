#include "hosttools/route_change.h"

#include <net/if.h>
#include <net/route.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <algorithm>
#include <cerrno>
#include <cstring>
#include <set>
#include <string>

#include "hosttools/addresses.h"
#include "hosttools/descriptor.h"
#include "hosttools/files.h"
#include "hosttools/text.h"

namespace hosttools {
namespace {

constexpr const char* toolName = "route";

/// What the words ask for.
struct Change {
    rtentry entry{};
    std::string interface;
};

/// What the classic tool knows besides. Anything else is the name of an interface.
constexpr std::string_view otherWords[] = {"reject", "mod",  "dyn",      "reinstate", "mss",
                                           "window", "irtt", "hopcount", "tunnel",    "scope"};

void setAddress(sockaddr& place, in_addr value) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr = value;
    std::memcpy(&place, &address, sizeof address);
}

/// Walks the words behind "add" or "del".
class Reader {
public:
    Reader(Arguments words, Answer& answer) : words_(words), answer_(answer) {}

    bool read(Change& change) {
        if (!readTarget(change)) return false;
        while (!words_.empty()) {
            if (!readDetail(change)) return false;
        }
        return true;
    }

private:
    bool readTarget(Change& change) {
        change.entry.rt_flags = RTF_UP;
        const std::string_view kind = firstOf(words_);
        setAddress(change.entry.rt_genmask, {});
        if (kind == "default") return readAddress(change.entry.rt_dst);
        if (kind.empty()) return refuse("add or del of which route?");
        if (kind != "-host" && kind != "-net") return leaveToHost(kind);
        take();
        if (kind == "-host") {
            change.entry.rt_flags |= RTF_HOST;
            setAddress(change.entry.rt_genmask, {INADDR_NONE});
        }
        return readAddress(change.entry.rt_dst);
    }
    bool readDetail(Change& change) {
        const std::string_view word = take();
        const bool named = word == "gw" || word == "netmask" || word == "metric" || word == "dev";
        const bool isOther = std::ranges::find(otherWords, word) != std::end(otherWords);
        if (isOther || word.starts_with('-')) return leaveToHost(word);
        const std::string_view kind = named ? word : "dev";
        if (!seen_.insert(kind).second) return refuse(Text().add(kind).add(" is given twice"));
        if (named && words_.empty()) return refuse(Text().add(word).add(" needs a word behind it"));
        if (kind == "dev") return readInterface(named ? take() : word, change.interface);
        return readNamed(word, change.entry);
    }
    bool readNamed(std::string_view word, rtentry& entry) {
        if (word == "metric") return readMetric(entry.rt_metric);
        if (word == "gw") {
            entry.rt_flags |= RTF_GATEWAY;
            return readAddress(entry.rt_gateway);
        }
        if ((entry.rt_flags & RTF_HOST) != 0) return refuse("a route to a host has no netmask");
        return readAddress(entry.rt_genmask);
    }
    bool readInterface(std::string_view word, std::string& interface) {
        // The call would take the beginning of a longer name for the whole.
        if (word.empty() || word.size() >= IFNAMSIZ) {
            return refuse(Text().add("no name of an interface: '").add(word).add("'"));
        }
        interface = word;
        return true;
    }
    bool readAddress(sockaddr& place) {
        if (words_.empty()) return refuse("an address is missing");
        const char* word = take();
        in_addr address{};
        // Names of hosts and networks, and 10.0.0.0/8.
        if (!parseInet(word, address))
            return *word == '\0' ? refuse("an empty word is no address") : leaveToHost(word);
        setAddress(place, address);
        return true;
    }
    bool readMetric(short& metric) {
        constexpr unsigned most = 32766;
        const std::string_view word = take();
        const auto number = parseNumber(word);
        const bool isNumber = !word.empty() && word.find_first_not_of("0123456789") == word.npos;
        if (!isNumber || !number || *number > most)
            return refuse(Text().add("no metric: '").add(word).add("'"));
        // The call counts from 1, 0 being "none given".
        metric = static_cast<short>(*number + 1);
        return true;
    }
    const char* take() {
        const char* word = words_.front();
        words_ = words_.subspan(1);
        return word;
    }
    bool leaveToHost(std::string_view word) {
        answer_.leaveToHost(toolName, word);
        return false;
    }
    bool refuse(std::string_view message) {
        answer_.complain(toolName, message);
        return false;
    }

    Arguments words_;
    Answer& answer_;
    std::set<std::string_view> seen_;
};

}  // namespace

int changeRoute(Arguments words, Answer& answer) {
    const std::string_view verb = words.front();
    Change change;
    if (verb != "add" && verb != "del") {
        return answer.leaveToHost(toolName, verb);
    }
    if (!Reader(words.subspan(1), answer).read(change)) return 1;
    if (!change.interface.empty()) change.entry.rt_dev = change.interface.data();
    const bool add = verb == "add";
    const Descriptor socket(::socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    if (ioctl(socket.get(), add ? SIOCADDRT : SIOCDELRT, &change.entry) == 0) return 0;
    answer.complain(toolName, Text().add(add ? "SIOCADDRT: " : "SIOCDELRT: ").add(std::strerror(errno)));
    return 1;
}

}  // namespace hosttools
