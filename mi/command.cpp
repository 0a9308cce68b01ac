#include "mi/command.h"

#include <array>
#include <cstdarg>
#include <cstdlib>
#include <memory>

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

std::optional<std::string> readLine(FILE* pipe, std::size_t longest) {
    std::array<char, kCommandBuffer> buffer{};
    const auto size = static_cast<int>(std::min(longest + 1, buffer.size()));
    if (pipe == nullptr || fgets(buffer.data(), size, pipe) == nullptr) {
        return std::nullopt;
    }
    return std::string(buffer.data());
}

}  // namespace

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

HostCommand::HostCommand(const std::optional<std::string>& command) {
    if (command) {
        pipe_ = process_.mypopen(command->c_str(), "r");
    }
}

HostCommand::HostCommand(FromText, const std::string& command) {
    if (fits(command)) {
        pipe_ = process_.mypopen(command, "r");
    }
}

HostCommand HostCommand::fromText(const std::string& command) {
    return {FromText{}, command};
}

std::optional<std::string> HostCommand::nextLine(std::size_t longest) {
    return readLine(pipe_, longest);
}

FirstLine firstLine(HostCommand&& command) {
    return {command.started(), command.nextLine()};
}

FirstLine firstLine(const std::optional<std::string>& command) {
    return firstLine(HostCommand(command));
}

PlainCommand::PlainCommand(const std::optional<std::string>& command)
    : pipe_(command ? popen(command->c_str(), "r") : nullptr) {}

PlainCommand::~PlainCommand() {
    if (pipe_ != nullptr) {
        pclose(pipe_);
    }
}

std::optional<std::string> PlainCommand::nextLine() {
    return readLine(pipe_, kCommandBuffer - 1);
}

void runToEnd(const std::string& command) {
    if (fits(command)) {
        [[maybe_unused]] const int status = system(command.c_str());
    }
}

}  // namespace IC
