#pragma once

#include <memory>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

namespace cvagent {

/// Errors that the plug-in has reported, each once with how often it came. Any thread.
class ErrorLines {
public:
    struct Taken {
        std::vector<std::string> texts;
        std::size_t lost = 0;  ///< how many more there were; a plug-in in trouble can report thousands
    };

    void add(const std::string& text);
    /// Everything since the last call.
    Taken take();
    /// How many were ever added.
    std::size_t count() const;

private:
    mutable std::mutex guard_;
    std::vector<std::pair<std::string, std::size_t>> errors_;  // text and how often; guarded by guard_
    std::size_t lost_ = 0;                                     // guarded by guard_
    std::size_t count_ = 0;                                    // guarded by guard_
};

/// From here to the end of the scope the errors reported on this thread are those of one call.
class ErrorScope {
public:
    explicit ErrorScope(ErrorLines& owner);
    ErrorScope(const ErrorScope&) = delete;
    ErrorScope& operator=(const ErrorScope&) = delete;
    ~ErrorScope();

    /// Whose errors this thread reports; null outside of all calls.
    static ErrorLines* owner();

private:
    ErrorLines* outer_;
};

}  // namespace cvagent
