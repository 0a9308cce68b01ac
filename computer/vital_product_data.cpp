#include <string>

#include "mi/command.h"
#include "mi/log.h"
#include "mi/os_hw_mi.h"

namespace IC {

/// Refreshes the system's vital-product-data database. Hosts have one of the two tools, or none.
void OsHwMI::vpdUpdate() {
    const LogScope scope;
    for (const char* tool : {"/usr/sbin/vpdupdate 2> /dev/null", "/sbin/update-lsvpd-db 2> /dev/null"}) {
        const HostCommand run{std::string(tool)};
    }
}

}  // namespace IC
