#include "agent/core/data_directory.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <system_error>
#include <thread>

#include "agent/core/own_directory.h"
#include "agent/core/problem.h"
#include "agent/core/text.h"
#include "framework/qx/corvista_utilities.h"

namespace cvagent {

namespace {

namespace fs = std::filesystem;

constexpr const char* kSettings = "/opt/vantrel/corvista/data";
constexpr const char* kLockFile = ".lock";

[[noreturn]] void failWith(int error) {
    throw std::system_error(error, std::generic_category());
}

/// @return a descriptor; -1 where there is no lock file and none can be made, for nothing can be written
int openLock(const std::string& path) {
    constexpr int kAlways = O_NOFOLLOW | O_CLOEXEC | O_NONBLOCK | O_NOCTTY;
    int lock = open(path.c_str(), O_RDWR | O_CREAT | kAlways, 0600);
    if (lock < 0 && errno == EROFS) {
        lock = open(path.c_str(), O_RDONLY | kAlways);
        if (lock < 0 && errno == ENOENT) {
            return -1;
        }
    }
    if (lock < 0) {
        failWith(errno);
    }
    return lock;
}

/// @return 0 or an errno
int lockWithin(int file, std::chrono::milliseconds wait) {
    constexpr std::chrono::milliseconds kBetween{20};
    const auto deadline = std::chrono::steady_clock::now() + wait;
    while (flock(file, LOCK_EX | LOCK_NB) != 0) {
        if (errno != EWOULDBLOCK || std::chrono::steady_clock::now() >= deadline) {
            return errno;
        }
        std::this_thread::sleep_for(kBetween);
    }
    return 0;
}

std::string standardDirectory() {
    const char* path = QX::CorvistaUtilities::getMoraineDataDir();
    return path != nullptr ? path : "";
}

/// What every agent of this user holds, for the plug-in's files have the same names in all of them.
std::string fixedDirectory() {
    struct stat found {};
    const bool isOurs = stat(kSettings, &found) == 0 && found.st_uid == geteuid();
    return isOurs || geteuid() == 0 ? kSettings : userDirectory();
}

}  // namespace

std::string userDirectory() {
    const char* state = std::getenv("XDG_STATE_HOME");
    const char* home = std::getenv("HOME");
    if (state != nullptr && *state == '/') {
        return std::string(state) + "/corvista/data/";
    }
    return home != nullptr && *home == '/' ? std::string(home) + "/.local/state/corvista/data/" : "";
}

HeldDirectory::HeldDirectory(const std::string& path, const DirectoryRole& role,
                             std::chrono::milliseconds wait)
    : path_(ownDirectory(path, role)), lock_(openLock(path_ + kLockFile)) {
    if (lock_ >= 0) {
        hold(role, wait);
    }
}

void HeldDirectory::hold(const DirectoryRole& role, std::chrono::milliseconds wait) const {
    struct stat found {};
    const bool isOurs = fstat(lock_, &found) == 0 && S_ISREG(found.st_mode) && found.st_uid == geteuid();
    if (isOurs && (found.st_mode & 077U) != 0) {
        fchmod(lock_, 0600);
    }
    const int error = isOurs ? lockWithin(lock_, wait) : EPERM;
    if (error == 0) {
        return;
    }
    close(lock_);
    if (error != EWOULDBLOCK) {
        failWith(error);
    }
    throw Problem(Problem::busy, "another agent holds the data directory " + inQuotes(path_), role.subject,
                  role.reason);
}

HeldDirectory::~HeldDirectory() {
    if (lock_ >= 0) {
        close(lock_);  // the lock goes with it
    }
}

DataDirectory::DataDirectory(std::chrono::milliseconds wait) {
    const char* chosen = std::getenv(kDataVariable);
    if (chosen != nullptr && *chosen == '\0') {
        throw Problem(Problem::refused, std::string(kDataVariable) + " is empty", Problem::dataVariable);
    }
    const bool isUsers = chosen == nullptr && geteuid() != 0;
    const std::string path = isUsers ? userDirectory() : standardDirectory();
    if (path.empty()) {
        throw Problem(Problem::failed, "there is no place for data", Problem::dataPlace);
    }
    // Root is held to the standard directory anyway, for the settings that are saved there.
    isStandard_ = chosen == nullptr && !isUsers;
    try {
        own_.emplace(path, DirectoryRole{isStandard_ ? Problem::dataFixed : Problem::dataOwn, ""}, wait);
    } catch (const std::system_error& error) {
        throw Problem(Problem::failed,
                      "cannot use the data directory " + inQuotes(path) + ": " + error.code().message(),
                      Problem::dataUse);
    }
    holdSettings(wait);
}

void DataDirectory::nameInEnvironment() const {
    if (!isStandard_) {
        setenv(kDataVariable, own_->path().c_str(), 1);
    }
}

void DataDirectory::holdSettings(std::chrono::milliseconds wait) {
    const std::string fixed = fixedDirectory();
    std::error_code missing;
    if (fixed.empty() || fs::equivalent(own_->path(), fixed, missing)) {
        return;
    }
    const std::string why = fixed == kSettings ? "; settings of interfaces are saved there whatever "
                                               : "; files in /tmp have the same names whatever ";
    try {
        settings_.emplace(fixed, DirectoryRole{Problem::dataFixed, why + kDataVariable + " is"}, wait);
    } catch (const std::system_error&) {
        // Where it cannot be made, no agent saves or removes settings.
    } catch (const Problem& problem) {
        // A user named another directory perhaps because this one is not safe.
        if (geteuid() == 0 || problem.kind() == Problem::busy) {
            throw;
        }
    }
}

}  // namespace cvagent
