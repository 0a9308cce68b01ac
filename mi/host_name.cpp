#include "mi/host_name.h"

#include <utility>

#include "mi/command.h"
#include "mi/line_file.h"
#include "mi/log.h"
#include "mi/node_tree.h"
#include "mi/text.h"

namespace IC {

namespace {

constexpr char kHostsFile[] = "/etc/hosts";
constexpr char kHostNameFile[] = "/etc/HOSTNAME";
/// Where a host without a fixed address finds its own full name.
constexpr char kOwnLoopback[] = "127.0.0.2";

/// The first line a `hostname` command prints, line break included, is kept unless the tool could not tell.
void updateName(const Command& command, std::string& name) {
    HostCommand asked(command);
    const auto line = asked.nextLine();
    if (line && !contains(*line, "Unknown")) {
        name = *line;
    }
}

bool setRunningName(const std::string& hostName, const std::string& domainName) {
    const auto command = domainName.empty() ? formatCommand("hostname %s", hostName)
                                            : formatCommand("hostname %s.%s", hostName, domainName);
    log(kProgress) << "command: " << command.shown();
    if (!HostCommand(command).started()) {
        log(kError) << "Could not set HostName !!";
        return false;
    }
    return true;
}

/// Moves the host's entry to the end of /etc/hosts. A comment that mentions the address goes with the entry.
bool replaceHostsEntry(const std::string& address, const std::string& hostName, const std::string& fullName) {
    auto hosts = LineFile::read(kHostsFile);
    if (!hosts) {
        log(kError) << "Can not open '/etc/hosts' in Read mode.";
        return false;
    }
    hosts->rewrite([&](const std::string& line) {
        const bool own = contains(line, address) || contains(line, kOwnLoopback);
        return own ? LineFile::Fate::drop : LineFile::Fate::keep;
    });
    hosts->append(address + '\t' + fullName + '\t' + hostName + '\n');
    if (!hosts->write(kHostsFile)) {
        log(kError) << "Can not open '/etc/hosts' in write mode.";
        return false;
    }
    return true;
}

}  // namespace

void NodeTree::updateHostAndDomainName() {
    const LogScope scope;
    updateName("hostname -s 2> /dev/null", hostName);
    updateName("hostname -d 2> /dev/null", domainName);
}

void executeDomainandHostnameChanges(std::string hostName, std::string domainName, bool operation,
                                     std::string ipAddress) {
    const LogScope scope;
    log(kProgress) << "HostName : " << hostName;
    log(kProgress) << "DomainName : " << domainName;
    log(kProgress) << "Operation : " << operation;
    log(kProgress) << "IPAddress : " << ipAddress;
    if (!setRunningName(hostName, domainName)) {
        return;
    }
    const std::string address = ipAddress.empty() ? kOwnLoopback : std::move(ipAddress);
    const std::string host = trimEnd(std::move(hostName));
    // Without a domain the full name ends in a lone dot; readers of both files have always seen it so.
    const std::string fullName = host + '.' + trimEnd(std::move(domainName));
    if (!replaceHostsEntry(address, host, fullName)) {
        return;
    }
    LineFile hostNameFile;
    hostNameFile.append(fullName);
    hostNameFile.write(kHostNameFile);
}

}  // namespace IC
