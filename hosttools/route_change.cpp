#include "hosttools/route_change.h"

#include <net/route.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <cerrno>
#include <cstring>
#include <string>

#include "hosttools/addresses.h"
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
        const std::string_view kind = words_.empty() ? "" : words_.front();
        setAddress(change.entry.rt_genmask, {});
        if (kind == "default") return readAddress(change.entry.rt_dst);
        if (kind != "-host" && kind != "-net") return refuse();
        take();
        if (kind == "-host") {
            change.entry.rt_flags |= RTF_HOST;
            setAddress(change.entry.rt_genmask, {INADDR_NONE});
        }
        return readAddress(change.entry.rt_dst);
    }
    bool readDetail(Change& change) {
        const std::string_view word = take();
        if (word == "gw") {
            change.entry.rt_flags |= RTF_GATEWAY;
            return readAddress(change.entry.rt_gateway);
        }
        if (word == "netmask" && !(change.entry.rt_flags & RTF_HOST))
            return readAddress(change.entry.rt_genmask);
        if (word == "metric") return readMetric(change.entry.rt_metric);
        if (!change.interface.empty() || (word == "dev" && words_.empty())) return refuse();
        change.interface = word == "dev" ? take() : word;
        return true;
    }
    bool readAddress(sockaddr& place) {
        if (words_.empty()) return refuse();
        const char* word = take();
        in_addr address{};
        if (!parseInet(word, address)) {
            answer_.complain(toolName, Text().add("resolving ").add(word));
            return false;
        }
        setAddress(place, address);
        return true;
    }
    bool readMetric(short& metric) {
        const auto number = words_.empty() ? std::nullopt : parseNumber(take());
        if (!number || *number > 32766) return refuse();
        // The call counts from 1, 0 being "none given".
        metric = static_cast<short>(*number + 1);
        return true;
    }
    const char* take() {
        const char* word = words_.front();
        words_ = words_.subspan(1);
        return word;
    }
    bool refuse() {
        answer_.complain(
            toolName,
            "cannot be read: add|del -host A|-net A netmask M|default [gw G] [metric N] [[dev] INTERFACE]");
        return false;
    }

    Arguments words_;
    Answer& answer_;
};

}  // namespace

int changeRoute(Arguments words, Answer& answer) {
    const std::string_view verb = words.front();
    Change change;
    if (verb != "add" && verb != "del") {
        answer.complain(toolName, Text().add("neither add nor del: ").add(verb));
        return 1;
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
