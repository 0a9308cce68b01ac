#include "agent/history/place.h"

#include <fcntl.h>
#include <grp.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <optional>
#include <system_error>

#include "agent/core/data_directory.h"
#include "agent/core/own_directory.h"
#include "agent/core/owners.h"
#include "agent/core/text.h"
#include "agent/history/history_error.h"

namespace cvagent {

namespace {

constexpr const char* kHostDirectory = "/var/lib/corvista/";
constexpr const char* kReaders = "corvista";  // the group that may read the host's history
constexpr std::array kParts = {"", "-wal", "-shm"};
constexpr const char* kDamaged = ".damaged-";

[[noreturn]] void failWith(int error, const std::string& what) {
    const HistoryError::Kind kind = error == EACCES || error == EPERM ? HistoryError::denied
                                    : error == EROFS                  ? HistoryError::readOnly
                                    : error == ENOSPC || error == EDQUOT || error == EFBIG
                                        ? HistoryError::full
                                    : error == ENOENT ? HistoryError::absent
                                                      : HistoryError::failed;
    throw HistoryError(kind, what + ": " + std::strerror(error));
}

/// Nothing where there is nothing.
std::optional<struct stat> look(const std::string& file) {
    struct stat found {};
    if (lstat(file.c_str(), &found) == 0) {
        return found;
    }
    if (errno != ENOENT) {
        failWith(errno, inQuotes(file));
    }
    return std::nullopt;
}

std::optional<gid_t> readers(const HistoryPlace& place) {
    const group* const found = place.isHosts && geteuid() == 0 ? getgrnam(kReaders) : nullptr;
    return found != nullptr ? std::optional(found->gr_gid) : std::nullopt;
}

/// What somebody else could change, or have changed.
void judge(const std::string& file, const struct stat& found) {
    const bool ours = S_ISREG(found.st_mode) && found.st_nlink == 1 &&
                      (found.st_uid == geteuid() || isTheSystem(found.st_uid));
    if (!ours || othersCanWrite(file, found)) {
        throw HistoryError(
            HistoryError::unsafe,
            inQuotes(file) + " is no file that only its owner can write, or it is another user's");
    }
}

/// Its owner reads and writes it, the readers read it, and nobody else.
void giveRights(const std::string& file, const struct stat& found, const std::optional<gid_t>& group) {
    if (group && found.st_gid != *group && lchown(file.c_str(), static_cast<uid_t>(-1), *group) != 0) {
        failWith(errno, inQuotes(file));
    }
    const mode_t wanted = group ? 0640 : 0600;
    if ((found.st_mode & 07777) != wanted && chmod(file.c_str(), wanted) != 0) {
        failWith(errno, inQuotes(file));
    }
}

void syncDirectory(const std::string& directory) {
    const int opened = open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (opened >= 0) {
        fsync(opened);
        close(opened);
    }
}

/// A file that is there is not opened: closing it would take the locks from who has it open in this process.
void makeFile(const HistoryPlace& place) {
    const int made = open(place.file().c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, 0600);
    if (made < 0 && errno != EEXIST) {
        failWith(errno, inQuotes(place.file()));
    }
    if (made >= 0) {
        close(made);
        syncDirectory(place.directory);
    }
}

/// As ownDirectory has made it; a directory that somebody has given another owner or mode keeps them.
void letReadersIn(const HistoryPlace& place, const std::optional<gid_t>& group) {
    const auto found = look(place.directory);
    if (group && found && found->st_gid == 0 && (found->st_mode & 07777) == 0700 &&
        lchown(place.directory.c_str(), static_cast<uid_t>(-1), *group) == 0) {
        chmod(place.directory.c_str(), 0750);
    }
}

}  // namespace

HistoryPlace ownHistoryPlace() {
    const char* named = std::getenv(kDataVariable);
    if (named == nullptr && geteuid() == 0) {
        return {kHostDirectory, true};
    }
    std::string directory = named != nullptr ? named : userDirectory();
    if (directory.empty()) {
        throw HistoryError(HistoryError::failed, "there is no place for it");
    }
    return {directory.ends_with('/') ? directory : directory + "/"};
}

HistoryPlace readHistoryPlace(std::string& left) {
    if (std::getenv(kDataVariable) != nullptr || geteuid() == 0) {
        return ownHistoryPlace();
    }
    HistoryPlace host{kHostDirectory, true};
    if (access(host.file().c_str(), R_OK) == 0) {
        return host;
    }
    const int error = errno;
    const std::string own = userDirectory();
    if (error == ENOENT && !own.empty()) {
        return ownHistoryPlace();
    }
    if (error != ENOENT && !own.empty() && access(ownHistoryPlace().file().c_str(), R_OK) == 0) {
        left = host.file() + ": " + std::strerror(error);
        return ownHistoryPlace();
    }
    return host;
}

FileIdentity identityOf(const std::string& file) {
    struct stat found {};
    return lstat(file.c_str(), &found) == 0 ? FileIdentity{found.st_dev, found.st_ino} : FileIdentity{};
}

HistoryPlace reachHistoryPlace(HistoryPlace place) {
    try {
        place.directory = ownDirectory(place.directory, {Problem::none, ""});
    } catch (const std::system_error& error) {
        failWith(error.code().value(), inQuotes(place.directory));
    } catch (const Problem& problem) {
        throw HistoryError(HistoryError::unsafe, problem.what());
    }
    return place;
}

void prepareHistoryFile(const HistoryPlace& place) {
    const auto group = readers(place);
    letReadersIn(place, group);
    if (!look(place.file())) {
        makeFile(place);
    }
    for (const char* part : kParts) {
        const std::string file = place.file() + part;
        if (const auto found = look(file)) {
            judge(file, *found);
            giveRights(file, *found, group);
        }
    }
}

HistoryPlace judgeForReading(HistoryPlace place) {
    const auto found = look(place.file());
    if (!found) {
        throw HistoryError(HistoryError::absent, "there is none");
    }
    judge(place.file(), *found);
    std::error_code error;
    const std::filesystem::path directory = std::filesystem::canonical(place.directory, error);
    if (error) {
        failWith(error.value(), inQuotes(place.directory));
    }
    place.directory = directory / "";
    return place;
}

std::string moveAside(const HistoryPlace& place) {
    const std::string file = place.file();
    std::tm now{};
    const std::time_t time = std::time(nullptr);
    gmtime_r(&time, &now);
    std::array<char, 40> when{};
    [[maybe_unused]] const std::size_t length =
        std::strftime(when.data(), when.size(), "%Y%m%dT%H%M%SZ", &now);
    const std::string base = file + kDamaged + when.data();
    std::string aside = base;
    for (int more = 2; look(aside); ++more) {
        aside = base + "." + std::to_string(more);
    }
    for (const char* part : kParts) {
        if (rename((file + part).c_str(), (aside + part).c_str()) != 0 && errno != ENOENT) {
            failWith(errno, inQuotes(file));
        }
    }
    syncDirectory(place.directory);
    return aside;
}

bool hasTraces(const HistoryPlace& place) {
    const std::string file = place.file();
    std::error_code error;
    for (const auto& entry : std::filesystem::directory_iterator(place.directory, error)) {
        const std::string found = entry.path().string();
        if (found.starts_with(file + "-") || found.starts_with(file + kDamaged)) {
            return true;
        }
    }
    return false;
}

HistoryLock::HistoryLock(const HistoryPlace& place, Kind kind) {
    const std::string name = place.directory + "history.lock";
    file_ = open(name.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC | O_NONBLOCK | O_NOCTTY, 0600);
    if (file_ < 0) {
        failWith(errno, inQuotes(name));
    }
    struct stat found {};
    if (fstat(file_, &found) != 0 || !S_ISREG(found.st_mode) || found.st_uid != geteuid()) {
        close(file_);
        throw HistoryError(HistoryError::unsafe, inQuotes(name) + " is not this user's");
    }
    constexpr timespec kPause{0, 10'000'000};
    constexpr int kPauses = 200;
    const int operation = (kind == Kind::shared ? LOCK_SH : LOCK_EX) | LOCK_NB;
    for (int i = 0; flock(file_, operation) != 0; ++i) {
        if (errno != EWOULDBLOCK || i == kPauses) {
            close(file_);
            throw HistoryError(HistoryError::busy, "another process is at work on it");
        }
        nanosleep(&kPause, nullptr);
    }
}

HistoryLock::~HistoryLock() {
    close(file_);  // the lock goes with it
}

}  // namespace cvagent
