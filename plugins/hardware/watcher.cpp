#include "plugins/hardware/watcher.h"

#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <exception>
#include <set>
#include <string_view>
#include <system_error>
#include <utility>

#include "plugins/hardware/quiet_thread.h"

namespace hardware {

namespace {

constexpr unsigned int kDeviceNews = 1;  // the kernel's own group; udev's is 2
constexpr int kAtOnce = 1000;            // messages taken from a socket before its clock is looked at

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
/// @return how many of its news concern something
int collect(int news, const char* fixed, std::set<std::string>& concerned) {
    bool dropped = false;
    int concern = 0;
    std::string message;
    for (int count = 0; news >= 0 && count < kAtOnce && receive(news, message, dropped); ++count) {
        const std::string subsystem = fixed != nullptr ? fixed : Watcher::subsystemOf(message);
        if (!message.empty() && !subsystem.empty()) {
            concerned.insert(subsystem);
            ++concern;
        }
    }
    if (dropped) {
        concerned.insert("");
        ++concern;
    }
    return concern;
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

Watcher::News Watcher::kernelNews() {
    return {openNews(NETLINK_KOBJECT_UEVENT, kDeviceNews), openNews(NETLINK_ROUTE, RTMGRP_LINK)};
}

Watcher::Watcher(Changed changed) : Watcher(std::move(changed), kernelNews(), Times()) {}

Watcher::Watcher(Changed changed, News news, Times times)
    : changed_(std::move(changed)),
      news_(news),
      times_(times),
      end_(eventfd(0, EFD_CLOEXEC)),
      told_(std::chrono::steady_clock::now()),
      everything_(told_) {
    if (end_ < 0) {
        return;  // a thread could not be told to end
    }
    try {
        thread_ = quietThread([this] { watch(); });
    } catch (const std::system_error&) {
        // No thread to be had: the tree shows what the start has found.
    }
}

Watcher::~Watcher() {
    if (thread_.joinable()) {
        eventfd_write(end_, 1);
        thread_.join();
    }
    for (const int descriptor : {news_.devices, news_.links, end_}) {
        if (descriptor >= 0) {
            close(descriptor);
        }
    }
}

int Watcher::waitMilliseconds() const {
    const auto until = concerned_.empty()
                           ? everything_ + times_.everything
                           : std::max(told_ + took_, std::min(first_ + times_.longest, last_ + times_.quiet));
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(until - std::chrono::steady_clock::now());
    return static_cast<int>(std::max<std::chrono::milliseconds::rep>(0, left.count()));
}

void Watcher::tell() {
    const Time start = std::chrono::steady_clock::now();
    if (concerned_.contains("") || start >= everything_ + times_.everything) {
        concerned_ = {""};
        everything_ = start;
    }
    for (const std::string& subsystem : concerned_) {
        try {
            changed_(subsystem);
        } catch (const std::exception&) {
            // No memory: the next look is another chance.
        }
    }
    concerned_.clear();
    told_ = std::chrono::steady_clock::now();
    took_ = told_ - start;
}

void Watcher::watch() {
    for (;;) {
        if (waitMilliseconds() == 0) {
            tell();
        }
        std::array<pollfd, 3> all{{{end_, POLLIN, 0}, {news_.devices, POLLIN, 0}, {news_.links, POLLIN, 0}}};
        const int count = poll(all.data(), all.size(), waitMilliseconds());
        const bool closed = ((all[1].revents | all[2].revents) & POLLNVAL) != 0;  // by somebody else
        if (all[0].revents != 0 || closed || (count < 0 && errno != EINTR)) {
            return;
        }
        const bool none = concerned_.empty();
        if (collect(news_.devices, nullptr, concerned_) + collect(news_.links, "net", concerned_) > 0) {
            last_ = std::chrono::steady_clock::now();
            first_ = none ? last_ : first_;
        }
    }
}

}  // namespace hardware
