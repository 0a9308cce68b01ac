#pragma once

#include <string>

/// The text of a file below recorded/: what a tool printed, or what a file of a host held.
std::string recording(const std::string& name);
