#include "network/link_queries.h"

#include <unistd.h>

#include "mi/command.h"
#include "mi/log.h"
#include "mi/text.h"
#include "network/interface_lists.h"
#include "network/link_parse.h"

namespace IC {

namespace {

/// First line of an `ethtool` pipeline, which all report a shell that cannot be started in the same words.
std::optional<std::string> ethtoolLine(const Command& command) {
    const FirstLine answer = firstLine(command);
    if (!answer.started) {
        log(kError) << "NetworkPort getProperty - ethtool error";
    }
    return answer.line;
}

bool isMiiStatusUp(const std::string& bond) {
    const FirstLine status = firstLine(HostCommand::fromText(
        textCommand("cat /proc/net/bonding/%s 2> /dev/null | grep \"MII Status:\"", bond)));
    if (!status.started) {
        log(kError) << "isNICUp - cat /proc/net/bonding/bond* error";
    }
    return status.line && parse::isMiiUp(*status.line);
}

/// Counts how deep a thread is in asking members of bonds. The kernel nests no bonds, but what is read as a
/// bond's file may name the bond itself as its member.
class BondDepth {
public:
    BondDepth() { ++depth; }
    BondDepth(const BondDepth&) = delete;
    BondDepth& operator=(const BondDepth&) = delete;
    ~BondDepth() { --depth; }

    static bool isTooDeep() {
        constexpr int kDeepest = 4;
        return depth > kDeepest;
    }

private:
    static thread_local int depth;
};

thread_local int BondDepth::depth = 0;

bool areMembersUp(const std::string& bond) {
    const BondDepth level;
    if (BondDepth::isTooDeep()) {
        return false;
    }
    HostCommand lines = bondMemberLines(bond);
    if (!lines.started()) {
        log(kError) << "isNICUp - grepping slave device error";
        return false;
    }
    bool any = false;
    while (const auto line = lines.nextLine()) {
        if (!isNICUp(parse::bondMemberToProbe(*line))) {
            return false;
        }
        any = true;
    }
    return any;
}

}  // namespace

bool getNetworkSpeed(const std::string& name, unsigned long long& speed) {
    const LogScope scope;
    const auto line = ethtoolLine(formatCommand(
        "ethtool %s 2> /dev/null | grep Speed | tr -s ' ' | cut -d ' ' -f2 2> /dev/null", name));
    if (line) {
        speed = parse::networkSpeed(*line);
    }
    return line.has_value();
}

bool getNetworkDuplex(const std::string& name) {
    const LogScope scope;
    const auto line = ethtoolLine(formatCommand("ethtool %s 2> /dev/null | grep Duplex", name));
    return line && parse::isFullDuplex(*line);
}

bool getAutoSense(const std::string& name) {
    const LogScope scope;
    const auto line = ethtoolLine(formatCommand("ethtool %s 2> /dev/null | grep Auto-negotiation", name));
    return line && parse::isAutoSense(*line);
}

void getHardwareAddress(std::string name, std::string& address) {
    const LogScope scope;
    const FirstLine answer =
        firstLine(formatCommand("ifconfig %s 2> /dev/null |grep HWaddr |awk '{print $5}'"
                                "|tr '[A-Z]' '[a-z]' 2> /dev/null",
                                name));
    if (!answer.started) {
        log(kProgress) << "getHardwareAddress: Can not get Hardware Address for SLES machine";
        return;
    }
    address = trimEnd(answer.line.value_or(""));
}

bool isInterfaceUP(std::string name) {
    const LogScope scope;
    // The blank at the end is nothing to the shell: the name is looked for anywhere in the lines, and eth1
    // finds eth10. A bond's aliases (bond0:1) are found by their bond's name this way.
    const auto command = ifconfigSnapshot.isOurs() && access(ifconfigSnapshotPath, R_OK) == 0
                             ? formatCommand("cat %s | grep %s ", ifconfigSnapshotPath, name)
                             : formatCommand("ifconfig | grep %s ", name);
    return firstLine(command).line.has_value();
}

bool isNICUp(std::string name) {
    const LogScope scope;
    if (contains(name, "bond")) {
        return isMiiStatusUp(name) && areMembersUp(name);
    }
    const FirstLine answer = firstLine(
        HostCommand::fromText(textCommand("ethtool %s 2> /dev/null | grep \"Link detected\"", name)));
    if (!answer.started) {
        log(kError) << "isNICUp - ethtool error";
    }
    if (!answer.line) {
        return false;
    }
    log(kProgress) << "buffer = " << *answer.line;
    return parse::isLinkDetected(*answer.line);
}

}  // namespace IC
