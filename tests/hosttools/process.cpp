#include "tests/hosttools/process.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>
#include <array>

namespace {

struct Pipe {
    std::array<int, 2> ends{};
    Pipe() { EXPECT_EQ(pipe2(ends.data(), O_CLOEXEC), 0); }
};

[[noreturn]] void become(const Words& words, const std::function<void()>& before, const Pipe& output,
                         const Pipe& errors) {
    dup2(output.ends[1], STDOUT_FILENO);
    dup2(errors.ends[1], STDERR_FILENO);
    if (before) before();
    std::vector<char*> arguments;
    for (const std::string& word : words) arguments.push_back(const_cast<char*>(word.c_str()));
    arguments.push_back(nullptr);
    execvp(arguments.front(), arguments.data());
    _exit(127);
}

/// Reads both pipes to their ends.
void drain(const Pipe& output, const Pipe& errors, Outcome& outcome) {
    std::array<pollfd, 2> open = {{{output.ends[0], POLLIN, 0}, {errors.ends[0], POLLIN, 0}}};
    const std::array<std::string*, 2> texts = {&outcome.output, &outcome.errors};
    while (open[0].fd >= 0 || open[1].fd >= 0) {
        if (poll(open.data(), open.size(), -1) < 0) return;
        for (std::size_t index = 0; index < open.size(); ++index) {
            if (open[index].revents == 0) continue;
            std::array<char, 65536> bytes;
            const ssize_t got = read(open[index].fd, bytes.data(), bytes.size());
            if (got <= 0) {
                open[index].fd = -1;
            } else {
                texts[index]->append(bytes.data(), static_cast<std::size_t>(got));
            }
        }
    }
}

}  // namespace

Outcome run(const Words& words, const std::function<void()>& before) {
    const Pipe output;
    const Pipe errors;
    Outcome outcome;
    const pid_t child = fork();
    if (child == 0) become(words, before, output, errors);
    close(output.ends[1]);
    close(errors.ends[1]);
    drain(output, errors, outcome);
    close(output.ends[0]);
    close(errors.ends[0]);
    int status = 0;
    waitpid(child, &status, 0);
    if (WIFEXITED(status)) outcome.status = WEXITSTATUS(status);
    return outcome;
}

Outcome shell(const std::string& command) {
    return run({"/bin/sh", "-c", command});
}

std::string adapter(const std::string& command) {
    return HOSTTOOLS_ADAPTERS "/" + command.substr(0, command.find(' ')) + "/" + command;
}

std::string adapterAlone(const std::string& command) {
    return "HOSTTOOLS_HANDED_OVER=already " + adapter(command);
}

bool hasProgram(const std::string& name) {
    return shell("command -v " + name).status == 0;
}
