// Whether set tells, by its status, that a change has not happened: the file is read-only, is missing, has no
// room, or the tool does nothing, as those of a caller who is not root.
#include <gmock/gmock.h>

#include "tests/agent/suse_host.h"

namespace {

using testing::HasSubstr;

constexpr const char* kRoutes = "/etc/sysconfig/network/routes";
constexpr const char* kResolver = "/etc/resolv.conf";
constexpr const char* kHosts = "/etc/hosts";
constexpr const char* kHostName = "/etc/HOSTNAME";
constexpr const char* kConfig = "ip-config:eth0";

/// A write, and the file that it changes.
struct Write {
    const char* property;
    const char* value;
    const char* file;
    bool makesTheFile = false;  ///< where there is none; without an interface file the origin is not fixed
};

// What a write changes at once is done by tools that follow it, see `obey`.
constexpr Write kWrites[] = {
    {"IPOrigin", "1", SuseHost::kInterfaceFile, true},
    {"IPv4Address", "192.0.2.20", SuseHost::kInterfaceFile},
    {"SubnetMask", "255.255.0.0", SuseHost::kInterfaceFile},
    {"IPv6Address", "2001:db8::20", SuseHost::kInterfaceFile},
    {"IPv6PrefixLength", "48", SuseHost::kInterfaceFile},
    {"IPv4Gateway", "192.0.2.254", kRoutes},
    {"IPv6Gateway", "FE80::2", kRoutes},
    {"DNSServers", "192.0.2.54", kResolver},
    {"DNSSuffixes", "example.org", kResolver},
    {"HostName", "earth", kHosts},
    {"HostName", "earth", kHostName, true},
    {"DomainName", "example.org", kHosts},
    {"DomainName", "example.org", kHostName, true},
};

constexpr const char* kCard =
    "eth0      Link encap:Ethernet  HWaddr 02:00:00:AA:BB:01  \n"
    "          inet addr:192.0.2.10  Bcast:192.0.2.255  Mask:";

void obey(const SuseHost& suse, FakeHost& host) {
    suse.follows("ifconfig eth0", std::string(kCard) + "255.255.255.0\n", "ifconfig eth0 netmask 255.255.0.0",
                 std::string(kCard) + "255.255.0.0\n");
    suse.follows("hostname -s", "linux\n", "hostname earth.example.com", "earth\n");
    suse.follows("hostname -d", "example.com\n", "hostname linux.example.org", "example.org\n");
    suse.follows("route -A inet6 -n", "::/0   fe80::1  UG   1024   0  0 eth0\n",
                 "ip -6 route add default via fe80::2 dev eth0", "::/0   fe80::2  UG   1024   0  0 eth0\n");
    host.tool("ip -6 route delete default via fe80::1 dev eth0", "");
    host.tool("route del -host 192.0.2.10 gw 192.0.2.254 eth0", "");
    host.tool("hostname linux.example.com", "");
}

constexpr int kNotConcerned = -1;

using Prepare = int (*)(FakeHost& host, const Write& write);  ///< gives the status to expect
using Repair = void (*)(FakeHost& host, const Write& write);

void expectStatus(
    FakeHost& host, Prepare prepare, Repair repair = [](FakeHost&, const Write&) {}) {
    for (const Write& write : kWrites) {
        host.remove("/sys/class/net/eth0/device");  // made anew
        SuseHost suse(host);
        obey(suse, host);
        const int status = prepare(host, write);
        if (status == kNotConcerned) {
            continue;
        }
        const Finished run = suse.run({"set", kConfig, write.property, write.value});
        repair(host, write);
        EXPECT_EQ(run.status, status) << write.property << " " << write.file << "\n" << run.out << run.err;
        EXPECT_EQ(run.err.find("was not changed") != std::string::npos ||
                      run.err.find("the plug-in reports") != std::string::npos,
                  status != 0)
            << run.err;
    }
}

std::string directoryOf(const Write& write) {
    const std::string file = write.file;
    return file.substr(0, file.rfind('/'));
}

HOST_TEST(WriteEffects, AreThereAfterAWrite) {
    expectStatus(host, [](FakeHost&, const Write&) { return 0; });
}

HOST_TEST(WriteEffects, AreMissedWhereTheFileIsReadOnly) {
    expectStatus(
        host,
        [](FakeHost& on, const Write& write) {
            on.readOnly(write.file);
            return 1;
        },
        [](FakeHost& on, const Write& write) { on.restore(write.file); });
}

HOST_TEST(WriteEffects, AreMissedWhereTheFileIsMissing) {
    expectStatus(host, [](FakeHost& on, const Write& write) {
        on.remove(write.file);
        return write.makesTheFile ? 0 : 1;
    });
}

HOST_TEST(WriteEffects, AreMissedWhereThereIsNoRoom) {
    expectStatus(
        host,
        [](FakeHost& on, const Write& write) {
            on.fullDisk(directoryOf(write));
            return 1;
        },
        [](FakeHost& on, const Write& write) { on.restore(directoryOf(write)); });
}

/// As Debian is.
HOST_TEST(WriteEffects, AreMissedWhereThereIsNoSuchDirectory) {
    expectStatus(host, [](FakeHost& on, const Write& write) {
        const bool isOfSuse = std::string(write.file).starts_with("/etc/sysconfig");
        on.remove("/etc/sysconfig");
        return isOfSuse ? 1 : kNotConcerned;
    });
}

HOST_TEST(WriteEffects, AreMissedWhereTheOriginIsNotFixed) {
    expectStatus(host, [](FakeHost& on, const Write& write) {
        on.file(SuseHost::kInterfaceFile, "BOOTPROTO=dhcp\n");
        const std::string property = write.property;
        const bool isAddress = property.starts_with("IPv") || property == "SubnetMask";
        return isAddress ? 1 : kNotConcerned;
    });
}

HOST_TEST(WriteEffect, OfAToolThatDoesNothingIsMissed) {
    SuseHost suse(host);
    obey(suse, host);
    for (const auto& [change, words] : std::vector<std::pair<std::string, std::vector<std::string>>>{
             {"hostname earth.example.com", {"HostName", "earth"}},
             {"hostname linux.example.org", {"DomainName", "example.org"}},
             {"ifconfig eth0 netmask 255.255.0.0", {"SubnetMask", "255.255.0.0"}},
             {"ip -6 route add default via fe80::2 dev eth0", {"IPv6Gateway", "FE80::2"}},
             {"ifconfig eth0 down", {"InterfaceState", "down"}}}) {
        host.tool(change, ToolAnswer{.out = "", .status = 1, .err = "Operation not permitted\n"});
        const Finished run = suse.run({"set", kConfig, words[0], words[1]});
        EXPECT_EQ(run.status, 1) << change;
        EXPECT_THAT(run.err, HasSubstr(words[0] + " was not changed, or only in part: ")) << change;
    }
}

HOST_TEST(WriteEffect, OfAnInterfaceThatIsBroughtUpIsItsFlagAndNotItsLink) {
    SuseHost suse(host);
    host.tool("ifconfig eth0 up", "");
    host.tool("ethtool eth0", "Settings for eth0:\n\tLink detected: no\n");
    EXPECT_EQ(suse.run({"set", kConfig, "InterfaceState", "up"}).status, 0) << "negotiating takes a while";
    host.file("/sys/class/net/eth0/flags", "0x1002\n");
    const Finished run = suse.run({"set", kConfig, "InterfaceState", "up"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("the interface is still down"));
}

HOST_TEST(WriteEffect, OfAPowerActionNeedsTheToolAndRoot) {
    SuseHost suse(host);
    EXPECT_EQ(suse.run({"set", "computer", "PowerAction", "9", "--yes"}).status, 0);
    host.toolMissing("shutdown");
    const Finished run = suse.run({"set", "computer", "PowerAction", "9", "--yes"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("there is no shutdown"));
    EXPECT_EQ(suse.run({"set", "computer", "PowerAction", "1"}).status, 0) << "changes nothing";
}

HOST_TEST(WriteEffect, OfAZoneThatCannotBeSwitchedIsMissed) {
    SuseHost suse(host);
    host.symlink("/etc/localtime", "/usr/share/zoneinfo/GMT");
    EXPECT_EQ(suse.run({"set", "computer", "TimeZoneOffset", "330"}).status, 0);
    host.readOnly("/etc");
    EXPECT_EQ(suse.run({"set", "computer", "TimeZoneOffset", "60"}).status, 1);
}

}  // namespace
