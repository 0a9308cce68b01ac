#include <algorithm>
#include <array>

#include "agent/shell/plan.h"

namespace cvagent::shell {

namespace {

/// Words that a shell understands itself, in whichever of the usual shells. Only `echo` is done here as well.
constexpr auto kShellWords = std::to_array<std::string_view>(
    {"!",        ".",       ":",         "[",        "[[",     "alias",   "bg",      "bind",     "break",
     "builtin",  "caller",  "case",      "cd",       "chdir",  "command", "compgen", "complete", "compopt",
     "continue", "coproc",  "declare",   "dirs",     "disown", "do",      "done",    "elif",     "else",
     "enable",   "esac",    "eval",      "exec",     "exit",   "export",  "false",   "fc",       "fg",
     "fi",       "for",     "function",  "getopts",  "hash",   "help",    "history", "if",       "in",
     "jobs",     "kill",    "let",       "local",    "logout", "mapfile", "popd",    "printf",   "pushd",
     "pwd",      "read",    "readarray", "readonly", "return", "select",  "set",     "shift",    "shopt",
     "source",   "suspend", "test",      "then",     "time",   "times",   "trap",    "true",     "type",
     "typeset",  "ulimit",  "umask",     "unalias",  "unset",  "until",   "wait",    "while"});

bool isBare(char letter) {
    const auto byte = static_cast<unsigned char>(letter);
    constexpr std::string_view kMarks = "_./:@%+=,-^";
    return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') || (byte >= '0' && byte <= '9') ||
           byte > 0x7f || kMarks.find(letter) != std::string_view::npos;
}

bool isBlank(char letter) {
    return letter == ' ' || letter == '\t';
}

/// Reads one plan; each step answers whether the text is still of the grammar.
class Reader {
public:
    explicit Reader(std::string_view text) : text_(text) {}

    bool readPipelines(Plan& plan) {
        do {
            if (!readPipeline(plan.emplace_back())) {
                return false;
            }
        } while (take(';'));
        return atEnd();
    }

    bool readPipeline(Pipeline& pipeline) {
        passBlanks();
        const std::size_t begin = at_;
        do {
            if (!pipeline.stages.empty() && pipeline.stages.back().output) {
                return false;
            }
            if (!readStage(pipeline, begin)) {
                return false;
            }
        } while (take('|'));
        if (pipeline.stages.size() == 1 && !pipeline.stages.front().pattern.empty()) {
            return false;
        }
        pipeline.text = text_.substr(begin, at_ - begin);
        if (insertedEnd_ > begin) {
            pipeline.behindInserted = text_.substr(insertedEnd_, at_ - insertedEnd_);
        }
        return true;
    }

    bool atEnd() const { return at_ == text_.size(); }

private:
    bool readStage(Pipeline& pipeline, std::size_t begin) {
        Stage& stage = pipeline.stages.emplace_back();
        const std::size_t start = at_;
        hasPattern_ = false;
        for (passBlanks(); !atEnd() && text_[at_] != '|' && text_[at_] != ';'; passBlanks()) {
            const bool known = text_[at_] == '>' || text_.substr(at_, 2) == "2>" ? readRedirection(stage)
                                                                                 : readWord(pipeline, begin);
            if (!known) {
                return false;
            }
        }
        if (hasPattern_) {
            stage.pattern = text_.substr(start, at_ - start);
            if (pipeline.stages.size() > 1 || insertedEnd_ > begin) {
                return false;
            }
        }
        return !stage.words.empty() && isTool(stage.words.front());
    }

    static bool isTool(const Word& word) {
        return word.inserted == nullptr && !word.text.empty() && word.text.find('=') == std::string::npos &&
               std::ranges::find(kShellWords, word.text) == kShellWords.end();
    }

    bool readRedirection(Stage& stage) {
        const bool ofErrors = text_[at_] == '2';
        at_ += ofErrors ? 2 : 1;
        const bool append = take('>');
        passBlanks();
        Word path;
        if (!readPlainWord(path) || !path.text.starts_with('/')) {
            return false;
        }
        if (ofErrors) {
            stage.silent = true;
            return !append && path.text == "/dev/null";
        }
        const bool first = !stage.output;
        stage.output = Redirection{path.text, append};
        return first;
    }

