#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

/// What popen does in this test program: what the system's does, unless the test says otherwise. Every
/// command line is kept in the order of the starts. May be used from many threads; set it up before they
/// start.
namespace shell_stub {

/// Such a command cannot be started: popen answers null.
void failWhen(std::function<bool(const std::string& command)> rule);
/// Such a command is not run: its output is what the rule gives. Nothing: the system runs it.
void answerWith(std::function<std::optional<std::string>(const std::string& command)> rule);
/// Called on the starting thread before every command.
void beforeEach(std::function<void(const std::string& command)> look);

std::vector<std::string> commands();
void clearCommands();
/// Whether commands are kept: thousands of rebuilds need not be.
void keepCommands(bool keep);

/// Whether the plug-in's file lock is held by somebody at this moment.
bool fileLockIsHeld();

}  // namespace shell_stub
