#include "agent/shell/kernel_news.h"

#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>

namespace cvagent::shell {

namespace {

constexpr unsigned group(unsigned number) {
    return 1U << (number - 1);
}

constexpr unsigned kGroups = group(RTNLGRP_LINK) | group(RTNLGRP_IPV4_IFADDR) | group(RTNLGRP_IPV6_IFADDR) |
                             group(RTNLGRP_IPV4_ROUTE) | group(RTNLGRP_IPV6_ROUTE) |
                             group(RTNLGRP_IPV6_PREFIX) | group(RTNLGRP_IPV6_IFINFO) | group(RTNLGRP_NEXTHOP);

/// The network that this thread is in; 0 where nobody tells.
ino_t ownNetwork() {
    struct stat found {};
    return stat("/proc/thread-self/ns/net", &found) == 0 ? found.st_ino : 0;
}

}  // namespace

/// A child process may have a network of its own, and its parent's socket tells of the parent's; so does one
/// of before this process has gone to another network.
bool KernelNews::subscribe() {
    owner_ = getpid();
    network_ = ownNetwork();
    hosttools::Descriptor made(socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, NETLINK_ROUTE));
    sockaddr_nl address{};
    address.nl_family = AF_NETLINK;
    address.nl_groups = kGroups;
    const auto* const plain = reinterpret_cast<const sockaddr*>(&address);
    const bool bound = made.isOpen() && bind(made.get(), plain, sizeof address) == 0;
    socket_ = bound ? std::move(made) : hosttools::Descriptor();
    return bound;
}

/// @return whether there was nothing
bool KernelNews::drain() const {
    bool quiet = true;
    for (std::array<char, 1> begin{};;) {
        // What was changed is not looked at: everything is read anew.
        if (recv(socket_.get(), begin.data(), begin.size(), MSG_TRUNC) >= 0 || errno == ENOBUFS) {
            quiet = false;
        } else if (errno != EINTR) {
            return quiet && (errno == EAGAIN || errno == EWOULDBLOCK);
        }
    }
}

bool KernelNews::isQuiet() {
    if (!socket_.isOpen() || owner_ != getpid() || network_ != ownNetwork()) {
        subscribe();
        return false;
    }
    return drain();
}

}  // namespace cvagent::shell
