#include "network/routes_file.h"

#include <algorithm>

#include "mi/line_file.h"
#include "mi/text.h"
#include "network/route_queries.h"

namespace IC {

namespace {

constexpr char kRoutes[] = "/etc/sysconfig/network/routes";

bool isComment(const std::string& line) {
    return contains(line, "#");
}

}  // namespace

RoutesRewrite replaceDefaultRoute(AddressFamily family, const std::string& gateway) {
    auto file = LineFile::read(kRoutes);
    if (!file) {
        return RoutesRewrite::notRead;
    }
    const bool isIPv6 = family == AddressFamily::ipv6;
    if (!std::ranges::all_of(file->lines(), isComment)) {
        file->rewrite([&](const std::string& line) {
            const bool stays = isComment(line) || isIPv6GatewayAddressPresent(line) != isIPv6;
            return stays ? LineFile::Fate::keep : LineFile::Fate::drop;
        });
    } else {
        file->clear();  // hosts come with a file of comments alone: it counts as empty, as it always has
    }
    const std::string route = "default\t" + gateway + "\t-\n";
    isIPv6 ? file->append(route) : file->prepend(route);
    return file->write(kRoutes) ? RoutesRewrite::written : RoutesRewrite::notWritten;
}

}  // namespace IC
