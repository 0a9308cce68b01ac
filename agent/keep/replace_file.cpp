#include "agent/keep/replace_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <string_view>
#include <system_error>
#include <vector>

#include "hosttools/descriptor.h"

namespace cvagent::keep {

namespace {

constexpr mode_t kReadable = 0644;

void must(bool isDone, const std::string& path) {
    if (!isDone) {
        throw std::system_error(errno, std::generic_category(), path);
    }
}

/// Removed again unless it has taken the file's place.
class FileBeside {
public:
    explicit FileBeside(const std::string& path)
        : path_(path),
          directory_(path.substr(0, path.rfind('/') + 1)),
          name_(directory_ + "." + path.substr(directory_.size()) + ".XXXXXX"),
          file_(mkostemp(name_.data(), O_CLOEXEC)) {
        must(file_.isOpen(), path_);
    }
    FileBeside(const FileBeside&) = delete;
    FileBeside& operator=(const FileBeside&) = delete;
    ~FileBeside() {
        if (!name_.empty()) {
            unlink(name_.c_str());
        }
    }

    void write(std::string_view content) const {
        while (!content.empty()) {
            const ssize_t written = ::write(file_.get(), content.data(), content.size());
            must(written > 0 || (written < 0 && errno == EINTR), path_);
            content.remove_prefix(written > 0 ? static_cast<std::size_t>(written) : 0);
        }
    }

    void becomeReadable() const { must(fchmod(file_.get(), kReadable) == 0, path_); }

    void becomeLike(const hosttools::Descriptor& other) const {
        struct stat found {};
        must(fstat(other.get(), &found) == 0 && fchown(file_.get(), found.st_uid, found.st_gid) == 0, path_);
        must(fchmod(file_.get(), found.st_mode & 07777U) == 0, path_);
    }

    void takeThePlace() {
        must(fsync(file_.get()) == 0 && rename(name_.c_str(), path_.c_str()) == 0, path_);
        name_.clear();
        const hosttools::Descriptor directory(open(directory_.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
        // EINVAL: a file system that has nothing to sync there.
        must(directory.isOpen() && (fsync(directory.get()) == 0 || errno == EINVAL), path_);
    }

    /// Access lists and labels. What cannot be given on was given by the system, which gives it again.
    void copyAttributes(int old) const {
        constexpr std::size_t kMostNames = 65536;
        std::vector<char> names(kMostNames);
        std::vector<char> value(kMostNames);
        const ssize_t length = flistxattr(old, names.data(), names.size());
        std::string_view left(names.data(), length > 0 ? static_cast<std::size_t>(length) : 0);
        while (!left.empty()) {
            const std::string name(left.substr(0, left.find('\0')));
            left.remove_prefix(name.size() + 1);
            const ssize_t size = fgetxattr(old, name.c_str(), value.data(), value.size());
            if (size >= 0) {
                fsetxattr(file_.get(), name.c_str(), value.data(), static_cast<std::size_t>(size), 0);
            }
        }
    }

private:
    std::string path_;
    std::string directory_;
    std::string name_;
    hosttools::Descriptor file_;
};

}  // namespace

void replaceFile(const std::string& path, const std::string& content, const std::string& like) {
    const hosttools::Descriptor old(open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    must(old.isOpen() || errno == ENOENT, path);
    const hosttools::Descriptor model(open(like.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC));
    must(model.isOpen() || like.empty(), like);
    FileBeside file(path);
    file.write(content);
    if (old.isOpen()) {
        file.becomeLike(old);
        file.copyAttributes(old.get());
    } else if (model.isOpen()) {
        file.becomeLike(model);
    } else {
        file.becomeReadable();
    }
    file.takeThePlace();
}

}  // namespace cvagent::keep
