#include "agent/service/manager.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <ctime>

#include "agent/core/text.h"
#include "framework/qx/whole_number.h"

namespace cvagent::service {

namespace {

std::string variable(const char* name) {
    const char* value = std::getenv(name);
    return value != nullptr ? value : "";
}

}  // namespace

Manager::Manager() : socket_(variable("NOTIFY_SOCKET")) {
    const std::string process = variable("WATCHDOG_PID");
    const auto longest = QX::wholeNumber<long long>(variable("WATCHDOG_USEC"));
    if (longest && *longest > 1 && (process.empty() || process == std::to_string(getpid()))) {
        watchdog_ = std::chrono::microseconds(*longest / 2);
    }
}

void Manager::reloading() const {
    constexpr long kMicroseconds = 1000000;
    constexpr long kNanoseconds = 1000;
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    tell("RELOADING=1\nMONOTONIC_USEC=" +
         std::to_string(now.tv_sec * kMicroseconds + now.tv_nsec / kNanoseconds));
}

/// Where nobody listens nothing is lost.
void Manager::tell(const std::string& state) const {
    sockaddr_un address{};
    if (socket_.empty() || socket_.size() >= sizeof(address.sun_path) ||
        (socket_.front() != '/' && socket_.front() != '@')) {
        return;
    }
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, socket_.data(), socket_.size());
    if (socket_.front() == '@') {
        address.sun_path[0] = '\0';
    }
    const int descriptor = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    if (descriptor < 0) {
        return;
    }
    const auto length = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + socket_.size());
    sendto(descriptor, state.data(), state.size(), MSG_NOSIGNAL, reinterpret_cast<sockaddr*>(&address),
           length);
    close(descriptor);
}

}  // namespace cvagent::service
