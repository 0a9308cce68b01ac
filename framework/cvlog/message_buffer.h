#pragma once

#include <sstream>
#include <string>

#include "framework/export.h"

namespace CVLog {

/// The text of one log line while it is being put together. One object belongs to one thread.
class CORVISTA_API CVMessageBuffer {
public:
    CVMessageBuffer();
    ~CVMessageBuffer();

    CVMessageBuffer& operator<<(const char* text);  ///< null prints "(null)"
    CVMessageBuffer& operator<<(char* text);
    CVMessageBuffer& operator<<(const std::string& text);
    CVMessageBuffer& operator<<(unsigned int number);
    CVMessageBuffer& operator<<(int number);
    CVMessageBuffer& operator<<(bool flag);  ///< prints 1 or 0
    operator std::ostream&() { return stream_; }

    std::string str() const;

private:
    std::ostringstream stream_;
};

}  // namespace CVLog
