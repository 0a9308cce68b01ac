#include "plugins/hardware/watcher.h"

#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <set>
#include <string_view>
#include <system_error>
#include <utility>

namespace hardware {

namespace {

constexpr int kSettlingMilliseconds = 200;
constexpr unsigned int kDeviceNews = 1;  // the kernel's own group; udev's is 2

/// -1 where the kernel gives none: the tree then shows what the start has found.
int openNews(int protocol, unsigned int groups) {
    const int news = socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, protocol);
    sockaddr_nl address{};
    address.nl_family = AF_NETLINK;
    address.nl_groups = groups;
    if (news >= 0 && bind(news, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
        close(news);
        return -1;
    }
    return news;
}

/// One message of the kernel; others may send to the group, too.
/// @return nothing more to read: false
bool receive(int news, std::string& message, bool& dropped) {
    std::array<char, 16384> buffer{};
    iovec piece{buffer.data(), buffer.size()};
    sockaddr_nl sender{};
    msghdr header{};
    header.msg_name = &sender;
    header.msg_namelen = sizeof sender;
    header.msg_iov = &piece;
    header.msg_iovlen = 1;
    const ssize_t length = recvmsg(news, &header, 0);
    dropped = dropped || (length < 0 && errno == ENOBUFS);
    message =
        length > 0 && sender.nl_pid == 0 ? std::string(buffer.data(), static_cast<std::size_t>(length)) : "";
    return length > 0 || (length < 0 && (errno == ENOBUFS || errno == EINTR));
}

/// Adds what the news of one socket concern; "" stands for everything.
void collect(int news, const char* fixed, std::set<std::string>& concerned) {
    bool dropped = false;
    for (std::string message; news >= 0 && receive(news, message, dropped);) {
        const std::string subsystem = fixed != nullptr ? fixed : Watcher::subsystemOf(message);
        if (!message.empty() && !subsystem.empty()) {
            concerned.insert(subsystem);
        }
    }
    if (dropped) {
        concerned.insert("");
    }
}

}  // namespace

std::string Watcher::subsystemOf(const std::string& message) {
    constexpr std::string_view kKey("\0SUBSYSTEM=", 11);
    const std::size_t start = message.find(kKey);
    return start == std::string::npos
               ? ""
               : std::string(message.substr(start + kKey.size(),
                                            message.find('\0', start + 1) - start - kKey.size()));
}

Watcher::Watcher(std::function<void(const std::string&)> changed)
    : changed_(std::move(changed)),
      devices_(openNews(NETLINK_KOBJECT_UEVENT, kDeviceNews)),
      links_(openNews(NETLINK_ROUTE, RTMGRP_LINK)),
      end_(eventfd(0, EFD_CLOEXEC)) {
    sigset_t all;
    sigset_t before;
    sigfillset(&all);
    pthread_sigmask(SIG_BLOCK, &all, &before);  // signals are the agent's
    try {
        thread_ = std::thread([this] { watch(); });
    } catch (const std::system_error&) {
        // No thread to be had: the tree shows what the start has found.
    }
    pthread_sigmask(SIG_SETMASK, &before, nullptr);
}

Watcher::~Watcher() {
    eventfd_write(end_, 1);
    if (thread_.joinable()) {
        thread_.join();
    }
    for (const int descriptor : {devices_, links_, end_}) {
        if (descriptor >= 0) {
            close(descriptor);
        }
    }
}

void Watcher::watch() const {
    std::set<std::string> concerned;
    for (;;) {
        std::array<pollfd, 3> all{{{end_, POLLIN, 0}, {devices_, POLLIN, 0}, {links_, POLLIN, 0}}};
        const int count = poll(all.data(), all.size(), concerned.empty() ? -1 : kSettlingMilliseconds);
        if (all[0].revents != 0 || (count < 0 && errno != EINTR)) {
            return;
        }
        collect(devices_, nullptr, concerned);
        collect(links_, "net", concerned);
        if (count == 0) {
            const bool everything = concerned.contains("");
            for (const std::string& subsystem : everything ? std::set<std::string>{""} : concerned) {
                changed_(subsystem);
            }
            concerned.clear();
        }
    }
}

}  // namespace hardware
