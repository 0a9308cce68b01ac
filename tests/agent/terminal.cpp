#include "tests/agent/terminal.h"

#include <pty.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <stdexcept>

namespace {

constexpr unsigned int kNobody = 65534;

[[noreturn]] void become(const std::vector<std::string>& words) {
    std::vector<char*> arguments;
    for (const std::string& word : words) {
        arguments.push_back(const_cast<char*>(word.c_str()));
    }
    arguments.push_back(nullptr);
    execv(arguments.front(), arguments.data());
    _exit(127);
}

/// Everything the program prints until it closes its end.
/// @param printed hears of all that was printed so far, whenever there is more
OnTerminal follow(pid_t process, int descriptor, const std::function<void(const std::string&)>& printed) {
    std::string output;
    std::array<char, 4096> part{};
    for (;;) {
        const ssize_t size = read(descriptor, part.data(), part.size());
        if (size < 0 && errno == EINTR) {
            continue;
        }
        if (size <= 0) {  // a terminal whose other end has gone gives EIO
            break;
        }
        output.append(part.data(), static_cast<std::size_t>(size));
        printed(output);
    }
    close(descriptor);
    int status = 0;
    waitpid(process, &status, 0);
    return {WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status), output};
}

/// A fake host has none.
void provideTerminals() {
    if (access("/dev/ptmx", F_OK) == 0) {
        return;
    }
    std::filesystem::create_directory("/dev/pts");
    if (mount("devpts", "/dev/pts", "devpts", MS_NOSUID | MS_NOEXEC, "newinstance,ptmxmode=0666") != 0) {
        throw std::runtime_error("no terminals");
    }
    std::filesystem::create_symlink("pts/ptmx", "/dev/ptmx");
}

std::string temporaryDirectory() {
    std::string name = (std::filesystem::temp_directory_path() / "cvagent-test-XXXXXX").string();
    if (mkdtemp(name.data()) == nullptr) {
        throw std::runtime_error("no temporary directory");
    }
    return name;
}

/// Runs a program on a terminal.
/// @param begun gets the terminal and the process, and says what is to be done with what is printed
OnTerminal onTerminal(
    const std::vector<std::string>& words,
    const std::function<std::function<void(const std::string&)>(int terminal, pid_t process)>& begun) {
    provideTerminals();
    const std::string data = temporaryDirectory();
    int terminal = -1;
    const pid_t process = forkpty(&terminal, nullptr, nullptr, nullptr);
    if (process < 0) {
        throw std::runtime_error("no terminal");
    }
    if (process == 0) {
        setenv("CORVISTA_DATA_DIR", (data + "/").c_str(), 1);
        setenv("TERM", "xterm", 1);
        unsetenv("NO_COLOR");
        become(words);
    }
    const OnTerminal result = follow(process, terminal, begun(terminal, process));
    std::filesystem::remove_all(data);
    return result;
}

void ignore(const std::string& /*output*/) {}

}  // namespace

OnTerminal runOnTerminal(const std::vector<std::string>& words, const std::string& typed) {
    return onTerminal(words, [&](int terminal, pid_t /*process*/) {
        [[maybe_unused]] const ssize_t written = write(terminal, typed.data(), typed.size());
        return ignore;
    });
}

OnTerminal stopOnTerminal(const std::vector<std::string>& words, const std::string& awaited, int signal) {
    return onTerminal(words, [&](int /*terminal*/, pid_t process) {
        return [&, process, sent = false](const std::string& output) mutable {
            if (!sent && output.find(awaited) != std::string::npos) {
                sent = kill(process, signal) == 0;
            }
        };
    });
}

void makeForNobody(const std::string& directory) {
    if (mkdir(directory.c_str(), 0700) != 0 ||
        (geteuid() == 0 && chown(directory.c_str(), kNobody, kNobody) != 0)) {
        throw std::runtime_error("cannot make " + directory);
    }
}

OnTerminal runAsNobody(const std::vector<std::string>& words, const std::string& home) {
    std::array<int, 2> ends{};
    if (pipe(ends.data()) != 0) {
        throw std::runtime_error("no pipe");
    }
    const pid_t process = fork();
    if (process == 0) {
        dup2(ends[1], STDOUT_FILENO);
        dup2(ends[1], STDERR_FILENO);
        unsetenv("CORVISTA_DATA_DIR");
        unsetenv("XDG_STATE_HOME");
        setenv("HOME", home.c_str(), 1);
        if (geteuid() == 0 && (setgid(kNobody) != 0 || setuid(kNobody) != 0)) {
            _exit(126);
        }
        become(words);
    }
    close(ends[1]);
    return follow(process, ends[0], ignore);
}
