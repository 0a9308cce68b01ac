#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/plugin_access.h"
#include "tests/support/shell_stub.h"
#include "tests/support/waiting.h"

/// A listing of tests/storage/listings.
std::string listing(const std::string& name);

/// The command lines started so far, in order.
std::vector<std::string> commands();
void clearCommands();
/// No command line is kept from here on: thousands of rebuilds start too many.
void forgetCommands();

/// Whether the plug-in's file lock is held by somebody at this moment.
bool fileLockIsHeld();

/// Waits for a tool that runs kUntilItMayGoOn to start and lets it go on as soon as nobody holds the
/// plug-in's file lock.
/// @return false when the lock was held all the time
bool fileLockIsFreeWhile(FakeHost& host, const std::string& toolRuns);

/// The lines of a log without the messages that nodes write when a property is stored or read.
std::vector<std::string> withoutPropertyLines(const std::vector<std::string>& messages);

/// A node as a test compares it.
struct Seen {
    unsigned int id;
    unsigned int index;
    std::string path;         ///< property 89
    unsigned long long size;  ///< property 37 of a drive, 112 of a partition

    friend bool operator==(const Seen&, const Seen&) = default;
    friend std::ostream& operator<<(std::ostream& out, const Seen& seen) {
        return out << "{" << seen.id << ", " << seen.index << ", " << seen.path << ", " << seen.size << "}";
    }
};

/// A fake host whose plug-in object has a disk controller with node id 100 and an agent that keeps a diary.
class StorageHost : public HostFixture {
protected:
    static constexpr unsigned int kControllerId = 100;

    void setUpHost(FakeHost& host) override;
    void tearDownHost(FakeHost& host) override;

    static std::vector<Seen> drives();
    static std::vector<Seen> partitions();
    /// The drives, or partitions, that the agent can reach.
    static std::vector<std::shared_ptr<IC::MutableNode>> nodesOfType(unsigned int type);
    /// What the agent was told: "published /dev/sda", "withdrawn /dev/sda".
    static std::vector<std::string>& diary();
    /// From here on the agent takes no more nodes.
    static void agentRefuses();
};
