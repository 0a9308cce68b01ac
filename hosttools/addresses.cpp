#include "hosttools/addresses.h"

#include <arpa/inet.h>

#include "hosttools/files.h"

namespace hosttools {

std::string textOf(in_addr address) {
    char shown[INET_ADDRSTRLEN];
    return inet_ntop(AF_INET, &address, shown, sizeof shown);
}

std::string textOf(const in6_addr& address) {
    char shown[INET6_ADDRSTRLEN];
    return inet_ntop(AF_INET6, &address, shown, sizeof shown);
}

bool parsePlainInet6(std::string_view digits, in6_addr& address) {
    if (digits.size() != 2 * sizeof address.s6_addr) return false;
    if (digits.find_first_not_of("0123456789abcdefABCDEF") != std::string_view::npos) return false;
    for (std::size_t index = 0; index < sizeof address.s6_addr; ++index) {
        address.s6_addr[index] = static_cast<std::uint8_t>(*parseNumber(digits.substr(2 * index, 2), 16));
    }
    return true;
}

bool parseInet(const char* text, in_addr& address) {
    return inet_aton(std::string_view(text) == "default" ? "0.0.0.0" : text, &address) != 0;
}

}  // namespace hosttools
