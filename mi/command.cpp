#include "mi/command.h"

#include <array>
#include <cstdarg>
#include <cstdlib>
#include <memory>

#include "framework/qx/thread.h"
#include "mi/log.h"

namespace IC {

namespace {

bool fits(const std::string& command) {
    if (command.size() < kCommandBuffer) {
        return true;
    }
    log(kError) << "Command too long, not run: " << command;
    return false;
}

}  // namespace

std::optional<std::string> OutputReader::nextLine(FILE* pipe, std::size_t longest) {
    std::array<char, kCommandBuffer> buffer{};
    const auto size = std::min(longest + 1, buffer.size());
    if (pipe == nullptr || left_ == 0 || fgets(buffer.data(), static_cast<int>(size), pipe) == nullptr) {
        return std::nullopt;
    }
    std::string line(buffer.data());
    // Without a line break it was a long line, or one that holds a zero and was longer than it looks.
    const std::size_t read = line.ends_with('\n') ? line.size() : size;
    left_ -= std::min(left_, read);
    if (left_ == 0) {
        log(kError) << "Output too long, the rest is not read: " << command_;
    }
    return line;
}

std::optional<std::string> formatCommand(const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    char* text = nullptr;
    const int length = vasprintf(&text, format, arguments);
    va_end(arguments);
    if (length < 0) {
        return std::nullopt;
    }
    const std::unique_ptr<char, void (*)(void*)> owner(text, free);
    std::string command(text, static_cast<std::size_t>(length));
    return fits(command) ? std::optional(std::move(command)) : std::nullopt;
}

HostCommand::HostCommand(const std::optional<std::string>& command) : reader_(command.value_or("")) {
    if (command) {
        pipe_ = process_.mypopen(command->c_str(), "r");
    }
}

HostCommand::HostCommand(FromText, const std::string& command) : reader_(command) {
    if (fits(command)) {
        pipe_ = process_.mypopen(command, "r");
    }
}

HostCommand HostCommand::fromText(const std::string& command) {
    return {FromText{}, command};
}

std::optional<std::string> HostCommand::nextLine(std::size_t longest) {
    return reader_.nextLine(pipe_, longest);
}

FirstLine firstLine(HostCommand&& command) {
    return {command.started(), command.nextLine()};
}

FirstLine firstLine(const std::optional<std::string>& command) {
    return firstLine(HostCommand(command));
}

PlainCommand::PlainCommand(const std::optional<std::string>& command)
    : reader_(command.value_or("")), pipe_(command ? openPipe(command->c_str(), "r") : nullptr) {}

PlainCommand::~PlainCommand() {
    closePipe(pipe_);
}

std::optional<std::string> PlainCommand::nextLine() {
    return reader_.nextLine(pipe_, kCommandBuffer - 1);
}

void runToEnd(const std::string& command) {
    if (fits(command) && !QX::Thread::isAborted()) {
        [[maybe_unused]] const int status = system(command.c_str());
    }
}

}  // namespace IC
