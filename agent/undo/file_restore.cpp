#include "agent/undo/file_restore.h"

#include <fcntl.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>

#include "hosttools/text.h"

namespace cvagent::undo {

namespace {

using hosttools::Descriptor;
using Type = FileState::Type;

/// What keeps a file from being put back.
struct Failed {
    int problem;
};

void must(int result) {
    if (result < 0) {
        throw Failed{errno};
    }
}

std::array<timespec, 2> timesOf(const FileState& state) {
    return {state.accessed, state.modified};
}

void giveOwner(int file, const FileState& state) {
    must(fchown(file, state.owner, state.group));
    must(fchmod(file, state.mode));  // behind the owner, who takes set-user-id bits away
}

/// Those that a new file gets by itself (a label, a list of the directory) and the old one had not go.
/// @return 0, or an errno: what one of them cannot be is no reason to keep the content away
int giveAttributes(int file, const FileState& state) {
    int problem = 0;
    const auto note = [&problem](int result) { problem = result < 0 ? errno : problem; };
    std::array<char, 65536> names{};
    const ssize_t size = flistxattr(file, names.data(), names.size());
    for (ssize_t at = 0; at < size;) {
        const std::string name(names.data() + at);
        at += static_cast<ssize_t>(name.size()) + 1;
        if (!state.attributes.contains(name)) {
            note(fremovexattr(file, name.c_str()));
        }
    }
    for (const auto& [name, value] : state.attributes) {
        note(fsetxattr(file, name.c_str(), value.data(), value.size(), 0));
    }
    return problem;
}

/// @return of its attributes, as giveAttributes
int fill(int file, const FileState& state) {
    if (!hosttools::writeAll(file, state.content)) {
        throw Failed{errno};
    }
    giveOwner(file, state);
    const int ofAttributes = giveAttributes(file, state);
    must(futimens(file, timesOf(state).data()));
    must(fsync(file));
    return ofAttributes;
}

/// A file that something is mounted on cannot be replaced.
int fillInPlace(int directory, const std::string& name, const FileState& state) {
    const Descriptor file(openat(directory, name.c_str(), O_WRONLY | O_TRUNC | O_NOFOLLOW | O_CLOEXEC));
    must(file.get());
    return fill(file.get(), state);
}

/// Hidden, so that nobody takes it for settings.
std::string temporaryName(const std::string& name) {
    return "." + name + ".corvista-undo";
}

// Each gives what fill does.

int putFile(int directory, const std::string& name, const FileState& state) {
    const std::string temporary = temporaryName(name);
    unlinkat(directory, temporary.c_str(), 0);  // of one who did not come to his end
    const Descriptor file(
        openat(directory, temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
    must(file.get());
    try {
        const int ofAttributes = fill(file.get(), state);
        must(renameat(directory, temporary.c_str(), directory, name.c_str()));
        return ofAttributes;
    } catch (const Failed& failed) {
        unlinkat(directory, temporary.c_str(), 0);
        if (failed.problem != EBUSY) {
            throw;
        }
        return fillInPlace(directory, name, state);
    }
}

int putLink(int directory, const std::string& name, const FileState& state) {
    const std::string temporary = temporaryName(name);
    unlinkat(directory, temporary.c_str(), 0);
    must(symlinkat(state.content.c_str(), directory, temporary.c_str()));
    must(fchownat(directory, temporary.c_str(), state.owner, state.group, AT_SYMLINK_NOFOLLOW));
    const std::string path = state.path.substr(0, state.path.rfind('/') + 1) + temporary;
    int ofAttributes = 0;
    for (const auto& [attribute, value] : state.attributes) {
        const int result = lsetxattr(path.c_str(), attribute.c_str(), value.data(), value.size(), 0);
        ofAttributes = result < 0 ? errno : ofAttributes;
    }
    must(utimensat(directory, temporary.c_str(), timesOf(state).data(), AT_SYMLINK_NOFOLLOW));
    must(renameat(directory, temporary.c_str(), directory, name.c_str()));
    return ofAttributes;
}

int putDirectory(int directory, const std::string& name, const FileState& state) {
    if (mkdirat(directory, name.c_str(), 0700) != 0 && errno != EEXIST) {
        throw Failed{errno};
    }
    const Descriptor made(openat(directory, name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    must(made.get());
    giveOwner(made.get(), state);
    return giveAttributes(made.get(), state);
}

void takeAway(int directory, const std::string& name) {
    unlinkat(directory, temporaryName(name).c_str(), 0);
    if (unlinkat(directory, name.c_str(), 0) == 0 || errno == ENOENT) {
        return;
    }
    if (errno == EISDIR || errno == EPERM) {
        must(unlinkat(directory, name.c_str(), AT_REMOVEDIR));
        return;
    }
    throw Failed{errno};
}

void syncDirectory(int directory) {
    const Descriptor readable(openat(directory, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    must(readable.get());
    must(fsync(readable.get()));
}

/// @return what of its attributes is not back, as an errno
int put(const FileState& state) {
    const Descriptor directory = openDirectoryOf(state.path);
    const std::string name = nameIn(state.path);
    if (!directory.isOpen() && state.type == Type::absent) {
        return 0;  // nor is the way to it
    }
    must(directory.get());
    int ofAttributes = 0;
    switch (state.type) {
        case Type::absent:
            takeAway(directory.get(), name);
            break;
        case Type::file:
            ofAttributes = putFile(directory.get(), name, state);
            break;
        case Type::link:
            ofAttributes = putLink(directory.get(), name, state);
            break;
        case Type::directory:
            ofAttributes = putDirectory(directory.get(), name, state);
            break;
        case Type::other:
            throw Failed{ENOTSUP};
    }
    syncDirectory(directory.get());
    return ofAttributes;
}

/// Directories have the time of what was last put into them.
void giveDirectoryTimes(const FileState& state) {
    const Descriptor above = openDirectoryOf(state.path);
    if (above.isOpen()) {
        utimensat(above.get(), nameIn(state.path).c_str(), timesOf(state).data(), AT_SYMLINK_NOFOLLOW);
    }
}

void tryToPut(const FileState& state, std::vector<std::string>& notes) {
    const FileState now = fileStateOf(state.path);
    if (now.isAs(state) && (state.type == Type::absent || now.hasTimesOf(state))) {
        return;
    }
    try {
        if (const int ofAttributes = put(state); ofAttributes != 0) {
            notes.push_back(state.path +
                            " is put back without all its attributes: " + std::strerror(ofAttributes));
        }
    } catch (const Failed& failed) {
        notes.push_back(state.path + " is not put back: " + std::strerror(failed.problem));
    }
}

}  // namespace

std::vector<std::size_t> filesToPutBack(const std::vector<FileState>& before,
                                        const std::vector<FileState>& left, const std::vector<FileState>& now,
                                        std::vector<std::size_t>& others) {
    std::vector<std::size_t> indices;
    for (std::size_t i = 0; i < before.size(); ++i) {
        const bool isOld = now[i].isAs(before[i]);
        const bool isTouched = left.empty() ? !isOld || !now[i].hasTimesOf(before[i])
                                            : !left[i].isAs(before[i]) || !left[i].hasTimesOf(before[i]);
        if (!isTouched) {
            continue;
        }
        if (left.empty() || isOld || now[i].isAs(left[i])) {
            indices.push_back(i);
        } else {
            others.push_back(i);
        }
    }
    return indices;
}

void putBackFiles(const std::vector<FileState>& before, const std::vector<std::size_t>& indices,
                  std::vector<std::string>& notes) {
    std::vector<const FileState*> states;
    states.reserve(indices.size());
    for (const std::size_t i : indices) {
        states.push_back(&before[i]);
    }
    std::ranges::sort(states, {}, &FileState::path);
    const auto those = [&states](auto&& isOne) {
        std::vector<const FileState*> found;
        std::ranges::copy_if(states, std::back_inserter(found), isOne);
        return found;
    };
    const auto directories = those([](const FileState* each) { return each->type == Type::directory; });
    const auto absent = those([](const FileState* each) { return each->type == Type::absent; });
    for (const FileState* each : directories) {
        tryToPut(*each, notes);
    }
    for (const FileState* each : states) {
        if (each->type == Type::file || each->type == Type::link) {
            tryToPut(*each, notes);
        }
    }
    for (auto each = absent.rbegin(); each != absent.rend(); ++each) {
        tryToPut(**each, notes);
    }
    for (auto each = directories.rbegin(); each != directories.rend(); ++each) {
        giveDirectoryTimes(**each);
    }
}

}  // namespace cvagent::undo
