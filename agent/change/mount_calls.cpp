#include "agent/change/mount_calls.h"

#include <fcntl.h>
#include <sys/mount.h>

#include <cerrno>
#include <fstream>
#include <sstream>

namespace cvagent::change {

using hosttools::Descriptor;

Descriptor newMount(const char* type, const MountOptions& options, unsigned attributes) {
    const Descriptor context(fsopen(type, FSOPEN_CLOEXEC));
    if (!context.isOpen()) {
        return {};
    }
    for (const auto& [name, value] : options) {
        const int set = value.empty()
                            ? fsconfig(context.get(), FSCONFIG_SET_FLAG, name.c_str(), nullptr, 0)
                            : fsconfig(context.get(), FSCONFIG_SET_STRING, name.c_str(), value.c_str(), 0);
        if (set != 0) {
            return {};
        }
    }
    if (fsconfig(context.get(), FSCONFIG_CMD_CREATE, nullptr, nullptr, 0) != 0) {
        return {};
    }
    return Descriptor(fsmount(context.get(), FSMOUNT_CLOEXEC, attributes));
}

Descriptor sameAgain(const std::string& path) {
    return Descriptor(open_tree(AT_FDCWD, path.c_str(), OPEN_TREE_CLONE | OPEN_TREE_CLOEXEC));
}

bool attach(const Descriptor& mount, const std::string& path) {
    return mount.isOpen() &&
           move_mount(mount.get(), "", AT_FDCWD, path.c_str(), MOVE_MOUNT_F_EMPTY_PATH) == 0;
}

bool restrict(const std::string& path, unsigned attributes) {
    mount_attr wanted{};
    wanted.attr_set = attributes;
    return mount_setattr(AT_FDCWD, path.c_str(), AT_RECURSIVE, &wanted, sizeof wanted) == 0;
}

namespace {

/// Blanks and the like stand as \040 in the kernel's table.
std::string plainPath(const std::string& text) {
    std::string plain;
    for (std::size_t at = 0; at < text.size(); ++at) {
        const bool escaped = text[at] == '\\' && at + 3 < text.size();
        plain += escaped ? static_cast<char>((text[at + 1] - '0') * 64 + (text[at + 2] - '0') * 8 +
                                             (text[at + 3] - '0'))
                         : text[at];
        at += escaped ? 3 : 0;
    }
    return plain;
}

}  // namespace

std::vector<MountPoint> mountPoints() {
    std::vector<MountPoint> all;
    std::ifstream table("/proc/self/mountinfo");
    for (std::string line; std::getline(table, line);) {
        std::istringstream words(line);
        std::string skipped;
        MountPoint point;
        words >> skipped >> skipped >> skipped >> point.root >> point.path;
        while (words >> skipped && skipped != "-") {
        }
        words >> point.type;
        point.path = plainPath(point.path);
        all.push_back(point);
    }
    return all;
}

}  // namespace cvagent::change
