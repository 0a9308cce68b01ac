#pragma once

#include <sys/types.h>

#include <optional>
#include <string>

namespace fake_host {

/// One message from the inside of a fake host to the test that started it, over a pipe.
struct Report {
    enum Kind : int {
        assertion,  ///< a failed or skipping assertion: `number` is its gtest type
        problem,    ///< the host could not be built
        finished,   ///< the body ran to its end
        ended,      ///< the body's process ended: `number` is its wait status
    };
    Kind kind;
    int number = 0;
    int line = 0;
    std::string file;
    std::string text;
};

void send(int pipe, const Report& report);

/// Takes reports apart that arrive in pieces.
class ReportReader {
public:
    void append(const char* data, size_t size) { buffer_.append(data, size); }
    std::optional<Report> next();

private:
    std::string buffer_;
};

}  // namespace fake_host
