// The bus of our own.
#include <gmock/gmock.h>

#include "agent/core/problem.h"
#include "agent/service/private_bus.h"
#include "tests/service/service_run.h"

namespace {

using cvagent::service::PrivateBus;
using testing::HasSubstr;

std::string problemWith(const std::string& directory) {
    try {
        const PrivateBus bus(directory);
        return "";
    } catch (const cvagent::Problem& problem) {
        return problem.what();
    }
}

HOST_TEST(PrivateBus, LiesInItsDirectoryAndGoesWithIt) {
    host.realTool("dbus-daemon");
    host.file("/etc/passwd", "root:x:0:0::/root:/bin/sh\n");
    {
        const PrivateBus own("/run/it's here");
        EXPECT_EQ(own.address(), "unix:path=/run/it%27s%20here/bus");
        const bus::Connection connection(own.address());
        EXPECT_THAT(connection.uniqueName(), HasSubstr(":1."));
        EXPECT_EQ(problemWith("/run/it's here"), "another cvagentd has a bus of its own in '/run/it's here'");
    }
    EXPECT_THAT(host.listDirectory("/run/it's here"), testing::ElementsAre(".lock"));
    EXPECT_EQ(problemWith("/run/it's here"), "");
}

HOST_TEST(PrivateBus, DoesNotLieWhereOthersCanWrite) {
    host.realTool("dbus-daemon");
    host.directory("/srv/open", 0777);
    EXPECT_THAT(
        problemWith("/srv/open"),
        HasSubstr("the directory of the bus '/srv/open' is not safe: '/srv/open' can be written by others"));
    host.directory("/srv/theirs");
    host.symlink("/srv/open/link", "/srv/theirs");
    EXPECT_THAT(problemWith("/srv/open/link"), HasSubstr("is not safe"));
    EXPECT_FALSE(host.exists("/srv/theirs/bus"));
}

/// What lies in the place of its files is of an earlier run.
HOST_TEST(PrivateBus, TakesThePlaceOfWhatWasLeft) {
    host.realTool("dbus-daemon");
    host.file("/etc/passwd", "root:x:0:0::/root:/bin/sh\n");
    host.file("/run/own/bus", "no socket");
    host.file("/srv/theirs", "kept");
    host.symlink("/run/own/bus.conf", "/srv/theirs");
    const PrivateBus own("/run/own");
    EXPECT_THAT(bus::Connection(own.address()).uniqueName(), HasSubstr(":1."));
    EXPECT_EQ(host.read("/srv/theirs"), "kept");
}

/// Whatever was sent to them and not read waits with the daemon.
HOST_TEST(PrivateBus, ReadersThatNeverReadHoldNobodyUp) {
    ServiceRun run(host);
    run.telling("drives").start();
    std::vector<std::unique_ptr<bus::Connection>> silent;
    std::vector<bus::Slot> waiting;
    for (int reader = 0; reader < 8; ++reader) {
        silent.push_back(std::make_unique<bus::Connection>(ServiceRun::address()));
    }
    for (int round = 0; round < 120; ++round) {
        for (const auto& one : silent) {
            waiting.push_back(
                one->askLater(call::make(*one, ServiceRun::kRoot, call::kManager, "GetManagedObjects"),
                              std::chrono::hours(1), [](const bus::Message&) {}));
            one->flush();
        }
        ASSERT_FALSE(call::ask(run.bus(), ServiceRun::kRoot, call::kManager, "GetManagedObjects").isError());
    }
}

/// The daemon lets nobody in whom the host does not know.
HOST_TEST(PrivateBus, NeedsItsUserToBeKnown) {
    host.realTool("dbus-daemon");
    EXPECT_EQ(problemWith("/run/x"),
              "cannot start a bus of our own: dbus-daemon lets nobody in who is not in /etc/passwd, and uid "
              "0 is not");
}

HOST_TEST(PrivateBus, NeedsADaemon) {
    EXPECT_EQ(problemWith("/run/x"),
              "cannot start a bus of our own: there is no dbus-daemon (package dbus-daemon)");
}

}  // namespace
