#pragma once

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <functional>
#include <optional>
#include <string_view>
#include <type_traits>

#include "hosttools/descriptor.h"
#include "hosttools/files.h"

namespace hosttools {

/// Reads a structure off the front of bytes that need not be aligned for it. Nothing when there are too few.
template <typename Plain>
std::optional<Plain> readPlain(std::string_view bytes) {
    static_assert(std::is_trivially_copyable_v<Plain>);
    if (bytes.size() < sizeof(Plain)) return std::nullopt;
    Plain plain;
    std::memcpy(&plain, bytes.data(), sizeof plain);
    return plain;
}

/// The same for a structure that later kernels have made longer: members that are not there are 0.
template <typename Plain>
Plain readPadded(std::string_view bytes) {
    static_assert(std::is_trivially_copyable_v<Plain>);
    Plain plain{};
    std::memcpy(&plain, bytes.data(), std::min(bytes.size(), sizeof plain));
    return plain;
}

/// Calls visit(type, data) for each attribute; a damaged one ends the walk.
void eachAttribute(std::string_view attributes, const std::function<void(unsigned, std::string_view)>& visit);

/// Called with the type of each message and what stands behind its header.
using MessageVisitor = std::function<void(unsigned, std::string_view)>;

/// Calls visit for each message of a datagram.
/// @param done set when the last message of an answer was among them
/// @return 0, or the error number that the kernel answered (EINTR: the answer changed while it was read)
int eachMessage(std::string_view datagram, const MessageVisitor& visit, bool& done);

/// A message. @param body what stands between the header and the attributes
std::string makeRequest(unsigned type, unsigned flags, std::string_view body,
                        std::string_view attributes = {});
std::string makeAttribute(unsigned type, std::string_view data);

/// The bytes of a plain structure.
template <typename Plain>
std::string_view bytesOf(const Plain& plain) {
    static_assert(std::is_trivially_copyable_v<Plain>);
    return {reinterpret_cast<const char*>(&plain), sizeof plain};
}

/// A netlink socket. One question at a time.
class NetlinkSocket {
public:
    /// @param protocol NETLINK_ROUTE and so on
    explicit NetlinkSocket(int protocol);

    /// Sends a request and calls visit for each message of the answer.
    /// @param datagrams when given, called with each whole datagram first
    /// @return 0 or an error number
    int ask(std::string_view request, const MessageVisitor& visit,
            const std::function<void(std::string_view)>& datagrams = {});
    /// Switches one of NETLINK_GET_STRICT_CHK and so on, on; a kernel without it does without.
    void enable(int option);

private:
    Descriptor socket_;
    int problem_;  ///< why there is no socket, or 0
};

/// A routing netlink socket.
class Netlink {
public:
    Netlink();

    /// Asks for all links and visits each.
    /// @return 0 or an error number; EINTR when the links changed meanwhile, so that some may be missing or
    /// doubled
    int links(const MessageVisitor& visit);
    /// Asks for one link by its name.
    /// @return 0 or an error number, ENODEV when there is no such link
    int link(std::string_view name, const MessageVisitor& visit);
    /// Asks for the IPv4 addresses.
    /// @param link index of the link whose addresses are wanted, 0 for all; a kernel before 4.20 answers with
    /// all of them
    /// @return as links()
    int addresses(int link, const MessageVisitor& visit);

private:
    NetlinkSocket socket_;
};

}  // namespace hosttools
