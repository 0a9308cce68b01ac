#pragma once

#include <functional>
#include <string>

/// Runs the writer in a process of its own and kills that when it opens `path` for writing, before the file
/// can change. Fails the test when the writer ends without opening it.
void killBeforeItWrites(const std::string& path, const std::function<void()>& writer);
