// How NetworkManager is made to keep something: what it is asked over the bus, and what becomes of its file.
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <chrono>
#include <cstdlib>

#include "agent/keep/way.h"
#include "agent/service/private_bus.h"
#include "tests/keep/mock_manager.h"
#include "tests/support/fake_host.h"

namespace {

using cvagent::bus::Writer;
using cvagent::keep::CannotKeep;
using cvagent::keep::go;
using cvagent::keep::Keeper;
using cvagent::keep::Way;
using cvagent::keep::wayToKeep;
using cvagent::keep::Wish;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr const char* kDevice = "/org/freedesktop/NetworkManager/Devices/2";
constexpr const char* kActive = "/org/freedesktop/NetworkManager/ActiveConnection/1";
constexpr const char* kProfile = "/org/freedesktop/NetworkManager/Settings/1";
constexpr const char* kFile = "/etc/NetworkManager/system-connections/my lan.nmconnection";
constexpr const char* kBefore = "# by hand\n[ipv4]\naddress1=192.0.2.10/24\n";
constexpr const char* kAfter = "[ipv4]\naddress1=192.0.2.77/24\n";

void put(Writer& writer, const char* key, const std::string& text) {
    writer.entry("sv", [&] { writer.put(key).variant("s", [&] { writer.put(text); }); });
}

void putSetting(Writer& writer, const char* name, const std::function<void()>& fill) {
    writer.entry("sa{sv}", [&] { writer.put(name).array("{sv}", fill); });
}

void putAddresses(Writer& writer, const char* attribute) {
    const auto address = [&] {
        put(writer, "address", "192.0.2.10");
        writer.entry("sv", [&] { writer.put("prefix").variant("u", [&] { writer.put(24U); }); });
        put(writer, attribute, "eth0:1");
    };
    writer.put("address-data").variant("aa{sv}", [&] {
        writer.array("a{sv}", [&] { writer.array("{sv}", address); });
    });
}

void putIpv4(Writer& writer, const char* attribute) {
    put(writer, "method", "manual");
    put(writer, "gateway", "192.0.2.1");
    writer.entry("sv", [&] { putAddresses(writer, attribute); });
    writer.entry("sv", [&] {  // as versions of old have them; they would count
        writer.put("addresses").variant("aau", [&] {
            writer.array("au", [&] { writer.put(std::vector<std::uint32_t>{1, 24, 2}); });
        });
    });
    writer.entry("sv", [&] {
        writer.put("dns").variant("au", [&] { writer.put(std::vector<std::uint32_t>{0x350200C0}); });
    });
    writer.entry("sv", [&] { writer.put("may-fail").variant("b", [&] { writer.put(false); }); });
}

/// @param odd an attribute of its address
void putSettings(Writer& writer, const char* odd = "label", const char* zone = "home") {
    writer.array("{sa{sv}}", [&] {
        putSetting(writer, "connection", [&] {
            put(writer, "id", "my lan");
            put(writer, "zone", zone);
        });
        putSetting(writer, "802-1x", [&] {
            writer.entry("sv", [&] {
                writer.put("ca-cert").variant("ay", [&] { writer.putBytes(std::string("\0\xff", 2)); });
            });
        });
        putSetting(writer, "ipv4", [&] { putIpv4(writer, odd); });
        putSetting(writer, "ipv6", [&] { put(writer, "method", "auto"); });
    });
}

void putSecret(Writer& writer, const std::string& secret) {
    writer.array("{sa{sv}}", [&] { putSetting(writer, "802-1x", [&] { put(writer, "password", secret); }); });
}

class KeptByManager : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        host.realTool("dbus-daemon");
        host.file("/etc/passwd", "root:x:0:0::/root:/bin/sh\n");
        host.file(kFile, kBefore, 0600);
        bus_ = std::make_unique<cvagent::service::PrivateBus>("/run/own");
        host.directory("/run/dbus");
        host.symlink("/run/dbus/system_bus_socket", "/run/own/bus");
        deeds_.settings = [](Writer& writer) { putSettings(writer); };
        deeds_.secrets["802-1x"] = [](Writer& writer, bool) { putSecret(writer, "geheim"); };
        deeds_.onUpdate = [&host] { host.file(kFile, kAfter, 0600); };
    }
    void tearDownHost(FakeHost& /*host*/) override {
        manager_.reset();
        bus_.reset();
    }

    const std::string& address() const { return bus_->address(); }
    MockManager& manager() {
        if (manager_ == nullptr) {
            manager_ = std::make_unique<MockManager>(
                bus_->address(), std::map<std::string, std::string>{{"eth0", kDevice}}, objects_, deeds_);
        }
        return *manager_;
    }
    Way way() {
        manager();
        Wish wish;
        wish.ipv4.address = "192.0.2.77";
        return wayToKeep({"eth0", 3}, cvagent::keep::keeperOf({"eth0", 3}), wish);
    }
    std::string refusal() {
        try {
            go(way());
            return "";
        } catch (const CannotKeep& cannot) {
            return cannot.what();
        }
    }

    MockManager::Objects objects_{{std::string(kDevice) + " Managed", true},
                                  {std::string(kDevice) + " ActiveConnection", MockManager::Path{kActive}},
                                  {std::string(kActive) + " StateFlags", 0x4cU},
                                  {std::string(kActive) + " Id", std::string("my lan")},
                                  {std::string(kActive) + " Connection", MockManager::Path{kProfile}},
                                  {std::string(kProfile) + " Filename", std::string(kFile)},
                                  {std::string(kProfile) + " Flags", 0U}};
    MockManager::Deeds deeds_;

