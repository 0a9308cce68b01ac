#include "agent/shell/command.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <initializer_list>
#include <string_view>
#include <utility>

namespace cvagent::shell {

namespace {

constexpr int kShellFailure = 2;
constexpr unsigned kStatusShift = 8;
constexpr auto kChangeTools =
    std::to_array<const char*>({"AWKBUFSIZE", "GAWK_PERSIST_FILE", "GAWK_READ_TIMEOUT", "GREP_OPTIONS",
                                "MAWKBINMODE", "POSIXLY_CORRECT"});

/// The value of the first of these variables that has one.
std::string_view firstSet(std::initializer_list<const char*> variables) {
    for (const char* const variable : variables) {
        if (const char* const value = std::getenv(variable); value != nullptr && *value != '\0') {
            return value;
        }
    }
    return "C";
}

/// The filters stand for the tools as they are in the C locale, without what else changes them.
bool toolsAreAsUsual() {
    for (const char* const category : {"LC_CTYPE", "LC_COLLATE", "LC_MESSAGES"}) {
        const std::string_view locale = firstSet({"LC_ALL", category, "LANG"});
        if (locale != "C" && locale != "POSIX") {
            return false;
        }
    }
    return std::ranges::none_of(kChangeTools, [](const char* name) { return std::getenv(name) != nullptr; });
}

}  // namespace

Command::Command(std::string text, int standardOutput)
    : text_(std::move(text)), standardOutput_(standardOutput) {}

Outcome Command::startNext() {
    const Pipeline& pipeline = plan_[next_++];
    current_ = std::make_unique<PipelineRun>(text_, standardOutput_);
    const Outcome outcome = current_->start(pipeline);
    if (outcome.kind == Outcome::refused && next_ > 1) {
        current_ = std::make_unique<PipelineRun>(text_, standardOutput_);
        return current_->startInShell(pipeline);
    }
    return outcome;
}

/// A shell that cannot start a tool ends there.
bool Command::startFurther() {
    if (startNext().kind == Outcome::started) {
        return true;
    }
    current_.reset();
    next_ = plan_.size();
    status_ = kShellFailure;
    return false;
}

Outcome Command::begin() noexcept {
    try {
        auto plan = toolsAreAsUsual() ? readPlan(text_) : std::nullopt;
        if (!plan) {
            return {Outcome::refused};
        }
        plan_ = std::move(*plan);
        Outcome outcome = startNext();
        while (outcome.kind == Outcome::started && current_->isDoneAtOnce() && hasMore()) {
            endCurrent(false);
            outcome = startNext();
        }
        return outcome;
    } catch (const std::exception&) {
        return {Outcome::failed, ENOMEM};
    }
}

Outcome Command::beginInShell() noexcept {
    try {
        inShell_ = true;
        plan_.clear();
        plan_.emplace_back().text = text_;
        next_ = plan_.size();
        current_ = std::make_unique<PipelineRun>(text_, standardOutput_);
        return current_->startInShell(plan_.front());
    } catch (const std::exception&) {
        return {Outcome::failed, ENOMEM};
    }
}

void Command::endCurrent(bool unread) {
    if (current_ != nullptr) {
        const Child::End end = current_->finish(unread);
        current_.reset();
        status_ = end.status;
        waited_ = end.waited;
        killed_ = killed_ || end.forced;
    }
}

ssize_t Command::read(char* buffer, std::size_t size) noexcept {
    try {
        while (pending_.empty() && !ended_) {
            if (current_ != nullptr && current_->pull(pending_)) {
                break;
            }
            // The last pipeline is waited for when its output is closed, not when it ends.
            ended_ = !hasMore();
            if (!ended_) {
                endCurrent(false);
                ended_ = killed_ || !startFurther();
            }
        }
        const std::size_t given = std::min(size, pending_.size());
        std::memcpy(buffer, pending_.data(), given);
        pending_.erase(0, given);
        return static_cast<ssize_t>(given);
    } catch (const std::exception&) {
        ended_ = true;
        pending_.clear();
        errno = ENOMEM;
        return -1;
    }
}

int Command::finish() noexcept {
    try {
        endCurrent(!ended_);
        while (hasMore() && !killed_) {
            if (startFurther()) {
                endCurrent(true);
            }
        }
    } catch (const std::exception&) {
        current_.reset();
        status_ = kShellFailure;
    }
    if (killed_) {
        return SIGKILL;
    }
    return inShell_ ? waited_ : static_cast<int>(static_cast<unsigned>(status_) << kStatusShift);
}

}  // namespace cvagent::shell