    bool readPlainWord(Word& word) {
        const std::size_t begin = at_;
        while (readPiece(word.text)) {
        }
        return at_ > begin && atWordEnd();
    }

    bool readWord(Pipeline& pipeline, std::size_t begin) {
        Word& word = pipeline.stages.back().words.emplace_back();
        const std::size_t start = at_;
        while (readPiece(word.text) || readPattern(pipeline.stages.back())) {
        }
        if (!atEnd() && text_[at_] == '`') {
            const bool first = pipeline.stages.size() == 1 && pipeline.beforeInserted.empty();
            pipeline.beforeInserted = text_.substr(begin, at_ - begin);
            if (!first || !readInserted(word)) {
                return false;
            }
            while (readPiece(word.after)) {
            }
            // What is in quotes is not divided, what is inserted is.
            if ((word.text + word.after).find_first_of(" \t\n") != std::string::npos) {
                return false;
            }
        }
        // A number before an arrow is a descriptor's.
        const bool descriptor =
            !atEnd() && text_[at_] == '>' &&
            text_.substr(start, at_ - start).find_first_not_of("0123456789") == std::string_view::npos;
        return at_ > start && atWordEnd() && !descriptor;
    }

    bool readInserted(Word& word) {
        const std::size_t end = text_.find('`', at_ + 1);
        if (end == std::string_view::npos) {
            return false;
        }
        auto inner = std::make_shared<Pipeline>();
        Reader reader(text_.substr(at_ + 1, end - at_ - 1));
        if (!reader.readPipeline(*inner) || !reader.atEnd() || inner->stages.back().output) {
            return false;
        }
        word.inserted = std::move(inner);
        at_ = insertedEnd_ = end + 1;
        return true;
    }

    /// Reads bare letters or a text in quotes. @return whether there was one of them
    bool readPiece(std::string& text) {
        if (atEnd()) {
            return false;
        }
        if (text_[at_] == '\'' || text_[at_] == '"') {
            return readQuoted(text);
        }
        const std::size_t begin = at_;
        while (!atEnd() && isBare(text_[at_])) {
            ++at_;
        }
        text += text_.substr(begin, at_ - begin);
        return at_ > begin;
    }

    /// A tool's name is no pattern, and neither is a file to write to.
    bool readPattern(const Stage& stage) {
        const bool found = stage.words.size() > 1 && take('*');
        hasPattern_ = hasPattern_ || found;
        return found;
    }

    /// A quote that does not end, or holds what the shell would read, is left where it is: no word ends
    /// there.
    bool readQuoted(std::string& text) {
        const char quote = text_[at_];
        const std::size_t end = text_.find(quote, at_ + 1);
        if (end == std::string_view::npos) {
            return false;
        }
        const std::string_view inside = text_.substr(at_ + 1, end - at_ - 1);
        if (quote == '"' && !isPlain(inside)) {
            return false;
        }
        text += inside;
        at_ = end + 1;
        return true;
    }

    /// In "quotes" a backslash is one, but before letters that would mean something else without it.
    static bool isPlain(std::string_view inside) {
        for (std::size_t at = 0; at < inside.size(); ++at) {
            const bool means = inside[at] == '\\' &&
                               (at + 1 == inside.size() ||
                                std::string_view("\\\n").find(inside[at + 1]) != std::string_view::npos);
            if (means || inside[at] == '$' || inside[at] == '`') {
                return false;
            }
        }
        return true;
    }

    bool atWordEnd() const {
        return atEnd() || isBlank(text_[at_]) ||
               std::string_view("|;>").find(text_[at_]) != std::string_view::npos;
    }

    void passBlanks() {
        while (!atEnd() && isBlank(text_[at_])) {
            ++at_;
        }
    }

    bool take(char letter) {
        if (atEnd() || text_[at_] != letter) {
            return false;
        }
        ++at_;
        return true;
    }

    std::string_view text_;
    std::size_t at_ = 0;
    std::size_t insertedEnd_ = 0;
    bool hasPattern_ = false;  ///< in the stage that is being read
};

}  // namespace

std::optional<Plan> readPlan(std::string_view text) {
    Plan plan;
    return Reader(text).readPipelines(plan) ? std::optional(std::move(plan)) : std::nullopt;
}

}  // namespace cvagent::shell