private:
    std::unique_ptr<cvagent::service::PrivateBus> bus_;
    std::unique_ptr<MockManager> manager_;
};

HOST_TEST_F(KeptByManager, GetsItsSettingsWithTheNewAddress) {
    const Way way = KeptByManager::way();
    EXPECT_THAT(manager().calls(), IsEmpty());  // nothing is done yet
    go(way);
    EXPECT_THAT(manager().calls(), ElementsAre(std::string("Update2 ") + kProfile + " to-disk",
                                               std::string("Reapply ") + kDevice));
    const auto given = manager().given();
    EXPECT_EQ(
        given.at("ipv4.address-data"),
        "vaa{sv}(aa{sv}(a{sv}(esv(address vs(192.0.2.77 ))esv(label vs(eth0:1 ))esv(prefix vu(24 )))))");
    EXPECT_EQ(given.at("ipv4.method"), "vs(manual )");
    EXPECT_EQ(given.at("ipv4.gateway"), "vs(192.0.2.1 )");
    EXPECT_EQ(given.at("ipv4.dns"), "vau(au(889323712 ))");
    EXPECT_FALSE(given.contains("ipv4.addresses"));
    // The rest is as it was, secrets are not among it.
    EXPECT_EQ(given.at("ipv4.may-fail"), "vb(0 )");
    EXPECT_EQ(given.at("connection.zone"), "vs(home )");
    EXPECT_EQ(given.at("802-1x.ca-cert"), "vay(ay(0 255 ))");
    EXPECT_EQ(given.at("ipv6.method"), "vs(auto )");
    EXPECT_EQ(given.size(), 10U);
    EXPECT_EQ(KeptByManager::way().request, std::nullopt);  // it is so now
}

HOST_TEST_F(KeptByManager, TellsBeforehandWhatItWouldBeAsked) {
    const Way way = KeptByManager::way();
    ASSERT_TRUE(way.request);
    EXPECT_THAT(
        way.request->words,
        ElementsAre("NetworkManager Update2 'my lan': ipv4.addresses '192.0.2.10/24' -> '192.0.2.77/24'",
                    "NetworkManager Reapply eth0"));
    ASSERT_EQ(way.files.size(), 1U);
    EXPECT_EQ(way.files[0].path, kFile);  // which is saved, for one who takes the change back
    EXPECT_THAT(way.callsAfter, ElementsAre("nmcli connection reload", "nmcli device reapply eth0"));
}

HOST_TEST_F(KeptByManager, IsAsBeforeWhenItIsNotInForce) {
    deeds_.errors["Reapply"] = "Can't\n\033[2J reapply";
    const std::string told = refusal();
    EXPECT_THAT(told, HasSubstr("NetworkManager: 'Can't\\x0a\\x1b[2J reapply'"));
    EXPECT_THAT(told, HasSubstr("; and taking it back: NetworkManager: "));
    EXPECT_EQ(host.read(kFile), std::string(kBefore));
    struct stat found {};
    ASSERT_EQ(stat(kFile, &found), 0);
    EXPECT_EQ(found.st_mode & 07777U, 0600U);
    EXPECT_THAT(manager().calls(), ElementsAre(std::string("Update2 ") + kProfile + " to-disk",
                                               std::string("LoadConnections ") + kFile));
}

HOST_TEST_F(KeptByManager, IsNotTouchedWhereItRefuses) {
    deeds_.errors["Update2"] = "ipv4.gateway: not with never-default";
    EXPECT_EQ(refusal(), "NetworkManager: 'ipv4.gateway: not with never-default'");
    EXPECT_THAT(manager().calls(), IsEmpty());
    EXPECT_EQ(host.read(kFile), std::string(kBefore));
}

