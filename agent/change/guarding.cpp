#include "agent/change/guarding.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <set>
#include <system_error>
#include <thread>

#include "agent/core/command_deadline.h"
#include "agent/core/own_directory.h"
#include "agent/core/program_path.h"
#include "agent/shell/starts.h"
#include "framework/qx/corvista_utilities.h"

namespace cvagent::change {

namespace {

namespace fs = std::filesystem;
using undo::ChangeError;
using Words = std::vector<std::string>;

constexpr const char* kGuardProgram = "corvista-guard";
constexpr const char* kNetworkSettings = "/etc/sysconfig/network";
constexpr const char* kSavedSettings = "/opt/vantrel/corvista/data";  // of interfaces, wherever data are kept
constexpr std::chrono::seconds kLongestStart{10};
constexpr std::chrono::milliseconds kGuardLook{5};

std::string findGuard() {
    auto built = besideProgram({".", "../agent"}, kGuardProgram);
    auto found = built ? built : besideProgram({"../lib/corvista"}, kGuardProgram);
    if (!found) {
        throw ChangeError(std::string("the program ") + kGuardProgram + " is not installed");
    }
    return *std::move(found);
}

/// Nothing of this process is handed down: no signal that it holds back, no variable, no open file.
pid_t spawnGuard(Words& words) {
    std::vector<char*> given;
    std::ranges::transform(words, std::back_inserter(given), [](std::string& word) { return word.data(); });
    given.push_back(nullptr);
    std::string path = "PATH=/usr/sbin:/usr/bin:/sbin:/bin";
    std::array<char*, 2> environment{path.data(), nullptr};
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    for (const int each : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        posix_spawn_file_actions_addopen(&actions, each, "/dev/null", O_RDWR, 0);
    }
    posix_spawnattr_t attributes;
    posix_spawnattr_init(&attributes);
    sigset_t none;
    sigemptyset(&none);
    posix_spawnattr_setsigmask(&attributes, &none);
    posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETSIGMASK);
    pid_t process = -1;
    const shell::Start gate;
    const int error =
        posix_spawn(&process, given.front(), &actions, &attributes, given.data(), environment.data());
    posix_spawnattr_destroy(&attributes);
    posix_spawn_file_actions_destroy(&actions);
    return error == 0 ? process : -1;
}

/// @return whether it has ended well in time
bool runs(Words words) {
    const pid_t process = spawnGuard(words);
    const auto end = std::chrono::steady_clock::now() + kLongestStart;
    int status = 0;
    while (process > 0) {
        const pid_t ended = waitpid(process, &status, WNOHANG);
        if (ended == process) {
            return WIFEXITED(status) && WEXITSTATUS(status) == 0;
        }
        if (ended < 0 && errno != EINTR) {
            return false;
        }
        if (std::chrono::steady_clock::now() >= end) {
            kill(process, SIGKILL);
            waitpid(process, nullptr, 0);
            return false;
        }
        std::this_thread::sleep_for(kGuardLook);
    }
    return false;
}

bool isAtWork(const undo::ChangeDirectory& change) {
    const auto end = std::chrono::steady_clock::now() + kLongestStart;
    while (!change.isTaken(undo::kGuardLock)) {
        if (std::chrono::steady_clock::now() >= end) {
            return false;
        }
        std::this_thread::sleep_for(kGuardLook);
    }
    return true;
}

/// What lives in the session of who logged in ends with it on some hosts, a unit does not. A DHCP client that
/// comes back with the change outlives the guard.
bool isStartedBySystemd(const std::string& guard, const std::string& number) {
    const auto* const program =
        fs::exists("/usr/bin/systemd-run") ? "/usr/bin/systemd-run" : "/bin/systemd-run";
    return fs::exists("/run/systemd/system") && fs::exists(program) &&
           runs({program, "--quiet", "--collect", "--unit=corvista-guard-" + number,
                 "--description=Takes change " + number + " of this host back unless it is confirmed",
                 "--property=Restart=on-failure", "--property=RestartSec=100ms",
                 "--property=StartLimitIntervalSec=0", "--property=KillMode=process", "--", guard, number});
}

void addZone(std::set<std::string>& paths) {
    for (const char* each : {"/etc/localtime", "/etc/localtime.bak", "/etc/timezone", "/etc/sysconfig/clock",
                             "/etc/sysconfig/clock.bak"}) {
        paths.insert(each);
    }
}

void addNetwork(std::set<std::string>& paths) {
    for (const char* each : {"/etc/hosts", "/etc/HOSTNAME", "/etc/hostname", "/etc/resolv.conf",
                             "/etc/sysconfig/network/config", "/etc/sysconfig/network/routes"}) {
        paths.insert(each);
    }
    const std::string settings = kNetworkSettings;
    std::error_code none;
    for (const auto& entry : fs::directory_iterator(kNetworkSettings, none)) {
        if (entry.is_regular_file(none)) {
            paths.insert(entry.path());
        }
    }
    for (const auto& link : fs::directory_iterator("/sys/class/net", none)) {
        paths.insert(settings + "/ifroute-" + link.path().filename().string());
        paths.insert(settings + "/ifcfg-" + link.path().filename().string());
    }
}

// What stands in the data directory; other writes may go on there, so only where no plan says what it will
// be.

void addOwners(std::set<std::string>& paths) {
    const char* const directory = QX::CorvistaUtilities::getMoraineDataDir();
    if (directory != nullptr) {
        paths.insert(std::string(directory) + "asset.dat");
    }
}

void addSavedSettings(std::set<std::string>& paths) {
    std::error_code none;
    for (const auto& entry : fs::directory_iterator(kSavedSettings, none)) {
        if (entry.path().filename().string().starts_with("ifcfg-") && entry.is_regular_file(none)) {
            paths.insert(entry.path());
        }
    }
    for (const auto& link : fs::directory_iterator("/sys/class/net", none)) {
        paths.insert(std::string(kSavedSettings) + "/ifcfg-" + link.path().filename().string());
    }
}

}  // namespace

