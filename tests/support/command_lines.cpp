#include "tests/support/command_lines.h"

#include <dlfcn.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <mutex>

#include "agent/shell/child.h"
#include "agent/shell/runner.h"
#include "framework/qx/process_tree.h"
#include "tests/support/no_descriptors.h"
#include "tests/support/shell_stub.h"

namespace {

/// What the stand-in for popen does beside its work.
struct Watch {
    std::mutex guard;
    bool remembers = false;
    bool refuses = false;
    std::vector<std::string> lines;
};

Watch& watch() {
    static Watch only;
    return only;
}

/// @return whether the command may run
bool note(const char* line) {
    const std::lock_guard lock(watch().guard);
    if (watch().remembers) {
        watch().lines.emplace_back(line);
    }
    return !watch().refuses;
}

void refuse(bool on) {
    const std::lock_guard lock(watch().guard);
    watch().refuses = on;
}

}  // namespace

CommandLines::CommandLines() {
    const std::lock_guard lock(watch().guard);
    watch().lines.clear();
    watch().remembers = true;
}

CommandLines::~CommandLines() {
    const std::lock_guard lock(watch().guard);
    watch().remembers = false;
}

std::vector<std::string> CommandLines::all() const {
    const std::lock_guard lock(watch().guard);
    return watch().lines;
}

void CommandLines::clear() {
    const std::lock_guard lock(watch().guard);
    watch().lines.clear();
}

NoDescriptors::NoDescriptors() {
    refuse(true);
}

NoDescriptors::~NoDescriptors() {
    refuse(false);
}

namespace {

using Popen = FILE* (*)(const char*, const char*);
using System = int (*)(const char*);

/// Commands run as cvagent runs the plug-in's; CORVISTA_TEST_SHELLS=1 has real shells run them all.
bool inShells() {
    static const bool all = [] {
        QX::setKillCallBack(cvagent::shell::noteKill);
        const char* const wish = std::getenv("CORVISTA_TEST_SHELLS");
        return wish != nullptr && *wish == '1';
    }();
    return all;
}

FILE* run(const char* line, const char* mode) {
    static const auto next = reinterpret_cast<Popen>(dlsym(RTLD_NEXT, "popen"));
    if (inShells() || std::string_view(mode) != "r") {
        return next(line, mode);
    }
    const auto direct = cvagent::shell::openCommand(line);
    return direct ? *direct : cvagent::shell::openInShell(line);
}

}  // namespace

// Stands in front of the C library's for the code in this program.
extern "C" __attribute__((visibility("default"))) FILE* popen(const char* line, const char* mode) {
    if (!note(line)) {
        errno = EMFILE;
        return nullptr;
    }
    cvagent::shell::tellCommand(line);
    return shell_stub::open(line, mode, run);
}

extern "C" __attribute__((visibility("default"))) int system(const char* line) {
    static const auto next = reinterpret_cast<System>(dlsym(RTLD_NEXT, "system"));
    const bool shell = line == nullptr || inShells();
    if (line != nullptr) {
        cvagent::shell::tellCommand(line);
    }
    const auto direct = shell ? std::nullopt : cvagent::shell::runCommand(line);
    return direct ? *direct : next(line);
}
