#include "mi/temporary_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>

namespace IC {

bool TemporaryFile::removeAndCreate() {
    // What cannot be removed is in the way of the new file, which tells.
    [[maybe_unused]] const int removed = std::remove(path_);
    const int file = open(path_, O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR);
    isLeftOver_ = file < 0;
    if (file >= 0) {
        close(file);
    }
    return file >= 0;
}

bool TemporaryFile::isOurs() const {
    struct stat found {};
    return !isLeftOver_ && lstat(path_, &found) == 0 && S_ISREG(found.st_mode) && found.st_nlink == 1 &&
           found.st_uid == geteuid() && (found.st_mode & (S_IWGRP | S_IWOTH)) == 0;
}

}  // namespace IC
