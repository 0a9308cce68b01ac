#include "framework/ic/error.h"

#include <ostream>
#include <utility>

namespace IC {

Error::Error(unsigned char status, Number code, std::string text)
    : status_(status), code_(code), text_(std::move(text)) {}

Error::operator std::string() const {
    if (!text_.empty()) {
        return text_;
    }
    return status_ == success ? "success" : "status " + std::to_string(status_);
}

std::ostream& operator<<(std::ostream& out, const Error& error) {
    return out << static_cast<std::string>(error);
}

}  // namespace IC
