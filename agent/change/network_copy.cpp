#include "agent/change/network_copy.h"

#include <fcntl.h>
#include <linux/netlink.h>
#include <sched.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>

#include "agent/change/cannot.h"
#include "agent/change/json_parts.h"
#include "agent/change/kernel_state.h"
#include "agent/change/network_builder.h"
#include "hosttools/text.h"

namespace cvagent::change {

namespace {

using hosttools::Descriptor;

/// In a process of its own, for there is no way back from another network. The socket stays in the first one.
/// @param peers gets the network of the cables' other ends
std::string buildElsewhere(Descriptor& peers) {
    hosttools::NetlinkSocket host(NETLINK_ROUTE);
    const NetworkMessages network = readNetwork(host);
    const auto cannot = [] {
        return Json{
            {"cannot", std::string("the host allows no network of its own here: ") + std::strerror(errno)}}
            .dump();
    };
    if (unshare(CLONE_NEWNET) != 0) {
        return cannot();
    }
    hosttools::NetlinkSocket others(NETLINK_ROUTE);
    peers = Descriptor(open("/proc/self/ns/net", O_RDONLY | O_CLOEXEC));
    if (unshare(CLONE_NEWNET) != 0) {
        return cannot();
    }
    buildNetwork(network, {others, peers.get()});
    hosttools::NetlinkSocket copy(NETLINK_ROUTE);
    const KernelState is = linesOf(readNetwork(copy));
    const KernelState was = linesOf(network);
    return Json{{"missing", texts(missingFrom(is, was))},
                {"added", texts(missingFrom(was, is))},
                {"peers", peers.get()}}
        .dump();
}

std::string readAll(int pipe) {
    std::string text;
    std::array<char, 4096> part{};
    for (;;) {
        const ssize_t got = read(pipe, part.data(), part.size());
        if (got == 0 || (got < 0 && errno != EINTR)) {
            return text;
        }
        text.append(part.data(), static_cast<std::size_t>(got > 0 ? got : 0));
    }
}

/// Tells what it did and waits for its end, so that its network can be found.
[[noreturn]] void runBuilder(Descriptor& pipe) {
    Descriptor peers;
    const std::string told = buildElsewhere(peers) + '\n';
    [[maybe_unused]] const bool sent = hosttools::writeAll(pipe.get(), told);
    pipe.reset();
    for (;;) {
        pause();
    }
}

void end(pid_t process) {
    kill(process, SIGKILL);
    while (waitpid(process, nullptr, 0) < 0 && errno == EINTR) {
    }
}

}  // namespace

NetworkCopy copyNetwork() {
    std::array<int, 2> ends{-1, -1};
    must(pipe2(ends.data(), O_CLOEXEC), "no pipe");
    const Descriptor reader(ends[0]);
    Descriptor writer(ends[1]);
    const pid_t builder = fork();
    must(builder, "no process");
    if (builder == 0) {
        runBuilder(writer);
    }
    writer.reset();
    const std::string told = readAll(reader.get());
    NetworkCopy copy;
    const std::string place = "/proc/" + std::to_string(builder);
    const Json json = Json::parse(told, nullptr, false);
    copy.handle = Descriptor(open((place + "/ns/net").c_str(), O_RDONLY | O_CLOEXEC));
    if (json.contains("peers")) {
        const std::string number = std::to_string(json.at("peers").get<int>());
        copy.peers = Descriptor(open((place + "/fd/" + number).c_str(), O_RDONLY | O_CLOEXEC));
    }
    end(builder);
    if (!json.is_object()) {
        throw Cannot("the network could not be copied");
    }
    if (json.contains("cannot")) {
        throw Cannot(json.at("cannot").get<std::string>());
    }
    must(copy.handle.get(), "the network's copy cannot be entered");
    copy.missing = textsFrom(json.at("missing"));
    copy.added = textsFrom(json.at("added"));
    return copy;
}

void enterNetwork(const NetworkCopy& copy) {
    must(setns(copy.handle.get(), CLONE_NEWNET), "the network's copy cannot be entered");
}

}  // namespace cvagent::change
