#include "agent/change/written_files.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <set>

#include "agent/change/directory.h"
#include "agent/change/tree_copy.h"
#include "agent/change/written_places.h"

namespace cvagent::change {

namespace {

using hosttools::Descriptor;

constexpr mode_t kModeBits = 07777;
constexpr std::size_t kMostContent = 1U << 20U;  // configuration files are kilobytes

/// Up to the bound; whether that was all.
bool readContent(int file, std::string& content) {
    std::array<char, 65536> part{};
    for (;;) {
        const ssize_t got = read(file, part.data(), part.size());
        if (got <= 0) {
            return got == 0;
        }
        content.append(part.data(), static_cast<std::size_t>(got));
        if (content.size() > kMostContent) {
            return false;
        }
    }
}

FileState::Type typeOf(mode_t mode) {
    return S_ISREG(mode)   ? FileState::Type::file
           : S_ISLNK(mode) ? FileState::Type::link
           : S_ISDIR(mode) ? FileState::Type::directory
                           : FileState::Type::other;
}

/// A copy keeps the time, a write does not.
std::string stampOf(const struct stat& found) {
    return std::to_string(found.st_size) + " " + std::to_string(found.st_mtim.tv_sec) + " " +
           std::to_string(found.st_mtim.tv_nsec);
}

/// @param name "" for what the descriptor itself stands for
std::optional<SeenFile> stateOf(int directory, const std::string& name) {
    struct stat found {};
    if (fstatat(directory, name.c_str(), &found, AT_SYMLINK_NOFOLLOW | AT_EMPTY_PATH) != 0) {
        return std::nullopt;
    }
    SeenFile seen;
    FileState& state = seen.state;
    state.type = typeOf(found.st_mode);
    state.mode = found.st_mode & kModeBits;
    state.owner = found.st_uid;
    state.group = found.st_gid;
    if (state.type == FileState::Type::link) {
        state.content = targetOf(directory, name);
    } else if (state.type == FileState::Type::file) {
        const Descriptor file(name.empty() ? open(("/proc/self/fd/" + std::to_string(directory)).c_str(),
                                                  O_RDONLY | O_NONBLOCK | O_CLOEXEC)
                                           : openRegular(directory, name));
        state.withheld = !file.isOpen() || !readContent(file.get(), state.content);
    }
    if (state.withheld) {
        state.content.clear();
        seen.stamp = stampOf(found);
    }
    return seen;
}

bool isDirectory(int directory, const std::string& name) {
    struct stat found {};
    return fstatat(directory, name.c_str(), &found, AT_SYMLINK_NOFOLLOW) == 0 && S_ISDIR(found.st_mode);
}

/// So an overlay says that something is gone.
bool isWhiteout(int directory, const std::string& name) {
    struct stat found {};
    return fstatat(directory, name.c_str(), &found, AT_SYMLINK_NOFOLLOW) == 0 && S_ISCHR(found.st_mode) &&
           major(found.st_rdev) == 0 && minor(found.st_rdev) == 0;
}

Descriptor below(int directory, const std::string& name) {
    return Descriptor(openat(directory, name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
}

std::optional<SeenFile> present(int directory, const std::string& name) {
    return directory < 0 ? std::nullopt : stateOf(directory, name);
}

/// One look at the covered places.
class Look {
public:
    /// @param original -1 where the host has no such directory
    void overlay(int ours, int original, const std::string& path) {
        for (const std::string& name : namesIn(ours)) {
            const std::string whole = path + "/" + name;
            if (isWhiteout(ours, name)) {
                goneOf(original, name, whole);
            } else if (isDirectory(ours, name)) {
                const Descriptor inner = below(ours, name);
                const Descriptor outer = below(original, name);
                noteDirectory(outer.isOpen(), ours, name, whole);
                overlay(inner.get(), outer.get(), whole);
            } else {
                note(whole, stateOf(ours, name), present(original, name));
            }
        }
    }

    void copy(int ours, int original, const std::string& path) {
        std::set<std::string> names;
        for (const int side : {ours, original}) {
            const auto found = namesIn(side);
            names.insert(found.begin(), found.end());
        }
        for (const std::string& name : names) {
            const std::string whole = path + "/" + name;
            if (isDirectory(ours, name) &&
                (original < 0 || isDirectory(original, name) || !exists(original, name))) {
                const Descriptor inner = below(ours, name);
                const Descriptor outer = below(original, name);
                noteDirectory(exists(original, name), ours, name, whole);
                copy(inner.get(), outer.get(), whole);
            } else if (!wasLeftOut(ours, original, name)) {
                note(whole, present(ours, name), present(original, name));
            }
        }
    }

    void note(const std::string& path, std::optional<SeenFile> now, const std::optional<SeenFile>& was) {
        if (now && was && owners_ == Owners::differ) {
            now->state.owner = was->state.owner;
            now->state.group = was->state.group;
        }
        if (now != was) {
            found_[path] = std::move(now);
        }
    }

    enum class Owners { kept, differ };
    explicit Look(Owners owners) : owners_(owners) {}
    WrittenFiles take() { return std::move(found_); }

private:
    static bool exists(int directory, const std::string& name) {
        struct stat found {};
        return directory >= 0 && fstatat(directory, name.c_str(), &found, AT_SYMLINK_NOFOLLOW) == 0;
    }

    /// Pipes, devices, and what the caller may not read were not copied.
    static bool wasLeftOut(int ours, int original, const std::string& name) {
        if (exists(ours, name)) {
            return false;
        }
        const auto was = present(original, name);
        return !was || was->state.type == FileState::Type::other || was->state.withheld;
    }

    void noteDirectory(bool existed, int ours, const std::string& name, const std::string& path) {
        if (!existed) {
            found_[path] = stateOf(ours, name);
        }
    }

    void goneOf(int original, const std::string& name, const std::string& path) {
        if (exists(original, name)) {
            found_[path] = std::nullopt;
        }
    }

    Owners owners_;
    WrittenFiles found_;
};

void look(const Cover& cover, WrittenFiles& all) {
    const bool own = cover.kind == Cover::Kind::overlay;
    Look seen(own ? Look::Owners::kept : Look::Owners::differ);
    switch (cover.kind) {
        case Cover::Kind::overlay:
            seen.overlay(cover.ours.get(), cover.original.get(), cover.path);
            break;
        case Cover::Kind::copy:
            seen.copy(cover.ours.get(), cover.original.get(), cover.path);
            break;
        case Cover::Kind::file:
            seen.note(cover.path, stateOf(cover.ours.get(), ""), stateOf(cover.original.get(), ""));
            break;
    }
    all.merge(seen.take());
}

/// What the host itself has there. The innermost place is the one that is seen.
std::optional<SeenFile> originally(const std::string& path, const std::vector<Cover>& covers) {
    const Cover* innermost = nullptr;
    for (const Cover& cover : covers) {
        if (isBelow(path, cover.path) &&
            (innermost == nullptr || cover.path.size() > innermost->path.size())) {
            innermost = &cover;
        }
    }
    if (innermost == nullptr) {
        return std::nullopt;
    }
    const std::string rest = path.substr(std::min(path.size(), innermost->path.size() + 1));
    return stateOf(innermost->original.get(), rest);
}

std::optional<FileState> stateIn(const std::optional<SeenFile>& seen) {
    return seen ? std::optional(seen->state) : std::nullopt;
}

}  // namespace

WrittenFiles writtenFiles(const std::vector<Cover>& covers) {
    WrittenFiles all;
    for (const Cover& cover : covers) {
        look(cover, all);
    }
    return all;
}

std::vector<FileChange> changesBetween(const WrittenFiles& before, const WrittenFiles& after,
                                       const std::vector<Cover>& covers, const std::string& dataDirectory) {
    std::set<std::string> paths;
    for (const WrittenFiles* side : {&before, &after}) {
        for (const auto& [path, state] : *side) {
            paths.insert(path);
        }
    }
    std::vector<FileChange> changes;
    for (const std::string& path : paths) {
        const bool isOwn = isBelow(path, "/tmp") && (dataDirectory.empty() || !isBelow(path, dataDirectory));
        const auto at = [&](const WrittenFiles& side) {
            const auto found = side.find(path);
            return found == side.end() ? originally(path, covers) : found->second;
        };
        const std::optional<SeenFile> was = at(before);
        const std::optional<SeenFile> now = at(after);
        if (!isOwn && was != now) {
            changes.push_back({path, stateIn(was), stateIn(now)});
        }
    }
    return changes;
}

}  // namespace cvagent::change
