#include "network/link_parse.h"

#include <algorithm>
#include <cstdint>
#include <limits>
#include <string_view>

#include "mi/text.h"

namespace IC::parse {

namespace {

constexpr std::string_view kSlaveLabel = "Slave Interface:";

/// `line` without the label of a bond's member and the rest of its first `length` characters. A line
/// without the label, the tail of one that did not fit the line buffer, stays.
std::string withoutSlaveLabel(std::string line, std::size_t length) {
    if (const auto label = line.find(kSlaveLabel); label != line.npos) {
        line.erase(0, label + length);
    }
    return line;
}

}  // namespace

int leadingNumber(const std::string& text) {
    return static_cast<int>(std::clamp<long long>(leadingDecimal(text), std::numeric_limits<int>::min(),
                                                  std::numeric_limits<int>::max()));
}

unsigned long long networkSpeed(const std::string& line) {
    // 32 bits, sign-extended, as the value has always reached its readers: from 2147484Mb/s it wraps.
    const auto kilobits = static_cast<std::uint32_t>(leadingNumber(line)) * std::uint32_t{1000};
    return static_cast<unsigned long long>(static_cast<std::int32_t>(kilobits));
}

bool isFullDuplex(const std::string& line) {
    return contains(line, "Full");
}

bool isAutoSense(const std::string& line) {
    // The label itself ("Auto-negotiation") holds the letters, so "off" counts too. Readers of the property
    // know it as "the driver can negotiate"; looking at the value alone would turn ports over to "no".
    return contains(line, "on");
}

bool isLinkDetected(const std::string& line) {
    return contains(line, "yes");
}

bool isMiiUp(const std::string& line) {
    return contains(line, "up");
}

// The two readers of a bond's member lines differ by the blank behind the label: this one goes into a
// command, where one more blank is nothing, the other one is compared with interface names.

std::string bondMemberToProbe(const std::string& line) {
    return trimEnd(withoutSlaveLabel(line, kSlaveLabel.size()));
}

std::string bondMember(const std::string& line) {
    return trimEnd(trimEnd(withoutSlaveLabel(line, kSlaveLabel.size() + 1)), ' ');
}

NICName nicName(const std::string& line) {
    const bool ofBridge = contains(line, "br");
    const auto colon = line.rfind(':');
    const auto end = ofBridge && colon == line.npos ? line.find('\t') : colon;
    return {trimEnd(line.substr(0, end)), ofBridge};
}

std::string bridgeMember(const std::string& line) {
    return trimEnd(trimStart(trimStart(line, ' '), '\t'));
}

}  // namespace IC::parse
