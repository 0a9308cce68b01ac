#include "agent/change/daemons.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <set>
#include <sstream>

#include "agent/change/cannot.h"
#include "agent/change/directory.h"
#include "agent/change/mount_calls.h"
#include "agent/core/host_file.h"
#include "agent/shell/mounts.h"
#include "hosttools/descriptor.h"

namespace cvagent::change {

namespace {

using hosttools::Descriptor;

constexpr const char* kRuntimeFiles = "/run";
constexpr int kDaemonDepth = 6;  // directories below /run that daemons have their sockets in

/// One that has gone meanwhile is hidden as well.
void mustHide(bool isHidden) {
    must(isHidden || errno == ENOENT ? 0 : -1, "a daemon's socket cannot be hidden");
}

void removeDaemonsFrom(int directory, int depth) {
    for (const std::string& name : namesIn(directory)) {
        struct stat found {};
        if (fstatat(directory, name.c_str(), &found, AT_SYMLINK_NOFOLLOW) != 0) {
            continue;
        }
        if (S_ISSOCK(found.st_mode) || S_ISFIFO(found.st_mode)) {
            mustHide(unlinkat(directory, name.c_str(), 0) == 0);
        } else if (S_ISDIR(found.st_mode) && depth > 0) {
            const Descriptor below(
                openat(directory, name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
            if (below.isOpen()) {
                removeDaemonsFrom(below.get(), depth - 1);
            }
        }
    }
}

bool isSocketHere(const std::string& name) {
    struct stat found {};
    return shell::localMountOf(name) && lstat(name.c_str(), &found) == 0 && S_ISSOCK(found.st_mode);
}

void layOver(const std::string& name, const std::string& file) {
    mustHide(attach(sameAgain(file), name));
}

}  // namespace

std::vector<std::string> socketNames(std::string_view table) {
    constexpr std::size_t kColumns = 7;  // in front of the name
    std::set<std::string> names;
    std::istringstream lines{std::string(table)};
    for (std::string line; std::getline(lines, line);) {
        std::istringstream columns(line);
        std::string skipped;
        for (std::size_t i = 0; i < kColumns; ++i) {
            columns >> skipped;
        }
        columns.ignore(1);
        std::string name;
        if (std::getline(columns, name) && name.starts_with('/')) {
            names.insert(name);
        }
    }
    return {names.begin(), names.end()};
}

void hideDaemons(const std::string& directory) {
    const Descriptor run(open(kRuntimeFiles, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (run.isOpen()) {
        removeDaemonsFrom(run.get(), kDaemonDepth);
    }
    const std::string nothing = directory + "/nothing";
    const Descriptor made(open(nothing.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0444));
    mustHide(made.isOpen());
    for (const std::string& name : socketNames(contentOf("/proc/net/unix").value_or(""))) {
        if (isSocketHere(name)) {
            layOver(name, nothing);
        }
    }
}

}  // namespace cvagent::change
