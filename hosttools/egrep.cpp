#include <algorithm>
#include <cerrno>
#include <cstring>

#include "hosttools/applet.h"
#include "hosttools/files.h"
#include "hosttools/wired.h"

namespace hosttools {
namespace {

constexpr const char* toolName = "egrep";
constexpr std::string_view listing[] = {"eth|bond|usb", "/proc/net/dev"};
constexpr const char* sysfs = "/sys/class/net";

// As of grep.
constexpr int nothingFound = 1;
constexpr int failed = 2;

}  // namespace

int runEgrep(Arguments arguments, Host& host, Answer& answer) {
    if (!std::ranges::equal(arguments, listing, {},
                            [](const char* word) { return std::string_view(word); })) {
        answer.leaveToHost(toolName, firstOf(arguments));
        return failed;
    }
    const auto devices = readFile(listing[1].data());
    if (!devices) {
        answer.complain(toolName, Text().add(listing[1]).add(": ").add(std::strerror(errno)));
        return failed;
    }
    std::shared_ptr<const Interfaces> known;
    if (host.interfaces({}, known) != 0) known = std::make_shared<Interfaces>();
    answer.out.add(wiredLines(*devices, sysfs, *known));
    return answer.out.size() > 0 ? 0 : nothingFound;
}

bool haveClassicNames() {
    const auto devices = readFile(listing[1].data());
    Interfaces known;
    if (readInterfaces({}, known) != 0) known = {};
    return !devices || haveClassicNames(*devices, sysfs, known);
}

}  // namespace hosttools
