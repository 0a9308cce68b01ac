#include "agent/change/covers.h"

#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <filesystem>

#include "agent/change/cannot.h"
#include "agent/change/daemons.h"
#include "agent/change/mount_calls.h"
#include "agent/change/tree_copy.h"
#include "agent/change/written_places.h"
#include "agent/shell/mounts.h"

namespace cvagent::change {

namespace {

using hosttools::Descriptor;

constexpr std::array kDevices = {"null", "zero", "full", "random", "urandom"};
constexpr const char* kWork = "/dev";  // where our own memory lies until the devices come there
constexpr const char* kSize = "256m";

Descriptor path(const std::string& name) {
    return Descriptor(open(name.c_str(), O_PATH | O_CLOEXEC));
}

bool isFile(const Descriptor& place) {
    struct stat found {};
    return fstat(place.get(), &found) == 0 && S_ISREG(found.st_mode);
}

std::string byNumber(const Descriptor& place) {
    return "/proc/self/fd/" + std::to_string(place.get());
}

/// Memory of ours, one directory after the other.
class Work {
public:
    Work() {
        if (!attach(newMount("tmpfs", {{"size", kSize}, {"mode", "0700"}}), kWork)) {
            throw Cannot(std::string("no memory for files can be mounted: ") + std::strerror(errno));
        }
    }
    std::string directory(const char* purpose) {
        std::string name = std::string(kWork) + "/" + std::to_string(++count_) + "-" + purpose;
        must(mkdir(name.c_str(), 0755), "no directory of its own");
        return name;
    }

private:
    int count_ = 0;
};

/// Owner and mode of a directory are those of the original.
void liken(const std::string& directory, const Descriptor& original) {
    struct stat found {};
    if (fstat(original.get(), &found) == 0) {
        [[maybe_unused]] const int owned = chown(directory.c_str(), found.st_uid, found.st_gid);
        chmod(directory.c_str(), found.st_mode & 07777U);
    }
}

bool coverByOverlay(Cover& cover, Work& work) {
    const std::string upper = work.directory("upper");
    liken(upper, cover.original);
    MountOptions options{{"lowerdir", byNumber(cover.original)},
                         {"upperdir", upper},
                         {"workdir", work.directory("work")},
                         {"metacopy", "off"},
                         {"index", "off"},
                         {"userxattr", ""}};
    Descriptor mount = newMount("overlay", options);
    if (!mount.isOpen()) {
        options.pop_back();
        mount = newMount("overlay", options);
    }
    cover.ours = path(upper);
    cover.kind = Cover::Kind::overlay;
    return attach(mount, cover.path);
}

void coverByCopy(Cover& cover, Work& work, CopyBudget& budget) {
    const std::string place = work.directory("copy");
    cover.kind = Cover::Kind::copy;
    cover.ours = path(place);
    if (!copyTree(cover.original.get(), cover.ours.get(), budget)) {
        throw Cannot(cover.path + " is too large to be copied, and the kernel lays nothing over it");
    }
    liken(place, cover.original);
    if (!attach(sameAgain(place), cover.path)) {
        throw Cannot("nothing can be laid over " + cover.path + ": " + std::strerror(errno));
    }
}

void coverFile(Cover& cover, Work& work, CopyBudget& budget) {
    const std::string place = work.directory("file") + "/content";
    cover.kind = Cover::Kind::file;
    const Descriptor in(open(byNumber(cover.original).c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC));
    const Descriptor out(open(place.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
    if (!out.isOpen() || (in.isOpen() && !copyContent(in.get(), out.get(), budget))) {
        throw Cannot(cover.path + " cannot be copied");
    }
    struct stat found {};
    if (fstat(cover.original.get(), &found) == 0) {
        const std::array<timespec, 2> times{found.st_atim, found.st_mtim};
        futimens(out.get(), times.data());
    }
    liken(place, cover.original);
    cover.ours = path(place);
    if (!attach(sameAgain(place), cover.path)) {
        throw Cannot("nothing can be laid over " + cover.path + ": " + std::strerror(errno));
    }
}

constexpr const char* kRun = "/run";
constexpr const char* kTmp = "/tmp";

bool canBeCovered(const Descriptor& place) {
    struct stat found {};
    return fstat(place.get(), &found) == 0 && (S_ISREG(found.st_mode) || S_ISDIR(found.st_mode));
}

Cover coverOf(const std::string& place) {
    return {place, Cover::Kind::overlay, path(place), {}};
}

/// A user has what is his own copied, and of what links lead to elsewhere the file alone. /run is empty but
/// for that. Of /tmp his agent keeps what it needs and hides the rest later (private_tmp.h).
std::vector<Cover> placesToCopy(std::vector<std::string> written) {
    std::vector<std::string> files;
    for (const LinkTarget& target : linkTargets()) {
        if (isBelow(target.directory, kRun)) {
            written.push_back(target.directory);
        } else if (!target.name.empty()) {
            files.push_back(target.directory + "/" + target.name);
        }
    }
    const std::vector<std::string> directories = outermost(std::move(written));
    std::vector<Cover> covers;
    const auto add = [&](const std::string& place) {
        if (place != kTmp && place != kRun) {
            covers.push_back(coverOf(place));
        }
    };
    std::ranges::for_each(directories, add);
    for (const std::string& file : outermost(std::move(files))) {
        const auto holds = [&file](const std::string& directory) { return isBelow(file, directory); };
        if (std::ranges::none_of(directories, holds)) {
            add(file);
        }
    }
    std::erase_if(covers, [](const Cover& each) { return !canBeCovered(each.original); });
    return covers;
}

/// What the agent needs may be mounted below /tmp, its programs and data (private_tmp.h).
bool isOursBelowTmp(const std::string& mount, const std::vector<std::string>& written) {
    return isBelow(mount, kTmp) && mount != kTmp &&
           std::ranges::any_of(written, [&mount](const std::string& place) {
               return isBelow(place, mount) || isBelow(mount, place);
           });
}

/// Each place and what of this machine's own is mounted below it, the upper first. Of /run and /tmp the
/// mounts below are others' business, but for those of what is written.
std::vector<Cover> placesToCover(std::vector<std::string> written) {
    const std::vector<std::string> data = written;
    for (const char* place : {kRun, kTmp}) {
        struct stat found {};
        if (lstat(place, &found) == 0 && S_ISDIR(found.st_mode)) {
            written.emplace_back(place);
        }
    }
    for (const LinkTarget& target : linkTargets()) {
        written.push_back(target.directory);
    }
    const std::vector<std::string> places = outermost(std::move(written));
    std::vector<Cover> covers;
    covers.reserve(places.size());
    for (const std::string& place : places) {
        covers.push_back(coverOf(place));
    }
    for (const MountPoint& mount : mountPoints()) {
        const bool wanted = std::ranges::any_of(places, [&mount](const std::string& place) {
            return place != kTmp && place != kRun && isBelow(mount.path, place);
        });
        const bool known = std::ranges::find(covers, mount.path, &Cover::path) != covers.end();
        if ((wanted || isOursBelowTmp(mount.path, data)) && !known && shell::localMountOf(mount.path)) {
            covers.push_back(coverOf(mount.path));
        }
    }
    std::erase_if(covers, [](const Cover& each) { return !canBeCovered(each.original); });
    std::ranges::stable_sort(covers, {}, &Cover::path);
    return covers;
}

struct View {
    std::string path;
    Descriptor mount;
};

/// What is mounted below /tmp and would be hidden with it, the upper first.
std::vector<View> viewsBelowTmp(const std::vector<MountPoint>& mounts) {
    std::vector<View> views;
    for (const MountPoint& mount : mounts) {
        if (isBelow(mount.path, kTmp) && mount.path != kTmp && shell::localMountOf(mount.path)) {
            views.push_back({mount.path, sameAgain(mount.path)});
        }
    }
    return views;
}

void showAgain(const std::vector<View>& views) {
    for (const View& view : views) {
        if (view.mount.isOpen()) {
            attach(view.mount, view.path);
        }
    }
}

void cover(Cover& place, bool copies, Work& work, CopyBudget& budget) {
    if (isFile(place.original)) {
        coverFile(place, work, budget);
    } else if (copies || !coverByOverlay(place, work)) {
        coverByCopy(place, work, budget);
    }
}

/// An empty /run, with the directories that will be covered.
void emptyRun(const std::vector<Cover>& covers, Work& work) {
    const std::string place = work.directory("run");
    if (!attach(sameAgain(place), kRun)) {
        throw Cannot(std::string("nothing can be laid over /run: ") + std::strerror(errno));
    }
    for (const Cover& each : covers) {
        std::error_code error;
        if (isBelow(each.path, kRun)) {
            std::filesystem::create_directories(each.path, error);
        }
    }
}

using Devices = std::vector<std::pair<std::string, Descriptor>>;

Devices plainDevices() {
    Devices devices;
    for (const char* name : kDevices) {
        devices.emplace_back(name, sameAgain(std::string("/dev/") + name));
    }
    return devices;
}

void showDevices(const Devices& devices) {
    if (!attach(newMount("tmpfs", {{"size", "1m"}, {"mode", "0755"}}), kWork)) {
        throw Cannot(std::string("no place for devices: ") + std::strerror(errno));
    }
    for (const auto& [name, device] : devices) {
        const std::string place = "/dev/" + name;
        if (device.isOpen()) {
            close(open(place.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
            attach(device, place);
        }
    }
    for (const auto& [name, target] :
         {std::pair("fd", "fd"), {"stdin", "fd/0"}, {"stdout", "fd/1"}, {"stderr", "fd/2"}}) {
        must(symlink((std::string("/proc/self/") + target).c_str(), (std::string("/dev/") + name).c_str()),
             "no standard streams");
    }
}

void showOwnProcesses(const std::vector<MountPoint>& mounts) {
    for (const MountPoint& mount : mounts) {
        if (mount.type == "proc" && mount.root == "/" &&
            !attach(newMount("proc", {},
                             MOUNT_ATTR_RDONLY | MOUNT_ATTR_NOSUID | MOUNT_ATTR_NODEV | MOUNT_ATTR_NOEXEC),
                    mount.path)) {
            throw Cannot(std::string("the kernel shows no process table of its own here, as in some "
                                     "containers: ") +
                         std::strerror(errno));
        }
    }
}

}  // namespace

std::vector<Cover> isolateFiles(bool copies, const std::string& dataDirectory) {
    const std::vector<MountPoint> mounts = mountPoints();
    std::vector<Cover> covers = copies ? placesToCopy(writtenPlaces(dataDirectory, Missing::leftOut))
                                       : placesToCover(writtenPlaces(dataDirectory, Missing::nearestAbove));
    const Devices devices = plainDevices();
    if (!restrict("/", MOUNT_ATTR_RDONLY | MOUNT_ATTR_NODEV | MOUNT_ATTR_NOSUID)) {
        throw Cannot(std::string("the host's files cannot be made read-only: ") + std::strerror(errno));
    }
    Work work;
    CopyBudget budget;
    if (copies && std::filesystem::is_directory(kRun)) {
        emptyRun(covers, work);
    }
    const std::vector<View> views = viewsBelowTmp(mounts);
    for (Cover& place : covers) {
        cover(place, copies, work, budget);
        if (place.path == kTmp) {
            showAgain(views);
        }
    }
    hideDaemons(work.directory("nothing"));
    showDevices(devices);
    showOwnProcesses(mounts);
    return covers;
}

}  // namespace cvagent::change
