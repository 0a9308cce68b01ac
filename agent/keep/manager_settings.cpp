#include "agent/keep/manager_settings.h"

#include <arpa/inet.h>

#include <algorithm>
#include <array>
#include <cstring>

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"
#include "agent/core/text.h"

namespace cvagent::keep {

namespace {

using bus::Reader;
using bus::Writer;

constexpr const char* kSettingEntry = "{sa{sv}}";
constexpr const char* kValueEntry = "{sv}";

/// Calls something for each value of each setting, with the reader at its variant.
template <class Take>
void forEachValue(const bus::Message& settings, const Take& take) {
    Reader reader(settings);
    reader.array(kSettingEntry, [&] {
        reader.entry("sa{sv}", [&] {
            const std::string setting = reader.text();
            reader.array(kValueEntry, [&] {
                reader.entry("sv", [&] {
                    const std::string key = reader.text();
                    take(reader, setting, key);
                });
            });
        });
    });
}

/// Calls something for each key of an "a{sv}".
template <class Take>
void forEachKey(Reader& reader, const Take& take) {
    reader.array(kValueEntry, [&] {
        reader.entry("sv", [&] {
            const std::string key = reader.text();
            reader.variant([&](const std::string& /*type*/) { take(key); });
        });
    });
}

void takeAddresses(Reader& reader, ProfileFamily& family) {
    reader.array("a{sv}", [&] {
        ProfileFamily::Address address;
        forEachKey(reader, [&](const std::string& key) {
            if (key == "prefix") {
                address.prefix = reader.number();
            } else if (key == "address" || key == "label") {
                (key == "label" ? address.label : address.text) = reader.text();
            } else {
                throw CannotKeep("an address of the connection has the attribute " + inQuotes(key));
            }
        });
        family.addresses.push_back(address);
    });
}

/// A route of a table of its own is not the host's default.
void takeRoutes(Reader& reader, ProfileFamily& family) {
    reader.array("a{sv}", [&] {
        bool isOfMain = true;
        std::string prefix;
        forEachKey(reader, [&](const std::string& key) {
            if (key == "prefix") {
                prefix = reader.asWord();
            } else {
                isOfMain = isOfMain && key != "table";
                reader.skip();
            }
        });
        family.hasDefaultRoute = family.hasDefaultRoute || (isOfMain && prefix == "0");
    });
}

void takeIpv4Servers(Reader& reader, ProfileFamily& family) {
    for (const std::uint32_t number : reader.numbers()) {
        std::array<char, INET_ADDRSTRLEN> text{};
        family.nameServers.emplace_back(inet_ntop(AF_INET, &number, text.data(), text.size()));
    }
}

void takeIpv6Servers(Reader& reader, ProfileFamily& family) {
    reader.array("ay", [&] {
        const std::string bytes = reader.bytes();
        std::array<char, INET6_ADDRSTRLEN> text{};
        if (bytes.size() != sizeof(in6_addr)) {
            throw CannotKeep("a name server of the connection is not understood");
        }
        family.nameServers.emplace_back(inet_ntop(AF_INET6, bytes.data(), text.data(), text.size()));
    });
}

struct KnownKey {
    const char* key;
    void (*take)(Reader& reader, ProfileFamily& family);
};
constexpr std::array kKnownKeys = {
    KnownKey{"method", [](Reader& reader, ProfileFamily& family) { family.method = reader.text(); }},
    KnownKey{"gateway", [](Reader& reader, ProfileFamily& family) { family.gateway = reader.text(); }},
    KnownKey{"dns-search",
             [](Reader& reader, ProfileFamily& family) { family.searchDomains = reader.texts(); }},
    KnownKey{"address-data", takeAddresses}, KnownKey{"route-data", takeRoutes}};

/// What says the same in the way of older versions, and would count instead of what is written.
constexpr std::array kOlder = {"addresses", "address-labels", "dns", "dns-data"};

/// The value at the reader, and all in it. The order within a dictionary means nothing.
std::string flatValue(Reader& reader, sd_bus_message* message) {
    char type = 0;
    const char* inner = nullptr;
    if (sd_bus_message_peek_type(message, &type, &inner) <= 0) {
        throw bus::Error(bus::kInvalidArgs, "the settings of a connection end too early");
    }
    if (inner == nullptr) {
        return reader.asWord() + '\0';
    }
    const std::string contents = inner;
    sd_bus_message_enter_container(message, type, contents.c_str());
    std::vector<std::string> parts;
    while (!reader.atEnd()) {
        parts.push_back(flatValue(reader, message));
    }
    sd_bus_message_exit_container(message);
    if (contents.starts_with('{')) {
        std::ranges::sort(parts);
    }
    return std::string(1, type) + contents + "(" + joinedWords(parts, "") + ")";
}

void putAddresses(Writer& writer, const std::vector<ProfileFamily::Address>& addresses) {
    const auto put = [&writer](const char* key, const auto& value, const char* type) {
        writer.entry("sv", [&] { writer.put(key).variant(type, [&] { writer.put(value); }); });
    };
    writer.array("a{sv}", [&] {
        for (const ProfileFamily::Address& each : addresses) {
            writer.array(kValueEntry, [&] {
                put("address", each.text, "s");
                put("prefix", each.prefix, "u");
                if (!each.label.empty()) {
                    put("label", each.label, "s");
                }
            });
        }
    });
}

std::string bytesOf(int family, const std::string& address) {
    std::array<char, sizeof(in6_addr)> bytes{};
    inet_pton(family, address.c_str(), bytes.data());
    return {bytes.data(), family == AF_INET ? sizeof(in_addr) : bytes.size()};
}

void putServers(Writer& writer, const std::vector<std::string>& servers, bool isIpv6) {
    if (isIpv6) {
        writer.array("ay", [&] {
            for (const std::string& each : servers) {
                writer.putBytes(bytesOf(AF_INET6, each));
            }
        });
        return;
    }
    std::vector<std::uint32_t> numbers(servers.size());
    for (std::size_t i = 0; i < servers.size(); ++i) {
        std::memcpy(&numbers[i], bytesOf(AF_INET, servers[i]).data(), sizeof(in_addr));
    }
    writer.put(numbers);
}

void putFamily(Writer& writer, const ProfileFamily& family, bool isIpv6) {
    const auto put = [&writer](const char* key, const char* type, const auto& fill) {
        writer.entry("sv", [&] { writer.put(key).variant(type, fill); });
    };
    put("method", "s", [&] { writer.put(family.method); });
    put("address-data", "aa{sv}", [&] { putAddresses(writer, family.addresses); });
    if (!family.gateway.empty()) {
        put("gateway", "s", [&] { writer.put(family.gateway); });
    }
    put("dns", isIpv6 ? "aay" : "au", [&] { putServers(writer, family.nameServers, isIpv6); });
    put("dns-search", "as", [&] { writer.put(family.searchDomains); });
}

bool isWrittenKey(const std::string& key) {
    return (std::ranges::find(kKnownKeys, key, &KnownKey::key) != kKnownKeys.end() && key != "route-data") ||
           std::ranges::find(kOlder, key) != kOlder.end();
}

bool isIpSetting(const std::string& setting) {
    return setting == "ipv4" || setting == "ipv6";
}

/// What comes next in the one, to the end of the other.
void copyNext(const bus::Message& from, const bus::Message& to) {
    if (sd_bus_message_copy(to.get(), from.get(), 0) < 0) {
        throw bus::Error(bus::kInvalidArgs, "the settings of a connection cannot be copied");
    }
}

}  // namespace

ProfileIp ipIn(const bus::Message& settings) {
    ProfileIp ip;
    forEachValue(settings, [&ip](Reader& reader, const std::string& setting, const std::string& key) {
        ProfileFamily& family = setting == "ipv6" ? ip.ipv6 : ip.ipv4;
        const auto* known =
            std::ranges::find_if(kKnownKeys, [&key](const KnownKey& each) { return key == each.key; });
        reader.variant([&](const std::string& /*type*/) {
            if (isIpSetting(setting) && known != kKnownKeys.end()) {
                known->take(reader, family);
            } else if (isIpSetting(setting) && key == "dns") {
                (setting == "ipv6" ? takeIpv6Servers : takeIpv4Servers)(reader, family);
            } else {
                reader.skip();
            }
        });
    });
    return ip;
}

std::map<std::string, std::string> flatSettings(const bus::Message& settings) {
    std::map<std::string, std::string> flat;
    forEachValue(settings, [&](Reader& reader, const std::string& setting, const std::string& key) {
        flat[setting + "." + key] = flatValue(reader, settings.get());
    });
    return flat;
}

bool isWrittenOtherwise(const std::string& name) {
    const std::size_t dot = name.find('.');
    return name == "connection.timestamp" ||
           (isIpSetting(name.substr(0, dot)) && isWrittenKey(name.substr(dot + 1)));
}

void writeSettings(const bus::Message& settings, const ProfileIp& before, const ProfileIp& wanted,
                   const bus::Message& call) {
    Reader reader(settings);
    Writer writer(call);
    const auto putSetting = [&] {
        const std::string setting = reader.text();
        const bool isIpv6 = setting == "ipv6";
        const ProfileFamily& family = isIpv6 ? wanted.ipv6 : wanted.ipv4;
        const bool isOther = isIpSetting(setting) && family != (isIpv6 ? before.ipv6 : before.ipv4);
        writer.put(setting).array(kValueEntry, [&] {
            reader.array(kValueEntry, [&] {
                reader.entry("sv", [&] {
                    const std::string key = reader.text();
                    if (isOther && isWrittenKey(key)) {
                        reader.skip();
                    } else {
                        writer.entry("sv", [&] {
                            writer.put(key);
                            copyNext(settings, call);
                        });
                    }
                });
            });
            if (isOther) {
                putFamily(writer, family, isIpv6);
            }
        });
    };
    writer.array(kSettingEntry, [&] {
        reader.array(kSettingEntry,
                     [&] { reader.entry("sa{sv}", [&] { writer.entry("sa{sv}", putSetting); }); });
    });
}

}  // namespace cvagent::keep
