#include "tests/agent/kernel_told.h"

#include <sstream>

namespace {

using Json = KernelTold::Json;

constexpr const char* kController = "/oshw/root/computer/chassis/network-controller";

bool contains(const std::string& text, const std::string& part) {
    return text.find(part) != std::string::npos;
}

std::string dotted(unsigned int prefixLength) {
    const unsigned long bits = prefixLength == 0 ? 0 : 0xFFFFFFFFUL << (32 - prefixLength) & 0xFFFFFFFFUL;
    return std::to_string(bits >> 24) + "." + std::to_string(bits >> 16 & 255) + "." +
           std::to_string(bits >> 8 & 255) + "." + std::to_string(bits & 255);
}

std::string fourthGroup(const std::string& address) {
    std::istringstream groups(address);
    std::string group;
    for (int i = 0; i < 4; ++i) {
        if (!std::getline(groups, group, ':')) {
            return "";
        }
    }
    return group;
}

unsigned int state(bool up) {
    return up ? 1 : 12;
}

/// The address of a family that is shown: the first one that stays, else the last one that was learnt.
Json shownAddress(const Json& link, const std::string& family) {
    Json learnt;
    for (const Json& address : link["addr_info"]) {
        if (address.value("family", "") != family || address.value("scope", "") != "global") {
            continue;
        }
        if (family == "inet" || !address.value("dynamic", false)) {
            return address;
        }
        learnt = address;
    }
    return learnt;
}

}  // namespace

KernelTold::KernelTold(FakeHost& host) : host_(host) {
    for (const Json& link : ask("-d address show")) {
        links_[link["ifname"].get<std::string>()] = link;
    }
    routes_ = ask("-4 route show table main");
    routes6_ = ask("-6 route show table main");
}

Json KernelTold::ask(const std::string& question) const {
    const Finished run = host_.run({"sh", "-c", "ip -j " + question});
    EXPECT_EQ(run.status, 0) << question << ": " << run.err;
    return Json::parse(run.out);
}

std::string KernelTold::firstLine(const std::vector<std::string>& words) const {
    const std::string out = host_.run(words).out;
    return out.substr(0, out.find('\n'));
}

Json KernelTold::nodes() const {
    Json all = Json::object();
    for (const auto& [name, link] : links_.items()) {
        if (!isVisited(name)) {
            continue;
        }
        std::string parent = kController;
        if (isPort(name)) {
            parent += "/network-port:" + name;
            all[parent] = port(name);
        }
        all[parent + "/ip-config:" + name] = config(name);
        if (kind(name) == "bond") {
            all["/oshw/root/computer/team:" + name] = team(name);
        }
    }
    return all;
}

unsigned int KernelTold::liveState(const std::string& name) const {
    return state(hasFlag(name, "LOWER_UP"));
}

bool KernelTold::isVisited(const std::string& name) const {
    const Json info = links_[name].value("linkinfo", Json::object());
    if (info.value("info_slave_kind", "") == "bridge") {
        return false;
    }
    const std::string of = kind(name);
    const bool wired = of == "veth" || of == "vlan" || of == "bond";
    const bool named = contains(name, "eth") || contains(name, "bond") || contains(name, "usb");
    return of == "bridge" || wired || (named && of != "vxlan");
}

bool KernelTold::isPort(const std::string& name) const {
    const std::string of = kind(name);
    return of == "veth" || of == "vlan" || of.empty();  // what a driver made has no kind
}

bool KernelTold::hasFlag(const std::string& name, const std::string& flag) const {
    const Json flags = links_[name]["flags"];
    return std::find(flags.begin(), flags.end(), flag) != flags.end();
}

std::string KernelTold::kind(const std::string& name) const {
    return links_[name].value("linkinfo", Json::object()).value("info_kind", "");
}

std::string KernelTold::fromInterfaceFile(const std::string& name, const std::string& key) const {
    const std::string file = "/etc/sysconfig/network/ifcfg-eth-id-" + hardwareAddress(name);
    std::istringstream lines(host_.read(file).value_or(""));
    for (std::string line; std::getline(lines, line);) {
        if (line.starts_with(key + "=")) {
            return line.substr(key.size() + 1);
        }
    }
    return "";
}

std::string KernelTold::ethtool(const std::string& name, const std::string& label) const {
    std::istringstream lines(host_.run({"ethtool", name}).out);
    for (std::string line; std::getline(lines, line);) {
        const auto start = line.find_first_not_of(" \t");
        if (start != line.npos && line.compare(start, label.size() + 1, label + ":") == 0) {
            const auto value = line.find_first_not_of(' ', start + label.size() + 1);
            return value == line.npos ? "" : line.substr(value);
        }
    }
    return "";
}

