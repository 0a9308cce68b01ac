#include "agent/shell/filters/line_filter.h"

#include <algorithm>

namespace cvagent::shell {

void LineFilter::endLinesAtZeros(std::string& buffer, std::size_t first) {
    std::replace(buffer.begin() + static_cast<std::ptrdiff_t>(first), buffer.end(), '\0', '\n');
}

/// Whether something came. What the tools see at once is seen at once here, too: grep looks for zeros in it.
bool LineFilter::fill() {
    const std::size_t held = buffer_.size();
    bool more = from().pull(buffer_);
    while (more && from().printsInBlocks() && buffer_.size() - held < kToolsBuffer) {
        more = from().pull(buffer_);
    }
    return buffer_.size() > held;
}

bool LineFilter::pull(std::string& out) {
    const std::size_t before = out.size();
    while (out.size() == before && !ended_) {
        const std::size_t held = buffer_.size();
        if (!fill()) {
            gaveUp_ = from().failed();
            takeLast(out);
            break;
        }
        arrived(buffer_, held);
        takeLines(out);
        if (buffer_.size() > kLongestLine) {
            ended_ = gaveUp_ = true;
        }
    }
    return out.size() > before;
}

void LineFilter::takeLines(std::string& out) {
    std::size_t begin = 0;
    for (std::size_t end = buffer_.find('\n', searched_); end != std::string::npos && !ended_;
         end = buffer_.find('\n', begin)) {
        ended_ = !takeLine(std::string_view(buffer_).substr(begin, end - begin), out);
        begin = end + 1;
    }
    buffer_.erase(0, begin);
    searched_ = buffer_.size();
}

void LineFilter::takeLast(std::string& out) {
    ended_ = true;
    if (!buffer_.empty() && !gaveUp_) {
        takeLine(buffer_, out);
        buffer_.clear();
    }
}

}  // namespace cvagent::shell
