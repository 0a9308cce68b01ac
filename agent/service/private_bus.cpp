#include "agent/service/private_bus.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <system_error>
#include <thread>

#include "agent/core/problem.h"
#include "agent/core/text.h"
#include "agent/service/users.h"

namespace cvagent::service {

namespace {

constexpr const char* kSocket = "bus";
constexpr const char* kConfig = "bus.conf";
constexpr int kStartTime = 5000;  // milliseconds for its start
constexpr std::array kPrograms = {"/usr/bin/dbus-daemon", "/bin/dbus-daemon", "/usr/local/bin/dbus-daemon"};

constexpr const char* kConfigurationHead =
    R"(<!DOCTYPE busconfig PUBLIC "-//freedesktop//DTD D-Bus Bus Configuration 1.0//EN"
 "http://www.freedesktop.org/standards/dbus/1.0/busconfig.dtd">
<busconfig>
)";
/// Everybody may call the agent and the bus, and own, send to and signal nothing else.
constexpr const char* kEverybody = R"(  <auth>EXTERNAL</auth>
  <policy context="default">
    <allow user="*"/>
    <deny own="*"/>
    <deny send_type="method_call"/>
    <deny send_type="signal"/>
    <allow send_requested_reply="true" send_type="method_return"/>
    <allow send_requested_reply="true" send_type="error"/>
    <allow receive_type="method_call"/>
    <allow receive_type="method_return"/>
    <allow receive_type="error"/>
    <allow receive_type="signal"/>
    <allow send_destination="org.freedesktop.DBus"/>
    <deny send_destination="org.freedesktop.DBus" send_interface="org.freedesktop.DBus"
          send_member="UpdateActivationEnvironment"/>
    <allow send_destination="com.vantrel.Corvista1" send_type="method_call"/>
  </policy>
)";
constexpr const char* kOwner = R"(    <allow own="*"/>
    <allow send_type="signal"/>
    <allow send_type="method_call"/>
)";
struct Limit {
    const char* name;
    long value;
};
/// A reader that stops costs the daemon what may wait for him (outgoing), and nobody else anything. What the
/// agent has sent and nobody has read counts as incoming, and at that limit the daemon listens to the agent
/// no more: it lies beyond what may wait for all connections together.
constexpr std::array<Limit, 12> kLimits = {{{"max_outgoing_bytes", 1L << 20},
                                            {"max_incoming_bytes", 2047L << 20},
                                            {"max_message_size", 32L << 20},
                                            {"max_completed_connections", 512},
                                            {"max_incomplete_connections", 256},
                                            {"max_connections_per_user", 256},
                                            {"max_pending_service_starts", 1},
                                            {"max_names_per_connection", 4},
                                            {"max_match_rules_per_connection", 64},
                                            {"max_replies_per_connection", 128},
                                            {"auth_timeout", 5000},
                                            {"reply_timeout", 900000}}};

[[noreturn]] void failToStart(const std::string& why) {
    throw Problem(Problem::failed, "cannot start a bus of our own: " + why);
}

const char* program() {
    for (const char* file : kPrograms) {
        if (access(file, X_OK) == 0) {
            return file;
        }
    }
    failToStart("there is no dbus-daemon (package dbus-daemon)");
}

/// Without an entry its clients are turned away as soon as they are connected.
void checkUserIsKnown(uid_t user) {
    if (!nameOfUser(user)) {
        failToStart("dbus-daemon lets nobody in who is not in /etc/passwd, and uid " + std::to_string(user) +
                    " is not");
    }
}

std::string escapedXml(const std::string& text) {
    std::string escaped;
    for (const char byte : text) {
        escaped += byte == '&' ? "&amp;" : byte == '<' ? "&lt;" : byte == '>' ? "&gt;" : std::string(1, byte);
    }
    return escaped;
}

/// Bytes of an address that stand for themselves; others are written as %2f.
std::string escapedAddress(const std::string& path) {
    constexpr std::string_view kPlain = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-_/.";
    constexpr std::string_view kDigits = "0123456789abcdef";
    std::string escaped;
    for (const char byte : path) {
        const auto code = static_cast<unsigned char>(byte);
        if (kPlain.find(byte) != std::string_view::npos) {
            escaped += byte;
        } else {
            escaped += {'%', kDigits[code >> 4U], kDigits[code & 0xFU]};
        }
    }
    return escaped;
}

