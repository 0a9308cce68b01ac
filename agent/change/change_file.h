#pragma once

#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace cvagent::change {

/// A change as a file has it; what its words mean is not known yet.
struct NamedChange {
    std::string node;
    std::string property;  ///< name or number
    std::vector<std::string> words;
    std::string place;  ///< where it stands, for messages: "changes[2]"
};

/// A text that is no file of changes; it says where the error is. Everything in it is printable.
class BadChangeFile : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// What a file may hold; more is refused.
inline constexpr std::size_t kLongestChangeFile = std::size_t{1} << 20;
inline constexpr std::size_t kMostChanges = 1000;
inline constexpr std::size_t kMostWords = 256;

/// {"changes": [{"node", "property", "value"}...]} or the array alone. A value is a text, a whole number or a
/// list of these; an empty list empties a list. Whatever else stands there is an error, a second key of the
/// same name too. Throws BadChangeFile.
std::vector<NamedChange> parseChanges(std::string_view text);

/// The text of such a file; a value of one word is a text, others are lists. With a line break at its end.
std::string changeFileText(const std::vector<NamedChange>& changes);

}  // namespace cvagent::change
