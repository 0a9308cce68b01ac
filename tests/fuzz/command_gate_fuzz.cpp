// Arbitrary bytes wherever a text enters a command. No shell runs: each command is read here by the shell's
// rules, and must be one of those that ordinary names make, with nothing but a text in the place of the name.
#include <algorithm>
#include <set>
#include <vector>

#include "framework/cvlog/logger.h"
#include "tests/fuzz/lines.h"
#include "tests/support/text_takers.h"

namespace {

// What stands between and around the letters of a command that the shell has read.
constexpr char kBlank = '\1';
constexpr char kOperator = '\2';  ///< in front of | & ; < > ( ) a line break and a backquote
constexpr char kReplaced = '\3';  ///< in front of what the shell would put something else in the place of
constexpr char kQuote = '\4';     ///< a double quote that opens or closes
constexpr std::string_view kMeanings = "\1\2\3\4";

/// A command as the shell reads it, by the rules of POSIX and nothing of the plug-in's.
std::string asTheShellReads(std::string_view command) {
    std::string read;
    char quote = '\0';
    bool atWord = true;
    for (const char letter : command.substr(0, command.find_last_not_of('\n') + 1)) {
        const auto isOneOf = [letter](std::string_view set) { return set.find(letter) != set.npos; };
        if (quote != '\0' && letter == quote) {
            quote = '\0';
            read += letter == '"' ? std::string(1, kQuote) : "";
        } else if (quote == '\'') {
            read += letter;
        } else if (quote == '"') {
            read += isOneOf("$`\\") ? std::string{kReplaced, letter} : std::string(1, letter);
        } else if (letter == '\'' || letter == '"') {
            quote = letter;
            read += letter == '"' ? std::string(1, kQuote) : "";
        } else if (letter == ' ' || letter == '\t') {
            read += kBlank;
        } else if (isOneOf("|&;<>()\n`")) {
            read += {kOperator, letter};
        } else if (isOneOf("$\\*?[{}!") || (atWord && isOneOf("#~"))) {
            read += {kReplaced, letter};
        } else {
            read += letter;
        }
        atWord = quote == '\0' && (letter == ' ' || letter == '\t' || isOneOf("|&;<>()\n`"));
    }
    return quote == '\0' ? read : read + kReplaced;
}

constexpr std::string_view kName = "Zq7";

/// Whether a text that stands there is one: blanks around it are no harm to the shell.
bool isText(std::string_view text, bool quoted) {
    if (!quoted) {
        text.remove_prefix(std::min(text.find_first_not_of(kBlank), text.size()));
        text = text.substr(0, text.find_last_not_of(kBlank) + 1);
    }
    return text.find_first_of(kMeanings) == text.npos && (quoted || !text.starts_with('-'));
}

/// A command that an ordinary name makes, without the name.
struct Shape {
    std::vector<std::string> pieces;
    std::vector<bool> quoted;  ///< the places between them

    explicit Shape(const std::string& read) {
        std::size_t from = 0;
        for (auto at = read.find(kName); at != read.npos; at = read.find(kName, from)) {
            pieces.push_back(read.substr(from, at - from));
            quoted.push_back(std::count(read.begin(), read.begin() + static_cast<long>(at), kQuote) % 2 != 0);
            from = at + kName.size();
        }
        pieces.push_back(read.substr(from));
    }
    bool operator<(const Shape& other) const { return pieces < other.pieces; }

    /// Whether a command is this one with some text in each place.
    bool fits(std::string_view read) const {
        if (!read.starts_with(pieces.front())) {
            return false;
        }
        std::size_t at = pieces.front().size();
        for (std::size_t i = 1; i < pieces.size(); ++i) {
            const std::string& piece = pieces[i];
            const bool isLast = i + 1 == pieces.size();
            const auto end =
                isLast ? std::max(read.size(), at + piece.size()) - piece.size() : read.find(piece, at);
            if (end == read.npos || !read.substr(end).starts_with(piece) ||
                !isText(read.substr(at, end - at), quoted[i - 1])) {
                return false;
            }
            at = end + piece.size();
        }
        return at == read.size();
    }
};

/// The shell that is not there.
struct Shell {
    const TextTaker* taker = nullptr;
    std::string text;
    std::set<Shape>* learning = nullptr;
    std::set<Shape> usual;
    int answersLeft = 0;  ///< a bond that is said to be its own member would be looked at for ever

    void judge(const char* command) {
        const std::string read = asTheShellReads(command);
        if (learning != nullptr) {
            learning->insert(Shape(read));
            return;
        }
        const bool known =
            std::any_of(usual.begin(), usual.end(), [&](const Shape& shape) { return shape.fits(read); });
        if (!known) {
            std::fprintf(stderr, "%s: the shell would have read: %s\n", taker->name, command);
        }
        AGREED(known);
    }

    FILE* answer(const char* command) {
        const std::string output = answersLeft-- > 0 ? taker->answer(command, text) : "";
        FILE* const stream =
            output.empty() ? std::fopen("/dev/null", "r") : fmemopen(nullptr, output.size() + 1, "w+");
        AGREED(stream != nullptr);
        if (!output.empty()) {
            std::fwrite(output.data(), 1, output.size(), stream);
            std::rewind(stream);
        }
        return stream;
    }

    void run(const TextTaker& of, const std::string& with) {
        taker = &of;
        text = with;
        answersLeft = 8;
        of.run(with);
    }
};

Shell shell;

/// A refused command is one line, whatever was in it.
class OneLine : public CVLog::LogSink {
public:
    void write(const CVLog::LogRecord& record) override {
        if (record.message.starts_with("Command ") &&
            record.message.find(" not run: ") != std::string::npos) {
            AGREED(std::none_of(record.message.begin(), record.message.end(),
                                [](unsigned char byte) { return byte < ' ' || byte == 0x7f; }));
        }
    }
};

bool learn() {
    static OneLine sink;
    constexpr int kErrors = 6000;
    CVLog::CVLogger::setLog(&sink, kErrors);
    shell.learning = &shell.usual;
    for (const TextTaker& taker : textTakers()) {
        if (!taker.writesFiles) {
            shell.run(taker, std::string(kName));
        }
    }
    // What is asked of a bond alone, with its name in the same place.
    std::set<Shape> ofBonds;
    shell.learning = &ofBonds;
    for (const TextTaker& taker : textTakers()) {
        if (!taker.writesFiles && taker.printedBy == nullptr) {
            shell.run(taker, "bond" + std::string(kName));
        }
    }
    for (Shape shape : ofBonds) {
        for (std::size_t i = 0; i + 1 < shape.pieces.size(); ++i) {
            std::string& piece = shape.pieces[i];
            AGREED(piece.ends_with("bond"));
            piece.resize(piece.size() - std::string_view("bond").size());
        }
        shell.usual.insert(shape);
    }
    shell.learning = nullptr;
    return true;
}

}  // namespace

// In front of the C library's.
extern "C" FILE* popen(const char* command, const char* /*mode*/) {
    shell.judge(command);
    return shell.answer(command);
}
extern "C" int pclose(FILE* stream) {
    return std::fclose(stream);
}
extern "C" int system(const char* command) {
    shell.judge(command);
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    [[maybe_unused]] static const bool learned = learn();
    const std::string text(reinterpret_cast<const char*>(data), size);
    for (const TextTaker& taker : textTakers()) {
        if (!taker.writesFiles) {
            shell.run(taker, text);
        }
    }
    return 0;
}
