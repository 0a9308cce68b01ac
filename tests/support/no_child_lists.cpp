#include "tests/support/no_child_lists.h"

#include <dlfcn.h>

#include <atomic>
#include <cerrno>
#include <cstdio>
#include <string_view>

namespace {

std::atomic<bool> hidden{false};

}  // namespace

NoChildLists::NoChildLists() {
    hidden = true;
}

NoChildLists::~NoChildLists() {
    hidden = false;
}

// Stands in front of the C library's; file streams open with it.
extern "C" __attribute__((visibility("default"))) FILE* fopen64(const char* path, const char* mode) {
    if (hidden && std::string_view(path).ends_with("/children")) {
        errno = ENOENT;
        return nullptr;
    }
    using Open = FILE* (*)(const char*, const char*);
    static const auto next = reinterpret_cast<Open>(dlsym(RTLD_NEXT, "fopen64"));
    return next(path, mode);
}
