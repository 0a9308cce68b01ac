#include "agent/core/private_tmp.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <map>
#include <sstream>

namespace cvagent {

namespace {

namespace fs = std::filesystem;

constexpr const char* kTmp = "/tmp";
constexpr const char* kContent = "mode=1777,size=32m";

/// What stays reachable: its name relative to /tmp, and where it really lies: relative to /tmp when that is
/// below /tmp, too, else absolute.
using Places = std::map<std::string, std::string>;

/// The last mount at a directory is the one in sight. A unit's own /tmp is a directory of the host's,
/// mounted.
bool isPrivateAlready(const std::string& tmp) {
    std::ifstream table("/proc/self/mountinfo");
    std::string root;
    for (std::string line; std::getline(table, line);) {
        std::istringstream words(line);
        std::string id, parent, device, source, place;
        words >> id >> parent >> device >> source >> place;
        root = place == tmp ? source : root;
    }
    return root.find("/systemd-private-") != std::string::npos;
}

/// The path relative to /tmp; empty when it does not lie below it.
std::string below(const fs::path& tmp, const fs::path& path) {
    const std::string start = tmp.string() + "/";
    return path.string().starts_with(start) ? path.string().substr(start.size()) : "";
}

void keep(Places& places, const fs::path& tmp, const fs::path& path) {
    std::error_code missing;
    const fs::path target = fs::canonical(path, missing);
    if (missing) {
        return;
    }
    for (const fs::path& name : {path, target}) {
        const fs::path stays =
            fs::is_directory(target, missing) || name.parent_path() == tmp ? name : name.parent_path();
        const fs::path source = fs::canonical(stays, missing);
        if (const std::string place = below(tmp, stays); !place.empty() && !missing) {
            places[place] = below(tmp, source).empty() ? source.string() : below(tmp, source);
        }
    }
}

bool makeMountPoint(const std::string& place, bool isDirectory) {
    std::error_code error;
    fs::create_directories(isDirectory ? fs::path(place) : fs::path(place).parent_path(), error);
    if (isDirectory || error) {
        return !error;
    }
    const int file = open(place.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600);
    if (file >= 0) {
        close(file);
    }
    return file >= 0;
}

/// With the covered /tmp as the current directory.
bool bindAll(const Places& places, const std::string& tmp) {
    std::vector<std::string> bound;
    for (const auto& [place, source] : places) {
        const std::string& wanted = place;
        if (std::any_of(bound.begin(), bound.end(),
                        [&wanted](const std::string& above) { return wanted.starts_with(above + "/"); })) {
            continue;  // came with the directory above it
        }
        const std::string target = fs::path(tmp) / place;
        std::error_code missing;
        if (!makeMountPoint(target, fs::is_directory(source, missing)) ||
            mount(source.c_str(), target.c_str(), nullptr, MS_BIND | MS_REC, nullptr) != 0) {
            return false;
        }
        bound.push_back(place);
    }
    return true;
}

/// Nothing that is mounted from here on is seen outside.
bool leaveTheMountsOfTheHost() {
    return unshare(CLONE_NEWNS) == 0 && mount(nullptr, "/", nullptr, MS_REC | MS_SLAVE, nullptr) == 0;
}

/// Covers /tmp with an empty one that holds the places; when one of them fails, it is taken away again.
void cover(const std::string& tmp, const Places& places) {
    const int covered = open(tmp.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC);  // of our own mounts by now
    if (covered < 0) {
        return;
    }
    if (mount("cvagent", tmp.c_str(), "tmpfs", MS_NOSUID | MS_NODEV, kContent) == 0 &&
        (fchdir(covered) != 0 || !bindAll(places, tmp))) {
        umount2(tmp.c_str(), MNT_DETACH);
    }
    close(covered);
    [[maybe_unused]] const int done = chdir("/");
}

}  // namespace

void makeTmpPrivate(const std::vector<std::string>& kept) {
    std::error_code missing;
    const fs::path tmp = fs::canonical(kTmp, missing);
    if (missing || isPrivateAlready(tmp)) {
        return;
    }
    Places places;
    for (const std::string& path : kept) {
        keep(places, tmp, path);
    }
    if (leaveTheMountsOfTheHost()) {
        cover(tmp, places);
    }
}

}  // namespace cvagent
