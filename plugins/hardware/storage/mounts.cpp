#include "plugins/hardware/storage/mounts.h"

#include <algorithm>
#include <array>
#include <map>
#include <optional>
#include <set>
#include <string_view>

namespace hardware {

namespace {

/// "\040" as the kernel writes blanks, tabs, line breaks and backslashes.
std::string decodedOctal(std::string_view text) {
    std::string plain;
    for (std::size_t at = 0; at < text.size(); ++at) {
        const bool coded =
            text[at] == '\\' && at + 3 < text.size() && text.find_first_not_of("01234567", at + 1) >= at + 4;
        if (coded) {
            plain +=
                static_cast<char>((text[at + 1] - '0') * 64 + (text[at + 2] - '0') * 8 + text[at + 3] - '0');
            at += 3;
        } else {
            plain += text[at];
        }
    }
    return plain;
}

/// Takes the word up to the next blank; it may be empty.
std::string_view takeWord(std::string_view& text) {
    const std::string_view word = text.substr(0, text.find(' '));
    text.remove_prefix(std::min(word.size() + 1, text.size()));
    return word;
}

std::optional<Mount> parsed(std::string_view line) {
    constexpr std::string_view kDash = " - ";
    const std::size_t dash = line.find(kDash);
    if (dash == std::string_view::npos) {
        return std::nullopt;
    }
    std::string_view place = line.substr(0, dash);
    std::string_view what = line.substr(dash + kDash.size());
    Mount mount;
    mount.id = takeWord(place);
    mount.under = takeWord(place);
    mount.number = takeWord(place);
    takeWord(place);  // the part of the file system
    mount.where = decodedOctal(takeWord(place));
    mount.type = takeWord(what);
    mount.source = decodedOctal(takeWord(what));
    return mount.where.starts_with('/') ? std::optional(std::move(mount)) : std::nullopt;
}

/// Whether a path goes through a directory or ends there.
bool leadsThrough(const std::string& path, const std::string& directory) {
    return directory == "/" || (path.starts_with(directory) &&
                                (path.size() == directory.size() || path[directory.size()] == '/'));
}

/// Whether somebody else has to answer before a path through it leads on.
bool hasServer(const std::string& type) {
    constexpr std::array<std::string_view, 10> kWithServer = {"9p",   "afs",    "autofs", "ceph", "cifs",
                                                              "coda", "lustre", "nfs",    "nfs4", "smb3"};
    return type.starts_with("fuse") ||
           std::find(kWithServer.begin(), kWithServer.end(), type) != kWithServer.end();
}

constexpr const char* kFirst = "/proc/1/mountinfo";
constexpr const char* kOwn = "/proc/self/mountinfo";

std::vector<Mount> rowsOf(const Host& host, const char* file) {
    constexpr std::size_t kLongest = 16UL << 20;  // a host with many containers has tens of thousands
    std::vector<Mount> found;
    const std::string text = host.text(file, kLongest).value_or("");
    for (std::string_view rest = text; !rest.empty();) {
        const std::string_view line = rest.substr(0, rest.find('\n'));
        rest.remove_prefix(std::min(line.size() + 1, rest.size()));
        if (auto mount = parsed(line)) {
            found.push_back(std::move(*mount));
        }
    }
    return found;
}

}  // namespace

std::vector<Mount> mounts(const Host& host) {
    std::vector<Mount> all = rowsOf(host, kFirst);
    return all.empty() ? rowsOf(host, kOwn) : all;
}

Within mountsWithinReach(const Host& host) {
    const bool allowed = host.exists("/proc/1/root/.");
    return allowed ? Within{rowsOf(host, kFirst), "/proc/1/root"} : Within{rowsOf(host, kOwn), ""};
}

bool leadsThere(const Mount& mount, const std::vector<Mount>& all) {
    std::map<std::string_view, const Mount*> byId;
    for (const Mount& one : all) {
        byId[one.id] = &one;
    }
    std::set<const Mount*> below;  // the mount and those that it stands on
    const auto known = byId.find(mount.id);
    for (auto at = known; at != byId.end() && below.insert(at->second).second;) {
        at = byId.find(at->second->under);
    }
    return std::all_of(all.begin(), all.end(), [&](const Mount& other) {
        return !leadsThrough(mount.where, other.where) ||
               (below.contains(&other) && (other.id == mount.id || !hasServer(other.type)));
    });
}

}  // namespace hardware
