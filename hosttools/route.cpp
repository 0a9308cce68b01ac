#include <cerrno>
#include <cstring>

#include "hosttools/applet.h"
#include "hosttools/files.h"
#include "hosttools/route_change.h"
#include "hosttools/route_listing.h"

namespace hosttools {
namespace {

constexpr const char* toolName = "route";

struct Request {
    bool numeric = false;
    bool inet6 = false;
};

/// Takes the options off the front. @return whether all of them are known
bool readOptions(Arguments& words, Request& request) {
    for (; !words.empty() && *words.front() == '-'; words = words.subspan(1)) {
        const std::string_view option = words.front();
        if (option == "-n") {
            request.numeric = true;
        } else if (option == "-6" || option == "-4") {
            request.inet6 = option == "-6";
        } else if (option == "-A" && words.size() > 1) {
            words = words.subspan(1);
            const std::string_view family = words.front();
            if (family != "inet" && family != "inet6") return false;
            request.inet6 = family == "inet6";
        } else {
            return false;
        }
    }
    return true;
}

int list(const char* path, Text (*listing)(std::string_view), Answer& answer) {
    const auto content = readFile(path);
    if (!content) {
        answer.complain(toolName, Text().add("can't open '").add(path).add("': ").add(std::strerror(errno)));
        return 1;
    }
    answer.out = listing(*content);
    return 0;
}

}  // namespace

int runRoute(Arguments arguments, Host&, Answer& answer) {
    Request request;
    Arguments words = arguments;
    const bool known = readOptions(words, request);
    if (known && !words.empty() && !request.inet6) return changeRoute(words, answer);
    // Without -n names would be looked up.
    if (!known || !words.empty() || !request.numeric) {
        return answer.leaveToHost(toolName, words.empty() ? "a listing with names" : words.front());
    }
    return request.inet6 ? list("/proc/net/ipv6_route", listInet6Routes, answer)
                         : list("/proc/net/route", listRoutes, answer);
}

}  // namespace hosttools
