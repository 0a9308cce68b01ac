#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <climits>
#include <exception>

#include "plugins/hardware/storage/own_devices.h"

namespace hardware {

namespace {

std::string packed(const DeviceAccess::Told& told) {
    std::string text;
    for (const auto& [name, value] : told) {
        text += name + "=" + value + "\n";
    }
    return text;
}

DeviceAccess::Told unpacked(const std::string& text) {
    DeviceAccess::Told told;
    std::size_t start = 0;
    for (std::size_t end = 0; (end = text.find('\n', start)) != std::string::npos; start = end + 1) {
        const std::size_t equals = text.find('=', start);
        if (equals < end) {
            told[text.substr(start, equals - start)] = text.substr(equals + 1, end - equals - 1);
        }
    }
    return told;
}

/// Nothing of the agent's is kept open: its reader would wait for it.
void closeAllBut(int descriptor) {
    if (descriptor > 0) {
        close_range(0, static_cast<unsigned int>(descriptor) - 1, 0);
    }
    close_range(static_cast<unsigned int>(descriptor) + 1, UINT_MAX, 0);
}

[[noreturn]] void workAndTell(const std::function<DeviceAccess::Told()>& work, int result) {
    closeAllBut(result);
    try {
        const std::string text = packed(work());
        const bool whole = write(result, text.data(), text.size()) == static_cast<ssize_t>(text.size());
        _exit(whole ? 0 : 1);
    } catch (const std::exception&) {
        _exit(1);
    }
}

/// Starts a process that is no child of this one: nobody has to wait for its end.
bool startApart(const std::function<DeviceAccess::Told()>& work, int result) {
    const pid_t between = fork();
    if (between == 0) {
        if (fork() == 0) {
            workAndTell(work, result);
        }
        _exit(0);
    }
    while (between > 0 && waitpid(between, nullptr, 0) < 0 && errno == EINTR) {
    }
    return between > 0;
}

std::string readToEnd(int descriptor) {
    constexpr std::size_t kMost = 16384;
    std::string text;
    std::array<char, 1024> piece{};
    for (ssize_t count = 1; text.size() < kMost && (count > 0 || errno == EINTR);) {
        errno = 0;
        count = read(descriptor, piece.data(), piece.size());
        if (count == 0) {
            break;
        }
        text.append(piece.data(), count > 0 ? static_cast<std::size_t>(count) : 0);
    }
    return text;
}

}  // namespace

DeviceAccess::Told OwnDevices::apart(const std::function<Told()>& work) const {
    std::array<int, 2> ends{};
    if (pipe2(ends.data(), O_CLOEXEC) != 0) {
        return {};
    }
    const bool started = startApart(work, ends[1]);
    close(ends[1]);
    const std::string text = started ? readToEnd(ends[0]) : "";
    close(ends[0]);
    return unpacked(text);
}

}  // namespace hardware
