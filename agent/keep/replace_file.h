#pragma once

#include <string>

namespace cvagent::keep {

/// Puts a content in the place of a file, whole or not at all: a file beside it, which those who read whole
/// directories pass over, reaches the disk before it takes the name. Owner, mode and extended attributes are
/// those of the file that was there; one that was not there can be read by everybody. Throws
/// std::system_error.
/// @param like a file whose owner and mode one gets that was not there; "" for none
void replaceFile(const std::string& path, const std::string& content, const std::string& like);

}  // namespace cvagent::keep
