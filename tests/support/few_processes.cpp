// A program for which the system has no more processes; loaded ahead into it. CORVISTA_FEW_PROCESSES says
// what it cannot start: "commands", "threads". C library only.
#include <dlfcn.h>
#include <pthread.h>
#include <spawn.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace {

bool cannotStart(const char* what) {
    const char* setting = std::getenv("CORVISTA_FEW_PROCESSES");
    return setting != nullptr && std::strcmp(setting, what) == 0;
}

template <class Function>
Function machine(const char* name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

__attribute__((constructor)) void begin() {
    unsetenv("LD_PRELOAD");  // the host's tools are not concerned
}

}  // namespace

#define REPLACED extern "C" __attribute__((visibility("default")))

REPLACED FILE* popen(const char* command, const char* mode) {
    if (cannotStart("commands")) {
        errno = EAGAIN;
        return nullptr;
    }
    return machine<FILE* (*)(const char*, const char*)>("popen")(command, mode);
}

REPLACED int posix_spawn(pid_t* process, const char* path, const posix_spawn_file_actions_t* actions,
                         const posix_spawnattr_t* attributes, char* const words[], char* const variables[]) {
    using Spawn = int (*)(pid_t*, const char*, const posix_spawn_file_actions_t*, const posix_spawnattr_t*,
                          char* const[], char* const[]);
    return cannotStart("commands")
               ? EAGAIN
               : machine<Spawn>("posix_spawn")(process, path, actions, attributes, words, variables);
}

REPLACED int pthread_create(pthread_t* thread, const pthread_attr_t* attributes, void* (*run)(void*),
                            void* argument) noexcept {
    using Create = int (*)(pthread_t*, const pthread_attr_t*, void* (*)(void*), void*);
    return cannotStart("threads") ? EAGAIN
                                  : machine<Create>("pthread_create")(thread, attributes, run, argument);
}
