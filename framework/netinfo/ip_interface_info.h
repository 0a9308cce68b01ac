#pragma once

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "framework/export.h"
#include "framework/netinfo/records.h"

using IPInfoByInterface = std::map<std::string, std::vector<CIPInfo*>>;

/// Addresses of the host's interfaces. What is handed out lives as long as the object. One object, one
/// thread.
class CORVISTA_API CIPInterfaceInfo {
public:
    CIPInterfaceInfo();
    CIPInterfaceInfo(const CIPInterfaceInfo&) = delete;
    CIPInterfaceInfo& operator=(const CIPInterfaceInfo&) = delete;
    ~CIPInterfaceInfo();

    /// The hardware address from /sys/class/net/<name>/address, lower-case; "" when there is none.
    std::string getMACAddress(std::string name) const;
    /// IPv4 and IPv6 addresses by interface, asked of the kernel at the first call; null when it does not
    /// answer.
    const IPInfoByInterface* getInterfaceIPsInfo();

private:
    struct Data;
    std::unique_ptr<Data> data_;
};
