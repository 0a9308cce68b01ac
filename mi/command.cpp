#include "mi/command.h"

#include <algorithm>
#include <cstdlib>

#include "framework/qx/thread.h"
#include "mi/log.h"
#include "mi/text.h"

namespace IC {

namespace {

using Place = TextSlot::Place;

/// The part of a text that the gate looks at. To the shell the blanks around it only separate words, and the
/// line breaks at its end only end a line.
std::string_view judged(std::string_view text) {
    text = text.substr(0, text.find_last_not_of('\n') + 1);
    text = text.substr(0, text.find_last_not_of(' ') + 1);
    return text.substr(std::min(text.find_first_not_of(' '), text.size()));
}

bool isBetween(char letter, char first, char last) {
    return letter >= first && letter <= last;
}

bool isMeant(char letter, Place place) {
    constexpr std::string_view kMarks = "._:@%+=,/-";
    constexpr std::string_view kNotQuoted = "\"$`\\\x7f";
    const bool above127 = (static_cast<unsigned char>(letter) & 0x80U) != 0;
    if (place == Place::quoted) {
        const bool shows = above127 || letter >= ' ' || letter == '\t' || letter == '\n';
        return shows && kNotQuoted.find(letter) == kNotQuoted.npos;
    }
    return above127 || isBetween(letter, 'a', 'z') || isBetween(letter, 'A', 'Z') ||
           isBetween(letter, '0', '9') || kMarks.find(letter) != kMarks.npos;
}

/// The first letter for which the gate refuses a text; nothing when the text may enter.
std::optional<char> firstWrong(std::string_view text, Place place) {
    if (place != Place::quoted && text.starts_with('-')) {
        return '-';  // an option
    }
    const auto* const wrong =
        std::find_if(text.begin(), text.end(), [place](char letter) { return !isMeant(letter, place); });
    return wrong == text.end() ? std::nullopt : std::optional(*wrong);
}

std::string_view entering(std::string_view text, Place place) {
    return place == Place::bare ? text.substr(0, text.find_last_not_of('\n') + 1) : text;
}

}  // namespace

Command::Command(std::string_view format, Slots slots, Texts texts, Length length, const char* function)
    : made_("") {
    std::size_t from = 0;
    std::optional<std::pair<std::string_view, char>> wrong;
    for (std::size_t i = 0; i < slots.size(); ++i) {
        const auto [at, place] = slots[i];
        made_->append(format, from, at - from).append(entering(texts[i], place));
        from = at + std::string_view("%s").size();
        const std::string_view text = judged(texts[i]);
        if (const auto letter = firstWrong(text, place); letter && !wrong) {
            wrong.emplace(text, *letter);
        }
    }
    made_->append(format, from);
    if (wrong) {
        refused_ = true;
        // For people, and for cvagent, which takes the text from this line up to the next quote.
        log(kError, function) << "Command refused for its text \"" << printable(wrong->first, '"')
                              << "\" (the \"" << printable({&wrong->second, 1}, '"')
                              << "\"), not run: " << shown();
    } else if (length == Length::ofBuffer && made_->size() >= kCommandBuffer) {
        refused_ = true;
        log(kError, function) << "Command too long, not run: " << shown();
    }
}

const char* Command::toRun() const {
    if (!made_) {
        return fixed_;
    }
    return refused_ ? nullptr : made_->c_str();
}

std::string Command::shown() const {
    if (!made_) {
        return fixed_;
    }
    return refused_ ? printable(*made_) : *made_;
}

std::optional<std::string> OutputReader::nextLine(FILE* pipe, std::size_t longest) {
    std::array<char, kCommandBuffer> buffer{};
    const auto size = std::min(longest + 1, buffer.size());
    if (pipe == nullptr || left_ == 0 || fgets(buffer.data(), static_cast<int>(size), pipe) == nullptr) {
        return std::nullopt;
    }
    std::string line(buffer.data());
    // Without a line break the line was long, or held a zero and was longer than it looks: the whole buffer
    // counts as read.
    const std::size_t read = line.ends_with('\n') ? line.size() : size;
    left_ -= std::min(left_, read);
    if (left_ == 0) {
        log(kError) << "Output too long, the rest is not read: " << command_;
    }
    return line;
}

HostCommand::HostCommand(const Command& command)
    : reader_(command.shown()), pipe_(process_.mypopen(command.toRun(), "r")) {}

HostCommand::HostCommand(FromText, const Command& command) : reader_(command.shown()) {
    if (const char* const text = command.toRun()) {
        pipe_ = process_.mypopen(std::string(text), "r");
    } else {
        pipe_ = process_.mypopen(nullptr, "r");
        MyProcess::logOpenPipes();
    }
}

HostCommand HostCommand::fromText(const Command& command) {
    return {FromText{}, command};
}

std::optional<std::string> HostCommand::nextLine(std::size_t longest) {
    return reader_.nextLine(pipe_, longest);
}

FirstLine firstLine(HostCommand&& command) {
    return {command.started(), command.nextLine()};
}

FirstLine firstLine(const Command& command) {
    return firstLine(HostCommand(command));
}

PlainCommand::PlainCommand(const Command& command)
    : reader_(command.shown()), pipe_(openPipe(command.toRun(), "r")) {}

PlainCommand::~PlainCommand() {
    closePipe(pipe_);
}

std::optional<std::string> PlainCommand::nextLine() {
    return reader_.nextLine(pipe_, kCommandBuffer - 1);
}

void runToEnd(const Command& command) {
    const char* const text = command.toRun();
    if (text != nullptr && !QX::Thread::isAborted()) {
        [[maybe_unused]] const int status = system(text);
    }
}

}  // namespace IC
