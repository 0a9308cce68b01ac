// Preloaded into the system's own ethtool: what the kernel answers to its questions comes from files, so that
// it prints network cards that the machine does not have. FAKE_ETHTOOL is their directory. A file has the
// number of a question's command for its name and holds the attributes of the answer. Without ethtool netlink
// ("none" in place of a directory) the tool has to use the older calls; FAKE_SETTINGS is then the bit of the
// one link mode that the card has, or -1 for all of them.
#include <dlfcn.h>
#include <linux/ethtool.h>
#include <linux/genetlink.h>
#include <linux/netlink.h>
#include <linux/sockios.h>
#include <net/if.h>
#include <sys/ioctl.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdarg>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iterator>
#include <string>

namespace {

struct Asked {
    unsigned family = 0;
    unsigned command = 0;
};
Asked asked;

template <typename Function>
Function next(const char* name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

std::string directory() {
    const char* const value = std::getenv("FAKE_ETHTOOL");
    return value != nullptr ? value : "";
}

void note(const void* message, std::size_t size) {
    nlmsghdr header{};
    genlmsghdr generic{};
    if (size < sizeof header + sizeof generic) return;
    std::memcpy(&header, message, sizeof header);
    std::memcpy(&generic, static_cast<const char*>(message) + sizeof header, sizeof generic);
    asked = {header.nlmsg_type, header.nlmsg_type == GENL_ID_CTRL ? 0U : generic.cmd};
}

template <typename Plain>
void append(std::string& bytes, const Plain& plain) {
    bytes.append(reinterpret_cast<const char*>(&plain), sizeof plain);
}

/// The answer from the file, and the acknowledgement behind it when the kernel's was an error.
std::string answerInPlaceOf(const nlmsghdr& real, const std::string& attributes) {
    constexpr std::size_t kHead = sizeof(nlmsghdr) + sizeof(genlmsghdr);
    std::string bytes;
    append(bytes, nlmsghdr{static_cast<__u32>(kHead + attributes.size()), static_cast<__u16>(asked.family), 0,
                           real.nlmsg_seq, real.nlmsg_pid});
    append(bytes, genlmsghdr{static_cast<__u8>(asked.command), 1, 0});
    bytes += attributes;
    if (real.nlmsg_type == NLMSG_ERROR) {
        append(bytes,
               nlmsghdr{sizeof(nlmsghdr) + sizeof(nlmsgerr), NLMSG_ERROR, 0, real.nlmsg_seq, real.nlmsg_pid});
        append(bytes, nlmsgerr{});
    }
    return bytes;
}

bool isAcknowledgement(const nlmsghdr& header, const char* bytes) {
    int error = 0;
    std::memcpy(&error, bytes + sizeof header, sizeof error);
    return header.nlmsg_type == NLMSG_ERROR && error == 0;
}

void fillIn(ethtool_link_settings& settings, int only) {
    constexpr int kWords = 4;
    if (settings.link_mode_masks_nwords != kWords) {
        settings.link_mode_masks_nwords = -kWords;
        return;
    }
    settings.speed = SPEED_2500;
    settings.duplex = DUPLEX_HALF;
    settings.port = PORT_TP;
    settings.phy_address = 3;
    settings.transceiver = XCVR_EXTERNAL;
    settings.autoneg = AUTONEG_ENABLE;
    settings.eth_tp_mdix = ETH_TP_MDI_X;
    settings.eth_tp_mdix_ctrl = ETH_TP_MDI_AUTO;
    std::array<std::uint32_t, std::size_t{3} * kWords> masks{};
    for (unsigned bit = 0; bit < 32U * masks.size(); ++bit) {
        if (only < 0 || bit % (32U * kWords) == static_cast<unsigned>(only))
            masks[bit / 32] |= 1U << (bit % 32);
    }
    std::memcpy(&settings + 1, masks.data(), sizeof masks);
}

void fillIn(ethtool_wolinfo& wake) {
    wake.supported = 0xff;
    wake.wolopts = WAKE_MAGIC | WAKE_ARP;
    std::ranges::fill(wake.sopass, 0);
    wake.sopass[1] = 0xab;
}

}  // namespace

extern "C" {

int ioctl(int descriptor, unsigned long request, ...) noexcept {
    static const auto real = next<int (*)(int, unsigned long, void*)>("ioctl");
    va_list rest;
    va_start(rest, request);
    void* const argument = va_arg(rest, void*);
    va_end(rest);
    const char* const only = std::getenv("FAKE_SETTINGS");
    if (request != SIOCETHTOOL || only == nullptr) return real(descriptor, request, argument);
    void* const data = static_cast<ifreq*>(argument)->ifr_data;
    const std::uint32_t command = *static_cast<std::uint32_t*>(data);
    if (command == ETHTOOL_GLINKSETTINGS) {
        fillIn(*static_cast<ethtool_link_settings*>(data), std::atoi(only));
    } else if (command == ETHTOOL_GWOL) {
        fillIn(*static_cast<ethtool_wolinfo*>(data));
    } else if (command == ETHTOOL_GMSGLVL) {
        static_cast<ethtool_value*>(data)->data = 0xffff;
    } else {
        return real(descriptor, request, argument);
    }
    return 0;
}

int socket(int domain, int type, int protocol) noexcept {
    static const auto real = next<int (*)(int, int, int)>("socket");
    if (domain == AF_NETLINK && protocol == NETLINK_GENERIC && directory() == "none") {
        errno = EPROTONOSUPPORT;
        return -1;
    }
    return real(domain, type, protocol);
}

ssize_t sendto(int socket, const void* data, size_t size, int flags, const sockaddr* address,
               socklen_t length) {
    static const auto real =
        next<ssize_t (*)(int, const void*, size_t, int, const sockaddr*, socklen_t)>("sendto");
    note(data, size);
    return real(socket, data, size, flags, address, length);
}

ssize_t sendmsg(int socket, const msghdr* message, int flags) {
    static const auto real = next<ssize_t (*)(int, const msghdr*, int)>("sendmsg");
    note(message->msg_iov[0].iov_base, message->msg_iov[0].iov_len);
    return real(socket, message, flags);
}

ssize_t recvmsg(int socket, msghdr* message, int flags) {
    static const auto real = next<ssize_t (*)(int, msghdr*, int)>("recvmsg");
    const ssize_t got = real(socket, message, flags);
    if (got < static_cast<ssize_t>(sizeof(nlmsghdr)) || (flags & MSG_PEEK) != 0 || asked.command == 0)
        return got;
    char* const bytes = static_cast<char*>(message->msg_iov[0].iov_base);
    nlmsghdr header{};
    std::memcpy(&header, bytes, sizeof header);
    std::ifstream file(directory() + "/" + std::to_string(asked.command), std::ios::binary);
    if (!file || isAcknowledgement(header, bytes)) return got;
    const std::string attributes((std::istreambuf_iterator<char>(file)), {});
    const std::string answer = answerInPlaceOf(header, attributes);
    if (answer.size() > message->msg_iov[0].iov_len) return got;
    std::ranges::copy(answer, bytes);
    return static_cast<ssize_t>(answer.size());
}
}
