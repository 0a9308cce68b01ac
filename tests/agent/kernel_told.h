#pragma once

#include <nlohmann/json.hpp>
#include <string>

#include "tests/support/fake_host.h"

/// The ports, IP configurations and teams that a tree must show, worked out from what `ip -j` and `ethtool`
/// tell of a host's links at this moment. Interface files are looked up by the hardware addresses told.
class KernelTold {
public:
    using Json = nlohmann::json;

    explicit KernelTold(FakeHost& host);

    /// Path of each node to its description, status, and what the tools tell of its properties (id to value,
    /// null for one that has none).
    Json nodes() const;
    /// What the link states of port and IP configuration answer when they are read live: 1 or 12.
    unsigned int liveState(const std::string& name) const;
    /// The hardware address, as the name of its interface file ends.
    std::string hardwareAddress(const std::string& name) const {
        return links_.at(name).value("address", "");
    }

private:
    Json ask(const std::string& question) const;
    std::string firstLine(const std::vector<std::string>& words) const;
    bool isVisited(const std::string& name) const;
    bool isPort(const std::string& name) const;
    bool hasFlag(const std::string& name, const std::string& flag) const;
    std::string kind(const std::string& name) const;
    std::string fromInterfaceFile(const std::string& name, const std::string& key) const;
    /// What `ethtool` prints behind a label; "" when it prints no such line.
    std::string ethtool(const std::string& name, const std::string& label) const;

    Json port(const std::string& name) const;
    Json team(const std::string& name) const;
    Json config(const std::string& name) const;
    void addMembership(const std::string& name, Json& properties) const;
    void addAddresses(const std::string& name, Json& properties) const;
    std::string gateway(const std::string& name) const;
    std::string gateway6(const std::string& name) const;

    FakeHost& host_;
    Json links_ = Json::object();  ///< name to what `ip` tells of it, addresses included
    Json routes_;
    Json routes6_;
};
