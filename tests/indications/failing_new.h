#pragma once

#include <cstddef>

/// While it lives, `new` of an object of that size fails in every thread: `fail` throws.
class FailingNew {
public:
    FailingNew(std::size_t size, void (*fail)());
    FailingNew(const FailingNew&) = delete;
    FailingNew& operator=(const FailingNew&) = delete;
    ~FailingNew();
};
