#include "tests/support/report.h"

#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace fake_host {
namespace {

struct Header {
    Report::Kind kind;
    int number;
    int line;
    unsigned fileSize;
    unsigned textSize;
};

}  // namespace

void send(int pipe, const Report& report) {
    Header header{report.kind, report.number, report.line, static_cast<unsigned>(report.file.size()),
                  static_cast<unsigned>(report.text.size())};
    std::string bytes(sizeof header, '\0');
    std::memcpy(bytes.data(), &header, sizeof header);
    bytes += report.file + report.text;
    for (size_t done = 0; done < bytes.size();) {
        ssize_t put = write(pipe, bytes.data() + done, bytes.size() - done);
        if (put < 0 && errno != EINTR) return;  // the test on the other side has given up
        if (put > 0) done += static_cast<size_t>(put);
    }
}

std::optional<Report> ReportReader::next() {
    Header header;
    if (buffer_.size() < sizeof header) return std::nullopt;
    std::memcpy(&header, buffer_.data(), sizeof header);
    size_t size = sizeof header + header.fileSize + header.textSize;
    if (buffer_.size() < size) return std::nullopt;
    Report report{header.kind, header.number, header.line, buffer_.substr(sizeof header, header.fileSize),
                  buffer_.substr(sizeof header + header.fileSize, header.textSize)};
    buffer_.erase(0, size);
    return report;
}

}  // namespace fake_host
