#pragma once

#include <optional>
#include <string>

namespace cvagent {

/// The whole of a regular file, of /proc and /sys too; nothing when it cannot be read. Any other kind of file
/// is not opened, for it could keep the reader waiting.
std::optional<std::string> contentOf(const std::string& path);

}  // namespace cvagent