HOST_TEST_F(KeptByManager, IsAsBeforeWhenASecretIsLost) {
    deeds_.secrets["802-1x"] = [](Writer& writer, bool isUpdated) {
        putSecret(writer, isUpdated ? "" : "geheim");
    };
    EXPECT_EQ(refusal(), "NetworkManager has changed '802-1x.password' of the connection, too");
    EXPECT_EQ(host.read(kFile), std::string(kBefore));
    EXPECT_THAT(manager().calls(), testing::Contains(std::string("LoadConnections ") + kFile));
}

HOST_TEST_F(KeptByManager, IsNotTouchedWhereItsSecretsAreNotKnown) {
    deeds_.errors["GetSecrets"] = "not allowed";
    EXPECT_EQ(refusal(), "NetworkManager: 'not allowed'");
    EXPECT_THAT(manager().calls(), IsEmpty());
}

HOST_TEST_F(KeptByManager, MayLeaveItsSecretsToOthers) {
    deeds_.secrets.clear();
    EXPECT_EQ(refusal(), "");
}

/// An answer without an error is not enough.
HOST_TEST_F(KeptByManager, IsLookedAtAgain) {
    deeds_.takes = false;
    EXPECT_EQ(refusal(), "NetworkManager has not taken what it was given");
    EXPECT_EQ(host.read(kFile), std::string(kBefore));
}

HOST_TEST_F(KeptByManager, HasItInItsFile) {
    deeds_.onUpdate = [] {};
    EXPECT_EQ(refusal(), std::string("NetworkManager has not written ") + kFile);
    EXPECT_THAT(manager().calls(),
                ElementsAre(std::string("Update2 ") + kProfile + " to-disk",
                            std::string("LoadConnections ") + kFile, std::string("Reapply ") + kDevice));
}

HOST_TEST_F(KeptByManager, IsNotChangedBehindSomebodysBack) {
    const Way way = KeptByManager::way();
    Wish other;
    other.ipv4.prefix = 25;
    go(wayToKeep({"eth0", 3}, cvagent::keep::keeperOf({"eth0", 3}), other));
    const auto calls = manager().calls().size();
    EXPECT_THROW(go(way), CannotKeep);
    EXPECT_EQ(manager().calls().size(), calls);
}

HOST_TEST_F(KeptByManager, IsRefusedWhereItsSettingsAreNotAFiles) {
    for (const char* file : {"", "/run/NetworkManager/system-connections/x.nmconnection",
                             "/etc/NetworkManager/system-connections/../x",
                             "/etc/NetworkManager/system-connections/\033[2J.nmconnection",
                             "/etc/NetworkManager/system-connections/",
                             "/usr/lib/NetworkManager/system-connections/x.nmconnection",
                             "/etc/sysconfig/network-scripts/ifcfg-eth0"}) {
        objects_[std::string(kProfile) + " Filename"] = std::string(file);
        const MockManager other(address(), {{"eth0", kDevice}}, objects_, deeds_);
        try {
            wayToKeep({"eth0", 3}, {"eth0", {{"NetworkManager", "", file}}, {}}, {});
            ADD_FAILURE() << file;
        } catch (const CannotKeep& cannot) {
            EXPECT_THAT(cannot.what(),
                        HasSubstr(*file == '\0' ? "is in memory only" : "is not from a file in"))
                << file;
        }
    }
}

HOST_TEST_F(KeptByManager, IsRefusedWhereMemoryAndFileDiffer) {
    for (const std::uint32_t flag : {1U, 2U, 4U, 8U}) {
        objects_[std::string(kProfile) + " Flags"] = flag;
        const MockManager other(address(), {{"eth0", kDevice}}, objects_, deeds_);
        EXPECT_THROW(wayToKeep({"eth0", 3}, {"eth0", {{"NetworkManager", "", kFile}}, {}}, {}), CannotKeep)
            << flag;
    }
    host.remove(kFile);
    host.symlink(kFile, "/srv/x");
    objects_[std::string(kProfile) + " Flags"] = 0U;
    EXPECT_THAT(refusal(), HasSubstr("is not from a file in"));
}

HOST_TEST_F(KeptByManager, IsRefusedWhereItSaysMoreThanIsUnderstood) {
    deeds_.settings = [](Writer& writer) { putSettings(writer, "colour"); };
    EXPECT_EQ(refusal(), "an address of the connection has the attribute 'colour'");
    EXPECT_THAT(manager().calls(), IsEmpty());
}

HOST_TEST_F(KeptByManager, IsNotBelievedWithSettingsOfAnotherType) {
    deeds_.settings = [](Writer& writer) {
        writer.array("{sa{sv}}", [&] {
            putSetting(writer, "ipv4", [&] {
                writer.entry("sv", [&] { writer.put("method").variant("u", [&] { writer.put(7U); }); });
            });
        });
    };
    EXPECT_THAT(refusal(), HasSubstr("something else than was expected"));
}

