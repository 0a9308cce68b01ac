#include "agent/core/oshw/start_facts.h"

#include <strings.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "agent/core/catalogue.h"
#include "framework/qx/whole_number.h"

namespace cvagent::oshw {

namespace {

constexpr unsigned int kLinkNameId = 108;
constexpr unsigned int kSupportedSpeed = 38;
constexpr unsigned int kDhcpServers = 93;
constexpr unsigned int kPortType = 185;

/// The lines that a command prints, without their ends, until one is the answer. Of a line that does not end
/// no more is kept than any answer has.
void readLines(const std::string& command, const std::function<bool(const std::string& line)>& isAnswer) {
    constexpr std::size_t kLongest = 65536;
    struct Close {
        void operator()(FILE* pipe) const { pclose(pipe); }
    };
    const std::unique_ptr<FILE, Close> pipe(popen(command.c_str(), "r"));
    std::array<char, 1024> part{};
    std::string line;
    while (pipe && std::fgets(part.data(), part.size(), pipe.get()) != nullptr) {
        line += part.data();
        if (line.ends_with('\n') || line.size() > kLongest) {
            if (isAnswer(line.substr(0, line.find('\n')))) {
                return;
            }
            line.clear();
        }
    }
    if (!line.empty()) {
        isAnswer(line);
    }
}

std::optional<std::string> firstAnswerOf(const std::string& command) {
    std::optional<std::string> first;
    readLines(command, [&first](const std::string& line) {
        first = line;
        return true;
    });
    return first;
}

/// "1000baseT" of a port whose first mode is 1000baseT/Full.
std::string firstModeOfPort(const std::string& name) {
    const std::string mode =
        firstAnswerOf("ethtool " + name +
                      " 2> /dev/null | grep \"Supported link modes\" | tr -s ' ' | cut -d ' ' -f4")
            .value_or("");
    return mode.substr(0, mode.find('/'));
}

IC::PropertyValue supportedSpeedOf(const std::string& name) {
    const std::string mode = firstModeOfPort(name);
    const std::size_t digits = std::min(mode.find_first_not_of("0123456789"), mode.size());
    const auto speed = QX::wholeNumber<unsigned int>(mode.substr(0, digits));
    const bool isBaseT = mode.substr(digits).starts_with("baseT");
    return {IC::Number(isBaseT ? speed.value_or(0) : 0U), true};
}

/// A type's name is that of the mode, however it is written.
IC::PropertyValue portTypeOf(const std::string& name) {
    const std::string mode = firstModeOfPort(name);
    const Property* row = findProperty(static_cast<unsigned int>(NodeType::networkPort), kPortType);
    for (const Label& label : row->labels) {
        if (strcasecmp(label.text, mode.c_str()) == 0) {
            return {IC::Number(label.code), true};
        }
    }
    return {IC::Number(0U), true};
}

/// One line is of what the port can do, any other of what it does.
IC::PropertyValue magicPacket(const std::string& name, bool isSupport) {
    bool isTold = false;
    readLines("ethtool " + name + " 2> /dev/null | grep \"Wake-on\"", [&](const std::string& line) {
        isTold = (line.find("Supports Wake-on") != std::string::npos) == isSupport;
        return isTold;
    });
    return isTold ? IC::PropertyValue(std::vector<IC::Number>{3U}, true) : IC::PropertyValue();
}

IC::PropertyValue wakeOnLanSupportedOf(const std::string& name) {
    return magicPacket(name, true);
}

IC::PropertyValue wakeOnLanEnabledOf(const std::string& name) {
    return magicPacket(name, false);
}

/// The servers of both leases; the one of IPv6 is known by its identity, and by the first lease of any link.
IC::PropertyValue dhcpServersOf(const std::string& name) {
    std::vector<std::string> servers;
    if (auto server = firstAnswerOf("cat /var/lib/dhcpcd/dhcpcd-" + name +
                                    ".info 2> /dev/null | grep DHCPSID | cut -d '=' -f2 2> /dev/null")) {
        std::erase_if(*server, [](char letter) { return letter == '\'' || letter == '"'; });
        servers.push_back(*server);
    }
    if (const auto server = firstAnswerOf(
            "cat /var/lib/dhcpv6/client6.leases* 2> /dev/null | grep SDUID | cut -d ' ' -f3 2> /dev/null")) {
        servers.push_back(server->substr(0, server->find_last_not_of(';') + 1));
    }
    return {servers, true};
}

struct StartFact {
    NodeType nodeClass;
    unsigned int property;
    unsigned int mark;  ///< a property that the plug-in stores in each node that has been asked for it
    IC::PropertyValue (*ask)(const std::string& name);
};

constexpr StartFact kStartFacts[] = {
    {NodeType::networkPort, kSupportedSpeed, kSupportedSpeed, supportedSpeedOf},
    {NodeType::networkPort, 182, kSupportedSpeed, wakeOnLanSupportedOf},
    {NodeType::networkPort, 183, kSupportedSpeed, wakeOnLanEnabledOf},
    {NodeType::networkPort, kPortType, kSupportedSpeed, portTypeOf},
    {NodeType::ipConfig, kDhcpServers, kDhcpServers, dhcpServersOf},
};

bool isOfNode(const StartFact& fact, const IC::MutableNode& node, const Properties& stored) {
    return static_cast<unsigned int>(fact.nodeClass) == node.nodeType() && stored.contains(fact.mark);
}

/// What the plug-in itself would put into a command.
bool isPlainName(const std::string& name) {
    constexpr std::string_view kFine = "._:@%+=,/-";
    constexpr unsigned char kBeyondAscii = 128;
    return !name.empty() && name.front() != '-' && std::ranges::all_of(name, [&](unsigned char byte) {
        return (byte >= '0' && byte <= '9') || (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') ||
               byte >= kBeyondAscii || kFine.find(static_cast<char>(byte)) != std::string_view::npos;
    });
}

}  // namespace

std::vector<unsigned int> startFacts(const IC::MutableNode& node) {
    std::vector<unsigned int> ids;
    const Properties stored = storedProperties(node);
    for (const StartFact& fact : kStartFacts) {
        if (isOfNode(fact, node, stored)) {
            ids.push_back(fact.property);
        }
    }
    return ids;
}

std::optional<IC::PropertyValue> askStartFact(const IC::MutableNode& node, unsigned int id) {
    const auto* const fact = std::ranges::find_if(kStartFacts, [&](const StartFact& row) {
        return row.property == id && static_cast<unsigned int>(row.nodeClass) == node.nodeType();
    });
    if (fact == std::end(kStartFacts)) {
        return std::nullopt;
    }
    const Properties stored = storedProperties(node);
    const auto found = stored.find(kLinkNameId);
    const std::string name = found == stored.end() ? "" : static_cast<std::string>(found->second);
    return stored.contains(fact->mark) && isPlainName(name) ? std::optional(fact->ask(name)) : std::nullopt;
}

}  // namespace cvagent::oshw
