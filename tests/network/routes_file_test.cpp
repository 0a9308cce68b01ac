#include "network/routes_file.h"

#include <sys/mount.h>
#include <sys/resource.h>

#include <csignal>

#include "tests/network/killed_writer.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

using IC::AddressFamily;
using IC::RoutesRewrite;

constexpr char kRoutes[] = "/etc/sysconfig/network/routes";

std::string rewritten(FakeHost& host, AddressFamily family, const std::string& content) {
    host.file(kRoutes, content);
    EXPECT_EQ(IC::replaceDefaultRoute(family, family == AddressFamily::ipv4 ? "10.0.0.1" : "fd00::1"),
              RoutesRewrite::written);
    return host.read(kRoutes).value_or("missing");
}

HOST_TEST(RoutesFile, TakesAnIPv4RouteInFrontAndKeepsOnlyIPv6) {
    EXPECT_EQ(rewritten(host, AddressFamily::ipv4,
                        "default 10.0.0.9 -\n# c\ndefault fd00::9 -\n10.1.0.0 10.0.0.8 -"),
              "default\t10.0.0.1\t-\n# c\ndefault fd00::9 -\n");
    EXPECT_EQ(rewritten(host, AddressFamily::ipv4, "default 10.0.0.9 -\ndefault fd00::9 -"),
              "default\t10.0.0.1\t-\ndefault fd00::9 -");
}

HOST_TEST(RoutesFile, TakesAnIPv6RouteAtTheEndAndKeepsOnlyIPv4) {
    EXPECT_EQ(rewritten(host, AddressFamily::ipv6,
                        "default 10.0.0.9 -\n# c\ndefault fd00::9 -\n10.1.0.0 10.0.0.8 -"),
              "default 10.0.0.9 -\n# c\n10.1.0.0 10.0.0.8 -\ndefault\tfd00::1\t-\n");
}

HOST_TEST(RoutesFile, OfCommentsAloneBecomesTheRouteAlone) {
    EXPECT_EQ(rewritten(host, AddressFamily::ipv4, "# a\n# b: c\n"), "default\t10.0.0.1\t-\n");
    EXPECT_EQ(rewritten(host, AddressFamily::ipv6, "# a\n# b: c\n"), "default\tfd00::1\t-\n");
}

HOST_TEST(RoutesFile, LooksIntoTheWholeOfALine) {
    const std::string padding(600, 'x');
    EXPECT_EQ(rewritten(host, AddressFamily::ipv4, padding + "\n"), "default\t10.0.0.1\t-\n");
    EXPECT_EQ(rewritten(host, AddressFamily::ipv4, padding + ":\n"),
              "default\t10.0.0.1\t-\n" + padding + ":\n");
    EXPECT_EQ(rewritten(host, AddressFamily::ipv6, padding + ":\n"), "default\tfd00::1\t-\n");
    EXPECT_EQ(rewritten(host, AddressFamily::ipv6, padding + "#\n"), "default\tfd00::1\t-\n");
}

HOST_TEST(RoutesFile, WithADirectoryInItsPlaceIsReadAndNotWritten) {
    host.directory(kRoutes);
    EXPECT_EQ(IC::replaceDefaultRoute(AddressFamily::ipv6, "fd00::1"), RoutesRewrite::notWritten);
}

HOST_TEST(RoutesFile, IsNotMade) {
    EXPECT_EQ(IC::replaceDefaultRoute(AddressFamily::ipv4, "10.0.0.1"), RoutesRewrite::notRead);
    EXPECT_FALSE(host.exists(kRoutes));
}

HOST_TEST(RoutesFile, IsTheOldOneWhenItCannotBeWritten) {
    host.file(kRoutes, "default 10.0.0.9 -\n");
    host.readOnly("/etc/sysconfig");
    EXPECT_EQ(IC::replaceDefaultRoute(AddressFamily::ipv4, "10.0.0.1"), RoutesRewrite::notWritten);
    EXPECT_EQ(host.read(kRoutes), "default 10.0.0.9 -\n");
}

HOST_TEST(RoutesFile, IsTheOldOneWhenTheDiskIsFull) {
    host.file(kRoutes, "default 10.0.0.9 -\n");
    host.fullDisk("/etc/sysconfig/network");
    IC::replaceDefaultRoute(AddressFamily::ipv4, "10.0.0.1");
    EXPECT_EQ(host.read(kRoutes), "default 10.0.0.9 -\n");
}

// Even where room cannot be reserved beforehand.
HOST_TEST(RoutesFile, IsTheOldOneWhenTheProcessMayNotWriteThatMuch) {
    host.directory("/etc/sysconfig/network");
    ASSERT_EQ(mount("ramfs", "/etc/sysconfig/network", "ramfs", 0, nullptr), 0);
    const std::string old = "default 10.0.0.9 -\ndefault fd00::9 -\n";
    host.file(kRoutes, old);
    const rlimit sevenBytes{7, RLIM_INFINITY};
    setrlimit(RLIMIT_FSIZE, &sevenBytes);
    LogCapture capture;
    EXPECT_EQ(IC::replaceDefaultRoute(AddressFamily::ipv4, "10.0.0.1"), RoutesRewrite::written);
    EXPECT_EQ(host.read(kRoutes), old);
    EXPECT_THAT(capture.messages(6000), TextsAre("Could not write all of '/etc/sysconfig/network/routes'."));
    const rlimit unlimited{RLIM_INFINITY, RLIM_INFINITY};
    setrlimit(RLIMIT_FSIZE, &unlimited);
}

HOST_TEST(RoutesFile, IsTheOldOneWhenTheWriterIsKilledBeforeItWrites) {
    host.file(kRoutes, "default 10.0.0.9 -\n");
    killBeforeItWrites(kRoutes, [] { IC::replaceDefaultRoute(AddressFamily::ipv4, "10.0.0.1"); });
    EXPECT_EQ(host.read(kRoutes), "default 10.0.0.9 -\n");
}

}  // namespace
