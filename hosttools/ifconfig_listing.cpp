#include "hosttools/ifconfig_listing.h"

#include <arpa/inet.h>
#include <net/if.h>
#include <net/if_arp.h>
#include <algorithm>
#include <span>

#include "hosttools/addresses.h"

namespace hosttools {
namespace {

constexpr std::string_view indent = "          ";
// Lower base addresses are not those of a card.
constexpr unsigned firstCardAddress = 0x100;

enum class Hardware { none, ethernet, bytes };

struct LinkType {
    unsigned type;
    Hardware address;
    std::string_view title;
};

constexpr LinkType linkTypes[] = {
    {ARPHRD_LOOPBACK, Hardware::none, "Local Loopback"},     {ARPHRD_ETHER, Hardware::ethernet, "Ethernet"},
    {ARPHRD_PPP, Hardware::none, "Point-to-Point Protocol"}, {ARPHRD_SIT, Hardware::none, "IPv6-in-IPv4"},
    {ARPHRD_INFINIBAND, Hardware::bytes, "InfiniBand"},
};
constexpr LinkType otherType = {0, Hardware::bytes, "UNSPEC"};

struct FlagName {
    unsigned flag;
    std::string_view name;
};

constexpr FlagName flagNames[] = {
    {IFF_UP, "UP "},
    {IFF_BROADCAST, "BROADCAST "},
    {IFF_DEBUG, "DEBUG "},
    {IFF_LOOPBACK, "LOOPBACK "},
    {IFF_POINTOPOINT, "POINTOPOINT "},
    {IFF_NOTRAILERS, "NOTRAILERS "},
    {IFF_RUNNING, "RUNNING "},
    {IFF_NOARP, "NOARP "},
    {IFF_PROMISC, "PROMISC "},
    {IFF_ALLMULTI, "ALLMULTI "},
    {IFF_SLAVE, "SLAVE "},
    {IFF_MASTER, "MASTER "},
    {IFF_MULTICAST, "MULTICAST "},
    {IFF_DYNAMIC, "DYNAMIC "},
};

struct ScopeName {
    unsigned scope;
    std::string_view name;
};

constexpr ScopeName scopeNames[] = {
    {0x00, "Global"}, {0x10, "Host"}, {0x20, "Link"}, {0x40, "Site"}, {0x80, "Compat"},
};

const LinkType& typeOf(const Link& link) {
    const auto* found = std::ranges::find(linkTypes, link.type, &LinkType::type);
    return found != std::end(linkTypes) ? *found : otherType;
}

void addHexByte(Text& text, std::uint8_t byte) {
    constexpr char digits[] = "0123456789ABCDEF";
    text.add(digits[byte >> 4]).add(digits[byte & 15]);
}

void addBytes(Text& text, std::span<const std::uint8_t> bytes, char separator) {
    for (std::size_t index = 0; index < bytes.size(); ++index) {
        if (index > 0) text.add(separator);
        addHexByte(text, bytes[index]);
    }
}

void addHardware(Text& text, const Link& link, Hardware kind) {
    if (kind == Hardware::none) return;
    text.add("HWaddr ");
    if (kind == Hardware::ethernet) {
        addBytes(text, std::span(link.hardware).first<6>(), ':');
    } else {
        // Sixteen bytes are shown, of which the classic call fills at most eight.
        std::array<std::uint8_t, 16> shown{};
        std::ranges::copy(link.hardware, shown.begin());
        addBytes(text, shown, '-');
    }
    text.add("  ");
}

in_addr maskOf(unsigned prefix) {
    return {htonl(prefix == 0 ? 0 : ~std::uint32_t{0} << (32 - std::min(prefix, 32u)))};
}

void addInetLine(Text& text, const Link& link, const InetAddress& address) {
    text.add(indent).add("inet addr:").add(textOf(address.local)).add(' ');
    if (link.flags & IFF_POINTOPOINT) text.add(" P-t-P:").add(textOf(address.peer)).add(' ');
    if (link.flags & IFF_BROADCAST) text.add(" Bcast:").add(textOf(address.broadcast)).add(' ');
    text.add(" Mask:").add(textOf(maskOf(address.prefix))).add('\n');
}

void addInet6Line(Text& text, const Inet6Address& address) {
    const auto* scope = std::ranges::find(scopeNames, address.scope, &ScopeName::scope);
    text.add(indent).add("inet6 addr: ").add(textOf(address.address)).add('/').number(address.prefix);
    text.add(" Scope:").add(scope != std::end(scopeNames) ? scope->name : "Unknown").add('\n');
}

void addFlagsLine(Text& text, const Link& link) {
    text.add(indent);
    if ((link.flags & 0xffff) == 0) text.add("[NO FLAGS] ");
    for (const auto& [flag, name] : flagNames) {
        if (link.flags & flag) text.add(name);
    }
    // The metric of an interface has never been more than a placeholder: the kernel answers 0, shown as 1.
    text.add(" MTU:").number(link.mtu).add("  Metric:1\n");
}

void addDirection(Text& text, std::string_view label, const Counters& counters, std::string_view framing) {
    text.add(indent)
        .add(label)
        .add(" packets:")
        .number(counters.packets)
        .add(" errors:")
        .number(counters.errors);
    text.add(" dropped:").number(counters.dropped).add(" overruns:").number(counters.overruns);
    text.add(framing).number(counters.framing).add('\n');
}

void addVolume(Text& text, std::string_view label, const Counters& counters) {
    addScaledBytes(text.add(label).number(counters.bytes).add(" ("), counters.bytes);
    text.add(')');
}

void addCounters(Text& text, const Link& link) {
    const bool compresses = link.type == ARPHRD_CSLIP || link.type == ARPHRD_CSLIP6;
    addDirection(text, "RX", link.received, " frame:");
    if (compresses) text.add("             compressed:").number(link.received.compressed).add('\n');
    addDirection(text, "TX", link.sent, " carrier:");
    text.add(indent).add("collisions:").number(link.collisions).add(' ');
    if (compresses) text.add("compressed:").number(link.sent.compressed).add(' ');
    text.add("txqueuelen:").number(link.queueLength).add(" \n");
    addVolume(text.add(indent), "RX bytes:", link.received);
    addVolume(text, "  TX bytes:", link.sent);
    text.add('\n');
}

void addCardLine(Text& text, const CardMap& card) {
    if (!card.interrupt && !card.memoryStart && !card.dma && card.baseAddress < firstCardAddress) return;
    text.add(indent);
    if (card.interrupt) text.add("Interrupt:").number(unsigned{card.interrupt}).add(' ');
    if (card.baseAddress >= firstCardAddress) text.add("Base address:0x").hex(card.baseAddress).add(' ');
    if (card.memoryStart) text.add("Memory:").hex(card.memoryStart).add('-').hex(card.memoryEnd).add(' ');
    if (card.dma) text.add("DMA chan:").hex(card.dma).add(' ');
    text.add('\n');
}

}  // namespace

void addScaledBytes(Text& text, std::uint64_t bytes) {
    constexpr std::string_view units[] = {" B", " KiB", " MiB", " GiB", " TiB"};
    std::size_t unit = 0;
    std::uint64_t tenths = 0;
    while (bytes >= 1024 && unit + 1 < std::size(units)) {
        tenths = bytes % 1024 * 10 / 1024;
        bytes /= 1024;
        ++unit;
    }
    text.number(bytes).add('.').number(tenths).add(units[unit]);
}

void listInterface(Text& text, const Stanza& stanza) {
    const Link& link = *stanza.link;
    const LinkType& type = typeOf(link);
    text.left(stanza.name, 9).add(" Link encap:").add(type.title).add("  ");
    addHardware(text, link, type.address);
    text.add('\n');
    if (stanza.inet != nullptr) addInetLine(text, link, *stanza.inet);
    for (const Inet6Address* address : stanza.inet6) addInet6Line(text, *address);
    addFlagsLine(text, link);
    if (!stanza.alias) addCounters(text, link);
    addCardLine(text, link.card);
    text.add('\n');
}

}  // namespace hosttools
