#pragma once

#include <string>
#include <vector>

/// While it lives, keeps the command lines that the code under test gives to the shell, in order and as they
/// are written, pipelines included. They run all the same.
class CommandLines {
public:
    CommandLines();
    ~CommandLines();
    CommandLines(const CommandLines&) = delete;
    CommandLines& operator=(const CommandLines&) = delete;

    const std::vector<std::string>& all() const { return lines_; }
    void clear() { lines_.clear(); }

private:
    friend void rememberCommandLine(const char* line);
    std::vector<std::string> lines_;
};
