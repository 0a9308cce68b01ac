#include "agent/core/own_directory.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <deque>
#include <filesystem>
#include <system_error>

#include "agent/core/owners.h"
#include "agent/core/text.h"

namespace cvagent {

namespace {

namespace fs = std::filesystem;

[[noreturn]] void failStep(int error) {
    throw std::system_error(error, std::generic_category());
}

/// The way from the root of the file system to a directory. It is walked name by name, so that nothing is
/// made or trusted behind a place where somebody else could put something of his own.
class Way {
public:
    /// @param role what a refusal is about
    Way(const std::string& path, const DirectoryRole& role) : role_(role), whole_(path), left_(names(path)) {}

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
            failStep(errno);
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
            failStep(error);
        }
        if (mkdir(next.c_str(), mode) != 0 && errno != EEXIST) {
            failStep(errno);
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
            failStep(ELOOP);
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
            "the " + role_.name + " " + inQuotes(whole_) + " is not safe: " + inQuotes(place) + " " + reason,
            role_.subject, role_.reason);
    }

    const DirectoryRole& role_;
    std::string whole_;
    std::deque<std::string> left_;
    std::string reached_;  // without a slash at its end; the root is empty
    int links_ = 0;
};

}  // namespace

std::string ownDirectory(const std::string& path, const DirectoryRole& role) {
    return Way(path, role).walk();
}

}  // namespace cvagent
