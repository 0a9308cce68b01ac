#include "hosttools/ethtool_netlink.h"

#include <linux/ethtool_netlink.h>
#include <linux/genetlink.h>
#include <linux/netlink.h>
#include <cerrno>
#include <cstring>

#include "hosttools/netlink.h"

namespace hosttools {
namespace {

struct Question {
    std::uint8_t command;
    std::uint16_t header;
};

constexpr std::array<Question, linkQuestions> questions = {{
    {ETHTOOL_MSG_LINKMODES_GET, ETHTOOL_A_LINKMODES_HEADER},
    {ETHTOOL_MSG_LINKINFO_GET, ETHTOOL_A_LINKINFO_HEADER},
    {ETHTOOL_MSG_WOL_GET, ETHTOOL_A_WOL_HEADER},
    {ETHTOOL_MSG_DEBUG_GET, ETHTOOL_A_DEBUG_HEADER},
    {ETHTOOL_MSG_LINKSTATE_GET, ETHTOOL_A_LINKSTATE_HEADER},
}};

std::string makeGenericRequest(unsigned family, std::uint8_t command, std::string_view attributes) {
    genlmsghdr header{};
    header.cmd = command;
    header.version = 1;
    return makeRequest(family, 0, bytesOf(header), attributes);
}

/// @return the number by which the kernel knows it, 0 when it does not
unsigned findFamily(NetlinkSocket& socket, std::string_view name) {
    unsigned number = 0;
    const std::string attribute = makeAttribute(CTRL_ATTR_FAMILY_NAME, std::string(name) + '\0');
    const std::string request = makeGenericRequest(GENL_ID_CTRL, CTRL_CMD_GETFAMILY, attribute);
    socket.ask(request, [&](unsigned, std::string_view message) {
        if (message.size() < sizeof(genlmsghdr)) return;
        eachAttribute(message.substr(sizeof(genlmsghdr)), [&](unsigned type, std::string_view data) {
            if (type == CTRL_ATTR_FAMILY_ID) number = readPadded<std::uint16_t>(data);
        });
    });
    return number;
}

/// The words behind an error. They stand behind the head of the request that it is about.
void readComplaint(std::string_view datagram, LinkReply& reply) {
    const auto header = readPlain<nlmsghdr>(datagram);
    constexpr unsigned needed = NLM_F_CAPPED | NLM_F_ACK_TLVS;
    constexpr std::size_t head = sizeof(nlmsghdr) + sizeof(nlmsgerr);
    if (!header || header->nlmsg_type != NLMSG_ERROR || (header->nlmsg_flags & needed) != needed) return;
    if (datagram.size() < head) return;
    eachAttribute(datagram.substr(head), [&](unsigned type, std::string_view data) {
        if (type == NLMSGERR_ATTR_MSG) reply.complaint = data.substr(0, data.find('\0'));
        if (type == NLMSGERR_ATTR_OFFS) reply.offset = readPadded<std::uint32_t>(data);
    });
}

}  // namespace

bool askLink(std::string_view name, LinkReplies& replies) {
    NetlinkSocket socket(NETLINK_GENERIC);
    socket.enable(NETLINK_CAP_ACK);
    socket.enable(NETLINK_EXT_ACK);
    const unsigned family = findFamily(socket, ETHTOOL_GENL_NAME);
    if (family == 0) return false;
    const std::string device = makeAttribute(ETHTOOL_A_HEADER_DEV_NAME, std::string(name) + '\0');
    for (std::size_t number = 0; number < questions.size(); ++number) {
        LinkReply& reply = replies[number];
        const std::string header = makeAttribute(NLA_F_NESTED | questions[number].header, device);
        reply.error = socket.ask(
            makeGenericRequest(family, questions[number].command, header),
            [&](unsigned, std::string_view message) {
                reply.attributes = message.substr(std::min(sizeof(genlmsghdr), message.size()));
            },
            [&](std::string_view datagram) { readComplaint(datagram, reply); });
    }
    return true;
}

Text complaintsOf(const LinkReplies& replies) {
    Text text;
    for (const LinkReply& reply : replies) {
        if (reply.error == 0 || reply.error == EOPNOTSUPP) continue;
        if (!reply.complaint.empty()) {
            text.add("netlink error: ").add(reply.complaint);
            if (reply.offset != 0) text.add(" (offset ").number(reply.offset).add(")");
            text.add('\n');
        }
        text.add("netlink error: ").add(std::strerror(reply.error)).add('\n');
    }
    return text;
}

}  // namespace hosttools
