#include "agent/keep/host_files.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <sstream>

#include "hosttools/descriptor.h"

namespace cvagent::keep {

namespace {

constexpr std::size_t kMostBytes = 1U << 20U;
/// Where the groups of a host's units are: of version 2, of both, of version 1.
constexpr std::array kGroups = {"/sys/fs/cgroup/", "/sys/fs/cgroup/unified/", "/sys/fs/cgroup/systemd/"};

}  // namespace

std::optional<std::string> smallFile(const std::string& path) {
    const hosttools::Descriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
    struct stat found {};
    if (!file.isOpen() || fstat(file.get(), &found) != 0 || !S_ISREG(found.st_mode)) {
        return std::nullopt;
    }
    std::string text;
    std::array<char, 65536> part{};
    for (;;) {
        const ssize_t got = read(file.get(), part.data(), part.size());
        if (got == 0) {
            return text;
        }
        if ((got < 0 && errno != EINTR) || text.size() > kMostBytes) {
            return std::nullopt;
        }
        text.append(part.data(), static_cast<std::size_t>(got > 0 ? got : 0));
    }
}

bool unitHasProcesses(const std::string& unit) {
    for (const char* groups : kGroups) {
        const auto processes =
            smallFile(groups + std::string("system.slice/") + unit + ".service/cgroup.procs");
        if (processes && !processes->empty()) {
            return true;
        }
    }
    return false;
}

std::string assigned(const std::string& text, const std::string& key) {
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
        if (line.starts_with(key + '=')) {
            return line.substr(key.size() + 1);
        }
    }
    return "";
}

bool isMountedOver(const std::string& path) {
    struct statx found {};
    return statx(AT_FDCWD, path.c_str(), AT_SYMLINK_NOFOLLOW, 0, &found) == 0 &&
           (found.stx_attributes & STATX_ATTR_MOUNT_ROOT) != 0;
}

std::string lastPart(const std::string& path) {
    return path.substr(path.rfind('/') + 1);
}

}  // namespace cvagent::keep
