#include "agent/shell/mounts.h"

#include <fcntl.h>
#include <poll.h>

#include <algorithm>
#include <array>
#include <map>
#include <mutex>
#include <vector>

#include "hosttools/descriptor.h"

namespace cvagent::shell {

namespace {

constexpr auto kLocalTypes = std::to_array<std::string_view>(
    {"bcachefs", "btrfs", "erofs",   "ext2", "ext3",  "ext4",     "f2fs",   "iso9660",
     "jfs",      "minix", "overlay", "proc", "ramfs", "reiserfs", "rootfs", "squashfs",
     "sysfs",    "tmpfs", "udf",     "vfat", "xfs",   "zfs"});

/// Mount points, and whether the file system on each is local. Of several on one point the last one counts.
using Mounts = std::map<std::string, bool, std::less<>>;

/// A mount point has its blanks and the like as \040.
std::string unescaped(std::string_view text) {
    std::string plain;
    for (std::size_t at = 0; at < text.size(); ++at) {
        const std::string_view digits = text.substr(at).substr(0, 4);
        if (digits.size() == 4 && digits.find_first_not_of("01234567", 1) == std::string_view::npos &&
            digits[0] == '\\') {
            plain += static_cast<char>((digits[1] - '0') * 64 + (digits[2] - '0') * 8 + (digits[3] - '0'));
            at += 3;
        } else {
            plain += text[at];
        }
    }
    return plain;
}

std::vector<std::string_view> wordsOf(std::string_view line) {
    std::vector<std::string_view> words;
    while (!line.empty()) {
        const std::size_t end = std::min(line.find(' '), line.size());
        words.push_back(line.substr(0, end));
        line.remove_prefix(std::min(end + 1, line.size()));
    }
    return words;
}

Mounts readMounts(std::string_view text) {
    constexpr std::size_t kPoint = 4;
    constexpr std::size_t kFirstOptional = 6;
    Mounts mounts;
    while (!text.empty()) {
        const std::size_t end = std::min(text.find('\n'), text.size());
        const auto words = wordsOf(text.substr(0, end));
        text.remove_prefix(std::min(end + 1, text.size()));
        const auto dash =
            std::find(words.begin() + static_cast<std::ptrdiff_t>(std::min(kFirstOptional, words.size())),
                      words.end(), "-");
        if (words.end() - dash >= 2) {
            mounts[unescaped(words[kPoint])] = std::ranges::find(kLocalTypes, dash[1]) != kLocalTypes.end();
        }
    }
    return mounts;
}

/// Every directory on the way is looked at, the root first.
std::optional<std::string> find(const Mounts& mounts, const std::string& path) {
    if (!path.starts_with('/') || path.find("..") != std::string::npos) {
        return std::nullopt;
    }
    const auto root = mounts.find("/");
    if (root == mounts.end() || !root->second) {
        return std::nullopt;
    }
    std::string deepest = "/";
    for (std::size_t slash = path.find('/', 1); true; slash = path.find('/', slash + 1)) {
        const auto mount = mounts.find(std::string_view(path).substr(0, slash));
        if (mount != mounts.end() && !mount->second) {
            return std::nullopt;
        }
        if (mount != mounts.end()) {
            deepest = mount->first;
        }
        if (slash == std::string::npos) {
            return deepest;
        }
    }
}

std::string readAll(const hosttools::Descriptor& file) {
    std::string text;
    std::array<char, 4096> buffer{};
    for (off_t at = 0;;) {
        const ssize_t got = pread(file.get(), buffer.data(), buffer.size(), at);
        if (got <= 0) {
            return got == 0 ? text : "";
        }
        text.append(buffer.data(), static_cast<std::size_t>(got));
        at += got;
    }
}

/// The mounts as they are now; the kernel tells when they have changed.
class Table {
public:
    std::optional<std::string> mountOf(const std::string& path) {
        const std::lock_guard lock(guard_);
        if (owner_ != getpid() || !file_.isOpen()) {
            // A child process may have mounts of its own.
            file_ = hosttools::Descriptor(open("/proc/self/mountinfo", O_RDONLY | O_CLOEXEC));
            owner_ = getpid();
            mounts_.clear();
        }
        if (mounts_.empty() || hasChanged()) {
            mounts_ = file_.isOpen() ? readMounts(readAll(file_)) : Mounts();
        }
        return find(mounts_, path);
    }

private:
    bool hasChanged() const {
        pollfd asked{file_.get(), POLLPRI, 0};
        return poll(&asked, 1, 0) != 0;
    }

    std::mutex guard_;
    hosttools::Descriptor file_;
    pid_t owner_ = 0;
    Mounts mounts_;
};

}  // namespace

std::optional<std::string> localMountOf(const std::string& path, std::string_view mountInfo) {
    return find(readMounts(mountInfo), path);
}

std::optional<std::string> localMountOf(const std::string& path) {
    static Table table;
    return table.mountOf(path);
}

}  // namespace cvagent::shell
