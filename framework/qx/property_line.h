#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace QX {

/// One line of a property file without its line break, from UTF-8 texts (stray bytes allowed) and back.
std::string formatPropertyLine(std::string_view key, std::string_view value);

/// Key and value of a line; nothing when it is damaged.
std::optional<std::pair<std::string, std::string>> parsePropertyLine(std::string_view line);

}  // namespace QX
