#include "network/address_parse.h"

#include "mi/text.h"
#include "network/link_parse.h"

namespace IC::parse {

std::optional<AddressAndPrefix> addressAndPrefix(const std::string& line) {
    const auto slash = line.find('/');
    if (slash == line.npos) {
        return std::nullopt;
    }
    return AddressAndPrefix{line.substr(0, slash),
                            static_cast<unsigned int>(leadingNumber(line.substr(slash + 1)))};
}

bool isAutoconfigured(const std::string& line) {
    return contains(line, "dynamic");
}

unsigned int addressKind(const std::string& scope) {
    // The word is compared as it came from the pipeline, line break and all, so that every scope gives 5.
    // Management stations have always been told 5 for an interface with IPv6 alone: do not trim the word.
    return scope == "Link" ? 6 : 5;
}

std::optional<std::string> gatewayField(const std::string& line) {
    const auto destination = line.find_first_not_of(' ');
    const auto blank = line.find(' ', destination);
    const auto gateway = line.find_first_not_of(' ', blank);
    if (destination == line.npos || blank == line.npos || gateway == line.npos) {
        return std::nullopt;
    }
    return trimEnd(line.substr(gateway, line.find(' ', gateway) - gateway));
}

std::string unquoted(const std::string& line) {
    std::string value = trimEnd(line);
    std::erase_if(value, [](char letter) { return letter == '\'' || letter == '"'; });
    return value;
}

std::string dhcpv6Server(const std::string& line) {
    return trimEnd(trimEnd(line), ';');
}

}  // namespace IC::parse
