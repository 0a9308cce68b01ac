#pragma once

#include <CLI/CLI.hpp>

#include "agent/cli/options.h"

namespace cvagent {

/// Decimal numbers only: "+1" and "0x10" are none, here as in ids and values.
CLI::Validator wholeDecimal();
/// Seconds up to a limit; the range check of the parser lets "nan" through.
CLI::Validator secondsUpTo(double most);

void addJson(CLI::App& command, Options& options);
void addYes(CLI::App& command, Options& options);
void addForce(CLI::App& command, Options& options);
/// @param usual the default, in words
void addVerifyWithin(CLI::App& command, Options& options, const std::string& usual);

/// How long a change waits for its confirmation.
void addConfirmWithin(CLI::App& command, Options& options);

/// The commands about files of changes, and those about changes that were made.
void addChanges(CLI::App& app, Options& options);

}  // namespace cvagent
