#include "agent/change/name_keeper.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstddef>
#include <cstring>

#include "agent/change/cannot.h"
#include "hosttools/descriptor.h"

namespace cvagent::change {

namespace {

using hosttools::Descriptor;

constexpr std::size_t kLongestName = 64;  // of the kernel

/// A name without a file, which only the copy of the network knows.
sockaddr_un placeOfKeeper(socklen_t& size) {
    constexpr std::string_view kName{"\0corvista-rehearsal-name", 24};
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::memcpy(static_cast<char*>(address.sun_path), kName.data(), kName.size());
    size = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + kName.size());
    return address;
}

template <int (*Call)(int, const sockaddr*, socklen_t)>
long atPlace(const Descriptor& handle) {
    socklen_t size = 0;
    const sockaddr_un address = placeOfKeeper(size);
    return Call(handle.get(), reinterpret_cast<const sockaddr*>(&address), size);
}

Descriptor packets() {
    return Descriptor(socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0));
}

/// Answers with one byte where it could.
void serve(const Descriptor& caller) {
    std::array<char, kLongestName> name{};
    const ssize_t got = recv(caller.get(), name.data(), name.size(), 0);
    if (got > 0 && sethostname(name.data(), static_cast<std::size_t>(got)) == 0) {
        send(caller.get(), "", 1, MSG_NOSIGNAL);
    }
}

}  // namespace

void startNameKeeper() {
    constexpr int kWaiting = 16;
    const Descriptor door = packets();
    must(atPlace<bind>(door), "the host's name cannot be kept apart");
    must(listen(door.get(), kWaiting), "the host's name cannot be kept apart");
    const pid_t keeper = fork();
    must(keeper, "no process");
    if (keeper == 0) {
        for (;;) {
            const Descriptor caller(accept4(door.get(), nullptr, nullptr, SOCK_CLOEXEC));
            serve(caller);
        }
    }
}

bool nameKeeperSets(const std::string& name) {
    const Descriptor keeper = packets();
    char done = 0;
    return name.size() <= kLongestName && atPlace<connect>(keeper) == 0 &&
           send(keeper.get(), name.data(), name.size(), MSG_NOSIGNAL) >= 0 &&
           recv(keeper.get(), &done, 1, 0) == 1;
}

}  // namespace cvagent::change
