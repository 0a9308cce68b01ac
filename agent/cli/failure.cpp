#include "agent/cli/failure.h"

#include <algorithm>
#include <array>
#include <iterator>

namespace cvagent {

namespace {

/// In the order of Problem::Kind.
constexpr std::array kStatuses = {ExitStatus::notFound, ExitStatus::notFound, ExitStatus::refused,
                                  ExitStatus::busy,     ExitStatus::failed,   ExitStatus::failed};

/// What the caller sets for the program is part of his command line.
ExitStatus statusOf(const Problem& problem) {
    return problem.subject() == Problem::dataVariable ? ExitStatus::usage : kStatuses.at(problem.kind());
}

constexpr const char* kForce = "\nNothing was done; --force does it all the same";

struct Advice {
    Problem::Kind kind;
    Problem::Subject subject;
    const char* text;
};

constexpr Advice kAdvice[] = {
    {Problem::notFound, Problem::node, "; see: cvagent tree"},
    {Problem::ambiguous, Problem::node, "; give the id or the path of one of them:"},
    {Problem::notFound, Problem::property, "; see: cvagent properties "},
    {Problem::refused, Problem::property, "; see: cvagent properties "},
    {Problem::refused, Problem::objection, kForce},
    {Problem::failed, Problem::objection, kForce},
    {Problem::failed, Problem::pluginSearch, "; name the plug-in with --plugin FILE"},
    {Problem::failed, Problem::pluginFile, "; name the right one with --plugin FILE"},
    {Problem::failed, Problem::pluginLoad,
     "\nName another one with --plugin FILE, or build and install this one again"},
    {Problem::failed, Problem::pluginEntry, "; name another one with --plugin FILE"},
    {Problem::failed, Problem::pluginOwner,
     "\nMake it and its directory yours or root's and writable by nobody else, take it away, or name the "
     "plug-ins to load with --plugin FILE"},
    {Problem::failed, Problem::logFile, "; name another file or none"},
    {Problem::failed, Problem::currentDirectory, "; give the whole path of "},
    {Problem::refused, Problem::dataVariable, "; set it to a directory or unset it"},
    {Problem::failed, Problem::dataPlace, "; set CORVISTA_DATA_DIR=DIRECTORY or run as root"},
    {Problem::failed, Problem::dataUse,
     "\nRun as root, or name another one with CORVISTA_DATA_DIR=DIRECTORY"},
    {Problem::failed, Problem::dataOwn,
     "\nMake all of the way to it yours or root's and writable by nobody else, or name another one with "
     "CORVISTA_DATA_DIR=DIRECTORY"},
    {Problem::busy, Problem::dataOwn,
     "\nStop it first, or name another one with CORVISTA_DATA_DIR=DIRECTORY"},
    {Problem::failed, Problem::dataFixed,
     "\nMake all of the way to it yours or root's and writable by nobody else"},
    {Problem::busy, Problem::dataFixed, "\nStop it first"},
};

std::string adviceOn(const Problem& problem) {
    const auto row = std::ranges::find_if(kAdvice, [&problem](const Advice& advice) {
        return advice.kind == problem.kind() && advice.subject == problem.subject();
    });
    return row == std::end(kAdvice) ? "" : row->text + problem.detail();
}

}  // namespace

Failure::Failure(const Problem& problem)
    : std::runtime_error(problem.what() + adviceOn(problem)), status_(statusOf(problem)) {}

}  // namespace cvagent
