#pragma once

#include <memory>
#include <ostream>
#include <string>

#include "framework/export.h"

namespace CVLog {

/// The text of one log line while it is being put together. One object belongs to one thread.
class CORVISTA_API CVMessageBuffer {
public:
    CVMessageBuffer();
    CVMessageBuffer(const CVMessageBuffer&) = delete;
    CVMessageBuffer& operator=(const CVMessageBuffer&) = delete;
    ~CVMessageBuffer();

    CVMessageBuffer& operator<<(const char* text);  ///< null prints "(null)"
    CVMessageBuffer& operator<<(char* text);
    CVMessageBuffer& operator<<(const std::string& text);
    CVMessageBuffer& operator<<(unsigned int number);
    CVMessageBuffer& operator<<(int number);
    CVMessageBuffer& operator<<(bool flag);  ///< prints 1 or 0
    /// A stream that adds to the text, for whatever has an operator<< of its own; made when first asked for.
    operator std::ostream&();

    std::string str() const { return text_; }

private:
    struct Stream;
    std::string text_;
    std::unique_ptr<Stream> stream_;
};

}  // namespace CVLog