Json KernelTold::port(const std::string& name) const {
    const std::string speed = ethtool(name, "Speed");
    // The links made here know no modes and wake nobody; the machine's own drivers are in other networks.
    EXPECT_EQ(ethtool(name, "Supported link modes").substr(0, 12), "Not reported") << name;
    EXPECT_EQ(ethtool(name, "Wake-on"), "") << name;
    EXPECT_EQ(ethtool(name, "Link detected") == "yes", hasFlag(name, "LOWER_UP")) << name;
    Json properties = {{"0", {name}},
                       {"38", 0},
                       {"57", contains(speed, "Mb/s") ? std::stoul(speed) * 1000 : 0},
                       {"67", !ethtool(name, "Auto-negotiation").empty()},  // told at all, be it "off"
                       {"82", ethtool(name, "Duplex") == "Full"},
                       {"108", name},
                       {"110", 1},
                       {"111", 1},
                       {"121", name},
                       {"123", liveState(name)},
                       {"125", {0, 1, 12}},
                       {"182", nullptr},  // no way to wake the host
                       {"183", nullptr},
                       {"185", 0}};
    addMembership(name, properties);
    return {{"description", "Network Port"}, {"status", liveState(name)}, {"properties", properties}};
}

void KernelTold::addMembership(const std::string& name, Json& properties) const {
    const Json info = links_[name].value("linkinfo", Json::object());
    const bool isMember = info.value("info_slave_kind", "") == "bond";
    properties.update({{"193", isMember}, {"194", false}, {"195", ""}, {"196", 0}, {"199", ""}});
    if (!isMember) {
        return;
    }
    const std::string bond = links_[name]["master"];
    const Json& fact = info["info_slave_data"];
    properties["194"] = links_[bond]["linkinfo"]["info_data"].value("active_slave", "") == name;
    properties["195"] = fact.value("mii_status", "") == "UP" ? "up" : "down";
    properties["196"] = fact["link_failure_count"];
    properties["199"] = bond;
}

Json KernelTold::team(const std::string& name) const {
    std::vector<std::string> members;
    for (const auto& [member, link] : links_.items()) {
        if (link.value("master", "") == name) {
            members.push_back(member);
        }
    }
    return {{"description", ""},
            {"status", 0},
            {"properties", {{"165", members}, {"197", name}, {"198", "fault-tolerance (active-backup)"}}}};
}

Json KernelTold::config(const std::string& name) const {
    const unsigned int listed = state(hasFlag(name, "UP"));
    const std::string origin = fromInterfaceFile(name, "BOOTPROTO");
    Json properties = {{"24", origin == "static" ? 3
                              : origin == "dhcp" ? 1
                                                 : 0},
                       {"93", Json::array()},
                       {"94", {"192.0.2.53", "2001:db8::53"}},
                       {"95", {1, 3}},
                       {"96", 3},
                       {"97", firstLine({"hostname", "-s"})},
                       {"98", firstLine({"hostname", "-d"})},
                       {"99", {"example.com", "example.org"}},
                       {"100", gateway(name)},
                       {"101", gateway6(name)},
                       {"108", name},
                       {"121", name},
                       {"123", liveState(name)},
                       {"125", {0, 1, 12}},
                       {"186", false}};
    addAddresses(name, properties);
    const char* description = kind(name) == "bridge" ? "Bridge" : "IP Configuration";
    return {{"description", description}, {"status", listed}, {"properties", properties}};
}

void KernelTold::addAddresses(const std::string& name, Json& properties) const {
    const Json ipv4 = shownAddress(links_[name], "inet");
    const Json ipv6 = shownAddress(links_[name], "inet6");
    const bool both = !ipv4.is_null() && !ipv6.is_null();
    const std::string address6 = ipv6.is_null() ? "" : ipv6["local"];
    const Json none = ipv6.is_null() ? "0.0.0.0" : "";  // zeros stand for an interface without any address
    properties["25"] = ipv4.is_null() ? none : ipv4["local"];
    properties["26"] = ipv4.is_null() ? none : Json(dotted(ipv4["prefixlen"]));
    properties["27"] = address6;
    properties["28"] = both ? 7 : ipv6.is_null() ? 2 : 5;
    properties["29"] = fourthGroup(address6);
    properties["47"] = both ? 4098 : ipv6.is_null() ? 4096 : 4097;
    properties["102"] = ipv6.is_null() ? Json(0) : ipv6["prefixlen"];
}

/// An interface with on-link routes alone shows the host's own way out. The routes of eth0.10 count as
/// eth0's, too: the plug-in's command looks for the name anywhere in a route's line.
std::string KernelTold::gateway(const std::string& name) const {
    bool onLink = false;
    std::string wayOut = "0.0.0.0";
    for (const Json& route : routes_) {
        if (contains(route.value("dev", ""), name)) {
            if (route.contains("gateway")) {
                return route["gateway"];
            }
            onLink = true;
        }
    }
    for (const Json& route : routes_) {
        if (route["dst"] == "default") {
            wayOut = route.value("gateway", "0.0.0.0");
            break;
        }
    }
    return onLink ? wayOut : "";
}

std::string KernelTold::gateway6(const std::string& name) const {
    for (const Json& route : routes6_) {
        if (contains(route.value("dev", ""), name) && route.contains("gateway")) {
            return route["gateway"];
        }
    }
    return "";
}
