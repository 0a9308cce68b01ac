#pragma once

#include <string>
#include <vector>

/// The words that start a program in a directory, after shell commands such as "umask 0".
inline std::vector<std::string> fromDirectory(const std::string& directory,
                                              const std::vector<std::string>& words,
                                              const std::string& first = "true") {
    std::vector<std::string> line = {"sh", "-c", "cd '" + directory + "' && " + first + " && exec \"$@\"",
                                     "sh"};
    line.insert(line.end(), words.begin(), words.end());
    return line;
}
