#include "hosttools/netlink.h"

#include <linux/if_addr.h>
#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <net/if.h>
#include <sys/socket.h>
#include <cerrno>
#include <memory>
#include <string>

namespace hosttools {
namespace {

// The kernel puts up to 32 KiB into a datagram when it sees that it is asked for so much.
constexpr std::size_t datagramBytes = 65536;

constexpr std::size_t aligned(std::size_t length) {
    return (length + 3) & ~std::size_t{3};
}

/// Takes one length-prefixed object off the front. Empty when it is damaged.
template <typename Header>
std::string_view takeObject(std::string_view& bytes, std::size_t length) {
    if (length < sizeof(Header) || length > bytes.size()) return {};
    const std::string_view object = bytes.substr(0, length);
    bytes.remove_prefix(std::min(aligned(length), bytes.size()));
    return object;
}

int errorOf(std::string_view body) {
    const auto number = readPlain<int>(body);
    return number ? -*number : EPROTO;
}

}  // namespace

void eachAttribute(std::string_view attributes,
                   const std::function<void(unsigned, std::string_view)>& visit) {
    while (const auto header = readPlain<nlattr>(attributes)) {
        const std::string_view attribute = takeObject<nlattr>(attributes, header->nla_len);
        if (attribute.empty()) return;
        visit(header->nla_type & NLA_TYPE_MASK, attribute.substr(sizeof(nlattr)));
    }
}

int eachMessage(std::string_view datagram, const MessageVisitor& visit, bool& done) {
    int error = 0;
    while (const auto header = readPlain<nlmsghdr>(datagram)) {
        const std::string_view message = takeObject<nlmsghdr>(datagram, header->nlmsg_len);
        if (message.empty()) return EPROTO;
        const std::string_view body = message.substr(sizeof(nlmsghdr));
        if ((header->nlmsg_flags & NLM_F_DUMP_INTR) != 0) error = EINTR;
        if (header->nlmsg_type == NLMSG_ERROR) {
            done = true;
            return errorOf(body);
        }
        if (header->nlmsg_type == NLMSG_DONE) {
            done = true;
        } else {
            visit(header->nlmsg_type, body);
            done = done || (header->nlmsg_flags & NLM_F_MULTI) == 0;
        }
    }
    return error;
}

std::string makeRequest(unsigned type, unsigned flags, std::string_view body, std::string_view attributes) {
    nlmsghdr header{};
    header.nlmsg_type = static_cast<std::uint16_t>(type);
    header.nlmsg_flags = static_cast<std::uint16_t>(NLM_F_REQUEST | flags);
    header.nlmsg_len = static_cast<std::uint32_t>(aligned(sizeof header + body.size()) + attributes.size());
    std::string request(bytesOf(header));
    request += body;
    request.resize(aligned(request.size()));
    request += attributes;
    return request;
}

std::string makeAttribute(unsigned type, std::string_view data) {
    const nlattr header{static_cast<std::uint16_t>(sizeof header + data.size()),
                        static_cast<std::uint16_t>(type)};
    std::string attribute(bytesOf(header));
    attribute += data;
    attribute.resize(aligned(attribute.size()));
    return attribute;
}

NetlinkSocket::NetlinkSocket(int protocol)
    : socket_(socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, protocol)),
      problem_(socket_.isOpen() ? 0 : errno) {}

void NetlinkSocket::enable(int option) {
    const int on = 1;
    setsockopt(socket_.get(), SOL_NETLINK, option, &on, sizeof on);
}

int NetlinkSocket::ask(std::string_view request, const MessageVisitor& visit,
                       const std::function<void(std::string_view)>& datagrams) {
    if (problem_ != 0) return problem_;
    if (send(socket_.get(), request.data(), request.size(), 0) < 0) return errno;
    const auto buffer = std::make_unique_for_overwrite<char[]>(datagramBytes);
    int result = 0;
    for (bool done = false; !done;) {
        const ssize_t got = recv(socket_.get(), buffer.get(), datagramBytes, 0);
        if (got < 0 && errno == EINTR) continue;
        if (got <= 0) return got < 0 ? errno : EPROTO;
        const std::string_view datagram(buffer.get(), static_cast<std::size_t>(got));
        if (datagrams) datagrams(datagram);
        const int error = eachMessage(datagram, visit, done);
        if (error == EPROTO) return error;
        if (error != 0) result = error;
    }
    return result;
}

Netlink::Netlink() : socket_(NETLINK_ROUTE) {
    // Lets a request for addresses name a link.
    socket_.enable(NETLINK_GET_STRICT_CHK);
}

int Netlink::links(const MessageVisitor& visit) {
    return socket_.ask(makeRequest(RTM_GETLINK, NLM_F_DUMP, bytesOf(ifinfomsg{})), visit);
}

int Netlink::addresses(int link, const MessageVisitor& visit) {
    ifaddrmsg address{};
    address.ifa_family = AF_INET;
    address.ifa_index = static_cast<std::uint32_t>(link);
    return socket_.ask(makeRequest(RTM_GETADDR, NLM_F_DUMP, bytesOf(address)), visit);
}

int Netlink::link(std::string_view name, const MessageVisitor& visit) {
    if (name.empty() || name.size() >= IFNAMSIZ) return ENODEV;
    const std::string attribute = makeAttribute(IFLA_IFNAME, std::string(name) + '\0');
    return socket_.ask(makeRequest(RTM_GETLINK, 0, bytesOf(ifinfomsg{}), attribute), visit);
}

}  // namespace hosttools
