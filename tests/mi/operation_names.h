#pragma once

#include <filesystem>
#include <map>
#include <set>
#include <string>

/// Which operations the headers of the plug-in's components declare for others, by name, each with the log
/// sources its lines may name. Private members, what the headers of helpers declare and what stands in a body
/// are none.
std::map<std::string, std::set<std::string>> operationNames(const std::filesystem::path& tree);
