#include <optional>

#include "agent/shell/filters/filters.h"
#include "agent/shell/filters/line_filter.h"
#include "hosttools/files.h"

namespace cvagent::shell {

namespace {

/// One field of each line; a line without the delimiter is printed whole.
class Cut : public LineFilter {
public:
    Cut(char delimiter, unsigned field, bool busybox)
        : delimiter_(delimiter), field_(field), zerosEndLines_(busybox) {}

protected:
    void arrived(std::string& buffer, std::size_t first) override {
        if (zerosEndLines_) {
            endLinesAtZeros(buffer, first);
        }
    }
    bool takeLine(std::string_view line, std::string& out) override {
        std::size_t end = line.find(delimiter_);
        if (end == std::string_view::npos) {
            out += line;
            out += '\n';
            return true;
        }
        for (unsigned passed = 1; passed < field_; ++passed) {
            line = end == std::string_view::npos ? std::string_view() : line.substr(end + 1);
            end = line.find(delimiter_);
        }
        out += line.substr(0, end);
        out += '\n';
        return true;
    }

private:
    char delimiter_;
    unsigned field_;
    bool zerosEndLines_;
};

/// The value of an option, joined to its letter or the next word.
std::optional<std::string> takeOption(Words& words, char letter) {
    if (words.empty() || !words.front().starts_with(std::string{'-', letter})) {
        return std::nullopt;
    }
    const bool joined = words.front().size() > 2;
    if (!joined && words.size() < 2) {
        return std::nullopt;
    }
    std::string value = joined ? words.front().substr(2) : words[1];
    words = words.subspan(joined ? 1 : 2);
    return value;
}

}  // namespace

std::unique_ptr<Filter> makeCut(Words words, Manner manner) {
    constexpr unsigned kMostFields = 1000;
    const auto delimiter = takeOption(words, 'd');
    const auto list = takeOption(words, 'f');
    if (!delimiter || !list || !words.empty() || delimiter->size() != 1 || *delimiter == "\n") {
        return nullptr;
    }
    std::string_view rest = *list;
    const auto field = hosttools::takeNumber(rest);
    if (!field || !rest.empty() || *field < 1 || *field > kMostFields) {
        return nullptr;
    }
    return std::make_unique<Cut>(delimiter->front(), static_cast<unsigned>(*field), manner.busybox);
}

}  // namespace cvagent::shell
