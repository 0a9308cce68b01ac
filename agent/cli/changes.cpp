#include "agent/cli/changes.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <set>

#include "agent/cli/print.h"
#include "agent/cli/prompt.h"
#include "agent/core/property_words.h"

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

std::string withPlace(const change::NamedChange& named, const std::string& text) {
    return named.place.empty() ? text : named.place + ": " + text;
}

MeantChange meant(Session& session, const change::NamedChange& named) {
    try {
        MeantChange change{session.find(named.node), nullptr, named.words, {}, named.place};
        change.row = &writableRow(*change.node, named.property);
        change.value = acceptedValue(*change.row, named.words);
        return change;
    } catch (const Problem& problem) {
        throw Problem(problem.kind(), withPlace(named, problem.what()), problem.subject(), problem.detail());
    }
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

}  // namespace

/// In one spelling, codes as numbers.
change::Wanted MeantChange::wanted() const {
    const std::vector<std::string>* list = value.asTexts();
    const auto plain = list != nullptr ? *list : std::vector<std::string>{static_cast<std::string>(value)};
    return {row->id, plain, row->type == NodeType::ipConfig ? change::interfaceNameOf(*node) : "",
            row->type == NodeType::computer};
}

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

std::vector<MeantChange> meantChanges(Session& session, const Options& options) {
    std::vector<MeantChange> changes;
    std::set<std::pair<unsigned int, unsigned int>> known;
    for (const change::NamedChange& named : namedChanges(options)) {
        changes.push_back(meant(session, named));
        const MeantChange& last = changes.back();
        if (!known.insert({last.node->getNodeId(), last.row->id}).second) {
            throw Failure(ExitStatus::usage,
                          withPlace(named, printable(last.target()) + " stands in the file twice"));
        }
    }
    return changes;
}

std::vector<change::Objection> objectionsTo(const std::vector<MeantChange>& changes) {
    std::vector<change::Wanted> wanted;
    std::ranges::transform(changes, std::back_inserter(wanted), &MeantChange::wanted);
    return change::objectionsTo(wanted, change::HostFacts::of(wanted));
}

void refuseUnlessForced(const std::vector<MeantChange>& changes,
                        const std::vector<change::Objection>& objections, bool force) {
    std::string text;
    for (const change::Objection& each : objections) {
        const MeantChange& change = changes.at(each.change);
        text += (text.empty() ? "" : "\n") + (change.place.empty() ? "" : change.place + ": ") +
                printable(change.target()) + ": " + printable(each.reason);
    }
    if (text.empty()) {
        return;
    }
    if (force) {
        complain("done all the same: " + text);
        return;
    }
    throw Failure(ExitStatus::refused, text + "\nNothing was done; --force does it all the same");
}

void confirmDrastic(const std::vector<MeantChange>& changes, const Options& options) {
    for (const MeantChange& change : changes) {
        if (const Label* drastic = drasticLabel(*change.row, change.value);
            drastic != nullptr && !options.yes) {
            confirm(drastic->text);
        }
    }
}

Found findNow(Session& session, const MeantChange& change, const Request& request) {
    Found found;
    found.reading.id = change.row->id;
    found.reading.row = change.row;
    found.reading.error = "it can only be written";
    if (change.row->readable) {
        const std::vector<Reading> readings =
            session.read(change.node, {std::to_string(change.row->id)}, request);
        found.reading = readings.empty() ? found.reading : readings.front();
        found.reading.row = change.row;
    }
    found.standing = change::standingOf(*change.node, *change.row, change.value, found.reading);
    return found;
}

}  // namespace cvagent
