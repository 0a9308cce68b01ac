#include "agent/shell/runner.h"

#include <sys/types.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <exception>
#include <memory>
#include <mutex>
#include <set>

#include "agent/shell/command.h"
#include "agent/shell/starts.h"

namespace cvagent::shell {

namespace {

std::atomic<bool> allToShell = false;
std::atomic<void (*)(const char*)> listener = nullptr;

struct Streams {
    std::mutex guard;
    std::set<FILE*> open;  // guarded by guard
};

Streams& streams() {
    static Streams only;
    return only;
}

/// What the stream that is being closed on this thread ended with.
thread_local int lastStatus = 0;

ssize_t readStream(void* command, char* buffer, std::size_t size) {
    return static_cast<Command*>(command)->read(buffer, size);
}

int closeStream(void* command) {
    const std::unique_ptr<Command> owner(static_cast<Command*>(command));
    lastStatus = owner->finish();
    return 0;
}

FILE* makeStream(std::unique_ptr<Command> command) {
    std::set<FILE*> place{nullptr};  // made first, since nothing may fail once there is a stream
    const cookie_io_functions_t functions{readStream, nullptr, nullptr, closeStream};
    FILE* const stream = fopencookie(command.get(), "r", functions);
    if (stream != nullptr) {
        static_cast<void>(command.release());
        auto node = place.extract(place.begin());
        node.value() = stream;
        const std::lock_guard lock(streams().guard);
        streams().open.insert(std::move(node));
    }
    return stream;
}

/// @return nothing with errno when it cannot be begun this way; null with errno when the system has no room
/// for it
std::optional<FILE*> openedBy(const char* text, Outcome (Command::*begin)() noexcept) {
    try {
        auto command = std::make_unique<Command>(text, -1);
        const Outcome outcome = (command.get()->*begin)();
        errno = outcome.error;
        if (outcome.kind == Outcome::refused) {
            return std::nullopt;
        }
        return outcome.kind == Outcome::failed ? nullptr : makeStream(std::move(command));
    } catch (const std::exception&) {
        errno = ENOMEM;
        return nullptr;
    }
}

}  // namespace

void leaveAllToShell(bool all) {
    allToShell = all;
}

void hearCommands(void (*hear)(const char* command)) {
    listener = hear;
}

void tellCommand(const char* command) {
    if (const auto hear = listener.load(); hear != nullptr) {
        hear(command);
    }
}

std::optional<FILE*> openCommand(const char* command) {
    return allToShell ? std::nullopt : openedBy(command, &Command::begin);
}

FILE* openInShell(const char* command) {
    const auto stream = openedBy(command, &Command::beginInShell);
    if (!stream) {
        countNotStarted(errno);
    }
    return stream.value_or(nullptr);
}

std::optional<int> closeCommand(FILE* stream) {
    {
        const std::lock_guard lock(streams().guard);
        if (streams().open.erase(stream) == 0) {
            return std::nullopt;
        }
    }
    [[maybe_unused]] const int closed = fclose(stream);  // nothing was written
    return lastStatus;
}

std::optional<int> runCommand(const char* command) {
    if (allToShell) {
        return std::nullopt;
    }
    try {
        Command run(command, STDOUT_FILENO);
        const Outcome outcome = run.begin();
        if (outcome.kind == Outcome::refused) {
            return std::nullopt;
        }
        if (outcome.kind == Outcome::failed) {
            errno = outcome.error;
            return -1;
        }
        return run.finish();
    } catch (const std::exception&) {
        errno = ENOMEM;
        return -1;
    }
}

}  // namespace cvagent::shell
