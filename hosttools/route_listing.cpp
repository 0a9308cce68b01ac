#include "hosttools/route_listing.h"

#include <net/route.h>
#include <netinet/in.h>

#include "hosttools/addresses.h"
#include "hosttools/files.h"

namespace hosttools {
namespace {

struct FlagLetter {
    unsigned flag;
    char letter;
};

constexpr FlagLetter inetLetters[] = {
    {RTF_GATEWAY, 'G'}, {RTF_HOST, 'H'}, {RTF_REINSTATE, 'R'}, {RTF_DYNAMIC, 'D'}, {RTF_MODIFIED, 'M'},
};

constexpr FlagLetter inet6Letters[] = {
    {RTF_UP, 'U'},       {RTF_GATEWAY, 'G'}, {RTF_HOST, 'H'},   {RTF_DEFAULT, 'D'},
    {RTF_ADDRCONF, 'A'}, {RTF_CACHE, 'C'},   {RTF_REJECT, '!'}, {RTF_NONEXTHOP, 'n'},
};

/// Walks the fields of a line; remembers when one was missing or no number.
class Fields {
public:
    explicit Fields(std::string_view line) : line_(line) {}

    std::string_view word() {
        const std::string_view word = takeWord(line_);
        whole_ = whole_ && !word.empty();
        return word;
    }
    std::uint32_t hex() { return number(word(), 16); }
    std::uint32_t decimal() {
        const std::string_view digits = word();
        const bool negative = digits.starts_with('-');
        const std::uint32_t value = number(digits.substr(negative ? 1 : 0), 10);
        return negative ? 0 - value : value;
    }
    bool whole() const { return whole_; }

private:
    std::uint32_t number(std::string_view digits, int base) {
        const auto value = parseNumber(digits, base);
        whole_ = whole_ && value.has_value();
        return static_cast<std::uint32_t>(value.value_or(0));
    }
    std::string_view line_;
    bool whole_ = true;
};

std::string inetText(std::uint32_t address) {
    return textOf(in_addr{address});
}

/// The kernel's counters and metrics are shown as signed numbers: the last of all IPv6 routes has -1.
Text& addSigned(Text& text, std::uint32_t value) {
    return text.number(static_cast<std::int32_t>(value));
}

void addLeft(Text& text, std::uint32_t value, std::size_t width) {
    const std::size_t mark = text.size();
    addSigned(text, value).padLeftAligned(mark, width).add(' ');
}

void addRight(Text& text, std::uint32_t value, std::size_t width) {
    const std::size_t mark = text.size();
    addSigned(text, value).padRightAligned(mark, width).add(' ');
}

template <std::size_t Count>
std::string lettersOf(std::uint32_t flags, const FlagLetter (&table)[Count]) {
    std::string letters;
    for (const auto& [flag, letter] : table) {
        if (flags & flag) letters += letter;
    }
    return letters;
}

void addRoute(Text& text, std::string_view line) {
    Fields fields(line);
    const std::string_view interface = fields.word();
    const std::uint32_t destination = fields.hex();
    const std::uint32_t gateway = fields.hex();
    const std::uint32_t flags = fields.hex();
    const std::uint32_t references = fields.decimal();
    const std::uint32_t use = fields.decimal();
    const std::uint32_t metric = fields.decimal();
    const std::uint32_t mask = fields.hex();
    if (!fields.whole() || !(flags & RTF_UP)) return;
    text.left(inetText(destination), 16).left(inetText(gateway), 16).left(inetText(mask), 16);
    const char first = flags & RTF_REJECT ? '!' : 'U';
    text.left(first + lettersOf(flags, inetLetters), 6);
    addLeft(text, metric, 6);
    addLeft(text, references, 2);
    addRight(text, use, 7);
    text.add(interface).add('\n');
}

/// @return empty when the digits are no address
std::string inet6Text(std::string_view digits) {
    in6_addr address{};
    return parsePlainInet6(digits, address) ? textOf(address) : std::string();
}

void addInet6Route(Text& text, std::string_view line) {
    Fields fields(line);
    const std::string destination = inet6Text(fields.word());
    const std::uint32_t prefix = fields.hex();
    fields.word();  // source
    fields.word();  // length of the source's prefix
    const std::string nextHop = inet6Text(fields.word());
    const std::uint32_t metric = fields.hex();
    const std::uint32_t references = fields.hex();
    const std::uint32_t use = fields.hex();
    const std::uint32_t flags = fields.hex();
    const std::string_view interface = fields.word();
    if (!fields.whole() || destination.empty() || nextHop.empty()) return;
    text.left(Text().add(destination).add('/').number(prefix), 43).add(' ');
    text.left(nextHop, 39).add(' ').left(lettersOf(flags, inet6Letters), 5).add(' ');
    addLeft(text, metric, 6);
    addLeft(text, references, 2);
    addRight(text, use, 7);
    text.left(interface, 8).add('\n');
}

}  // namespace

Text listRoutes(std::string_view procNetRoute) {
    Text text;
    text.add("Kernel IP routing table\n");
    text.add("Destination     Gateway         Genmask         Flags Metric Ref    Use Iface\n");
    takeLine(procNetRoute);  // its heading
    while (!procNetRoute.empty()) addRoute(text, takeLine(procNetRoute));
    return text;
}

Text listInet6Routes(std::string_view procNetIpv6Route) {
    Text text;
    text.add("Kernel IPv6 routing table\n");
    text.left("Destination", 44).left("Next Hop", 40).add("Flags Metric Ref    Use Iface\n");
    while (!procNetIpv6Route.empty()) addInet6Route(text, takeLine(procNetIpv6Route));
    return text;
}

}  // namespace hosttools
