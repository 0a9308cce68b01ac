#pragma once

#include <sys/types.h>

#include <optional>
#include <string>

namespace cvagent::service {

/// What the host's table of users calls him; nothing when it does not have him.
std::optional<std::string> nameOfUser(uid_t user);

/// For people: "alice (uid 1000)", or the number alone.
std::string userText(uid_t user);

/// The number of the group of that name in the host's table; nothing when it is not there.
std::optional<gid_t> groupNamed(const std::string& name);

}  // namespace cvagent::service
