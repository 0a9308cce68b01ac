// What is to be seen on the host once a property is written: what it reads, and the lines of its files. The
// plug-in's writers say nothing of a file that cannot be written, of a command that fails, and of a write
// that is left out because the origin is not a fixed one.
#include <arpa/inet.h>
#include <net/if.h>
#include <unistd.h>

#include <algorithm>
#include <sstream>

#include "agent/core/environment.h"
#include "agent/core/host_file.h"
#include "agent/core/oshw/tables.h"
#include "agent/core/text.h"
#include "framework/ic/link_state.h"
#include "framework/qx/whole_number.h"

namespace cvagent::oshw {

namespace {

constexpr unsigned int kInterfaceName = 108;
constexpr const char* kRoutesFile = "/etc/sysconfig/network/routes";
constexpr const char* kHostNameFile = "/etc/HOSTNAME";
constexpr int kDaylightSaving = 60;  // minutes

using Texts = std::vector<std::string>;

std::string firstLineOf(const std::string& path) {
    const std::string content = contentOf(path).value_or("");
    return content.substr(0, content.find('\n'));
}

std::string interfaceOf(const Taken& taken) {
    const Properties stored = storedProperties(taken.node);
    const auto name = stored.find(kInterfaceName);
    const std::string text = name == stored.end() ? "" : static_cast<std::string>(name->second);
    return text.substr(0, text.find(':'));  // an alias has its link's hardware address
}

std::string attributeOf(const Taken& taken, const char* attribute) {
    return firstLineOf("/sys/class/net/" + interfaceOf(taken) + "/" + attribute);
}

/// "" when the file has the line.
std::string lackingLine(const std::string& path, const std::string& line) {
    const auto content = contentOf(path);
    if (!content) {
        return "there is no file " + path + " that can be read";
    }
    const bool has = ("\n" + *content + "\n").find("\n" + line + "\n") != std::string::npos;
    return has ? "" : path + " has no line " + inQuotes(line);
}

std::string joined(const std::string& first, const std::string& second) {
    return first + (first.empty() || second.empty() ? "" : ", and ") + second;
}

std::string readsAs(const Taken& taken) {
    return taken.read == nullptr ? "it cannot be read"
                                 : "it reads " + inQuotes(static_cast<std::string>(*taken.read));
}

std::string unlessRead(const Taken& taken, bool same) {
    return same ? "" : readsAs(taken);
}

std::string textOf(const IC::PropertyValue* value) {
    return value == nullptr ? "" : static_cast<std::string>(*value);
}

std::string sameValue(const Taken& taken) {
    return unlessRead(taken, taken.read != nullptr && textOf(taken.read) == textOf(&taken.written));
}

/// A line of a resolver's file that stands there twice is read twice.
Texts withoutRepeats(const IC::PropertyValue* value) {
    Texts once;
    if (const Texts* all = value == nullptr ? nullptr : value->asTexts()) {
        for (const std::string& text : *all) {
            if (std::ranges::find(once, text) == once.end()) {
                once.push_back(text);
            }
        }
    }
    return once;
}

std::string sameList(const Taken& taken) {
    return unlessRead(taken,
                      taken.read != nullptr && withoutRepeats(taken.read) == withoutRepeats(&taken.written));
}

template <const char* key>
std::string inInterfaceFile(const Taken& taken) {
    return lackingLine("/etc/sysconfig/network/ifcfg-eth-id-" + attributeOf(taken, "address"),
                       key + textOf(&taken.written));
}

constexpr char kAddress[] = "IPADDR=";
constexpr char kMask[] = "NETMASK=";
constexpr char kIpv6Address[] = "IPADDR_1=";
constexpr char kPrefixLength[] = "PREFIXLEN_1=";

std::string mask(const Taken& taken) {
    return joined(inInterfaceFile<kMask>(taken), sameValue(taken));
}

std::string inRoutesFile(const Taken& taken) {
    return lackingLine(kRoutesFile, "default\t" + textOf(&taken.written) + "\t-");
}

/// An address has many spellings.
std::string sameIpv6Address(const Taken& taken) {
    in6_addr written{};
    in6_addr read{};
    const bool known = inet_pton(AF_INET6, textOf(&taken.written).c_str(), &written) == 1 &&
                       inet_pton(AF_INET6, textOf(taken.read).c_str(), &read) == 1;
    return unlessRead(taken, known && IN6_ARE_ADDR_EQUAL(&written, &read));
}

std::string ipv6Gateway(const Taken& taken) {
    return joined(inRoutesFile(taken), sameIpv6Address(taken));
}

/// The file holds "name.domain", with the dot even where there is no domain.
std::string hostName(const Taken& taken) {
    const std::string wanted = textOf(&taken.written) + ".";
    const bool kept = firstLineOf(kHostNameFile).starts_with(wanted);
    return joined(sameValue(taken), kept ? "" : kHostNameFile + (" has no name " + inQuotes(wanted)));
}

std::string domainName(const Taken& taken) {
    const std::string wanted = "." + textOf(&taken.written);
    const std::string kept = firstLineOf(kHostNameFile);
    const std::size_t dot = std::min(kept.find('.'), kept.size());
    return joined(sameValue(taken), kept.substr(dot) == wanted
                                        ? ""
                                        : kHostNameFile + (" has no name that ends in " + inQuotes(wanted)));
}

/// The property reads whether there is a link, which can take its time; the order itself shows in the flags.
std::string interfaceState(const Taken& taken) {
    const std::string text = attributeOf(taken, "flags");  // 0x1003
    const auto flags =
        text.starts_with("0x") ? QX::wholeNumber<unsigned int>(text.substr(2), 16) : std::nullopt;
    if (!flags) {
        return "the kernel tells no flags of the interface";
    }
    const auto order = static_cast<unsigned int>(taken.written);
    const bool wantsUp = order == IC::LinkState::up || order == IC::LinkState::bringUp;
    const bool isUp = (*flags & static_cast<unsigned int>(IFF_UP)) != 0;
    return isUp == wantsUp ? "" : std::string("the interface is still ") + (isUp ? "up" : "down");
}

bool isOnPath(const char* program) {
    const std::vector<std::string> directories = directoriesOnPath();
    return std::ranges::any_of(directories, [program](const std::string& directory) {
        return access((directory + "/" + program).c_str(), X_OK) == 0;
    });
}

/// Whether the host is about to stop is told nobody; these two keep it from it for certain.
std::string powerAction(const Taken& taken) {
    constexpr unsigned int kRunning = 1;
    if (static_cast<unsigned int>(taken.written) == kRunning) {
        return "";
    }
    if (!isOnPath("shutdown")) {
        return "there is no shutdown";
    }
    return geteuid() == 0 ? "" : "only root can do that";
}

/// It is written without daylight saving and read with it.
std::string timeZone(const Taken& taken) {
    const auto minutes = QX::wholeNumber<int>(textOf(taken.read));
    const auto wanted = QX::wholeNumber<int>(textOf(&taken.written));
    return unlessRead(taken,
                      minutes && wanted && (*minutes == *wanted || *minutes == *wanted + kDaylightSaving));
}

constexpr auto computer = NodeType::computer;
constexpr auto ipConfig = NodeType::ipConfig;

// The clock is not among them: setting it fails with an error of its own.
constexpr Effect kEffects[] = {
    {computer, 115, sameValue},
    {computer, 116, sameValue},
    {computer, 123, powerAction},
    {computer, 127, timeZone},
    {ipConfig, 24, sameValue},
    {ipConfig, 25, inInterfaceFile<kAddress>},
    {ipConfig, 26, mask},
    {ipConfig, 27, inInterfaceFile<kIpv6Address>},
    {ipConfig, 94, sameList},
    {ipConfig, 97, hostName},
    {ipConfig, 98, domainName},
    {ipConfig, 99, sameList},
    {ipConfig, 100, inRoutesFile},
    {ipConfig, 101, ipv6Gateway},
    {ipConfig, 102, inInterfaceFile<kPrefixLength>},
    {ipConfig, 123, interfaceState},
};

}  // namespace

std::span<const Effect> effects() {
    return kEffects;
}

}  // namespace cvagent::oshw
