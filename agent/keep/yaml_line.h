#pragma once

#include <cstddef>
#include <string>

namespace cvagent::keep {

/// A line without its comment, in its parts.
struct YamlLine {
    std::size_t indent = 0;
    std::string text;  ///< behind the indentation; "" for an empty line and a comment
    std::string key;   ///< "" for an item of a list and what is no key
    std::string value;
};

/// Throws CannotKeep, with the key of the line at most: such a file may hold passwords of networks.
[[noreturn]] void refuseYaml(const std::string& line);

/// Throws CannotKeep for what is not of the part of YAML that is understood; see editedNetplan().
YamlLine parsed(const std::string& line);

/// Without the quotes around it.
std::string unquoted(const std::string& text);

}  // namespace cvagent::keep
