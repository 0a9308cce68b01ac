#include "agent/change/recorders.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <filesystem>
#include <sstream>

#include "agent/change/cannot.h"
#include "agent/change/name_keeper.h"
#include "agent/core/program_path.h"

namespace cvagent::change {

namespace {

namespace fs = std::filesystem;

constexpr const char* kDirectories = "/tmp/.corvista-rehearsal-";  // one of ours begins so
constexpr std::array kNames = {"shutdown", "reboot",  "halt",    "poweroff",   "service",     "rpm",
                               "init",     "telinit", "hwclock", "systemctl",  "ifdown",      "ifup",
                               "wicked",   "netplan", "nmcli",   "networkctl", "hostnamectl", "resolvconf"};
// Only ask, mostly.
constexpr const char* kDate = "date";
constexpr const char* kHostName = "hostname";
constexpr int kCannotRun = 127;  // as a shell ends

bool isName(std::string_view name) {
    return std::ranges::find(kNames, name) != kNames.end();
}

bool setsClock(std::string_view word) {
    const bool isOption = word.starts_with("--") ? word.starts_with("--s") : word.starts_with("-s");
    return isOption || (!word.empty() && word.find_first_not_of("0123456789.") == std::string_view::npos);
}

/// Behind our own directory in PATH.
int runHostsOwn(const char* name, char** words) {
    const char* variable = std::getenv("PATH");
    std::istringstream directories(variable != nullptr ? variable : "");
    for (std::string directory; std::getline(directories, directory, ':');) {
        if (!directory.starts_with(kDirectories) && !directory.empty()) {
            execv((directory + "/" + name).c_str(), words);
        }
    }
    return kCannotRun;
}

}  // namespace

void putRecordersOnPath(bool withHostName) {
    const std::string program = fs::path(programDirectory()) / fs::read_symlink("/proc/self/exe").filename();
    must(access(program.c_str(), X_OK), "nothing can stand in for commands");
    std::string directory = std::string(kDirectories) + "XXXXXX";
    must(mkdtemp(directory.data()) != nullptr ? 0 : -1, "no place for what stands in for commands");
    const auto link = [&](const char* name) {
        must(symlink(program.c_str(), (directory + "/" + name).c_str()),
             std::string("nothing can stand in for ") + name);
    };
    std::ranges::for_each(kNames, link);
    link(kDate);
    if (withHostName) {
        link(kHostName);
    }
    const char* path = std::getenv("PATH");
    setenv("PATH", (directory + ":" + (path != nullptr ? path : "")).c_str(), 1);
}

std::optional<int> runAsRecorder(int count, char** words) {
    const std::string name = count > 0 ? fs::path(words[0]).filename().string() : "";
    if (isName(name)) {
        return EXIT_SUCCESS;
    }
    if (name == kHostName) {
        const bool sets = count == 2 && !std::string_view(words[1]).starts_with('-');
        const bool done = sets && nameKeeperSets(words[1]);
        return done ? EXIT_SUCCESS : sets ? EXIT_FAILURE : runHostsOwn(kHostName, words);
    }
    if (name != kDate) {
        return std::nullopt;
    }
    const bool sets = std::any_of(words + 1, words + count, setsClock);
    return sets ? EXIT_SUCCESS : runHostsOwn(kDate, words);
}

bool isRecorded(std::string_view command) {
    std::string spaced;
    for (const char each : command) {
        const bool divides = std::string_view("|;&()`").find(each) != std::string_view::npos;
        spaced += divides ? std::string(" ; ") : std::string(1, each);
    }
    std::istringstream words(spaced);
    bool first = true;
    for (std::string word; words >> word;) {
        if (first && isName(fs::path(word).filename().string())) {
            return true;
        }
        first = word == ";";
    }
    return false;
}

}  // namespace cvagent::change
