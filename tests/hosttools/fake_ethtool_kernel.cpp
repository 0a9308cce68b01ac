// Preloaded into the system's own ethtool: what the kernel answers to its questions comes from files, so that
// it prints network cards that the machine does not have. FAKE_ETHTOOL is their directory. A file has the
// number of a question's command for its name and holds the attributes of the answer. Or, when ethtool
// netlink is missing ("none" in place of a directory), the tool has to use the older calls.
#include <dlfcn.h>
#include <linux/genetlink.h>
#include <linux/netlink.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>
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

}  // namespace

extern "C" {

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
