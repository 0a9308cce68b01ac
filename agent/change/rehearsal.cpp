#include "agent/change/rehearsal.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <utility>

#include "agent/change/request_json.h"
#include "agent/core/command_deadline.h"
#include "agent/core/program_path.h"
#include "agent/core/text.h"
#include "agent/shell/starts.h"
#include "hosttools/descriptor.h"

namespace cvagent::change {

namespace {

using hosttools::Descriptor;
using Clock = std::chrono::steady_clock;

constexpr const char* kProgram = "corvista-rehearsal";
/// Files of a host are kilobytes; a plug-in that prints without end is not read to it.
constexpr std::size_t kMostAnswer = 64U << 20U;
constexpr long long kBetweenQuestions = 200;  // milliseconds
constexpr long kConnectTime = 10;             // seconds

[[noreturn]] void fail(const std::string& what, int error) {
    throw CannotRehearse("cannot try the change: " + what + ": " + std::strerror(error));
}

std::string findProgram() {
    auto built = besideProgram({".", "../agent"}, kProgram);
    auto found = built ? built : besideProgram({"../lib/corvista"}, kProgram);
    if (!found) {
        throw CannotRehearse(std::string("the program ") + kProgram + " is not installed");
    }
    return *std::move(found);
}

/// Only root's processes are believed there.
Descriptor connectedTo(const std::string& place) {
    sockaddr_un address{};
    if (place.size() >= sizeof(address.sun_path)) {
        throw CannotRehearse("cannot try the change: the name of the socket is too long");
    }
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, place.data(), place.size());
    Descriptor socket(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const timeval longest{kConnectTime, 0};
    if (!socket.isOpen() ||
        setsockopt(socket.get(), SOL_SOCKET, SO_SNDTIMEO, &longest, sizeof(longest)) != 0 ||
        connect(socket.get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)) != 0) {
        fail("nobody answers at " + inQuotes(place), errno);
    }
    ucred peer{};
    socklen_t size = sizeof(peer);
    if (getsockopt(socket.get(), SOL_SOCKET, SO_PEERCRED, &peer, &size) != 0 || peer.uid != 0) {
        throw CannotRehearse("cannot try the change: it is not root who answers at " + inQuotes(place));
    }
    return socket;
}

/// The program at work. It ends with everything that it has started when the other end of its socket is
/// closed, so it cannot outlive this process either.
class Rehearsal {
public:
    explicit Rehearsal(const RehearsalSettings& settings) : goesOn_(settings.goesOn) {
        if (!settings.socket.empty()) {
            ours_ = connectedTo(settings.socket);
            return;
        }
        std::string program = settings.program.empty() ? findProgram() : settings.program;
        std::array<int, 2> ends{-1, -1};
        if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends.data()) != 0) {
            fail("no socket", errno);
        }
        ours_ = Descriptor(ends[0]);
        const Descriptor theirs(ends[1]);
        start(program, theirs.get());
    }
    Rehearsal(const Rehearsal&) = delete;
    Rehearsal& operator=(const Rehearsal&) = delete;
    ~Rehearsal() {
        if (process_ > 0) {
            kill(process_, SIGKILL);
            while (waitpid(process_, nullptr, 0) < 0 && errno == EINTR) {
            }
        }
    }

    void ask(std::string_view request) const {
        while (!request.empty()) {
            const ssize_t sent = send(ours_.get(), request.data(), request.size(), MSG_NOSIGNAL);
            if (sent < 0 && errno != EINTR) {
                return;  // it has ended; its answer tells why
            }
            request.remove_prefix(sent > 0 ? static_cast<std::size_t>(sent) : 0);
        }
    }

    std::string answer(Clock::time_point end) const {
        std::string text;
        std::array<char, 65536> part{};
        for (;;) {
            waitForMore(end);
            const ssize_t got = recv(ours_.get(), part.data(), part.size(), 0);
            if (got == 0 || (got < 0 && errno != EINTR)) {
                return text;
            }
            text.append(part.data(), static_cast<std::size_t>(got > 0 ? got : 0));
            if (text.size() > kMostAnswer) {
                throw CannotRehearse("what the change does is too much to be told");
            }
        }
    }

private:
    void start(std::string& program, int socket) {
        std::array<char*, 2> words{program.data(), nullptr};
        posix_spawn_file_actions_t actions;
        posix_spawn_file_actions_init(&actions);
        posix_spawn_file_actions_adddup2(&actions, socket, STDIN_FILENO);
        posix_spawn_file_actions_adddup2(&actions, socket, STDOUT_FILENO);
        posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, "/dev/null", O_WRONLY, 0);
        const shell::Start gate;
        const int error = posix_spawn(&process_, program.c_str(), &actions, nullptr, words.data(), environ);
        posix_spawn_file_actions_destroy(&actions);
        if (error != 0) {
            fail("cannot start " + inQuotes(program), error);
        }
    }

    void waitForMore(Clock::time_point end) const {
        for (;;) {
            const auto left = std::chrono::ceil<std::chrono::milliseconds>(end - Clock::now()).count();
            pollfd ready{ours_.get(), POLLIN, 0};
            const auto slice = goesOn_ ? std::min<long long>(left, kBetweenQuestions) : left;
            const int result = left > 0 ? poll(&ready, 1, static_cast<int>(slice)) : 0;
            if (result > 0) {
                return;
            }
            if (goesOn_ && !goesOn_()) {
                throw CannotRehearse("the agent ends");
            }
            if (left <= 0) {
                throw CannotRehearse("the change did not come to an end in time where it was tried");
            }
        }
    }

    const std::function<bool()> goesOn_;
    Descriptor ours_;
    pid_t process_ = -1;
};

}  // namespace

Plan rehearse(const RehearsalSettings& settings, const std::vector<Change>& changes) {
    const auto end = Clock::now() + settings.longest;
    const CommandScope own(CommandScope::ours);  // no command of a plug-in, whose time is limited otherwise
    const Rehearsal rehearsal(settings);
    rehearsal.ask(
        toJson({settings.plugins, settings.dataDirectory, settings.hostTools, settings.commands, changes}) +
        '\n');
    const std::string text = rehearsal.answer(end);
    try {
        RehearsalAnswer answer = answerFromJson(text);
        if (answer.cannot.empty()) {
            return std::move(answer.plan);
        }
        throw CannotRehearse("the change cannot be tried beforehand: " + answer.cannot);
    } catch (const BadPlan&) {
        throw CannotRehearse("the program that tries the change has failed");
    }
}

}  // namespace cvagent::change
