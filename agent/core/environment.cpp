#include "agent/core/environment.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "agent/core/owners.h"

namespace cvagent {

namespace {

namespace fs = std::filesystem;

constexpr std::string_view kKept[] = {"HOME", "NO_COLOR", "PATH", "TERM", "TZ", "XDG_STATE_HOME"};
constexpr std::string_view kSystemDirectories[] = {"/usr/local/sbin", "/usr/sbin", "/sbin", "/usr/bin",
                                                   "/bin"};
constexpr std::string_view kOwnPrefix = "CORVISTA_";
constexpr const char* kMark = "CVAGENT_COMMAND";

bool isKept(std::string_view name) {
    return name.starts_with(kOwnPrefix) ||
           std::find(std::begin(kKept), std::end(kKept), name) != std::end(kKept);
}

/// The C library opens any file that is named in place of a zone, be it a pipe that nobody writes to.
bool isZone(std::string_view value) {
    const std::string_view zone = value.substr(value.starts_with(':') ? 1 : 0);
    const bool isSystems = zone == "/etc/localtime" || zone.starts_with("/usr/share/zoneinfo/");
    return (!zone.starts_with('/') || isSystems) && zone.find("..") == zone.npos;
}

std::vector<std::pair<std::string, std::string>> keptVariables() {
    std::vector<std::pair<std::string, std::string>> kept;
    for (char** variable = environ; variable != nullptr && *variable != nullptr; ++variable) {
        const std::string text = *variable;
        const std::size_t equals = text.find('=');
        const std::string name = text.substr(0, equals);
        if (equals != std::string::npos && isKept(name) &&
            (name != "TZ" || isZone(text.substr(equals + 1)))) {
            kept.emplace_back(name, text.substr(equals + 1));
        }
    }
    return kept;
}

/// Whether users without rights can put a program there, or change the way to it.
bool isOpenToOthers(const fs::path& directory) {
    fs::path way;
    for (const fs::path& name : directory) {
        way /= name;
        struct stat found {};
        if (stat(way.c_str(), &found) != 0 || isSomebodyElses(found) ||
            othersCanReplace(way, found, way == directory, Writers::everybody)) {
            return true;
        }
    }
    return false;
}

/// The directory as it comes into PATH; "" when it must not. A relative one, the empty name among them, would
/// be one of "/", where the commands run. For root links are followed now, for who owns one can lead it
/// elsewhere later; the system's own stay as everybody knows them.
std::string usable(const std::string& directory) {
    if (!directory.starts_with('/')) {
        return "";
    }
    if (geteuid() != 0) {
        return directory;
    }
    std::error_code missing;
    const fs::path place = fs::canonical(directory, missing);
    if (missing || isOpenToOthers(place)) {
        return "";
    }
    const bool isSystems = std::ranges::find(kSystemDirectories, directory) != std::end(kSystemDirectories);
    return isSystems ? directory : place.string();
}

std::string safePath() {
    std::vector<std::string> directories = directoriesOnPath();
    std::ranges::transform(directories, directories.begin(), usable);
    std::erase(directories, "");
    for (const std::string_view directory : kSystemDirectories) {
        if (std::ranges::find(directories, directory) == directories.end()) {
            directories.emplace_back(directory);
        }
    }
    std::string path;
    for (const std::string& directory : directories) {
        path += (path.empty() ? "" : ":") + directory;
    }
    return path;
}

}  // namespace

void reduceEnvironment() {
    const auto kept = keptVariables();
    clearenv();
    for (const auto& [name, value] : kept) {
        setenv(name.c_str(), value.c_str(), 1);
    }
    setenv("PATH", safePath().c_str(), 1);
    setenv("LC_ALL", "C", 1);
    setenv(kMark, std::to_string(getpid()).c_str(), 1);
}

std::string markOfCommands() {
    return std::string(kMark) + "=" + std::to_string(getpid());
}

std::vector<std::string> directoriesOnPath() {
    const char* variable = std::getenv("PATH");
    const std::string path = variable != nullptr ? variable : "";
    std::vector<std::string> directories;
    for (std::size_t start = 0; start <= path.size();) {
        const std::size_t end = std::min(path.find(':', start), path.size());
        directories.push_back(path.substr(start, end - start));
        start = end + 1;
    }
    return directories;
}

}  // namespace cvagent
