#include "agent/core/data_directory.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <deque>
#include <filesystem>
#include <system_error>

#include "agent/core/owners.h"
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

/// The way from the root of the file system to a directory. It is walked name by name, so that nothing is
/// made or trusted behind a place where somebody else could put something of his own.
class Way {
public:
    /// @param role what a refusal is about
    Way(const std::string& path, const HeldDirectory::Role& role)
        : role_(role), whole_(path), left_(names(path)) {}

    /// Makes what is missing. @return the path without symbolic links
    std::string walk() {
        while (!left_.empty()) {
            const std::string name = left_.front();
            left_.pop_front();
            if (name == "..") {
                reached_.erase(std::min(reached_.rfind('/'), reached_.size()));
            } else {
                step(reached_ + "/" + name);
            }
        }
        judge(reached_.empty() ? "/" : reached_, look(reached_ + "/"), true);
        return reached_ + "/";
    }

private:
    static std::deque<std::string> names(const std::string& path) {
        std::deque<std::string> all;
        for (const fs::path& name : fs::path(path).relative_path()) {
            if (!name.empty() && name != ".") {
                all.push_back(name);
            }
        }
        return all;
    }

    static struct stat look(const std::string& place) {
        struct stat found {};
        if (lstat(place.c_str(), &found) != 0) {
            failWith(errno);
        }
        return found;
    }
    void step(const std::string& next) {
        struct stat found {};
        if (lstat(next.c_str(), &found) != 0) {
            make(next, errno);
            found = look(next);
        }
        judge(next, found, false);
        if (S_ISLNK(found.st_mode)) {
            follow(next);
        } else {
            reached_ = next;
        }
    }
    void make(const std::string& next, int error) const {
        const mode_t mode = left_.empty() ? 0700 : 0755;
        if (error != ENOENT) {
            failWith(error);
        }
        if (mkdir(next.c_str(), mode) != 0 && errno != EEXIST) {
            failWith(errno);
        }
    }
    void judge(const std::string& place, const struct stat& found, bool isGoal) const {
        if (isGoal ? found.st_uid != geteuid() : isSomebodyElses(found)) {
            refuse(place, "belongs to somebody else (user " + std::to_string(found.st_uid) + ")");
        }
        if (othersCanReplace(place, found, isGoal, Writers::groupsToo)) {
            refuse(place, "can be written by others");
        }
    }
    void follow(const std::string& link) {
        constexpr int kMostLinks = 40;
        if (++links_ > kMostLinks) {
            failWith(ELOOP);
        }
        const fs::path target = fs::read_symlink(link);
        const std::deque<std::string> more = names(target);
        left_.insert(left_.begin(), more.begin(), more.end());
        if (target.is_absolute()) {
            reached_.clear();
        }
    }
    [[noreturn]] void refuse(const std::string& place, const std::string& reason) const {
        throw Problem(
            Problem::failed,
            "the data directory " + inQuotes(whole_) + " is not safe: " + inQuotes(place) + " " + reason,
            role_.subject, role_.reason);
    }

    const HeldDirectory::Role& role_;
    std::string whole_;
    std::deque<std::string> left_;
    std::string reached_;  // without a slash at its end; the root is empty
    int links_ = 0;
};

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

std::string standardDirectory() {
    const char* path = QX::CorvistaUtilities::getMoraineDataDir();
    return path != nullptr ? path : "";
}

/// Where a user who may not write to the standard place keeps the data; "" when there is no home.
std::string userDirectory() {
    const char* state = std::getenv("XDG_STATE_HOME");
    const char* home = std::getenv("HOME");
    if (state != nullptr && *state == '/') {
        return std::string(state) + "/corvista/data/";
    }
    return home != nullptr && *home == '/' ? std::string(home) + "/.local/state/corvista/data/" : "";
}

/// What every agent of this user holds, for the plug-in's files have the same names in all of them.
std::string fixedDirectory() {
    struct stat found {};
    const bool isOurs = stat(kSettings, &found) == 0 && found.st_uid == geteuid();
    return isOurs || geteuid() == 0 ? kSettings : userDirectory();
}

}  // namespace

HeldDirectory::HeldDirectory(const std::string& path, const Role& role)
    : path_(Way(path, role).walk()), lock_(openLock(path_ + kLockFile)) {
    if (lock_ >= 0) {
        hold(role);
    }
}

void HeldDirectory::hold(const Role& role) const {
    struct stat found {};
    const bool isOurs = fstat(lock_, &found) == 0 && S_ISREG(found.st_mode) && found.st_uid == geteuid();
    if (isOurs && (found.st_mode & 077U) != 0) {
        fchmod(lock_, 0600);
    }
    const int error = !isOurs ? EPERM : flock(lock_, LOCK_EX | LOCK_NB) != 0 ? errno : 0;
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

DataDirectory::DataDirectory() {
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
        own_.emplace(path, HeldDirectory::Role{isStandard_ ? Problem::dataFixed : Problem::dataOwn, ""});
    } catch (const std::system_error& error) {
        throw Problem(Problem::failed,
                      "cannot use the data directory " + inQuotes(path) + ": " + error.code().message(),
                      Problem::dataUse);
    }
    holdSettings();
}

void DataDirectory::nameInEnvironment() const {
    if (!isStandard_) {
        setenv(kDataVariable, own_->path().c_str(), 1);
    }
}

void DataDirectory::holdSettings() {
    const std::string fixed = fixedDirectory();
    std::error_code missing;
    if (fixed.empty() || fs::equivalent(own_->path(), fixed, missing)) {
        return;
    }
    const std::string why = fixed == kSettings ? "; settings of interfaces are saved there whatever "
                                               : "; files in /tmp have the same names whatever ";
    try {
        settings_.emplace(fixed, HeldDirectory::Role{Problem::dataFixed, why + kDataVariable + " is"});
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
