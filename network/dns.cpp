#include "network/dns.h"

#include <algorithm>
#include <string_view>

#include "mi/line_file.h"
#include "mi/log.h"
#include "mi/text.h"
#include "network/ip_origin.h"
#include "network/network_builder.h"

namespace IC {

namespace {

using Fate = LineFile::Fate;

constexpr char kResolver[] = "/etc/resolv.conf";
constexpr char kNetconfig[] = "/etc/sysconfig/network/config";
constexpr char kServers[] = "nameserver";
constexpr char kSuffixes[] = "search";
constexpr char kPolicy[] = "NETCONFIG_DNS_POLICY=";

/// Six letters of the keyword are enough: a line with a misspelt one ("nameservers") is replaced, too, where
/// it would otherwise stay beside the new one.
bool isLineOf(const char* keyword, const std::string& line) {
    return line.starts_with(std::string_view(keyword).substr(0, 6));
}

std::string serverLine(const std::string& server) {
    return std::string(kServers) + ' ' + server + '\n';
}

void setServers(LineFile& file, const std::vector<std::string>& servers) {
    auto next = servers.begin();
    file.rewrite([&](std::string& line) {
        if (!isLineOf(kServers, line)) {
            return Fate::keep;
        }
        if (next == servers.end()) {
            return Fate::drop;
        }
        line = serverLine(*next++);
        return Fate::keep;
    });
    std::for_each(next, servers.end(), [&](const std::string& server) { file.append(serverLine(server)); });
}

void setSuffixes(LineFile& file, const std::vector<std::string>& suffixes) {
    std::string wanted = kSuffixes;
    for (const std::string& suffix : suffixes) {
        wanted += ' ' + suffix;
    }
    wanted += '\n';
    bool seen = false;
    file.rewrite([&](std::string& line) {
        if (isLineOf(kSuffixes, line)) {
            line = wanted;
            seen = true;
        }
        return Fate::keep;
    });
    if (!seen) {
        file.append(wanted);
    }
}

void setPolicy(std::string& line, unsigned int origin) {
    if (origin == IPOrigin::fixed) {
        line = std::string(kPolicy) + "\"\"\n";
    } else if (origin == IPOrigin::dhcp) {
        line = std::string(kPolicy) + "\"auto\"\n";
    }
}

/// Appends what stands behind the keyword and its blank, split at every single blank. A keyword with nothing
/// behind it has no values.
/// @return whether the line holds the keyword
bool readValues(const std::string& line, const char* keyword, std::vector<std::string>& values) {
    const auto at = line.find(keyword);
    if (at == line.npos) {
        return false;
    }
    for (auto blank = line.find(' ', at); blank != line.npos;) {
        const auto next = line.find(' ', blank + 1);
        values.push_back(line.substr(blank + 1, next == line.npos ? next : next - blank - 1));
        blank = next;
    }
    return true;
}

void appendAll(std::string& text, const std::vector<std::string>& values) {
    for (const std::string& value : values) {
        text += value + ' ';
    }
}

}  // namespace

void executeDNSChanges(std::vector<std::string> values, bool servers) {
    const LogScope scope("executeDNSChanges: Entering", "executeDNSChanges: exit");
    log(kProgress) << "method: " << servers;
    auto file = LineFile::read(kResolver);
    if (!file) {
        log(kError) << "Can not open '/etc/resolv.conf' in read mode.";
        return;
    }
    servers ? setServers(*file, values) : setSuffixes(*file, values);
    if (!file->write(kResolver)) {
        log(kError) << "Can not open '/etc/resolv.conf' in write mode.";
    }
}

void disableNetConfigDNSPolicy(PropertyValue origin) {
    const LogScope scope("disableNetConfigDNSPolicy: Entering", "disableNetConfigDNSPolicy: exit");
    const unsigned int code = originCode(origin);
    log(kProgress) << "bootproto: " << code;
    auto file = LineFile::read(kNetconfig);
    if (!file) {
        return;
    }
    bool found = false;
    file->rewrite([&](std::string& line) {
        if (contains(line, kPolicy)) {
            setPolicy(line, code);
            log(kProgress) << "buffer: " << line;
            log(kProgress) << "DHCP: " << EnumValue(IPOrigin::dhcp);
            log(kProgress) << "Static: " << EnumValue(IPOrigin::fixed);
            found = true;
        }
        return Fate::keep;
    });
    if (found) {
        file->write(kNetconfig);
    }
}

void getDNSDetails(std::vector<std::string>& servers, std::vector<std::string>& suffixes) {
    const LogScope scope;
    const auto file = LineFile::read(kResolver);
    if (!file) {
        return;
    }
    for (const std::string& line : file->lines()) {
        const std::string text = trimEnd(line);
        if (!contains(text, "#") && !readValues(text, kServers, servers)) {
            readValues(text, kSuffixes, suffixes);
        }
    }
}

void NetworkBuilder::stringFormatForDNSServersAndSuffixes(std::string& servers, std::string& suffixes) {
    const LogScope scope;
    appendAll(servers, dnsServers_);
    appendAll(suffixes, dnsSuffixes_);
}

}  // namespace IC
