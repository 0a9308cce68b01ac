#include "agent/keep/host_settings.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <filesystem>

#include "agent/core/text.h"
#include "agent/keep/host_files.h"

namespace cvagent::keep {

namespace {

namespace fs = std::filesystem;

constexpr const char* kZones = "/usr/share/zoneinfo/";
constexpr std::size_t kLongestName = 64;  // of the kernel

bool isAnyThere(std::initializer_list<const char*> paths) {
    return std::ranges::any_of(paths, [](const char* path) { return access(path, F_OK) == 0; });
}

void checkHostName(const std::string& name) {
    const bool isFitting =
        !name.empty() && name.size() <= kLongestName && std::ranges::all_of(name, [](unsigned char letter) {
            return (letter < 0x80 && std::isalnum(letter) != 0) || letter == '-' || letter == '.' ||
                   letter == '_';
        });
    if (!isFitting || name.find("..") != std::string::npos || name.front() == '.' || name.front() == '-' ||
        name.back() == '.' || name.back() == '-') {
        throw CannotKeep(inQuotes(name) + " is no name that a host could have after a restart");
    }
}

/// As systemd reads it: the first line that is none of comment, without dots at its end.
std::string hostNameIn(const std::string& text) {
    std::string_view left = text;
    while (!left.empty()) {
        const std::string_view line = left.substr(0, left.find('\n'));
        left.remove_prefix(std::min(line.size() + 1, left.size()));
        const std::vector<std::string> words = wordsOf(std::string(line));
        if (!words.empty() && !words[0].starts_with('#')) {
            return words[0].substr(0, words[0].find_last_not_of('.') + 1);
        }
    }
    return "";
}

}  // namespace

/// Systemd starts it when it is asked, and who has the one has the other. Looked up in files, which a host
/// that changes are only tried on has, too.
bool isHostnamedThere() {
    return isAnyThere({"/run/systemd/system"}) && isAnyThere({"/usr/bin/hostnamectl", "/bin/hostnamectl"});
}

/// Where the old file of SUSE's is a link to this one, the plug-in has written it by now.
Way wayOfHostName(const std::string& name) {
    checkHostName(name);
    const auto before = smallFile(kHostNameFile);
    const bool isKeptAlready = before && hostNameIn(*before) == name;
    Way way;
    way.files = {{kHostNameFile, before, isKeptAlready ? before : std::optional(name + "\n")}};
    if (isHostnamedThere()) {
        way.system = "systemd-hostnamed";
        way.callsBefore = {"hostnamectl --no-ask-password --static set-hostname " + name};
    }
    return way;
}

bool isNameInOldFile() {
    return isAnyThere({kOldHostNameFile}) && !isAnyThere({kHostNameFile, "/run/systemd/system"});
}

std::string oldNameFileWith(const std::string& name) {
    if (hostNameIn(smallFile(kOldHostNameFile).value_or("")) != name) {
        throw CannotKeep(std::string(kOldHostNameFile) + " does not have it");
    }
    return kOldHostNameFile;
}

Way wayOfZone(const std::string& zone) {
    std::error_code none;
    const fs::path target = fs::read_symlink(kZoneLink, none);
    if (target != kZones + zone || !fs::is_regular_file(kZones + zone, none)) {
        throw CannotKeep(std::string(kZoneLink) + " does not lead to " + inQuotes(zone));
    }
    Way way;
    if (const auto before = smallFile(kZoneNameFile)) {
        const bool isKeptAlready = wordsOf(*before) == std::vector{zone};
        way.files = {{kZoneNameFile, before, isKeptAlready ? before : std::optional(zone + "\n")}};
    }
    return way;
}

}  // namespace cvagent::keep
