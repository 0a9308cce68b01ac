#include <unistd.h>

#include <algorithm>

#include "agent/shell/filters/filters.h"
#include "agent/shell/filters/line_filter.h"
#include "agent/shell/filters/pattern.h"

namespace cvagent::shell {

namespace {

/// GNU grep takes input with a zero in it for no text: the zeros divide lines, nothing of it is printed, and
/// the first line that fits ends the search with a complaint.
class Grep : public LineFilter {
public:
    Grep(std::string name, Pattern pattern, bool invert, Manner manner)
        : name_(std::move(name)), pattern_(std::move(pattern)), invert_(invert), manner_(manner) {}

    int status() const override { return gaveUp() ? 2 : found_ ? 0 : 1; }

protected:
    void arrived(std::string& buffer, std::size_t first) override {
        binary_ = binary_ || (!manner_.busybox && buffer.find('\0', first) != std::string::npos);
        if (binary_) {
            std::replace(buffer.begin(), buffer.end(), '\0', '\n');
        }
    }
    bool takeLine(std::string_view line, std::string& out) override {
        if (pattern_.isIn(line) == invert_) {
            return true;
        }
        found_ = true;
        if (binary_) {
            complain();
            return false;
        }
        out += line;
        out += '\n';
        return true;
    }

private:
    void complain() const {
        if (!manner_.silent) {
            const std::string text = "grep: " + name_ + ": binary file matches\n";
            [[maybe_unused]] const ssize_t written = write(STDERR_FILENO, text.data(), text.size());
        }
    }

    std::string name_;
    Pattern pattern_;
    bool invert_;
    Manner manner_;
    bool binary_ = false;
    bool found_ = false;
};

/// grep -P looks at one line at a time, so a pattern that wants a line break in the middle is never found.
class NeverFound : public Filter {
public:
    bool pull(std::string& /*out*/) override {
        for (std::string chunk; from().pull(chunk); chunk.clear()) {
        }
        return false;
    }
    int status() const override { return 1; }
};

/// `-P` with letters, digits and harmless marks and a `\n` among them. The complaint of a grep that was built
/// without -P must be wanted by nobody.
bool isNeverFound(Words words, Manner manner) {
    if (!manner.silent || manner.busybox || words.size() != 2 || words.front() != "-P") {
        return false;
    }
    const std::string& pattern = words[1];
    const std::size_t escape = pattern.find("\\n");
    const auto plain = [](std::string_view text) {
        return std::ranges::all_of(text, [](char letter) {
            return (letter >= 'a' && letter <= 'z') || (letter >= 'A' && letter <= 'Z') ||
                   (letter >= '0' && letter <= '9') ||
                   std::string_view(" :_-.@/").find(letter) != std::string_view::npos;
        });
    };
    return escape != std::string::npos && plain(pattern.substr(0, escape)) &&
           (plain(pattern.substr(escape + 2)) ||
            (pattern.ends_with("\\n") && plain(pattern.substr(escape + 2, pattern.size() - escape - 4))));
}

struct Request {
    bool invert = false;
    bool ignoreCase = false;
    bool wholeWord = false;
};

/// Takes one word of options. @return whether all its letters are known
bool readOptions(std::string_view letters, Request& request) {
    for (const char letter : letters) {
        request.invert = request.invert || letter == 'v';
        request.ignoreCase = request.ignoreCase || letter == 'i';
        request.wholeWord = request.wholeWord || letter == 'w';
    }
    return !letters.empty() && letters.find_first_not_of("viw") == std::string_view::npos;
}

}  // namespace

std::unique_ptr<Filter> makeGrepOf(const std::string& name, Words words, Dialect dialect, Manner manner) {
    Request request;
    while (!words.empty() && words.front().starts_with('-')) {
        if (!readOptions(std::string_view(words.front()).substr(1), request)) {
            return nullptr;
        }
        words = words.subspan(1);
    }
    if (words.size() != 1 || words.front().find('\n') != std::string::npos) {
        return nullptr;
    }
    auto pattern = Pattern::read(words.front(), dialect, request.ignoreCase, request.wholeWord);
    return pattern ? std::make_unique<Grep>(name, std::move(*pattern), request.invert, manner) : nullptr;
}

std::unique_ptr<Filter> makeGrep(Words words, Manner manner) {
    if (isNeverFound(words, manner)) {
        return std::make_unique<NeverFound>();
    }
    return makeGrepOf("(standard input)", words, Dialect::basic, manner);
}

std::unique_ptr<Filter> makeEgrep(Words words, Manner manner) {
    return makeGrepOf("(standard input)", words, Dialect::extended, manner);
}

}  // namespace cvagent::shell
