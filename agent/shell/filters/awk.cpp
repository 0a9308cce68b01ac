#include "agent/shell/filters/filters.h"
#include "agent/shell/filters/line_filter.h"

namespace cvagent::shell {

namespace {

constexpr unsigned kLastField = 0;
constexpr std::string_view kBlanks = " \t";
constexpr std::string_view kBusyboxBlanks = " \t\v\f\r";

/// `{print $N}` and `{print $NF}`: fields are divided by blanks and tabs. The last field of a line without
/// any is the line.
class Awk : public LineFilter {
public:
    Awk(unsigned field, bool busybox)
        : field_(field), blanks_(busybox ? kBusyboxBlanks : kBlanks), zerosEndLines_(busybox) {}

protected:
    void arrived(std::string& buffer, std::size_t first) override {
        if (zerosEndLines_) {
            endLinesAtZeros(buffer, first);
        }
    }
    bool takeLine(std::string_view line, std::string& out) override {
        out += field_ == kLastField ? lastOf(line) : fieldOf(line);
        out += '\n';
        return true;
    }

private:
    std::string_view lastOf(std::string_view line) const {
        const std::size_t end = line.find_last_not_of(blanks_);
        if (end == std::string_view::npos) {
            return line;
        }
        const std::size_t before = line.find_last_of(blanks_, end);
        const std::size_t begin = before == std::string_view::npos ? 0 : before + 1;
        return line.substr(begin, end + 1 - begin);
    }

    std::string_view fieldOf(std::string_view line) const {
        for (unsigned number = 1;; ++number) {
            const std::size_t begin = line.find_first_not_of(blanks_);
            if (begin == std::string_view::npos) {
                return {};
            }
            const std::size_t end = line.find_first_of(blanks_, begin);
            if (number == field_) {
                return line.substr(begin, end == std::string_view::npos ? end : end - begin);
            }
            line.remove_prefix(end == std::string_view::npos ? line.size() : end);
        }
    }

    unsigned field_;
    std::string_view blanks_;
    bool zerosEndLines_;
};

}  // namespace

std::unique_ptr<Filter> makeAwk(Words words, Manner manner) {
    constexpr std::string_view kBegin = "{print $";
    if (words.size() != 1 || !words.front().starts_with(kBegin) || !words.front().ends_with('}')) {
        return nullptr;
    }
    const std::string_view field =
        std::string_view(words.front()).substr(kBegin.size(), words.front().size() - kBegin.size() - 1);
    if (field == "NF") {
        return std::make_unique<Awk>(kLastField, manner.busybox);
    }
    const bool oneDigit = field.size() == 1 && field.front() >= '1' && field.front() <= '9';
    return oneDigit ? std::make_unique<Awk>(static_cast<unsigned>(field.front() - '0'), manner.busybox)
                    : nullptr;
}

}  // namespace cvagent::shell
