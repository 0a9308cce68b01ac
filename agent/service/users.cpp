#include "agent/service/users.h"

#include <grp.h>
#include <pwd.h>

namespace cvagent::service {

namespace {

constexpr std::size_t kEntrySize = 65536;  // what the texts of one entry may take

}  // namespace

std::optional<std::string> nameOfUser(uid_t user) {
    std::string texts(kEntrySize, '\0');
    passwd entry{};
    passwd* found = nullptr;
    getpwuid_r(user, &entry, texts.data(), texts.size(), &found);
    return found != nullptr ? std::optional<std::string>(found->pw_name) : std::nullopt;
}

std::string userText(uid_t user) {
    const std::string id = "uid " + std::to_string(user);
    const std::optional<std::string> name = nameOfUser(user);
    return name ? *name + " (" + id + ")" : id;
}

std::optional<gid_t> groupNamed(const std::string& name) {
    std::string texts(kEntrySize, '\0');
    struct group entry {};
    struct group* found = nullptr;
    getgrnam_r(name.c_str(), &entry, texts.data(), texts.size(), &found);
    return found != nullptr ? std::optional<gid_t>(found->gr_gid) : std::nullopt;
}

}  // namespace cvagent::service
