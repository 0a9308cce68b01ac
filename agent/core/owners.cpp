#include "agent/core/owners.h"

#include <grp.h>
#include <pwd.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <fstream>

namespace cvagent {

namespace {

constexpr uid_t kUnmappedOwner = 65534;  // elsewhere that is "nobody", whom daemons run as
constexpr unsigned long kAllUsers = 4294967295;

bool isInUserNamespace() {
    std::ifstream map("/proc/self/uid_map");
    unsigned long inside = 0;
    unsigned long outside = 0;
    unsigned long count = 0;
    return map >> inside >> outside >> count && count != kAllUsers;
}

/// Whether the group bears the user's name and lists nobody else.
bool isNamedAfter(const std::string& user, gid_t id) {
    const group* const found = getgrgid(id);
    if (found == nullptr || user != found->gr_name) {
        return false;
    }
    for (char* const* member = found->gr_mem; *member != nullptr; ++member) {
        if (user != *member) {
            return false;
        }
    }
    return true;
}

bool isGroupOfAnybodyElse(const std::string& user, gid_t id) {
    bool any = false;
    setpwent();
    for (const passwd* other = getpwent(); other != nullptr; other = getpwent()) {
        any = any || (other->pw_gid == id && user != other->pw_name);
    }
    endpwent();
    return any;
}

/// Root's group is left out: on many hosts it has members by other ways.
bool isOwnersAlone(uid_t owner, gid_t id) {
    const passwd* const found = owner != 0 ? getpwuid(owner) : nullptr;
    if (found == nullptr || found->pw_gid != id) {
        return false;
    }
    const std::string user = found->pw_name;
    return isNamedAfter(user, id) && !isGroupOfAnybodyElse(user, id);
}

/// With one the bits of the group say what anybody in the list may do at most.
bool hasAccessList(const std::string& place) {
    return lgetxattr(place.c_str(), "system.posix_acl_access", nullptr, 0) > 0;
}

}  // namespace

bool isTheSystem(uid_t owner) {
    return owner == 0 || (owner == kUnmappedOwner && isInUserNamespace());
}

bool isSomebodyElses(const struct stat& found) {
    return found.st_uid != geteuid() && !isTheSystem(found.st_uid);
}

bool othersCanReplace(const std::string& place, const struct stat& found, bool isGoal, Writers writers) {
    const bool onlyOwnFiles = (found.st_mode & S_ISVTX) != 0 && !isGoal;
    if (S_ISLNK(found.st_mode) || onlyOwnFiles) {
        return false;
    }
    return writers == Writers::groupsToo ? othersCanWrite(place, found) : (found.st_mode & S_IWOTH) != 0;
}

bool othersCanWrite(const std::string& place, const struct stat& found) {
    if ((found.st_mode & S_IWOTH) != 0) {
        return true;
    }
    return (found.st_mode & S_IWGRP) != 0 &&
           (hasAccessList(place) || !isOwnersAlone(found.st_uid, found.st_gid));
}

}  // namespace cvagent
