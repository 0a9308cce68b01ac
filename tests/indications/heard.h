#pragma once

#include <mutex>
#include <string>
#include <vector>

#include "framework/ic/alert.h"
#include "framework/ic/error.h"

/// An agent that keeps the messages of the alerts it is sent, on whatever thread they come.
struct Heard {
    std::mutex guard;
    std::vector<std::string> messages;

    static IC::Error hear(const std::vector<IC::Alert>& alerts, const void* context) {
        auto* heard = const_cast<Heard*>(static_cast<const Heard*>(context));
        const std::lock_guard lock(heard->guard);
        heard->messages.push_back(alerts.at(0).message());
        return {};
    }
    std::vector<std::string> now() {
        const std::lock_guard lock(guard);
        return messages;
    }
};
