#pragma once

// A test program that lists no_child_lists.cpp among its sources can have a kernel of another make.

/// While it lives, the kernel is one that lists no children of threads, as far as files are opened by
/// streams.
class NoChildLists {
public:
    NoChildLists();
    NoChildLists(const NoChildLists&) = delete;
    NoChildLists& operator=(const NoChildLists&) = delete;
    ~NoChildLists();
};
