#pragma once

#include <sys/wait.h>

#include <cstdio>
#include <string>

/// What a shell command printed, and its exit status (128 and the signal when it was killed).
struct Shell {
    int status;
    std::string out;
};

/// Runs a command as the code under test does, with popen.
inline Shell shell(const std::string& command) {
    Shell result{-1, ""};
    FILE* pipe = popen(command.c_str(), "r");
    if (!pipe) return result;
    for (int c; (c = std::fgetc(pipe)) != EOF;) result.out += static_cast<char>(c);
    int status = pclose(pipe);
    result.status = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    return result;
}
