#include "agent/change/tree_copy.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <climits>

#include "agent/change/directory.h"
#include "hosttools/descriptor.h"

namespace cvagent::change {

namespace {

using hosttools::Descriptor;

constexpr mode_t kBits = 07777;

bool take(std::size_t& left, std::size_t wanted) {
    if (left < wanted) {
        return false;
    }
    left -= wanted;
    return true;
}

void copyTimes(int to, const std::string& name, const struct stat& found) {
    const std::array<timespec, 2> times{found.st_atim, found.st_mtim};
    utimensat(to, name.c_str(), times.data(), AT_SYMLINK_NOFOLLOW);
}

bool copyFile(int from, int to, const std::string& name, const struct stat& found, CopyBudget& budget) {
    const Descriptor in(openRegular(from, name));
    if (!in.isOpen()) {
        return true;
    }
    const Descriptor out(
        openat(to, name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600));
    const bool whole = out.isOpen() && copyContent(in.get(), out.get(), budget);
    fchmod(out.get(), found.st_mode & kBits);
    return whole;
}

bool copyDirectory(int from, int to, const std::string& name, const struct stat& found, CopyBudget& budget) {
    constexpr int kHow = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
    mkdirat(to, name.c_str(), S_IRWXU);
    const Descriptor in(openat(from, name.c_str(), kHow));
    const Descriptor out(openat(to, name.c_str(), kHow));
    const bool done = !in.isOpen() || !out.isOpen() || copyTree(in.get(), out.get(), budget);
    fchmod(out.get(), (found.st_mode & kBits) | S_IRWXU);
    return done;
}

bool copyEntry(int from, int to, const std::string& name, CopyBudget& budget) {
    struct stat found {};
    if (fstatat(from, name.c_str(), &found, AT_SYMLINK_NOFOLLOW) != 0) {
        return true;
    }
    bool done = true;
    if (S_ISDIR(found.st_mode)) {
        done = copyDirectory(from, to, name, found, budget);
    } else if (S_ISREG(found.st_mode)) {
        done = copyFile(from, to, name, found, budget);
    } else if (S_ISLNK(found.st_mode)) {
        const bool copied = symlinkat(targetOf(from, name).c_str(), to, name.c_str()) == 0;
        done = copied || errno == ENOENT;  // it has gone meanwhile
    }
    copyTimes(to, name, found);
    return done;
}

}  // namespace

int openRegular(int directory, const std::string& name) {
    Descriptor file(
        openat(directory, name.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
    struct stat found {};
    if (!file.isOpen() || fstat(file.get(), &found) != 0 || !S_ISREG(found.st_mode)) {
        return -1;
    }
    return fcntl(file.get(), F_DUPFD_CLOEXEC, 0);
}

bool copyContent(int from, int to, CopyBudget& budget) {
    std::array<char, 65536> part{};
    for (;;) {
        const ssize_t got = read(from, part.data(), part.size());
        if (got <= 0) {
            return true;
        }
        const auto size = static_cast<std::size_t>(got);
        if (!take(budget.bytes, size) || write(to, part.data(), size) != got) {
            return false;
        }
    }
}

bool copyTree(int from, int to, CopyBudget& budget) {
    for (const std::string& name : namesIn(from)) {
        if (!take(budget.entries, 1) || !copyEntry(from, to, name, budget)) {
            return false;
        }
    }
    return true;
}

}  // namespace cvagent::change
