#include "tests/support/failing_new.h"

#include <atomic>
#include <cstdlib>
#include <new>

namespace {

std::atomic<std::size_t> failingSize{0};
std::atomic<void (*)()> failure{nullptr};
constinit thread_local long untilFailure =
    -1;  ///< how many allocations of this thread succeed; none fails below 0

void* allocate(std::size_t size) {
    if (size == failingSize && failingSize != 0) {
        failure.load()();
    }
    if (untilFailure >= 0 && untilFailure-- == 0) {
        throw std::bad_alloc();
    }
    return std::malloc(size == 0 ? 1 : size);
}

}  // namespace

FailingNew::FailingNew(std::size_t size, void (*fail)()) {
    failure = fail;
    failingSize = size;
}

FailingNew::~FailingNew() {
    failingSize = 0;
}

FailingOnce::FailingOnce(long after) {
    untilFailure = after;
}

FailingOnce::~FailingOnce() {
    untilFailure = -1;
}

bool FailingOnce::happened() const {
    return untilFailure < 0;
}

// All that a sanitizer would otherwise pair with an operator of its own.
void* operator new(std::size_t size) {
    void* memory = allocate(size);
    if (memory == nullptr) {
        throw std::bad_alloc();
    }
    return memory;
}

void* operator new(std::size_t size, const std::nothrow_t& /*tag*/) noexcept {
    return std::malloc(size == 0 ? 1 : size);
}

void operator delete(void* memory) noexcept {
    std::free(memory);
}

void operator delete(void* memory, std::size_t /*size*/) noexcept {
    std::free(memory);
}
