#include "agent/shell/local_file.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <poll.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>

#include <cerrno>
#include <optional>

#include "agent/shell/mounts.h"

namespace cvagent::shell {

namespace {

constexpr unsigned kMode = 0666;

/// A path as the file system that it lies on sees it. A link that leads to another file system, and so
/// perhaps to one over a network, ends the search.
class Place {
public:
    explicit Place(const std::string& path) {
        const auto mount = localMountOf(path);
        if (mount) {
            root_ = hosttools::Descriptor(::open(mount->c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
            inside_ = path.substr(mount->size());
            inside_.erase(0, inside_.find_first_not_of('/'));
        }
    }

    bool isKnown() const { return root_.isOpen() && !inside_.empty(); }
    hosttools::Descriptor open(int flags) const {
        struct open_how how {};
        how.flags = static_cast<unsigned>(flags | O_CLOEXEC);
        how.mode = (flags & O_CREAT) != 0 ? kMode : 0;
        how.resolve = RESOLVE_NO_XDEV | RESOLVE_NO_MAGICLINKS;
        const long number = syscall(SYS_openat2, root_.get(), inside_.c_str(), &how, sizeof how);
        return hosttools::Descriptor(static_cast<int>(number));
    }

private:
    hosttools::Descriptor root_;
    std::string inside_;
};

std::optional<mode_t> kindOf(const hosttools::Descriptor& file) {
    struct stat found {};
    return fstat(file.get(), &found) == 0 ? std::optional(found.st_mode & S_IFMT) : std::nullopt;
}

bool isRegular(const hosttools::Descriptor& file) {
    return kindOf(file) == static_cast<mode_t>(S_IFREG);
}

LocalFile::Outcome outcomeOf(int error) {
    return error == ENOENT || error == ENOTDIR || error == EACCES ? LocalFile::missing : LocalFile::unfit;
}

/// Some files of /proc wait for news.
bool answersAtOnce(const hosttools::Descriptor& file) {
    pollfd asked{file.get(), POLLIN, 0};
    return poll(&asked, 1, 0) == 1 && (asked.revents & POLLIN) != 0;
}

/// A write beyond such a limit would end this program.
bool sizeIsLimited() {
    rlimit limit{};
    return getrlimit(RLIMIT_FSIZE, &limit) != 0 || limit.rlim_cur != RLIM_INFINITY;
}

}  // namespace

LocalFile openForReading(const std::string& path, off_t most) {
    const Place place(path);
    if (!place.isKnown()) {
        return {};
    }
    const hosttools::Descriptor looked = place.open(O_PATH);
    if (!looked.isOpen()) {
        return {outcomeOf(errno)};
    }
    if (!isRegular(looked)) {
        return {kindOf(looked) == static_cast<mode_t>(S_IFDIR) ? LocalFile::missing : LocalFile::unfit};
    }
    hosttools::Descriptor file = place.open(O_RDONLY | O_NONBLOCK | O_NOCTTY);
    if (!file.isOpen()) {
        return {outcomeOf(errno)};
    }
    struct stat found {};
    if (fstat(file.get(), &found) != 0 || !S_ISREG(found.st_mode) || !answersAtOnce(file)) {
        return {};
    }
    if (found.st_size > most) {
        return {LocalFile::large};
    }
    return {LocalFile::opened, std::move(file)};
}

LocalFile openForWriting(const std::string& path, bool append) {
    const Place place(path);
    if (!place.isKnown() || sizeIsLimited()) {
        return {};
    }
    const hosttools::Descriptor looked = place.open(O_PATH);
    if (looked.isOpen() ? !isRegular(looked) : errno != ENOENT) {
        return {};
    }
    hosttools::Descriptor file =
        place.open(O_WRONLY | O_CREAT | O_NONBLOCK | O_NOCTTY | (append ? O_APPEND : O_TRUNC));
    if (!file.isOpen() || !isRegular(file)) {
        return {};
    }
    return {LocalFile::opened, std::move(file)};
}

LocalFile::Outcome removable(const std::string& path) {
    const Place place(path);
    if (!place.isKnown()) {
        return LocalFile::unfit;
    }
    const hosttools::Descriptor looked = place.open(O_PATH | O_NOFOLLOW);
    if (!looked.isOpen()) {
        return errno == ENOENT ? LocalFile::missing : LocalFile::unfit;
    }
    const bool isLink = kindOf(looked) == static_cast<mode_t>(S_IFLNK);
    return isLink || isRegular(looked) ? LocalFile::opened : LocalFile::unfit;
}

}  // namespace cvagent::shell
