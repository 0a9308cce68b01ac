#pragma once

#include <optional>
#include <string>

#include "plugins/hardware/found.h"
#include "plugins/hardware/host.h"

namespace hardware {

/// The rows of a drive's health.
struct HealthIds {
    Id power;
    Id temperature;
    Id worn;
    Id spare;
    Id hours;
    Id warnings;
    Id mediaErrors;
};

/// What the drive says of its health, for those who may ask it. One that the kernel lets sleep is not asked.
/// @param transport how it is attached: some cases with a drive in them do not stand the question
void addHealth(const Host& host, const std::string& name, const std::string& transport, const HealthIds& ids,
               Facts& facts);

/// Whether a drive turns for sure, so that a question that other drivers pass on to it wakes it not: one that
/// has nothing to turn does, and one of a recorded host. It is told nothing of those that may not be asked.
bool isAwake(const Host& host, const std::string& name);

}  // namespace hardware
