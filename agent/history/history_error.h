#pragma once

#include <stdexcept>
#include <string>

namespace cvagent {

/// Why something could not be kept in the history, or read there.
class HistoryError : public std::runtime_error {
public:
    enum Kind {
        absent,    ///< there is no history yet
        denied,    ///< the caller has no right to it
        unsafe,    ///< others could change it, or the way to it
        newer,     ///< a later version of this program has written it
        foreign,   ///< the file is another program's
        readOnly,  ///< nothing can be written there
        busy,      ///< others have been writing all the time
        full,      ///< no room is left
        damaged,   ///< the file is not what was written
        failed,    ///< anything else
    };

    HistoryError(Kind kind, const std::string& text) : std::runtime_error(text), kind_(kind) {}
    Kind kind() const { return kind_; }

private:
    Kind kind_;
};

}  // namespace cvagent
