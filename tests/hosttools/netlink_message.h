#pragma once

#include <linux/netlink.h>

#include <string>

/// Builds netlink messages as the kernel sends them.
namespace message {

template <typename Plain>
std::string bytes(const Plain& plain) {
    return {reinterpret_cast<const char*>(&plain), sizeof plain};
}

inline std::string padded(std::string text) {
    text.resize((text.size() + 3) & ~std::size_t{3});
    return text;
}

inline std::string attribute(unsigned type, const std::string& data) {
    const nlattr header{static_cast<std::uint16_t>(sizeof header + data.size()),
                        static_cast<std::uint16_t>(type)};
    return padded(bytes(header) + data);
}

template <typename Plain>
std::string attribute(unsigned type, const Plain& data) {
    return attribute(type, bytes(data));
}

inline std::string text(unsigned type, const std::string& data) {
    return attribute(type, data + '\0');
}

inline std::string whole(unsigned type, unsigned flags, const std::string& body) {
    nlmsghdr header{};
    header.nlmsg_len = static_cast<std::uint32_t>(sizeof header + body.size());
    header.nlmsg_type = static_cast<std::uint16_t>(type);
    header.nlmsg_flags = static_cast<std::uint16_t>(flags);
    return padded(bytes(header) + body);
}

}  // namespace message
