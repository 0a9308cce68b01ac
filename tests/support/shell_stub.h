#pragma once

#include <cstdio>
#include <functional>
#include <optional>
#include <string>

/// What becomes of the command lines that the code under test gives to the shell; without a rule the shell
/// runs them. Set rules up before the threads that start commands; an empty function takes a rule back.
namespace shell_stub {

/// Such a command cannot be started: popen answers null.
void failWhen(std::function<bool(const std::string& command)> rule);
/// Such a command is not run: its output is what the rule gives. Nothing: the shell runs it.
void answerWith(std::function<std::optional<std::string>(const std::string& command)> rule);
/// Called on the starting thread before every command.
void beforeEach(std::function<void(const std::string& command)> look);

/// popen under these rules; `shell` is the real one.
FILE* open(const char* command, const char* mode, FILE* (*shell)(const char*, const char*));

}  // namespace shell_stub
