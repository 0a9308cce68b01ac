#include "mi/stopped_thread.h"

#include <dlfcn.h>
#include <link.h>

#include <atomic>

namespace IC {

namespace {

constexpr unsigned int kPatienceMilliseconds = 10'000;

std::atomic<bool> closing{false};

/// Has the loader keep this library in its place whatever its user closes.
bool keepMapped() {
    Dl_info ignored{};
    void* found = nullptr;
    if (closing || dladdr1(&closing, &ignored, &found, RTLD_DL_LINKMAP) == 0) {
        return false;
    }
    const char* const library = static_cast<const link_map*>(found)->l_name;
    const bool isProgram = *library == '\0';  // nobody closes that
    return isProgram || dlopen(library, RTLD_NOW | RTLD_NOLOAD | RTLD_NODELETE) != nullptr;
}

}  // namespace

void joinWithPatience(QX::Thread& thread) {
    if (!thread.isThisThread() && !thread.joinWithin(kPatienceMilliseconds)) {
        thread.abort();
        thread.join();
    }
}

void dropStopped(std::unique_ptr<QX::Thread> thread) {
    if (!thread->joinWithin(0) && keepMapped()) {
        QX::Thread::leave(std::move(thread));
    }
}

void leaveNoThreads() {
    closing = true;
}

}  // namespace IC
