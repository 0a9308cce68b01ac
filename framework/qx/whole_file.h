#pragma once

#include <optional>
#include <string>

namespace QX {

/// The content of a regular file; nothing when there is none of that name. Throws std::system_error when it
/// cannot be read.
std::optional<std::string> readWholeFile(const std::string& path);

/// Puts `content` in the place of a file, whole or not at all, whatever happens on the way: a temporary file
/// beside it reaches the disk before it takes the name. Mode and owner of an existing file are kept.
/// Temporary files that writers of this file left behind when they were killed are removed. Throws
/// std::system_error; the old file is then untouched, unless all that failed was to bring the new name to the
/// disk.
void replaceWholeFile(const std::string& path, const std::string& content);

}  // namespace QX
