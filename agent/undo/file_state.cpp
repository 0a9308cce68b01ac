#include "agent/undo/file_state.h"

#include <fcntl.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <memory>

namespace cvagent::undo {

namespace {

using hosttools::Descriptor;
using Type = FileState::Type;

constexpr std::size_t kMostContent = 16U << 20U;  // settings are kilobytes
constexpr std::size_t kMostAttributes = 64;
constexpr std::size_t kLongestAttribute = 65536;  // the kernel's own bound
constexpr mode_t kModeBits = 07777;
constexpr std::uint64_t kNanoseconds = 1'000'000'000;

/// @return why not all of it is there, as an errno; 0 when it is
int readContent(int file, std::string& content) {
    std::array<char, 65536> part{};
    for (;;) {
        const ssize_t got = read(file, part.data(), part.size());
        if (got < 0 && errno == EINTR) {
            continue;
        }
        if (got <= 0) {
            return got == 0 ? 0 : errno;
        }
        content.append(part.data(), static_cast<std::size_t>(got));
        if (content.size() > kMostContent) {
            return EFBIG;
        }
    }
}

/// A file system without them has none.
void readAttributes(FileState& state) {
    std::string names(kLongestAttribute, '\0');
    const ssize_t size = llistxattr(state.path.c_str(), names.data(), names.size());
    names.resize(size > 0 ? static_cast<std::size_t>(size) : 0);
    for (std::size_t at = 0; at < names.size() && state.attributes.size() < kMostAttributes;) {
        const std::string name(names.c_str() + at);
        at += name.size() + 1;
        std::string value(kLongestAttribute, '\0');
        const ssize_t got = lgetxattr(state.path.c_str(), name.c_str(), value.data(), value.size());
        if (got >= 0) {
            value.resize(static_cast<std::size_t>(got));
            state.attributes[name] = std::move(value);
        }
    }
}

void giveUp(FileState& state, const std::string& reason) {
    state.type = Type::other;
    state.content = reason;
}

void readFile(int directory, const std::string& name, FileState& state) {
    state.type = Type::file;
    const Descriptor file(openat(directory, name.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    const int problem = file.isOpen() ? readContent(file.get(), state.content) : errno;
    if (problem != 0) {
        giveUp(state, std::strerror(problem));
    }
}

void readLink(int directory, const std::string& name, FileState& state) {
    std::array<char, PATH_MAX> target{};
    const ssize_t size = readlinkat(directory, name.c_str(), target.data(), target.size());
    state.type = Type::link;
    if (size <= 0) {
        giveUp(state, std::strerror(errno));
    } else {
        state.content.assign(target.data(), static_cast<std::size_t>(size));
    }
}

bool isSameTime(const timespec& one, const timespec& other) {
    return one.tv_sec == other.tv_sec && one.tv_nsec == other.tv_nsec;
}

std::uint64_t secondsOf(const timespec& time) {
    return static_cast<std::uint64_t>(static_cast<std::int64_t>(time.tv_sec));
}

/// A time before 1970 is a large number here.
void addTime(RecordWriter& record, std::string_view name, const timespec& time) {
    record.add(name, secondsOf(time)).add(name, static_cast<std::uint64_t>(time.tv_nsec));
}

/// Takes the first number for the seconds and the second one for what is behind them.
void takeTime(const Record& record, timespec& time, bool& hasSeconds) {
    if (hasSeconds) {
        time.tv_nsec = static_cast<decltype(time.tv_nsec)>(record.number(kNanoseconds - 1));
    } else {
        time.tv_sec = static_cast<time_t>(static_cast<std::int64_t>(record.number()));
    }
    hasSeconds = true;
}

void takeAttribute(std::string_view text, FileState& state) {
    RecordReader reader(text);
    const auto name = reader.next();
    const auto value = reader.next();
    if (!name || !value || name->bytes.empty() || name->bytes.find('\0') != std::string_view::npos) {
        throw BadRecord("an attribute of a file is damaged");
    }
    state.attributes[std::string(name->bytes)] = value->bytes;
}

void judge(const FileState& state) {
    const bool isWhole = state.path.starts_with('/') && state.path.size() < PATH_MAX &&
                         state.path.find('\0') == std::string::npos && !nameIn(state.path).empty();
    const bool isLink = state.type == Type::link;
    if (!isWhole || (isLink && (state.content.empty() || state.content.find('\0') != std::string::npos))) {
        throw BadRecord("a saved file has no name or leads nowhere");
    }
}

}  // namespace

bool FileState::isAs(const FileState& as) const {
    const bool isBare = type == Type::absent || type == Type::other;
    return path == as.path && type == as.type && content == as.content &&
           (isBare ||
            (mode == as.mode && owner == as.owner && group == as.group && attributes == as.attributes));
}

bool FileState::hasTimesOf(const FileState& other) const {
    return isSameTime(modified, other.modified);
}

FileState fileStateOf(const std::string& path) {
    FileState state;
    state.path = path;
    const Descriptor directory = openDirectoryOf(path);
    const std::string name = nameIn(path);
    struct stat found {};
    if (!directory.isOpen() || fstatat(directory.get(), name.c_str(), &found, AT_SYMLINK_NOFOLLOW) != 0) {
        if (errno != ENOENT && errno != ENOTDIR) {
            giveUp(state, std::strerror(errno));
        }
        return state;
    }
    state.mode = found.st_mode & kModeBits;
    state.owner = found.st_uid;
    state.group = found.st_gid;
    state.accessed = found.st_atim;
    state.modified = found.st_mtim;
    readAttributes(state);
    if (S_ISREG(found.st_mode)) {
        readFile(directory.get(), name, state);
    } else if (S_ISLNK(found.st_mode)) {
        readLink(directory.get(), name, state);
    } else if (S_ISDIR(found.st_mode)) {
        state.type = Type::directory;
    } else {
        giveUp(state, "it is no file");
    }
    return state;
}

std::string nameIn(const std::string& path) {
    return path.substr(path.rfind('/') + 1);
}

std::string withoutLinks(const std::string& path) {
    const std::size_t end = path.rfind('/');
    const std::string directory = path.substr(0, end);
    if (end == std::string::npos || end == 0) {
        return path;
    }
    const std::unique_ptr<char, decltype(&std::free)> real(realpath(directory.c_str(), nullptr), std::free);
    const std::string above = real ? std::string(real.get()) : withoutLinks(directory);
    return (above == "/" ? "" : above) + path.substr(end);
}

Descriptor openDirectoryOf(const std::string& path) {
    Descriptor reached(open("/", O_PATH | O_DIRECTORY | O_CLOEXEC));
    const std::size_t end = path.rfind('/');
    for (std::size_t at = 1; reached.isOpen() && at < end;) {
        const std::size_t next = path.find('/', at);
        const std::string name = path.substr(at, next - at);
        reached =
            Descriptor(openat(reached.get(), name.c_str(), O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
        at = next + 1;
    }
    return reached;
}

std::string recordOf(const FileState& state) {
    RecordWriter record;
    record.add("path", state.path).add("type", static_cast<std::uint64_t>(state.type));
    record.add("content", state.content).add("mode", std::uint64_t{state.mode});
    record.add("owner", std::uint64_t{state.owner}).add("group", std::uint64_t{state.group});
    addTime(record, "accessed", state.accessed);
    addTime(record, "modified", state.modified);
    for (const auto& [name, value] : state.attributes) {
        record.add("attribute", RecordWriter().add("name", name).add("value", value).text());
    }
    return record.text();
}

FileState fileStateFrom(std::string_view text) {
    FileState state;
    bool hasAccessed = false;
    bool hasModified = false;
    RecordReader reader(text);
    while (const auto record = reader.next()) {
        if (record->name == "path") {
            state.path = record->bytes;
        } else if (record->name == "type") {
            state.type = static_cast<Type>(record->number(static_cast<std::uint64_t>(Type::other)));
        } else if (record->name == "content") {
            state.content = record->bytes;
        } else if (record->name == "mode") {
            state.mode = static_cast<mode_t>(record->number(kModeBits));
        } else if (record->name == "owner") {
            state.owner = static_cast<uid_t>(record->number(UINT32_MAX));
        } else if (record->name == "group") {
            state.group = static_cast<gid_t>(record->number(UINT32_MAX));
        } else if (record->name == "accessed") {
            takeTime(*record, state.accessed, hasAccessed);
        } else if (record->name == "modified") {
            takeTime(*record, state.modified, hasModified);
        } else if (record->name == "attribute") {
            takeAttribute(record->bytes, state);
        } else {
            throw BadRecord("a saved file has a part that is not known");
        }
    }
    judge(state);
    return state;
}

}  // namespace cvagent::undo
