#include "agent/cli/changes.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>

#include "agent/cli/local_session.h"
#include "agent/cli/print.h"
#include "agent/cli/prompt.h"

namespace cvagent {

namespace {

[[noreturn]] void failToRead(const std::string& file, const std::string& reason) {
    throw Failure(ExitStatus::failed, inQuotes(file) + " cannot be read: " + reason);
}

/// Any other kind of file could keep the reader waiting.
int openChangeFile(const std::string& file) {
    if (file == "-") {
        return dup(STDIN_FILENO);
    }
    const int descriptor = open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
    struct stat found {};
    if (descriptor < 0 || fstat(descriptor, &found) != 0) {
        failToRead(file, std::strerror(errno));
    }
    if (!S_ISREG(found.st_mode)) {
        close(descriptor);
        failToRead(file, "it is no file; what a program prints is read with -");
    }
    return descriptor;
}

}  // namespace

std::string readChangeFile(const std::string& file) {
    const int descriptor = openChangeFile(file);
    std::string text;
    std::array<char, 65536> part{};
    ssize_t got = 0;
    while (text.size() <= change::kLongestChangeFile &&
           ((got = read(descriptor, part.data(), part.size())) > 0 || (got < 0 && errno == EINTR))) {
        text.append(part.data(), static_cast<std::size_t>(std::max<ssize_t>(got, 0)));
    }
    const int problem = got < 0 ? errno : 0;
    close(descriptor);
    if (problem != 0) {
        failToRead(file, std::strerror(problem));
    }
    return text;
}

std::vector<change::NamedChange> namedChanges(const Options& options) {
    if (options.changeFile.empty()) {
        return {{options.node, options.property, options.values, ""}};
    }
    try {
        return change::parseChanges(options.changeText);
    } catch (const change::BadChangeFile& bad) {
        throw Failure(ExitStatus::usage, inQuotes(options.changeFile) + ": " + bad.what());
    }
}

std::vector<change::MeantChange> meantChanges(Session& session, const Options& options) {
    const std::vector<change::NamedChange> named = namedChanges(options);
    try {
        return change::meantChanges(session, named);
    } catch (const change::BadChangeFile& twice) {
        throw Failure(ExitStatus::usage, twice.what());
    }
}

void confirmDrastic(const std::vector<change::MeantChange>& changes, const Options& options) {
    for (const change::MeantChange& change : changes) {
        if (const Label* drastic = change.drastic(); drastic != nullptr && !options.yes) {
            confirm(drastic->text);
        }
    }
}

change::RehearsalSettings rehearsalSettings(const Options& options) {
    change::RehearsalSettings settings;
    Options found = options;
    if (found.plugins.empty()) {  // the service has answered so far
        findPlugins(found);
    }
    settings.plugins = found.plugins;
    settings.hostTools = options.hostTools;
    settings.commands = options.commands;
    return settings;
}

}  // namespace cvagent
