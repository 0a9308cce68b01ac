#include "tests/support/mounts.h"

#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <utility>

#include "tests/support/system_call.h"

namespace fake_host {

Tree::Tree(const std::string& path)
    : path_(path),
      handle_(must(open_tree(AT_FDCWD, path.c_str(), OPEN_TREE_CLONE | OPEN_TREE_CLOEXEC | AT_RECURSIVE),
                   "take a copy of the mount " + path)) {}

Tree::~Tree() {
    if (handle_ >= 0) close(handle_);
}

Tree::Tree(Tree&& other) noexcept : path_(other.path_), handle_(std::exchange(other.handle_, -1)) {}

bool Tree::isDirectory() const {
    struct stat found;
    must(fstat(handle_, &found), "look at " + path_);
    return S_ISDIR(found.st_mode);
}

void Tree::makeReadOnly() {
    mount_attr attributes{};
    attributes.attr_set = MOUNT_ATTR_RDONLY;
    must(mount_setattr(handle_, "", AT_EMPTY_PATH | AT_RECURSIVE, &attributes, sizeof attributes),
         "make " + path_ + " read-only");
}

void Tree::attach(const std::string& place) {
    must(move_mount(handle_, "", AT_FDCWD, place.c_str(), MOVE_MOUNT_F_EMPTY_PATH),
         "mount " + path_ + " at " + place);
}

}  // namespace fake_host
