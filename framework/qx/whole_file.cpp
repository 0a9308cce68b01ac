#include "framework/qx/whole_file.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <random>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

#include "framework/qx/hex.h"

namespace QX {
namespace {

namespace fs = std::filesystem;

[[noreturn]] void fail(const std::string& path, const char* what, int problem = errno) {
    throw std::system_error(problem, std::generic_category(), path + ": cannot " + what);
}

class Descriptor {
public:
    explicit Descriptor(int number) : number_(number) {}
    Descriptor(Descriptor&& other) noexcept : number_(std::exchange(other.number_, -1)) {}
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    Descriptor& operator=(Descriptor&&) = delete;
    ~Descriptor() {
        if (number_ >= 0) {
            ::close(number_);
        }
    }
    int get() const { return number_; }
    bool isOpen() const { return number_ >= 0; }

private:
    int number_;
};

/// Some file systems tell only at close that data was lost. A copy is closed for the answer; the file itself
/// stays open for the lock that keeps sweeps away.
bool closesCleanly(const Descriptor& file) {
    const int copy = fcntl(file.get(), F_DUPFD_CLOEXEC, 0);
    return copy >= 0 && ::close(copy) == 0;
}

void writeAll(const Descriptor& file, std::string_view content, const std::string& path) {
    while (!content.empty()) {
        const ssize_t written = ::write(file.get(), content.data(), content.size());
        if (written >= 0) {
            content.remove_prefix(static_cast<std::size_t>(written));
        } else if (errno != EINTR) {
            fail(path, "write");
        }
    }
}

// The name of a temporary file is "." + name + "." + 16 hexadecimal digits + ".tmp". Its writer holds a lock
// on it as long as it needs it; one without a lock was left behind.
constexpr std::size_t kRandomDigits = 16;
constexpr std::string_view kSuffix = ".tmp";

std::string randomName() {
    std::random_device source;
    std::string digits(kRandomDigits, '0');
    std::ranges::generate(digits, [&] { return kHexDigits[source() % kHexDigits.size()]; });
    return digits;
}

std::string temporaryPrefix(const fs::path& target) {
    return "." + target.filename().string() + ".";
}

bool isTemporaryOf(const fs::path& target, const std::string& name) {
    const std::string prefix = temporaryPrefix(target);
    return name.size() == prefix.size() + kRandomDigits + kSuffix.size() && name.starts_with(prefix) &&
           name.ends_with(kSuffix) &&
           name.find_first_not_of(kHexDigits, prefix.size()) == prefix.size() + kRandomDigits;
}

fs::path directoryOf(const fs::path& target) {
    return target.has_parent_path() ? target.parent_path() : fs::path(".");
}

/// A file of a new name, locked by us. The sweep of another writer may catch it between creation and lock:
/// then again.
std::pair<Descriptor, fs::path> createTemporary(const fs::path& target) {
    constexpr mode_t kPrivate = 0600;
    for (;;) {
        fs::path path = directoryOf(target) / (temporaryPrefix(target) + randomName() + std::string(kSuffix));
        Descriptor file(::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kPrivate));
        if (!file.isOpen()) {
            if (errno == EEXIST) {
                continue;
            }
            fail(target, "create a temporary file beside it");
        }
        struct stat status {};
        if (flock(file.get(), LOCK_EX | LOCK_NB) == 0 && fstat(file.get(), &status) == 0 &&
            status.st_nlink > 0) {
            return {std::move(file), std::move(path)};
        }
        ::unlink(path.c_str());
    }
}

void removeLeftovers(const fs::path& target) {
    std::error_code ignored;  // what cannot be removed now does no harm
    for (fs::directory_iterator entry(directoryOf(target), ignored), end; entry != end;
         entry.increment(ignored)) {
        if (!isTemporaryOf(target, entry->path().filename().string())) {
            continue;
        }
        const Descriptor file(::open(entry->path().c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
        if (file.isOpen() && flock(file.get(), LOCK_EX | LOCK_NB) == 0) {
            ::unlink(entry->path().c_str());
        }
    }
}

void copyOwnership(const Descriptor& file, const std::string& target) {
    struct stat old {};
    if (::stat(target.c_str(), &old) != 0) {
        return;
    }
    // A writer that may not give files away keeps its own; the content counts.
    [[maybe_unused]] const int owner = fchown(file.get(), old.st_uid, old.st_gid);
    if (fchmod(file.get(), old.st_mode & 07777U) != 0) {
        fail(target, "set the mode");
    }
}

void syncDirectory(const fs::path& target) {
    const Descriptor directory(::open(directoryOf(target).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    // EINVAL: a file system that has nothing to sync there.
    if (!directory.isOpen() || (fsync(directory.get()) != 0 && errno != EINVAL)) {
        fail(target, "bring the directory to the disk");
    }
}

}  // namespace

std::optional<std::string> readWholeFile(const std::string& path) {
    // Not blocking: a pipe in the place of the file must not hold us up.
    const Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    if (!file.isOpen()) {
        if (errno == ENOENT) {
            return {};
        }
        fail(path, "open");
    }
    struct stat status {};
    if (fstat(file.get(), &status) != 0) {
        fail(path, "read");
    }
    if (!S_ISREG(status.st_mode)) {
        fail(path, "read: not a regular file", S_ISDIR(status.st_mode) ? EISDIR : EINVAL);
    }
    std::string content;
    std::vector<char> buffer(std::size_t{64} * 1024);
    for (;;) {
        const ssize_t count = ::read(file.get(), buffer.data(), buffer.size());
        if (count == 0) {
            return content;
        }
        if (count > 0) {
            content.append(buffer.data(), static_cast<std::size_t>(count));
        } else if (errno != EINTR) {
            fail(path, "read");
        }
    }
}

void replaceWholeFile(const std::string& path, const std::string& content) {
    removeLeftovers(path);
    auto [file, temporary] = createTemporary(path);
    try {
        writeAll(file, content, path);
        copyOwnership(file, path);
        if (fsync(file.get()) != 0 || !closesCleanly(file)) {
            fail(path, "bring it to the disk");
        }
        if (::rename(temporary.c_str(), path.c_str()) != 0) {
            fail(path, "replace");
        }
    } catch (...) {
        ::unlink(temporary.c_str());
        throw;
    }
    syncDirectory(path);
}

}  // namespace QX
