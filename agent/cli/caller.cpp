#include "agent/cli/caller.h"

#include <pwd.h>
#include <sys/types.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <optional>

#include "agent/core/text.h"
#include "framework/qx/whole_number.h"

namespace cvagent {

namespace {

constexpr uid_t kNobodyLoggedIn = static_cast<uid_t>(-1);

std::optional<uid_t> sudoUser;

std::optional<uid_t> userOf(const std::string& text) {
    const auto user = QX::wholeNumber<uid_t>(text);
    return user && *user != kNobodyLoggedIn ? user : std::nullopt;
}

std::optional<uid_t> loginUser() {
    std::ifstream file("/proc/self/loginuid");
    std::string text;
    std::getline(file, text);
    return userOf(text);
}

std::string named(uid_t user) {
    const passwd* const found = getpwuid(user);
    const std::string number = "uid " + std::to_string(user);
    return found != nullptr ? std::string(found->pw_name) + " (" + number + ")" : number;
}

}  // namespace

/// Who is not root could name anybody.
void rememberCaller() {
    const char* told = std::getenv("SUDO_UID");
    sudoUser = told != nullptr && geteuid() == 0 ? userOf(told) : std::nullopt;
}

std::string callerName() {
    const uid_t user = geteuid();
    auto first = loginUser();
    if (!first || *first == user) {
        first = sudoUser;
    }
    return first && *first != user ? named(*first) + " as " + named(user) : named(user);
}

}  // namespace cvagent