/// Only in the child: what it does before it becomes the daemon. It dies with this process.
[[noreturn]] void becomeDaemon(const char* file, const std::string& config, pid_t parent) {
    prctl(PR_SET_PDEATHSIG, SIGTERM);
    if (getppid() != parent) {
        _exit(1);
    }
    const std::string option = "--config-file=" + config;
    execl(file, file, "--nofork", "--nopidfile", "--nosyslog", "--print-address=1", option.c_str(),
          static_cast<char*>(nullptr));
    _exit(127);
}

}  // namespace

std::string privateBusConfig(const std::string& socket, uid_t owner) {
    std::string text = kConfigurationHead;
    text +=
        "  <type>corvista</type>\n  <listen>unix:path=" + escapedXml(escapedAddress(socket)) + "</listen>\n";
    text += kEverybody;
    for (const std::string& user : {std::string("0"), std::to_string(owner)}) {
        text += "  <policy user=\"" + user + "\">\n" + kOwner + "  </policy>\n";
    }
    for (const Limit& limit : kLimits) {
        text +=
            "  <limit name=\"" + std::string(limit.name) + "\">" + std::to_string(limit.value) + "</limit>\n";
    }
    return text + "</busconfig>\n";
}

std::string PrivateBus::standardDirectory() {
    const char* runtime = std::getenv("XDG_RUNTIME_DIR");
    if (geteuid() == 0 || runtime == nullptr || *runtime != '/') {
        return "/run/corvista";
    }
    return std::string(runtime) + "/corvista";
}

/// One that was killed a moment ago may have left a child that has the lock until it becomes another program.
void PrivateBus::takeDirectory(const std::string& directory) {
    constexpr int kAttempts = 20;
    constexpr std::chrono::milliseconds kBetween{50};
    for (int attempt = 1; !directory_; ++attempt) {
        try {
            directory_.emplace(directory, DirectoryRole{Problem::none, "", "directory of the bus"});
        } catch (const std::system_error& error) {
            failToStart("the directory " + inQuotes(directory) + ": " + error.code().message());
        } catch (const Problem& problem) {
            if (problem.kind() != Problem::busy) {
                failToStart(problem.what());
            }
            if (attempt == kAttempts) {
                throw Problem(Problem::busy,
                              "another cvagentd has a bus of its own in " + inQuotes(directory));
            }
            std::this_thread::sleep_for(kBetween);
        }
    }
}

PrivateBus::PrivateBus(const std::string& directory) {
    takeDirectory(directory);
    const std::string path = directory_->path();
    chmod(path.c_str(), 0755);  // what others may do is the bus's business
    place_ = open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    const std::string config = path + kConfig;
    for (const char* name : {kSocket, kConfig}) {  // of one that ended by force
        unlinkat(place_, name, 0);
    }
    std::ofstream(config) << privateBusConfig(path + kSocket, geteuid());
    start(config);
}

void PrivateBus::start(const std::string& config) {
    const char* file = program();
    checkUserIsKnown(geteuid());
    std::array<int, 2> pipe{-1, -1};
    if (pipe2(pipe.data(), O_CLOEXEC) != 0) {
        failToStart(std::strerror(errno));
    }
    const pid_t parent = getpid();
    daemon_ = fork();
    if (daemon_ == 0) {
        dup2(pipe[1], STDOUT_FILENO);
        becomeDaemon(file, config, parent);
    }
    const int error = errno;
    close(pipe[1]);
    if (daemon_ > 0) {
        waitForAddress(pipe[0]);
    }
    close(pipe[0]);
    if (daemon_ < 0) {
        failToStart(std::strerror(error));
    }
    if (address_.empty()) {
        failToStart("dbus-daemon does not start");
    }
}

/// It prints the address when its socket is there.
void PrivateBus::waitForAddress(int pipe) {
    pollfd readable{pipe, POLLIN, 0};
    std::array<char, 512> text{};
    if (poll(&readable, 1, kStartTime) == 1 && read(pipe, text.data(), text.size()) > 0) {
        address_ = "unix:path=" + escapedAddress(directory_->path() + kSocket);
    }
}

PrivateBus::~PrivateBus() {
    if (daemon_ > 0) {
        kill(daemon_, SIGTERM);
        waitpid(daemon_, nullptr, 0);
    }
    for (const char* name : {kSocket, kConfig}) {
        unlinkat(place_, name, 0);
    }
    close(place_);
}

}  // namespace cvagent::service
