#pragma once

#include <sys/types.h>

#include <optional>
#include <string>

namespace fake_host {

std::optional<std::string> readFile(const std::string& path);
/// Creates or replaces a file with its parents; the mode is what it is given, whatever the umask.
void writeFile(const std::string& path, const std::string& content, mode_t mode = 0644);
void makeDirectories(const std::string& path);
void makeParents(const std::string& path);

}  // namespace fake_host
