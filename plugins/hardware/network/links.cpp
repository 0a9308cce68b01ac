#include "plugins/hardware/network/links.h"

#include <algorithm>
#include <array>

#include "plugins/hardware/network/link_driver.h"
#include "plugins/hardware/storage/devices.h"

namespace hardware {

namespace {

constexpr auto kType = Class::link;
constexpr const char* kAll = "/sys/class/net/";

enum : Id {
    kSort = firstId(kType) + 1,
    kIndex,
    kAddress,
    kPermanentAddress,
    kMtu,
    kState,
    kCarrier,
    kSpeed,
    kDuplex,
    kMaster,
    kDriver,
    kFirmware,
    kBus,
    kQueues,
    kReceivedBytes,
    kReceivedPackets,
    kReceiveErrors,
    kReceiveDropped,
    kSentBytes,
    kSentPackets,
    kSendErrors,
    kSendDropped,
    kCarrierChanges,
    kNeighbours,
    kNeighbourChassis,
    kNeighbourPorts,
    kNeighbourPortDescriptions,
};

constexpr Row kRows[] = {
    {kSort, "LinkKind", Kind::text, "",
     "uevent, type and directories in /sys/class/net/LINK, else the driver",
     "ethernet, wlan, bond, bridge, vlan, loopback and others"},
    {kIndex, "Index", Kind::number, "", "ifindex", "the kernel's number for it"},
    {kAddress, "HardwareAddress", Kind::text, "", "address", "the hardware address in use"},
    {kPermanentAddress, "PermanentAddress", Kind::text, "", "ETHTOOL_GPERMADDR",
     "the hardware address it was made with"},
    {kMtu, "MTU", Kind::number, "bytes", "mtu", "longest packet"},
    {kState, "State", Kind::text, "", "operstate", "up, down, dormant, lowerlayerdown or unknown", kLive},
    {kCarrier, "Carrier", Kind::flag, "", "carrier", "whether there is a signal; not told while it is off",
     kLive},
    {kSpeed, "Speed", Kind::number, "megabits per second", "speed", "speed of the link", kLive},
    {kDuplex, "Duplex", Kind::text, "", "duplex", "full or half", kLive},
    {kMaster, "Master", Kind::text, "", "master", "the bond, bridge or the like it belongs to", kLive},
    {kDriver, "Driver", Kind::text, "", "ETHTOOL_GDRVINFO, else device/driver", "the driver"},
    {kFirmware, "FirmwareVersion", Kind::text, "", "ETHTOOL_GDRVINFO", "version of its firmware"},
    {kBus, "BusAddress", Kind::text, "", "ETHTOOL_GDRVINFO, else device", "where the device sits"},
    {kQueues, "Queues", Kind::number, "", "queues", "queues that receive"},
    {kReceivedBytes, "ReceivedBytes", Kind::number, "bytes", "statistics/rx_bytes", "bytes received", kLive},
    {kReceivedPackets, "ReceivedPackets", Kind::number, "", "statistics/rx_packets", "packets received",
     kLive},
    {kReceiveErrors, "ReceiveErrors", Kind::number, "", "statistics/rx_errors", "packets received damaged",
     kLive},
    {kReceiveDropped, "ReceiveDropped", Kind::number, "", "statistics/rx_dropped",
     "packets received and thrown away", kLive},
    {kSentBytes, "SentBytes", Kind::number, "bytes", "statistics/tx_bytes", "bytes sent", kLive},
    {kSentPackets, "SentPackets", Kind::number, "", "statistics/tx_packets", "packets sent", kLive},
    {kSendErrors, "SendErrors", Kind::number, "", "statistics/tx_errors", "packets that could not be sent",
     kLive},
    {kSendDropped, "SendDropped", Kind::number, "", "statistics/tx_dropped", "packets thrown away unsent",
     kLive},
    {kCarrierChanges, "CarrierChanges", Kind::number, "", "carrier_changes",
     "how often the signal came or went", kLive},
    {kNeighbours, "Neighbours", Kind::texts, "", "lldpd", "names of what is at the other end", kLive},
    {kNeighbourChassis, "NeighbourChassis", Kind::texts, "", "lldpd",
     "numbers of what is at the other end, one for each neighbour", kLive},
    {kNeighbourPorts, "NeighbourPorts", Kind::texts, "", "lldpd",
     "which of their ports the link leads to, one for each neighbour", kLive},
    {kNeighbourPortDescriptions, "NeighbourPortDescriptions", Kind::texts, "", "lldpd",
     "what those ports are called, one for each neighbour", kLive},
};

struct Counter {
    Id id;
    const char* file;
};

constexpr std::array<Counter, 9> kCounters = {{{kReceivedBytes, "statistics/rx_bytes"},
                                               {kReceivedPackets, "statistics/rx_packets"},
                                               {kReceiveErrors, "statistics/rx_errors"},
                                               {kReceiveDropped, "statistics/rx_dropped"},
                                               {kSentBytes, "statistics/tx_bytes"},
                                               {kSentPackets, "statistics/tx_packets"},
                                               {kSendErrors, "statistics/tx_errors"},
                                               {kSendDropped, "statistics/tx_dropped"},
                                               {kCarrierChanges, "carrier_changes"}}};

struct Mark {
    const char* file;
    const char* sort;
};

// Files and directories that only one kind of link has.
constexpr std::array<Mark, 5> kMarks = {{{"/bonding", "bond"},
                                         {"/bridge", "bridge"},
                                         {"/tun_flags", "tun"},
                                         {"/wireless", "wlan"},
                                         {"/phy80211", "wlan"}}};

/// The numbers of the kernel's link types (ARPHRD_*).
constexpr unsigned int kEthernet = 1;
constexpr unsigned int kInfiniband = 32;
constexpr unsigned int kLoopback = 772;

std::optional<std::string> sortOf(const Host& host, const std::string& link, const LinkDriver& driver) {
    const auto mark = std::find_if(kMarks.begin(), kMarks.end(),
                                   [&](const Mark& one) { return host.exists(link + one.file); });
    if (mark != kMarks.end()) {
        return mark->sort;
    }
    if (auto told = host.field(link + "/uevent", "DEVTYPE")) {
        return told;
    }
    const unsigned long long type = host.number(link + "/type").value_or(0);
    if (type == kLoopback || type == kInfiniband) {
        return type == kLoopback ? "loopback" : "infiniband";
    }
    return type == kEthernet && host.exists(link + "/device") ? "ethernet" : driver.name;
}

std::optional<unsigned long long> receiveQueues(const Host& host, const std::string& link) {
    const std::vector<std::string> all = host.entries(link + "/queues");
    const auto count = std::count_if(all.begin(), all.end(),
                                     [](const std::string& name) { return name.starts_with("rx-"); });
    return count == 0 ? std::nullopt : std::optional(static_cast<unsigned long long>(count));
}

/// The kernel says -1 for a speed that it does not know, older ones the same without a sign.
std::optional<unsigned long long> speedOf(const Host& host, const std::string& link) {
    constexpr unsigned long long kUnknown = 0xffffffff;
    const unsigned long long speed = host.number(link + "/speed").value_or(0);
    return speed == 0 || speed == kUnknown ? std::nullopt : std::optional(speed);
}

std::optional<std::string> duplexOf(const Host& host, const std::string& link) {
    const auto duplex = host.line(link + "/duplex");
    return duplex == "unknown" ? std::nullopt : duplex;
}

struct NeighbourFact {
    Id id;
    std::string Neighbour::*text;
};

constexpr std::array<NeighbourFact, 4> kNeighbourFacts = {
    {{kNeighbours, &Neighbour::name},
     {kNeighbourChassis, &Neighbour::chassis},
     {kNeighbourPorts, &Neighbour::port},
     {kNeighbourPortDescriptions, &Neighbour::portDescription}}};

void addNeighbours(const Host& host, Found& found) {
    if (host.devices() == nullptr) {
        return;
    }
    const std::optional<Neighbours> all = host.devices()->neighbours();
    for (const NeighbourFact& fact : kNeighbourFacts) {
        if (!all) {
            found.facts.unanswered(fact.id);
        } else if (const auto own = all->find(found.name); own != all->end()) {
            std::vector<std::string> texts(own->second.size());
            std::ranges::transform(own->second, texts.begin(), fact.text);
            found.facts.texts(fact.id, texts);
        }
    }
}

}  // namespace

Rows linkRows() {
    return kRows;
}

/// Links are directories; the bonding driver puts a file of its own beside them.
std::vector<std::string> listLinks(const Host& host) {
    std::vector<std::string> names = host.entries(kAll);
    std::erase(names, "bonding_masters");
    return names;
}

void describeLink(const Host& host, Found& found) {
    const std::string link = kAll + found.name;
    const LinkDriver driver = host.live() ? askDriver(found.name) : LinkDriver();
    Facts& facts = found.facts;
    facts.text(kSort, sortOf(host, link, driver));
    facts.number(kIndex, host.number(link + "/ifindex"));
    facts.text(kAddress, host.line(link + "/address"));
    facts.text(kPermanentAddress, driver.permanentAddress);
    facts.number(kMtu, host.number(link + "/mtu"));
    facts.text(kState, host.line(link + "/operstate"));
    facts.flag(kCarrier, host.flag(link + "/carrier"));
    facts.number(kSpeed, speedOf(host, link));
    facts.text(kDuplex, duplexOf(host, link));
    facts.text(kMaster, host.target(link + "/master"));
    facts.text(kDriver, firstTold({driver.name, host.target(link + "/device/driver")}));
    facts.text(kFirmware, driver.firmware);
    facts.text(kBus, firstTold({driver.bus, host.target(link + "/device")}));
    facts.number(kQueues, receiveQueues(host, link));
    for (const Counter& counter : kCounters) {
        facts.number(counter.id, host.number(link + "/" + counter.file));
    }
    addNeighbours(host, found);
}

}  // namespace hardware
