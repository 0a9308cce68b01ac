#pragma once

#include <array>
#include <cstddef>
#include <string_view>

namespace IC {

/// Where a text enters a command.
struct TextSlot {
    enum class Place : unsigned char {
        bare,       ///< outside quotes, more of the command behind it
        bareAtEnd,  ///< outside quotes, the last of the command
        quoted,     ///< between double quotes
    };
    std::size_t at = 0;  ///< where its "%s" stands in the format
    Place place = Place::bare;
};

/// Reads a format as the shell will read the command. What it does not understand, and every place that is
/// not safe for a text, is a call that the compiler cannot make: such a format does not compile.
class FormatScan {
public:
    constexpr explicit FormatScan(std::string_view format) : format_(format) {}

    /// Goes on to the next "%s" and tells where it stands; at the end of the format every quote is closed.
    constexpr bool findSlot(TextSlot& slot) {
        for (; at_ < format_.size(); ++at_) {
            if (format_[at_] == '%') {
                slot = takeSlot();
                return true;
            }
            read(format_[at_]);
        }
        if (quote_ != kNone || inBackquotes_) {
            aQuoteIsNotClosed();
        }
        return false;
    }

private:
    static constexpr char kNone = '\0';

    constexpr TextSlot takeSlot() {
        if (next() != 's') {
            onlyTextsEnterACommand();
        }
        if (quote_ == '\'' || (quote_ == '"' && inBackquotes_)) {
            aTextStandsBareOrInDoubleQuotes();
        }
        if (!commandIsNamed_) {
            aTextIsNoProgram();
        }
        const TextSlot slot{at_, place()};
        at_ += 2;
        return slot;
    }

    constexpr TextSlot::Place place() const {
        if (quote_ == '"') {
            return TextSlot::Place::quoted;
        }
        return at_ + 2 == format_.size() ? TextSlot::Place::bareAtEnd : TextSlot::Place::bare;
    }

    constexpr char next() const { return at_ + 1 < format_.size() ? format_[at_ + 1] : kNone; }

    constexpr void read(char letter) {
        if (quote_ == '\'') {
            quote_ = letter == '\'' ? kNone : quote_;
        } else if (quote_ == '"') {
            readQuoted(letter);
        } else {
            readBare(letter);
        }
    }

    constexpr void readQuoted(char letter) {
        // A backslash before a letter is one to the shell; before anything else it takes its meaning away.
        const bool escapes = letter == '\\' && !(next() >= 'a' && next() <= 'z');
        if (escapes || letter == '$' || letter == '`') {
            theShellWouldReplaceThis();
        }
        quote_ = letter == '"' ? kNone : quote_;
    }

    constexpr void readBare(char letter) {
        if (std::string_view("\\$<()#~").find(letter) != std::string_view::npos) {
            theShellWouldReplaceThis();
        }
        if (letter == '\'' || letter == '"') {
            quote_ = letter;
        }
        if (letter == '`') {
            inBackquotes_ = !inBackquotes_;
        }
        if (std::string_view("|;&\n`").find(letter) != std::string_view::npos) {
            wordBegun_ = commandIsNamed_ = false;
        } else if (letter == ' ') {
            commandIsNamed_ = commandIsNamed_ || wordBegun_;
        } else {
            wordBegun_ = true;
        }
    }

    // Called only where a format is wrong; their names are what the compiler then says.
    static void aQuoteIsNotClosed();
    static void onlyTextsEnterACommand();
    static void aTextStandsBareOrInDoubleQuotes();
    static void aTextIsNoProgram();
    static void theShellWouldReplaceThis();

    std::string_view format_;
    std::size_t at_ = 0;
    char quote_ = kNone;
    bool inBackquotes_ = false;
    bool wordBegun_ = false;
    bool commandIsNamed_ = false;
};

/// A command of the source with a "%s" for each of so many texts, judged when it is compiled.
template <std::size_t texts>
class CommandFormat {
public:
    template <std::size_t size>
    consteval CommandFormat(const char (&format)[size]) : format_(format, size - 1) {
        FormatScan scan(format_);
        std::size_t found = 0;
        for (TextSlot slot; scan.findSlot(slot); ++found) {
            slots_[found] = slot;  // one more than there are texts does not compile
        }
        if (found != texts) {
            eachTextNeedsItsPlace();
        }
    }

    constexpr std::string_view format() const { return format_; }
    constexpr const std::array<TextSlot, texts>& slots() const { return slots_; }

private:
    static void eachTextNeedsItsPlace();

    std::string_view format_;
    std::array<TextSlot, texts> slots_{};
};

}  // namespace IC
