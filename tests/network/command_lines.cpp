#include "tests/network/command_lines.h"

#include <dlfcn.h>

#include <cstdio>

namespace {

CommandLines* current = nullptr;

}  // namespace

CommandLines::CommandLines() {
    current = this;
}

CommandLines::~CommandLines() {
    current = nullptr;
}

void rememberCommandLine(const char* line) {
    if (current != nullptr) {
        current->lines_.emplace_back(line);
    }
}

// Stands in front of the C library's for the code in this program.
extern "C" __attribute__((visibility("default"))) FILE* popen(const char* line, const char* mode) {
    using Popen = FILE* (*)(const char*, const char*);
    static const auto next = reinterpret_cast<Popen>(dlsym(RTLD_NEXT, "popen"));
    rememberCommandLine(line);
    return next(line, mode);
}
