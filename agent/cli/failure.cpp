#include "agent/cli/failure.h"

namespace cvagent {

namespace {

ExitStatus statusOf(const Problem& problem) {
    if (problem.subject() == Problem::environment) {
        return ExitStatus::usage;
    }
    switch (problem.kind()) {
        case Problem::notFound:
        case Problem::ambiguous:
            return ExitStatus::notFound;
        case Problem::refused:
            return ExitStatus::refused;
        case Problem::busy:
            return ExitStatus::busy;
        case Problem::timedOut:
        case Problem::failed:
            break;
    }
    return ExitStatus::failed;
}

std::string adviceOn(const Problem& problem) {
    switch (problem.subject()) {
        case Problem::node:
            return "; see: cvagent tree";
        case Problem::property:
            return "; see: cvagent properties " + problem.nodeClass();
        case Problem::pluginSearch:
            return "; name the plug-in with --plugin FILE";
        case Problem::pluginFile:
            return "; name the right one with --plugin FILE";
        case Problem::pluginLoad:
            return "\nName another one with --plugin FILE, or build and install this one again";
        case Problem::pluginEntry:
            return "; name another one with --plugin FILE";
        case Problem::logFile:
            return "; name another file or none";
        case Problem::none:
        case Problem::environment:
            break;
    }
    return {};
}

}  // namespace

Failure::Failure(const Problem& problem)
    : std::runtime_error(problem.what() + adviceOn(problem)), status_(statusOf(problem)) {}

}  // namespace cvagent
