#include "framework/netinfo/ip_interface_info.h"

#include <arpa/inet.h>
#include <ifaddrs.h>
#include <netinet/in.h>

#include <array>
#include <bit>
#include <cstring>
#include <deque>

#include "framework/netinfo/sysfs.h"

namespace {

template <class Address>
Address copied(const sockaddr* from) {
    Address address{};
    std::memcpy(&address, from, sizeof(address));
    return address;
}

std::string text(int family, const void* address) {
    std::array<char, INET6_ADDRSTRLEN> buffer{};
    const char* const result = inet_ntop(family, address, buffer.data(), buffer.size());
    return result != nullptr ? result : "";
}

void fillIPv4(CIPInfo& info, const ifaddrs& entry) {
    const auto address = copied<sockaddr_in>(entry.ifa_addr);
    info.address = text(AF_INET, &address.sin_addr);
    if (entry.ifa_netmask != nullptr) {
        const auto mask = copied<sockaddr_in>(entry.ifa_netmask);
        info.mask = text(AF_INET, &mask.sin_addr);
        info.prefixLength = static_cast<unsigned int>(std::popcount(mask.sin_addr.s_addr));
    }
}

void fillIPv6(CIPInfo& info, const ifaddrs& entry) {
    const auto address = copied<sockaddr_in6>(entry.ifa_addr);
    info.ipv6 = true;
    info.address = text(AF_INET6, &address.sin6_addr);
    if (entry.ifa_netmask != nullptr) {
        const auto mask = copied<sockaddr_in6>(entry.ifa_netmask);
        for (const unsigned char byte : mask.sin6_addr.s6_addr) {
            info.prefixLength += static_cast<unsigned int>(std::popcount(byte));
        }
    }
}

}  // namespace

struct CIPInterfaceInfo::Data {
    bool asked = false;
    bool answered = false;
    std::deque<CIPInfo> addresses;  // a deque: the map below points into it
    IPInfoByInterface byInterface;

    void ask();
};

void CIPInterfaceInfo::Data::ask() {
    asked = true;
    ifaddrs* first = nullptr;
    if (getifaddrs(&first) != 0) {
        return;
    }
    const std::unique_ptr<ifaddrs, decltype(&freeifaddrs)> owner(first, &freeifaddrs);
    for (const ifaddrs* entry = first; entry != nullptr; entry = entry->ifa_next) {
        const int family = entry->ifa_addr != nullptr ? entry->ifa_addr->sa_family : AF_UNSPEC;
        if (family != AF_INET && family != AF_INET6) {
            continue;
        }
        CIPInfo& info = addresses.emplace_back();
        info.interfaceName = entry->ifa_name;
        (family == AF_INET ? fillIPv4 : fillIPv6)(info, *entry);
        byInterface[info.interfaceName].push_back(&info);
    }
    answered = true;
}

CIPInterfaceInfo::CIPInterfaceInfo() : data_(std::make_unique<Data>()) {}
CIPInterfaceInfo::~CIPInterfaceInfo() = default;

std::string CIPInterfaceInfo::getMACAddress(std::string name) const {
    return netinfo::readAttribute(netinfo::kClassDirectory, name, "address");
}

const IPInfoByInterface* CIPInterfaceInfo::getInterfaceIPsInfo() {
    if (!data_->asked) {
        data_->ask();
    }
    return data_->answered ? &data_->byInterface : nullptr;
}
