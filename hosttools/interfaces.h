#pragma once

#include <netinet/in.h>
#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace hosttools {

/// What went over a link since it is there, added up as the kernel does in /proc/net/dev.
struct Counters {
    std::uint64_t packets = 0;
    std::uint64_t bytes = 0;
    std::uint64_t errors = 0;
    std::uint64_t dropped = 0;
    std::uint64_t overruns = 0;
    std::uint64_t framing = 0;  ///< receiving: frame errors; sending: carrier errors
    std::uint64_t compressed = 0;
};

/// The bus addresses of a network card.
struct CardMap {
    std::uint64_t memoryStart = 0;
    std::uint64_t memoryEnd = 0;
    std::uint16_t baseAddress = 0;
    std::uint8_t interrupt = 0;
    std::uint8_t dma = 0;
};

struct Link {
    std::string name;
    int index = 0;
    unsigned flags = 0;  ///< IFF_UP and so on
    unsigned type = 0;   ///< ARPHRD_ETHER and so on
    std::array<std::uint8_t, 8> hardware{};
    unsigned mtu = 0;
    unsigned queueLength = 0;
    CardMap card;
    Counters received;
    Counters sent;
    std::uint64_t collisions = 0;
    std::string kind;      ///< "veth", "vlan", "bond" and so on; empty for hardware
    std::string memberOf;  ///< kind of the link that it is a member of, "bridge" and so on
};

struct InetAddress {
    int link = 0;       ///< index of its link
    std::string label;  ///< the link's name, or an alias such as "eth0:1"
    in_addr local{};
    in_addr peer{};  ///< the other end of a point-to-point link
    in_addr broadcast{};
    unsigned prefix = 0;
};

struct Inet6Address {
    std::string link;  ///< name of its link
    in6_addr address{};
    unsigned prefix = 0;
    unsigned scope = 0;  ///< the kernel's scope bits: 0 global, 0x20 link and so on
};

/// Everything that a listing shows, read at one time.
struct Interfaces {
    std::vector<Link> links;
    std::vector<InetAddress> inet;
    std::vector<Inet6Address> inet6;
};

/// The payload of an RTM_NEWLINK message.
Link parseLink(std::string_view message);
/// The payload of an RTM_NEWADDR message of IPv4.
InetAddress parseInetAddress(std::string_view message);
/// The text of /proc/net/if_inet6; a damaged line costs that line.
std::vector<Inet6Address> parseInet6Addresses(std::string_view text);

/// Reads links and addresses. Two netlink answers and one file, whatever their number. The IPv6 addresses
/// come from /proc/net/if_inet6 because listings show them in its order, which netlink does not keep.
/// @param only name of the one link wanted; empty: all
/// @return 0 or an error number, ENODEV when the one link is not there
int readInterfaces(std::string_view only, Interfaces& interfaces);

/// One paragraph of a listing: a link, or an alias of one.
struct Stanza {
    std::string name;
    const Link* link = nullptr;
    const InetAddress* inet = nullptr;         ///< its first address, null when it has none
    std::vector<const Inet6Address*> inet6{};  ///< none for an alias
    bool alias = false;                        ///< an alias has no counters of its own
};

/// All links and their aliases by name. The stanzas point into interfaces.
std::vector<Stanza> listStanzas(const Interfaces& interfaces);
/// The one of a name ("eth0" or "eth0:1"). An alias need not exist: it then has no address.
/// @return nothing when there is no such link
std::optional<Stanza> makeStanza(const Interfaces& interfaces, std::string_view name);

}  // namespace hosttools
