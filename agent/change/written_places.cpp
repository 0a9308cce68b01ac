#include "agent/change/written_places.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <deque>
#include <filesystem>
#include <optional>

#include "agent/change/directory.h"
#include "agent/change/mount_calls.h"
#include "agent/shell/mounts.h"
#include "hosttools/descriptor.h"

namespace cvagent::change {

namespace {

namespace fs = std::filesystem;
using hosttools::Descriptor;

constexpr const char* kSettings = "/opt/vantrel/corvista/data";
constexpr const char* kLinkDirectories[] = {"/etc", "/etc/sysconfig", "/etc/sysconfig/network"};
constexpr std::string_view kWithoutFiles[] = {"proc", "sysfs", "devtmpfs", "devpts", "cgroup", "cgroup2"};
constexpr int kMostLinks = 40;  // as the kernel counts

std::deque<std::string> namesOf(const std::string& path) {
    std::deque<std::string> names;
    for (const fs::path& name : fs::path(path).relative_path()) {
        if (name != "." && !name.empty()) {
            names.push_back(name);
        }
    }
    return names;
}

/// Where a path ends when all links on its way are followed. Nothing when it leads in a circle or to another
/// machine, where a look could take for ever.
std::optional<LinkTarget> endOf(const std::string& path) {
    std::string reached = "/";
    auto left = namesOf(path);
    for (int links = 0; !left.empty();) {
        const std::string name = left.front();
        left.pop_front();
        if (name == "..") {
            reached = fs::path(reached).parent_path();
            continue;
        }
        const std::string next = (reached == "/" ? "" : reached) + "/" + name;
        struct stat found {};
        if (!shell::localMountOf(next)) {
            return std::nullopt;
        }
        const bool isThere = lstat(next.c_str(), &found) == 0;
        if (isThere && S_ISLNK(found.st_mode)) {
            const std::string target = targetOf(AT_FDCWD, next);
            if (++links > kMostLinks) {
                return std::nullopt;
            }
            const auto names = namesOf(target);
            left.insert(left.begin(), names.begin(), names.end());
            reached = target.starts_with('/') ? "/" : reached;
        } else if (isThere && S_ISDIR(found.st_mode)) {
            reached = next;
        } else {
            return left.empty() ? std::optional(LinkTarget{reached, name}) : std::nullopt;
        }
    }
    return LinkTarget{reached, ""};
}

/// Whether a directory lies on a file system that holds files, unlike /proc, where /etc/mtab leads.
bool holdsFiles(const std::string& directory) {
    MountPoint innermost;
    for (const MountPoint& mount : mountPoints()) {
        if (isBelow(directory, mount.path) && mount.path.size() >= innermost.path.size()) {
            innermost = mount;
        }
    }
    return std::ranges::find(kWithoutFiles, innermost.type) == std::end(kWithoutFiles);
}

/// Where it is, or the nearest directory above that is there.
std::string existing(const std::string& path) {
    fs::path place = path;
    std::error_code error;
    while (!fs::is_directory(place, error) && place.has_relative_path()) {
        place = place.parent_path();
    }
    const fs::path plain = fs::canonical(place, error);
    return error ? "/" : plain.string();
}

void addLinkTargets(const std::string& directory, std::vector<LinkTarget>& targets) {
    const Descriptor opened(open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    for (const std::string& name : opened.isOpen() ? namesIn(opened.get()) : std::vector<std::string>()) {
        const std::string path = directory + "/" + name;
        struct stat link {};
        if (lstat(path.c_str(), &link) != 0 || !S_ISLNK(link.st_mode)) {
            continue;
        }
        if (auto target = endOf(path); target && target->directory != "/" && holdsFiles(target->directory)) {
            targets.push_back(*std::move(target));
        }
    }
}

}  // namespace

bool isBelow(const std::string& path, const std::string& directory) {
    return path == directory || path.starts_with(directory + "/");
}

std::vector<std::string> outermost(std::vector<std::string> places) {
    std::ranges::sort(places);
    std::vector<std::string> kept;
    for (const std::string& place : places) {
        if (place != "/" && (kept.empty() || !isBelow(place, kept.back()))) {
            kept.push_back(place);
        }
    }
    return kept;
}

std::vector<std::string> writtenPlaces(const std::string& dataDirectory, Missing missing) {
    std::vector<std::string> places;
    for (const std::string& place : {std::string("/etc"), std::string(kSettings), dataDirectory}) {
        std::error_code error;
        if (!place.empty() && (missing == Missing::nearestAbove || fs::is_directory(place, error))) {
            places.push_back(existing(place));
        }
    }
    return places;
}

std::vector<LinkTarget> linkTargets() {
    std::vector<LinkTarget> targets;
    for (const char* directory : kLinkDirectories) {
        addLinkTargets(directory, targets);
    }
    return targets;
}

}  // namespace cvagent::change
