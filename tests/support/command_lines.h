#pragma once

#include <string>
#include <vector>

/// While it lives, keeps the command lines that the code under test gives to the shell, in order and as they
/// are written, pipelines included. They run all the same. One at a time; the code may use any thread.
class CommandLines {
public:
    CommandLines();
    ~CommandLines();
    CommandLines(const CommandLines&) = delete;
    CommandLines& operator=(const CommandLines&) = delete;

    std::vector<std::string> all() const;
    void clear();
};
