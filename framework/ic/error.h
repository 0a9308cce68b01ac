#pragma once

#include <iosfwd>
#include <string>

#include "framework/export.h"
#include "framework/ic/number.h"

namespace IC {

/// The result of a call that can fail. Status 0 is success; the framework's own failures use 1. A plug-in may
/// use 2 where the host has not answered in time: what was known before can still be so.
class CORVISTA_API Error {
public:
    enum StatusType : unsigned char { success = 0, failure = 1, unanswered = 2 };
    /// The code of a failure to read a property that was never stored.
    static constexpr unsigned int kNoSuchProperty = 1;

    Error() = default;
    Error(unsigned char status, Number code, std::string text);

    unsigned char getStatus() const { return status_; }
    operator StatusType() const { return static_cast<StatusType>(status_); }
    /// What a person reads in a log: the text, or "status N" when there is none, or "success".
    operator std::string() const;
    const Number& code() const { return code_; }
    const std::string& text() const { return text_; }

private:
    unsigned char status_ = success;
    Number code_;
    std::string text_;
};

CORVISTA_API std::ostream& operator<<(std::ostream& out, const Error& error);

}  // namespace IC
