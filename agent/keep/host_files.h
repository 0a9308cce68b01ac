#pragma once

#include <optional>
#include <string>

namespace cvagent::keep {

/// The whole of a regular file of at most a mebibyte, which is many times what such a file has; nothing for
/// any other, and for one that cannot be read. Nobody is waited for, whatever lies there.
std::optional<std::string> smallFile(const std::string& path);

/// Whether a unit of systemd's has processes, as its control group tells, which only the system can write.
bool unitHasProcesses(const std::string& unit);

/// The value of a line "KEY=VALUE"; "" when there is none.
std::string assigned(const std::string& text, const std::string& key);

/// Whether a file system begins at it, as with a file of a container's engine, so that nothing can take its
/// place.
bool isMountedOver(const std::string& path);

/// The last part of a path.
std::string lastPart(const std::string& path);

}  // namespace cvagent::keep
