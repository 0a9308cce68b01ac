#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace cvagent::keep {

/// "iface eth0 inet static" with what belongs to it, in a file of ifupdown's.
struct Stanza {
    std::string name;       ///< of the logical interface
    std::string family;     ///< "inet", "inet6" or another
    std::string method;     ///< "static", "dhcp" and so on
    std::size_t first = 0;  ///< its line, from 0
    std::size_t end = 0;    ///< the line behind the last one that is not a comment or empty
    bool inherits = false;  ///< parts of it stand elsewhere
};

/// What a line of such a file says first; "" for a comment and an empty line.
std::string keywordOf(std::string_view line);

/// In the order of the file. A line that goes on (with a backslash at its end) counts as its parts.
std::vector<Stanza> stanzasIn(const std::vector<std::string>& lines);

/// The files that ifupdown reads: /etc/network/interfaces and what it names by "source" and
/// "source-directory", each once.
std::vector<std::string> interfacesFiles();

/// The lines of a text without their ends; see joined().
std::vector<std::string> splitLines(const std::string& text);
/// @param like the text that the lines were of: the last one has a line break where it had one, or was empty
std::string joined(const std::vector<std::string>& lines, const std::string& like);

}  // namespace cvagent::keep
