#include "agent/undo/renewed_lease.h"

#include <linux/if_addr.h>
#include <linux/rtnetlink.h>
#include <net/if.h>

#include <chrono>
#include <ctime>
#include <string_view>
#include <thread>

#include "agent/undo/boot_clock.h"
#include "agent/undo/message_parts.h"
#include "agent/undo/network_messages.h"

namespace cvagent::undo {

namespace {

constexpr std::chrono::milliseconds kBetweenRenewalLooks{20};

/// As the kernel stamps addresses, in hundredths of a second.
std::uint32_t kernelsNow() {
    constexpr std::uint64_t kHundred = 100;
    constexpr std::uint64_t kTenMilliseconds = 10'000'000;
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<std::uint32_t>(static_cast<std::uint64_t>(now.tv_sec) * kHundred +
                                      static_cast<std::uint64_t>(now.tv_nsec) / kTenMilliseconds);
}

}  // namespace

RenewedLease::RenewedLease(const std::string& link) : link_(if_nametoindex(link.c_str())), old_(stamp()) {
    constexpr std::uint32_t kOldEnough = 110;
    constexpr std::uint64_t kLongestUntilOld = 2000;  // one may be renewed every second
    const std::uint64_t end = bootMilliseconds() + kLongestUntilOld;
    while (old_ && kernelsNow() - *old_ < kOldEnough &&
           bootMilliseconds() < end) {  // it wraps, as the stamp does
        std::this_thread::sleep_for(kBetweenRenewalLooks);
        old_ = stamp();
    }
}

void RenewedLease::wait() const {
    constexpr std::uint64_t kLongestUntilRenewed = 3000;
    const std::uint64_t end = bootMilliseconds() + kLongestUntilRenewed;
    while (old_ && stamp() == old_ && bootMilliseconds() < end) {
        std::this_thread::sleep_for(kBetweenRenewalLooks);
    }
}

/// When it was set or renewed. Nothing where there is none.
std::optional<std::uint32_t> RenewedLease::stamp() const {
    hosttools::NetlinkSocket socket(NETLINK_ROUTE);
    ifaddrmsg ofIpv4{};
    ofIpv4.ifa_family = AF_INET;
    std::optional<std::uint32_t> found;
    const auto look = [&](unsigned type, std::string_view body) {
        const NetworkMessage message{type, std::string(body)};
        const Parts<ifaddrmsg> parts(message);
        const auto lifetime = hosttools::readPlain<ifa_cacheinfo>(parts[IFA_CACHEINFO]);
        const bool isLeased = lifetime && lifetime->ifa_valid != ~0U;
        if (isLeased && parts.fixed().ifa_index == link_) {
            found = lifetime->tstamp;
        }
    };
    socket.ask(hosttools::makeRequest(RTM_GETADDR, NLM_F_DUMP, hosttools::bytesOf(ofIpv4)), look);
    return found;
}

}  // namespace cvagent::undo