std::vector<std::string> touchedPaths(const std::vector<FileChange>& planned, bool isOfNetwork) {
    std::set<std::string> paths;
    for (const FileChange& file : planned) {
        const bool isLock = file.path.ends_with("/.lock");  // of who makes the change
        if (!isLock && !file.path.starts_with("/tmp/")) {
            paths.insert(file.path);
        }
    }
    addZone(paths);
    if (isOfNetwork) {
        addNetwork(paths);
    }
    if (planned.empty()) {
        addOwners(paths);
    }
    if (planned.empty() && isOfNetwork) {
        addSavedSettings(paths);
    }
    std::error_code none;
    for (const std::string& link : std::set<std::string>(paths)) {
        const fs::path target = fs::is_symlink(link, none) ? fs::canonical(link, none) : fs::path();
        if (!target.empty() && fs::is_regular_file(target, none) && !target.string().starts_with("/usr/")) {
            paths.insert(target);
        }
    }
    return {paths.begin(), paths.end()};
}

std::string changesPlace() {
    try {
        const DirectoryRole role{Problem::none, "", "directory of changes"};
        std::string place = ownDirectory(undo::kChangesPlace, role);
        place.pop_back();
        return place;
    } catch (const std::exception& error) {
        throw ChangeError(std::string(undo::kChangesPlace) + ": " + error.what());
    }
}

void startGuard(const undo::ChangeDirectory& change) {
    const CommandScope own(CommandScope::ours);
    const std::string guard = findGuard();
    const std::string number = std::to_string(change.number());
    const bool isStarted = (isStartedBySystemd(guard, number) && isAtWork(change)) ||
                           (runs({guard, "--detach", number}) && isAtWork(change));
    if (!isStarted) {
        throw ChangeError(std::string(kGuardProgram) + " does not start");
    }
}

}  // namespace cvagent::change
