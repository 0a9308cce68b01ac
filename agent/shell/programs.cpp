#include "agent/shell/programs.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <map>
#include <mutex>
#include <utility>

#include "hosttools/descriptor.h"

namespace cvagent::shell {

namespace {

constexpr auto kSystemDirectories =
    std::to_array<std::string_view>({"/usr/bin/", "/bin/", "/usr/sbin/", "/sbin/"});

/// A filter's name and the words that are found in the program which it stands for.
struct Known {
    std::string_view name;
    std::string_view mark;
};
constexpr std::string_view kBinary = "\177ELF";
constexpr std::string_view kScript = "#!";
/// Zeros around it: a text of a program in C, and not one that only speaks of these.
constexpr std::string_view kCoreutils("\0GNU coreutils\0", 15);
/// Older releases print this complaint, worded otherwise, among what they find.
constexpr std::string_view kGrep = ": binary file matches";
constexpr std::string_view kEgrepScript = "exec grep -E \"$@\"\n";
/// Its own tools differ from release to release and from build to build.
constexpr std::string_view kBusybox("\0BusyBox v1.35.0 (Debian ", 25);
constexpr std::string_view kGawk("\0GNU Awk ", 9);
constexpr auto kKnown = std::to_array<Known>({{"awk", "Thomas E. Dickey"},
                                              {"awk", kGawk},
                                              {"cat", kCoreutils},
                                              {"cut", kCoreutils},
                                              {"egrep", kGrep},
                                              {"grep", kGrep},
                                              {"md5sum", kCoreutils},
                                              {"rm", kCoreutils},
                                              {"sha1sum", kCoreutils},
                                              {"tr", kCoreutils}});

using Identity = FileIdentity;

Identity identityOf(const struct stat& file) {
    return {file.st_dev,          file.st_ino,         file.st_size,        file.st_mtim.tv_sec,
            file.st_mtim.tv_nsec, file.st_ctim.tv_sec, file.st_ctim.tv_nsec};
}

std::string beginningOf(const std::string& path) {
    constexpr std::size_t kMost = 4UL << 20U;
    const hosttools::Descriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    std::string content;
    for (std::size_t used = 0; file.isOpen() && used < kMost;) {
        content.resize(used + 65536);
        const ssize_t got = read(file.get(), content.data() + used, content.size() - used);
        used += got > 0 ? static_cast<std::size_t>(got) : 0;
        content.resize(used);
        if (got <= 0) {
            break;
        }
    }
    return content;
}

/// The script that newer releases of GNU grep install as egrep; theirs, or a distribution's without the
/// warning.
bool isEgrepScript(std::string_view content) {
    constexpr std::size_t kLongest = 200;
    return content.size() < kLongest && content.starts_with("#!/bin/sh\n") &&
           content.ends_with(kEgrepScript) && content.find("obsolescent") == std::string_view::npos;
}

/// A string's own search stops at each first byte of what it looks for, and programs are full of zeros.
bool holds(std::string_view content, std::string_view mark) {
    return memmem(content.data(), content.size(), mark.data(), mark.size()) != nullptr;
}

Program::Kind kindIn(const std::string& name, std::string_view content) {
    if (content.starts_with(kScript)) {
        return name == "egrep" && isEgrepScript(content) ? Program::known : Program::tool;
    }
    if (!content.starts_with(kBinary)) {
        return Program::tool;
    }
    const bool known = std::ranges::any_of(
        kKnown, [&](const Known& one) { return one.name == name && holds(content, one.mark); });
    return known ? Program::known : holds(content, kBusybox) ? Program::busybox : Program::tool;
}

/// What was found out about files, by what identifies them.
class Memory {
public:
    Program::Kind kindOf(const std::string& name, const std::string& path, const struct stat& file) {
        const auto key = std::pair(name, identityOf(file));
        {
            const std::lock_guard lock(guard_);
            if (const auto found = answers_.find(key); found != answers_.end()) {
                return found->second;
            }
        }
        const std::string content = beginningOf(path);
        const Program::Kind answer = kindIn(name, content);
        const std::lock_guard lock(guard_);
        constexpr std::size_t kMost = 1000;
        // A file that could not be read for want of descriptors can be read later.
        if (!content.empty() && answers_.size() < kMost) {
            answers_.emplace(key, answer);
        }
        return answer;
    }

    void setAdapters(const std::string& program) {
        const std::lock_guard lock(guard_);
        struct stat file {};
        const bool there = stat(program.c_str(), &file) == 0;
        adapters_ = there ? std::optional(identityOf(file)) : std::nullopt;
    }
    bool isAdapter(const struct stat& file) {
        const std::lock_guard lock(guard_);
        return adapters_ == identityOf(file);
    }

