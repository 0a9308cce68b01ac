#pragma once

#include <cstddef>

// A test program that lists failing_new.cpp among its sources has an operator new that can fail.

/// While it lives, `new` of an object of that size fails in every thread: `fail` throws.
class FailingNew {
public:
    FailingNew(std::size_t size, void (*fail)());
    FailingNew(const FailingNew&) = delete;
    FailingNew& operator=(const FailingNew&) = delete;
    ~FailingNew();
};

/// While it lives, one `new` of the calling thread finds no memory: the one after so many that find some.
class FailingOnce {
public:
    explicit FailingOnce(long after);
    FailingOnce(const FailingOnce&) = delete;
    FailingOnce& operator=(const FailingOnce&) = delete;
    ~FailingOnce();

    bool happened() const;
};
