#include "agent/change/interface_settings.h"

#include <algorithm>
#include <iterator>
#include <sstream>

#include "agent/core/host_file.h"
#include "framework/qx/whole_number.h"

namespace cvagent::change {

namespace {

constexpr unsigned kMostBits = 128;

struct Key {
    const char* name;
    std::string InterfaceSettings::*value;
};
constexpr Key kKeys[] = {{"BOOTPROTO", &InterfaceSettings::origin},
                         {"IPADDR", &InterfaceSettings::ipv4Address},
                         {"NETMASK", &InterfaceSettings::mask},
                         {"IPADDR_1", &InterfaceSettings::ipv6Address},
                         {"PREFIXLEN_1", &InterfaceSettings::prefixLength}};

std::string withoutQuotes(std::string text) {
    std::erase_if(text, [](char letter) { return letter == '\'' || letter == '"' || letter == '\r'; });
    return text.substr(0, text.find_last_not_of(" \t") + 1);
}

}  // namespace

std::string interfaceNameOf(const std::string& path) {
    const std::string last = path.substr(path.rfind('/') + 1);
    const std::size_t colon = last.find(':');
    const std::string name = colon == std::string::npos ? "" : last.substr(colon + 1);
    return name.find(':') == std::string::npos ? name : "";
}

std::string interfaceNameOf(const IC::MutableNode& node) {
    return interfaceNameOf(node.getPath());
}

InterfaceSettings settingsOf(const std::string& interface) {
    InterfaceSettings settings;
    const std::string hardware =
        interface.empty() ? "" : contentOf("/sys/class/net/" + interface + "/address").value_or("");
    if (hardware.empty()) {
        return settings;
    }
    const auto content =
        contentOf("/etc/sysconfig/network/ifcfg-eth-id-" + hardware.substr(0, hardware.find('\n')));
    settings.isThere = content.has_value();
    std::istringstream lines(content.value_or(""));
    for (std::string line; std::getline(lines, line);) {
        const std::size_t equals = std::min(line.find('='), line.size());
        const auto* key = std::ranges::find(kKeys, line.substr(0, equals), &Key::name);
        if (key != std::end(kKeys) && equals < line.size()) {
            settings.*key->value = withoutQuotes(line.substr(equals + 1));
        }
    }
    return settings;
}

std::optional<unsigned> prefixLengthIn(const std::string& text) {
    const auto length = QX::wholeNumber<unsigned>(text);
    return length && *length >= 1 && *length <= kMostBits ? length : std::nullopt;
}

std::optional<unsigned> prefixIn(const InterfaceSettings& settings) {
    return prefixLengthIn(settings.prefixLength);
}

bool isDefaultInRoutesFile(const std::string& gateway) {
    const std::string content = contentOf("/etc/sysconfig/network/routes").value_or("");
    return ("\n" + content + "\n").find("\ndefault\t" + gateway + "\t-\n") != std::string::npos;
}

}  // namespace cvagent::change