HOST_TEST_F(KeptByManager, IsWaitedForTwoSecondsWithAQuestion) {
    deeds_.silent.insert("GetSettings");
    EXPECT_EQ(refusal(), "org.freedesktop.NetworkManager has not answered for 2 s");
    EXPECT_THAT(manager().calls(), IsEmpty());
}

/// The whole program, on links of a real kernel.
class SetAndKeptByManager : public KeptByManager {
protected:
    void setUpHost(FakeHost& host) override {
        KeptByManager::setUpHost(host);
        for (const char* tool : {"ip", "ifconfig", "hostname"}) {
            host.realTool(tool);
        }
        host.useKernelNetwork();
        for (const char* words :
             {"link add eth0 type veth peer name sw0", "address add 192.0.2.10/24 dev eth0 noprefixroute",
              "address add 198.51.100.5/24 dev eth0 noprefixroute", "link set sw0 up", "link set eth0 up",
              "route add 192.0.2.0/24 dev eth0 proto kernel src 192.0.2.10 metric 100",
              "route add 198.51.100.0/24 dev eth0 proto kernel src 198.51.100.5 metric 100"}) {
            ip(host, words);
        }
        deeds_.onReapply = [] {
            [[maybe_unused]] const int status = std::system(
                "ip address del 192.0.2.10/24 dev eth0; ip address add 192.0.2.77/24 dev eth0 noprefixroute; "
                "ip route add 192.0.2.0/24 dev eth0 proto kernel src 192.0.2.77 metric 100; "
                "grep -q Generated /etc/resolv.conf && echo nameserver 192.0.2.9 >> /etc/resolv.conf");
        };
        manager();
    }
    static std::string ip(FakeHost& host, const std::string& words) {
        const Finished done = host.run({"sh", "-c", "ip " + words});
        EXPECT_EQ(done.status, 0) << words << ": " << done.err;
        return done.out;
    }
};

HOST_TEST_F(SetAndKeptByManager, APlanShowsIt) {
    const Finished run = host.run({CVAGENT_PROGRAM, "plan", "ip-config:eth0", "IPv4Address", "192.0.2.77"});
    EXPECT_THAT(run.out, HasSubstr("NetworkManager Update2 'my lan': ipv4.addresses '192.0.2.10/24' -> "
                                   "'192.0.2.77/24'  (not tried)\n"));
    EXPECT_THAT(run.out, HasSubstr("NetworkManager Reapply eth0  (not tried)\n"));
    EXPECT_THAT(run.out, HasSubstr("+ address eth0 192.0.2.77/24\n"));
    EXPECT_THAT(manager().calls(), IsEmpty());
    EXPECT_EQ(host.read(kFile), std::string(kBefore));
}

HOST_TEST_F(SetAndKeptByManager, NameServersOfALeaseStandBehindTheWantedOnes) {
    host.file("/etc/hosts", "127.0.0.1\tlocalhost\n");  // so that nobody asks a name server
    host.file("/etc/hostname", "localhost\n");
    host.file("/etc/resolv.conf", "# Generated by NetworkManager\nnameserver 192.0.2.1\n");
    const Finished run = host.run({CVAGENT_PROGRAM, "set", "ip-config:eth0", "DNSServers", "192.0.2.54"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.err, HasSubstr("kept over a restart by NetworkManager"));
    EXPECT_EQ(host.read("/etc/resolv.conf"),
              "# Generated by NetworkManager\nnameserver 192.0.2.54\nnameserver 192.0.2.9\n");
    host.file("/tmp/changes",
              R"([{"node": "ip-config:eth0", "property": "DNSServers", "value": ["192.0.2.54"]}])");
    EXPECT_EQ(host.run({CVAGENT_PROGRAM, "diff", "/tmp/changes"}).status, 0);
}

/// An address set with no route of the kernel's has one of NetworkManager's, in the kernel's name.
HOST_TEST_F(SetAndKeptByManager, AnAddressIsInItsProfileAndInForce) {
    const Finished run = host.run({CVAGENT_PROGRAM, "set", "ip-config:eth0", "IPv4Address", "192.0.2.77"});
    EXPECT_THAT(run.err, HasSubstr(std::string("kept over a restart by NetworkManager, in ") + kFile));
    EXPECT_EQ(run.status, 0);
    EXPECT_EQ(host.read(kFile), std::string(kAfter));
    EXPECT_THAT(ip(host, "-4 -o address show dev eth0"),
                testing::ContainsRegex("^[0-9]+: eth0 +inet 192.0.2.77/24"));
    const std::string routes = ip(host, "route");
    EXPECT_THAT(routes, HasSubstr("192.0.2.0/24 dev eth0 proto kernel scope link src 192.0.2.77 metric 100"));
    EXPECT_THAT(routes,
                HasSubstr("198.51.100.0/24 dev eth0 proto kernel scope link src 198.51.100.5 metric 100"));
}

}  // namespace
