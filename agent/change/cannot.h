#pragma once

#include <stdexcept>
#include <string>

namespace cvagent::change {

/// Why the program that tries changes cannot, for people. Inside that program only.
class Cannot : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// Throws Cannot with the text and what errno says when the result is negative.
long must(long result, const std::string& what);

}  // namespace cvagent::change
