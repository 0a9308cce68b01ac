#pragma once

#include <string>
#include <utility>
#include <vector>

#include "mi/os_hw_mi.h"

namespace IC {

/// What tests set in the plug-in object in the place of its builders.
struct OsHwMITestAccess {
    static void setLists(OsHwMI& mi, std::vector<std::string> servers, std::vector<std::string> suffixes) {
        mi.dnsServers_ = std::move(servers);
        mi.dnsSuffixes_ = std::move(suffixes);
    }
    static MutableNode* computer(OsHwMI& mi) { return mi.computerNode_; }
};

}  // namespace IC
