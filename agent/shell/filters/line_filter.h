#pragma once

#include <string>
#include <string_view>

#include "agent/shell/source.h"

namespace cvagent::shell {

/// A filter that looks at one line after the other. A line of more than kLongestLine bytes ends it, as a tool
/// ends that finds no more memory: nothing that a host says is that long. So does a file that cannot be read
/// further; the line that was begun is lost.
class LineFilter : public Filter {
public:
    static constexpr std::size_t kLongestLine = 8UL << 20U;

    bool pull(std::string& out) override;
    bool printsInBlocks() const override { return true; }
    int status() const override { return gaveUp_ ? 2 : 0; }

protected:
    /// @param line without its line break; the last one may have had none
    /// @return false when no further line is wanted
    virtual bool takeLine(std::string_view line, std::string& out) = 0;
    /// Sees the bytes that have just come before they are taken for lines, and may change them.
    virtual void arrived(std::string& /*buffer*/, std::size_t /*first*/) {}
    static void endLinesAtZeros(std::string& buffer, std::size_t first);
    bool gaveUp() const { return gaveUp_; }

private:
    bool fill();
    void takeLines(std::string& out);
    void takeLast(std::string& out);

    std::string buffer_;
    std::size_t searched_ = 0;  ///< bytes of the buffer known to hold no line break
    bool ended_ = false;
    bool gaveUp_ = false;
};

}  // namespace cvagent::shell