    /// A directory that is the same as then has no such file yet.
    bool isAbsent(const std::string& path, const Identity& directory) {
        const std::lock_guard lock(guard_);
        const auto found = absent_.find(path);
        return found != absent_.end() && found->second == directory;
    }
    void noteAbsent(const std::string& path, const Identity& directory) {
        constexpr std::size_t kMost = 1000;
        const std::lock_guard lock(guard_);
        if (absent_.size() < kMost || absent_.contains(path)) {
            absent_[path] = directory;
        }
    }

private:
    std::mutex guard_;
    std::map<std::pair<std::string, Identity>, Program::Kind> answers_;
    std::optional<Identity> adapters_;
    std::map<std::string, Identity> absent_;  // files, with the directory in which they were missing
};

Memory& memory() {
    static Memory only;
    return only;
}

bool isNothing(const std::string& path) {
    struct stat file {};
    return lstat(path.c_str(), &file) != 0 && errno == ENOENT;  // a link may lead somewhere later
}

std::chrono::nanoseconds timeOf(const timespec& time) {
    return std::chrono::seconds(time.tv_sec) + std::chrono::nanoseconds(time.tv_nsec);
}

/// What is changed within a tick of a file system's clock bears the same time.
bool isSettled(const struct stat& directory) {
    constexpr std::chrono::seconds kLongestTick{2};
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    return std::max(timeOf(directory.st_mtim), timeOf(directory.st_ctim)) + kLongestTick < timeOf(now);
}

}  // namespace

ProgramSearch::ProgramSearch() {
    const char* const variable = std::getenv("PATH");
    std::string_view rest = variable != nullptr ? variable : "";
    for (bool more = true; more;) {
        const std::size_t end = rest.find(':');
        directories_.push_back({std::string(rest.substr(0, end)), false, std::nullopt});
        more = end != std::string_view::npos;
        rest.remove_prefix(more ? end + 1 : rest.size());
    }
}

Program::Kind ProgramSearch::kindOf(const std::string& name, const std::string& path,
                                    const struct stat& file) {
    if (memory().isAdapter(file)) {
        return Program::adapter;
    }
    const bool filtered = std::ranges::find(kKnown, name, &Known::name) != kKnown.end();
    const std::string_view directory = std::string_view(path).substr(0, path.rfind('/') + 1);
    const bool standard = std::ranges::find(kSystemDirectories, directory) != kSystemDirectories.end();
    if (!filtered || !standard) {
        return Program::tool;
    }
    const Program::Kind kind = memory().kindOf(name, path, file);
    // The one may be a script that runs the other.
    const bool asGrep = kind != Program::known || name != "egrep" || find("grep").kind == Program::known;
    return asGrep ? kind : Program::tool;
}

std::optional<Program> ProgramSearch::lookAt(const std::string& name, const std::string& path) {
    struct stat file {};
    if (stat(path.c_str(), &file) != 0) {
        return errno == ENOENT || errno == ENOTDIR ? std::nullopt : std::optional(Program{Program::unclear});
    }
    if (!S_ISREG(file.st_mode) || access(path.c_str(), X_OK) != 0) {
        return Program{Program::unclear};
    }
    return Program{kindOf(name, path, file), path};
}

std::optional<Program> ProgramSearch::lookIn(Directory& directory, const std::string& name) {
    if (!std::exchange(directory.looked, true)) {
        struct stat found {};
        if (stat(directory.path.c_str(), &found) == 0 && S_ISDIR(found.st_mode) && isSettled(found)) {
            directory.settled = identityOf(found);
        }
    }
    const std::string path = directory.path + '/' + name;
    if (directory.settled && memory().isAbsent(path, *directory.settled)) {
        return std::nullopt;
    }
    auto found = lookAt(name, path);
    if (!found && directory.settled && isNothing(path)) {
        memory().noteAbsent(path, *directory.settled);
    }
    return found;
}

Program ProgramSearch::find(const std::string& name) {
    if (name.find('/') != std::string::npos) {
        return name.front() == '/' ? lookAt(name, name).value_or(Program{}) : Program{Program::unclear};
    }
    for (Directory& directory : directories_) {
        if (!directory.path.starts_with('/')) {
            return {Program::unclear};
        }
        if (auto found = lookIn(directory, name)) {
            return *found;
        }
    }
    return {};
}

void setHostTools(const std::string& program) {
    memory().setAdapters(program);
}

}  // namespace cvagent::shell
