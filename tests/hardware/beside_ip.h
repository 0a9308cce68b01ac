#pragma once

#include <algorithm>
#include <cctype>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "tests/hardware/storage_host.h"
#include "tests/hardware/tools.h"

/// What ip and ethtool tell of links, by the names of the plug-in's properties; "" for what must not be told.
namespace hardware_test {

using Told = std::map<std::string, std::string>;

inline std::string plain(const nlohmann::json& value) {
    return value.is_string() ? value.get<std::string>() : value.dump();
}

inline std::string lowered(std::string text) {
    std::ranges::transform(text, text.begin(), [](unsigned char letter) { return std::tolower(letter); });
    return text;
}

/// The counters of a row of ip -j -s -s link.
inline Told countedByIp(const nlohmann::json& link) {
    const nlohmann::json& received = link["stats64"]["rx"];
    const nlohmann::json& sent = link["stats64"]["tx"];
    return {{"ReceivedBytes", plain(received["bytes"])},
            {"ReceivedPackets", plain(received["packets"])},
            {"ReceiveErrors", plain(received["errors"])},
            {"ReceiveDropped", plain(received["dropped"])},
            {"SentBytes", plain(sent["bytes"])},
            {"SentPackets", plain(sent["packets"])},
            {"SendErrors", plain(sent["errors"])},
            {"SendDropped", plain(sent["dropped"])},
            {"CarrierChanges", plain(sent.at("carrier_changes"))}};
}

/// What else stands in a row of ip -j -d link.
inline Told toldByIp(const nlohmann::json& link) {
    const nlohmann::json& flags = link["flags"];
    const auto has = [&flags](const char* flag) { return std::ranges::find(flags, flag) != flags.end(); };
    Told all{{"Index", plain(link["ifindex"])},
             {"HardwareAddress", link.value("address", "")},
             {"MTU", plain(link["mtu"])},
             {"State", lowered(link["operstate"])},
             {"Carrier", !has("UP")        ? ""
                         : has("LOWER_UP") ? "true"
                                           : "false"},
             {"Master", link.value("master", "")},
             {"Queues", plain(link["num_rx_queues"])}};
    if (link.contains("linkinfo") && link["linkinfo"].contains("info_kind")) {
        all["LinkKind"] = link["linkinfo"]["info_kind"];
    } else if (has("LOOPBACK")) {
        all["LinkKind"] = "loopback";
    }
    if (link.contains("permaddr")) {
        all["PermanentAddress"] = link["permaddr"];
    }
    return all;
}

/// The rows "key: value" of a tool, without blanks before them.
inline Told rowsOf(const std::string& command) {
    std::istringstream lines(printed(command));
    Told rows;
    for (std::string line; std::getline(lines, line);) {
        line = hardware::trimmed(line);
        if (const std::size_t colon = line.find(':'); colon != std::string::npos) {
            rows[line.substr(0, colon)] = hardware::trimmed(line.substr(colon + 1));
        }
    }
    return rows;
}

/// What ethtool tells of a link; nothing for what its driver cannot answer.
inline Told toldByEthtool(const std::string& link) {
    Told all;
    const Told driver = rowsOf("ethtool -i '" + link + "'");
    for (const auto& [row, property] : {std::pair{"driver", "Driver"},
                                        {"firmware-version", "FirmwareVersion"},
                                        {"bus-info", "BusAddress"}}) {
        if (driver.contains(row)) {
            all[property] = driver.at(row) == "N/A" ? "" : driver.at(row);
        }
    }
    const Told settings = rowsOf("ethtool '" + link + "'");
    if (settings.contains("Speed")) {
        const std::string& speed = settings.at("Speed");
        all["Speed"] = speed.ends_with("Mb/s") ? speed.substr(0, speed.size() - 4) : "";
    }
    if (settings.contains("Duplex")) {
        const std::string duplex = lowered(settings.at("Duplex"));
        all["Duplex"] = duplex.starts_with("unknown") ? "" : duplex;
    }
    const Told address = rowsOf("ethtool -P '" + link + "'");
    if (address.contains("Permanent address")) {
        const std::string& permanent = address.at("Permanent address");
        all["PermanentAddress"] = permanent == "not set" ? "" : permanent;
    }
    return all;
}

/// What differs between the plug-in's facts and what a tool tells; each a line.
inline std::vector<std::string> differences(const Told& own, const Told& theirs) {
    std::vector<std::string> all;
    for (const auto& [property, value] : theirs) {
        const auto fact = own.find(property);
        if ((fact == own.end() ? "" : fact->second) != value) {
            all.push_back(property + ": " + (fact == own.end() ? "nothing" : fact->second) +
                          ", the tool: " + value);
        }
    }
    return all;
}

}  // namespace hardware_test
