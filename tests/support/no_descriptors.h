#pragma once

/// While it lives, no command can be started: popen fails as it does in a process that has no descriptors
/// left. They are not really taken away, for the sanitizers' checks need some.
class NoDescriptors {
public:
    NoDescriptors();
    NoDescriptors(const NoDescriptors&) = delete;
    NoDescriptors& operator=(const NoDescriptors&) = delete;
    ~NoDescriptors();
};
