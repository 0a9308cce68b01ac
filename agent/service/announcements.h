#pragma once

#include <cstdint>
#include <functional>
#include <string_view>

namespace cvagent::service {

/// What the kernel announces by one netlink protocol. One thread.
class Announcements {
public:
    /// @param groups as a mask. Where the kernel gives no such socket nothing is ever announced.
    Announcements(int protocol, std::uint32_t groups);
    Announcements(const Announcements&) = delete;
    Announcements& operator=(const Announcements&) = delete;
    ~Announcements();

    /// -1 where there is none.
    int descriptor() const { return socket_; }

    using Take = std::function<void(std::string_view message)>;
    /// Hands on what waits, but only so much at a time; the rest makes the descriptor ready again. What
    /// others than the kernel have sent is passed over.
    /// @return whether the kernel had to drop some
    bool takeWaiting(const Take& take) const;
    /// Asks the kernel by a socket of its own for all of a kind (a dump) and hands the answers on.
    /// @return whether they came whole
    static bool askForAll(int protocol, std::uint16_t type, const Take& take);

private:
    int socket_;
};

}  // namespace cvagent::service
