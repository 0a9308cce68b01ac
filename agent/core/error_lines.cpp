#include "agent/core/error_lines.h"

#include <algorithm>

namespace cvagent {

namespace {

constexpr std::size_t kMostErrors = 50;

thread_local ErrorLines* ownerHere = nullptr;

}  // namespace

void ErrorLines::add(const std::string& text) {
    const std::lock_guard lock(guard_);
    ++count_;
    const auto known = std::find_if(errors_.begin(), errors_.end(),
                                    [&text](const auto& error) { return error.first == text; });
    if (known != errors_.end()) {
        ++known->second;
    } else if (errors_.size() < kMostErrors) {
        errors_.emplace_back(text, 1);
    } else {
        ++lost_;
    }
}

ErrorLines::Taken ErrorLines::take() {
    const std::lock_guard lock(guard_);
    Taken taken;
    for (const auto& [text, count] : errors_) {
        taken.texts.push_back(count == 1 ? text : text + " (" + std::to_string(count) + " times)");
    }
    taken.lost = std::exchange(lost_, 0);
    errors_.clear();
    return taken;
}

std::size_t ErrorLines::count() const {
    const std::lock_guard lock(guard_);
    return count_;
}

ErrorScope::ErrorScope(ErrorLines& owner) : outer_(std::exchange(ownerHere, &owner)) {}

ErrorScope::~ErrorScope() {
    ownerHere = outer_;
}

ErrorLines* ErrorScope::owner() {
    return ownerHere;
}

}  // namespace cvagent
