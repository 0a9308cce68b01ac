#pragma once

#include <sys/types.h>
#include <functional>
#include <map>
#include <string>

#include "tests/hosttools/process.h"

/// @return whether this machine lets the tests make namespaces
bool canUnshare();

/// In a child: a mount namespace of its own with directories in the places of the machine's ("/proc" and so
/// on).
void enterPrivate(const std::map<std::string, std::string>& directories);

/// A network of its own, kept alive by a process that sleeps in it. Nothing done in it reaches the machine's.
class NetworkNamespace {
public:
    NetworkNamespace();
    NetworkNamespace(const NetworkNamespace&) = delete;
    NetworkNamespace& operator=(const NetworkNamespace&) = delete;
    ~NetworkNamespace();

    Outcome run(const Words& words) const;
    Outcome shell(const std::string& command) const;
    /// Runs a function of the test in a child inside. @return whether it returned true
    bool inside(const std::function<bool()>& function) const;

private:
    void join() const;

    pid_t keeper_ = -1;
    int leash_ = -1;  ///< the keeper ends when this is closed
};
