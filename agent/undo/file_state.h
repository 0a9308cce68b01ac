#pragma once

#include <sys/stat.h>

#include <map>
#include <string>
#include <string_view>

#include "agent/undo/records.h"
#include "hosttools/descriptor.h"

namespace cvagent::undo {

/// A file with all that can be put back of it.
struct FileState {
    /// Of `other` nothing is kept: a device, a file that is too long or cannot be read.
    enum class Type { absent, file, link, directory, other };

    std::string path;  ///< whole, without links in the way to it
    Type type = Type::absent;
    std::string content;  ///< of a file; of a link the target, of `other` why nothing is kept
    mode_t mode = 0;      ///< without the type
    uid_t owner = 0;
    gid_t group = 0;
    timespec accessed{};
    timespec modified{};
    std::map<std::string, std::string> attributes;  ///< extended ones

    /// Whether the same stands there, whenever it was written.
    bool isAs(const FileState& other) const;
    bool hasTimesOf(const FileState& other) const;
};

/// @param path whole; where the way to it is not there, neither is the file
FileState fileStateOf(const std::string& path);
/// The path with the links in the way to the file resolved, as far as the way is there.
std::string withoutLinks(const std::string& path);

/// Walks to the directory of a file, through directories alone. Not open, with errno, where there is none.
hosttools::Descriptor openDirectoryOf(const std::string& path);
std::string nameIn(const std::string& path);

std::string recordOf(const FileState& state);
/// Throws BadRecord.
FileState fileStateFrom(std::string_view record);

}  // namespace cvagent::undo
