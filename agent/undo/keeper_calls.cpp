#include "agent/undo/keeper_calls.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <optional>
#include <string_view>
#include <thread>

#include "agent/undo/boot_clock.h"
#include "agent/undo/networkd_links.h"
#include "agent/undo/renewed_lease.h"
#include "hosttools/files.h"
#include "hosttools/text.h"

namespace cvagent::undo {

namespace {

constexpr std::uint64_t kLongestCall = 20'000;
constexpr std::chrono::milliseconds kLookAtCall{10};

/// What was saved belongs to root alone. Still nothing else is run, whatever stands there.
struct KnownCall {
    std::string_view words;
    bool isOfLink;         ///< the link's name follows
    bool isWhileStarting;  ///< it makes files for who starts later
};
constexpr std::array kKnownCalls{
    KnownCall{"netplan generate", false, true},
    KnownCall{kNetworkdReload, false, false},
    KnownCall{"systemctl reset-failed systemd-resolved", false, false},
    KnownCall{"systemctl try-reload-or-restart systemd-resolved", false, false},
    KnownCall{"resolvconf -u", false, false},
    KnownCall{"nmcli connection reload", false, false},
    KnownCall{kReapply, true, false},
    KnownCall{"wicked ifreload", true, false},
    KnownCall{"ifdown", true, false},
    KnownCall{"ifup", true, false},
};

bool isLinkName(std::string_view text) {
    return !text.empty() && text.front() != '-' && std::ranges::all_of(text, [](unsigned char letter) {
        return std::isalnum(letter) != 0 ||
               std::string_view("._@=-").find(static_cast<char>(letter)) != std::string_view::npos;
    });
}

const KnownCall* knownCall(std::string_view call) {
    const auto* found = std::ranges::find_if(kKnownCalls, [call](const KnownCall& known) {
        if (!known.isOfLink) {
            return call == known.words;
        }
        const std::size_t name = known.words.size() + 1;
        return call.starts_with(known.words) && call.size() > name && call[name - 1] == ' ' &&
               isLinkName(call.substr(name));
    });
    return found == kKnownCalls.end() ? nullptr : found;
}

/// "" where it is not installed.
std::string programOf(const std::string& name) {
    for (const char* directory : {"/usr/sbin/", "/usr/bin/", "/sbin/", "/bin/"}) {
        if (access((directory + name).c_str(), X_OK) == 0) {
            return directory + name;
        }
    }
    return "";
}

/// In the child: it gets nothing of this process, which ignores signals, holds locks, is spared when memory
/// is short, and may be in the session of somebody who is cut off by this.
[[noreturn]] void become(char* const* words) {
    setsid();
    hosttools::writeAll(open("/proc/self/oom_score_adj", O_WRONLY | O_CLOEXEC), "0");
    for (int signal = 1; signal < NSIG; ++signal) {
        static_cast<void>(std::signal(signal, SIG_DFL));
    }
    sigset_t none;
    sigemptyset(&none);
    sigprocmask(SIG_SETMASK, &none, nullptr);
    const int nowhere = open("/dev/null", O_RDWR);
    for (const int each : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        dup2(nowhere, each);
    }
    constexpr unsigned kFirstOfOthers = 3;
    syscall(SYS_close_range, kFirstOfOthers, ~0U, 0);
    [[maybe_unused]] const int stays = chdir("/");
    umask(S_IWGRP | S_IWOTH);
    static char path[] = "PATH=/usr/sbin:/usr/bin:/sbin:/bin";
    std::array<char*, 2> environment{static_cast<char*>(path), nullptr};
    execve(words[0], words, environment.data());
    _exit(127);
}

/// @return nothing when it has not ended in time
std::optional<int> statusOf(pid_t process) {
    const std::uint64_t end = bootMilliseconds() + kLongestCall;
    for (int status = 0;;) {
        const pid_t ended = waitpid(process, &status, WNOHANG);
        if (ended == process || (ended < 0 && errno != EINTR)) {
            return ended == process ? status : -1;
        }
        if (bootMilliseconds() >= end) {
            return std::nullopt;
        }
        std::this_thread::sleep_for(kLookAtCall);
    }
}

/// @return what is wrong; "" for nothing
std::string problemOf(const std::string& call) {
    if (knownCall(call) == nullptr) {
        return "is not a command of this program's";
    }
    std::vector<std::string> words;
    std::string_view left = call;
    for (auto word = hosttools::takeWord(left); !word.empty(); word = hosttools::takeWord(left)) {
        words.emplace_back(word);
    }
    words[0] = programOf(words[0]);
    if (words[0].empty()) {
        return "is not installed";
    }
    std::vector<char*> given;
    std::ranges::transform(words, std::back_inserter(given), [](std::string& word) { return word.data(); });
    given.push_back(nullptr);
    const pid_t process = fork();
    if (process == 0) {
        become(given.data());
    }
    if (process < 0) {
        return std::string("cannot be run: ") + std::strerror(errno);
    }
    const auto status = statusOf(process);
    if (!status) {
        return "has not ended in time and is left to itself";
    }
    return *status == 0 ? "" : "has failed";
}

}  // namespace

KeeperCalls KeeperCalls::whileStarting() const {
    KeeperCalls calls{files, {}, {}};
    std::ranges::copy_if(after, std::back_inserter(calls.after), [](const std::string& call) {
        const KnownCall* known = knownCall(call);
        return known != nullptr && known->isWhileStarting;
    });
    return calls;
}

void runCalls(const std::vector<std::string>& calls, std::vector<std::string>& notes) {
    const std::string reapply = std::string(kReapply) + " ";
    for (const std::string& call : calls) {
        const NetworkdLinks links;
        const RenewedLease lease(call.starts_with(reapply) ? call.substr(reapply.size()) : "");
        if (const std::string problem = problemOf(call); !problem.empty()) {
            notes.push_back("'" + call + "' " + problem);
        } else if (call == kNetworkdReload) {
            links.waitUntilSetUp();
        } else {
            lease.wait();
        }
    }
}

}  // namespace cvagent::undo
