#pragma once

#include <optional>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "hosttools/interfaces.h"
#include "hosttools/link_settings.h"

namespace cvagent::verify {

/// A file to be read line by line; without any lines when it is no regular file that can be read.
std::istringstream linesOf(const std::string& path);

/// What the kernel says at one moment: links and addresses by netlink, the rest out of /proc and /sys when it
/// is asked for. No process is started.
class Kernel {
public:
    Kernel();

    /// Why links and addresses are not known, as an errno; 0 when they are.
    int problem() const { return problem_; }
    /// Null when there is none of that name.
    const hosttools::Link* link(const std::string& name) const;
    const std::vector<hosttools::Link>& links() const { return interfaces_.links; }
    bool hasCarrier(const std::string& name) const;
    bool isUp(const std::string& name) const;
    /// The first line of a file of the link in sysfs; "" when there is none.
    static std::string attribute(const std::string& name, const std::string& file);
    /// The bond that the link is a member of; "" for none.
    static std::string bondOf(const std::string& name);
    /// What the driver says, of a link that is down as well; nothing when it says nothing.
    static std::optional<hosttools::LinkSettings> settingsOf(const std::string& name);
    /// Whether the driver tells how the link wakes the host; only root is told.
    static bool tellsWakeOnLan(const std::string& name);
    /// The first one of the link itself, not of an alias; null for none.
    const hosttools::InetAddress* inet(const std::string& name) const;
    /// The global ones, as texts with their prefix lengths.
    std::vector<std::pair<std::string, unsigned>> inet6(const std::string& name) const;
    /// Of the default routes; of one link, or of all for an empty name.
    static std::vector<std::string> gateways(const std::string& name);
    /// Of all routes of a link.
    static std::vector<std::string> inet6Gateways(const std::string& name);

private:
    hosttools::Interfaces interfaces_;
    int problem_;
};

}  // namespace cvagent::verify
