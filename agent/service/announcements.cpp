#include "agent/service/announcements.h"

#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <unistd.h>

#include <array>
#include <cerrno>

namespace cvagent::service {

namespace {

constexpr int kBuffer = 4 << 20;  // of the socket, used only while much is announced at once
constexpr int kAtOnce = 65536;    // messages: more than there is room for
constexpr time_t kDumpSeconds = 5;

int opened(int protocol, std::uint32_t groups, int flags) {
    const int made = socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC | flags, protocol);
    sockaddr_nl address{};
    address.nl_family = AF_NETLINK;
    address.nl_groups = groups;
    if (made >= 0 && bind(made, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
        close(made);
        return -1;
    }
    return made;
}

enum class Came { message, nothing, lost, other };

/// One message; a link's can be long where it has many virtual functions.
Came receive(int from, std::array<char, 65536>& buffer, std::string_view& message) {
    iovec piece{buffer.data(), buffer.size()};
    sockaddr_nl sender{};
    msghdr header{};
    header.msg_name = &sender;
    header.msg_namelen = sizeof sender;
    header.msg_iov = &piece;
    header.msg_iovlen = 1;
    const ssize_t size = recvmsg(from, &header, 0);
    if (size < 0) {
        return errno == ENOBUFS ? Came::lost : errno == EINTR ? Came::other : Came::nothing;
    }
    if (sender.nl_pid != 0) {
        return Came::other;
    }
    message = {buffer.data(), static_cast<std::size_t>(size)};
    return (header.msg_flags & MSG_TRUNC) != 0 ? Came::lost : Came::message;
}

/// Whether a dump ends with this message.
bool endsDump(std::string_view message, bool& whole) {
    auto left = static_cast<int>(message.size());
    for (const auto* header = reinterpret_cast<const nlmsghdr*>(message.data()); NLMSG_OK(header, left);
         header = NLMSG_NEXT(header, left)) {
        whole = whole && (header->nlmsg_flags & NLM_F_DUMP_INTR) == 0 && header->nlmsg_type != NLMSG_ERROR;
        if (header->nlmsg_type == NLMSG_DONE || header->nlmsg_type == NLMSG_ERROR) {
            return true;
        }
    }
    return false;
}

}  // namespace

Announcements::Announcements(int protocol, std::uint32_t groups)
    : socket_(opened(protocol, groups, SOCK_NONBLOCK)) {
    if (socket_ >= 0 && setsockopt(socket_, SOL_SOCKET, SO_RCVBUFFORCE, &kBuffer, sizeof kBuffer) != 0) {
        setsockopt(socket_, SOL_SOCKET, SO_RCVBUF, &kBuffer, sizeof kBuffer);  // as much as a user may have
    }
}

Announcements::~Announcements() {
    if (socket_ >= 0) {
        close(socket_);
    }
}

bool Announcements::takeWaiting(const Take& take) const {
    static thread_local std::array<char, 65536> buffer;
    bool lost = false;
    for (int count = 0; socket_ >= 0; ++count) {
        std::string_view message;
        const Came came = receive(socket_, buffer, message);
        if (came == Came::nothing) {
            break;
        }
        if (count >= kAtOnce) {
            return true;  // it comes faster than it can be taken
        }
        lost = lost || came == Came::lost;
        if (came == Came::message) {
            take(message);
        }
    }
    return lost;
}

bool Announcements::askForAll(int protocol, std::uint16_t type, const Take& take) {
    struct {
        nlmsghdr header;
        rtgenmsg family;
    } question{{sizeof question, type, NLM_F_REQUEST | NLM_F_DUMP, 1, 0}, {AF_UNSPEC}};
    const int asked = opened(protocol, 0, 0);
    const timeval patience{kDumpSeconds, 0};
    bool whole = asked >= 0 && setsockopt(asked, SOL_SOCKET, SO_RCVTIMEO, &patience, sizeof patience) == 0 &&
                 send(asked, &question, sizeof question, 0) == static_cast<ssize_t>(sizeof question);
    static thread_local std::array<char, 65536> buffer;
    for (bool done = !whole; !done;) {
        std::string_view message;
        const Came came = receive(asked, buffer, message);
        if (came == Came::message) {
            take(message);
            done = endsDump(message, whole);
        } else if (came != Came::other) {
            done = true;
            whole = false;
        }
    }
    if (asked >= 0) {
        close(asked);
    }
    return whole;
}

}  // namespace cvagent::service
