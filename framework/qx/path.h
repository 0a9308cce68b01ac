#pragma once

#include <string>
#include <utility>

namespace QX::File {

/// The path of a file.
class Path {
public:
    Path(std::string text) : text_(std::move(text)) {}
    Path(const char* text) : text_(text ? text : "") {}
    const std::string& str() const { return text_; }

private:
    std::string text_;
};

}  // namespace QX::File
