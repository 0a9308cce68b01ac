#pragma once

#include <cstdlib>

/// A number of the environment. Read it before the fake host takes the environment away: into a constant
/// outside of functions.
inline unsigned long numberFrom(const char* name, unsigned long otherwise) {
    const char* const given = std::getenv(name);
    return given != nullptr ? std::strtoul(given, nullptr, 10) : otherwise;
}

/// What a test begins with that changes or kills at random. The everyday run does the same each time;
/// scripts/endurance names another number for each of its own.
inline unsigned int seedOfRun() {
    constexpr unsigned long kEveryday = 22;
    return static_cast<unsigned int>(numberFrom("CORVISTA_SEED", kEveryday));
}
