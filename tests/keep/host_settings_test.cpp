// How the host's name and its zone are kept.
#include "agent/keep/host_settings.h"

#include <gmock/gmock.h>

#include "tests/support/fake_host.h"

namespace {

using cvagent::keep::CannotKeep;
using cvagent::keep::go;
using cvagent::keep::isNameInOldFile;
using cvagent::keep::Way;
using cvagent::keep::wayOfHostName;
using cvagent::keep::wayOfZone;
using testing::IsEmpty;

constexpr const char* kName = "/etc/hostname";
constexpr const char* kZoneName = "/etc/timezone";
constexpr const char* kAsked = "hostnamectl --no-ask-password --static set-hostname moon.example.com";

std::string whyNot(const std::function<void()>& act) {
    try {
        act();
        return "";
    } catch (const CannotKeep& cannot) {
        return cannot.what();
    }
}

HOST_TEST(HostName, IsInItsFile) {
    host.file(kName, "earth\n", 0640);
    const Way way = wayOfHostName("moon.example.com");
    EXPECT_EQ(host.read(kName), "earth\n");
    go(way);
    EXPECT_EQ(host.read(kName), "moon.example.com\n");
    EXPECT_TRUE(wayOfHostName("moon.example.com").isEmpty());
    go(way.back());
    EXPECT_EQ(host.read(kName), "earth\n");
    host.remove(kName);
    go(wayOfHostName("moon"));
    EXPECT_EQ(host.read(kName), "moon\n");
}

/// As the plug-in has written it through a link from its own file.
HOST_TEST(HostName, MayStandThereInAnotherForm) {
    for (const char* text : {"moon", "# mine\n\nmoon\n", "moon.\n", "moon x\n"}) {
        host.file(kName, text);
        EXPECT_TRUE(wayOfHostName("moon").isEmpty()) << text;
    }
    for (const char* text : {"", "#moon\n", "moon.example.com\n", "\nmoo\nmoon\n"}) {
        host.file(kName, text);
        EXPECT_FALSE(wayOfHostName("moon").isEmpty()) << text;
    }
}

HOST_TEST(HostName, IsNoneThatCouldNotBeReadAgain) {
    for (const char* name : {"", "a b", "a\nb", "$(touch /tmp/x)", "-a", ".a", "a.", "a..b", "a;b",
                             "12345678901234567890123456789012345678901234567890123456789012345"}) {
        EXPECT_NE(whyNot([name] { wayOfHostName(name); }), "") << name;
    }
}

class HostNameByHostnamed : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        host.directory("/run/systemd/system");
        host.file(kName, "earth\n");
        host.tool("/usr/bin/hostnamectl %any", "");
        host.tool(kAsked, {"", 0, "", 0, "echo moon.example.com > /etc/hostname"});
    }
};

HOST_TEST_F(HostNameByHostnamed, IsWrittenByIt) {
    const Way way = wayOfHostName("moon.example.com");
    EXPECT_EQ(way.system, "systemd-hostnamed");
    go(way);
    EXPECT_EQ(host.read(kName), "moon.example.com\n");
    EXPECT_THAT(host.calls(), testing::ElementsAre(kAsked));
    go(way.back());
    EXPECT_EQ(host.read(kName), "earth\n");
}

/// As where the change is only tried on.
HOST_TEST_F(HostNameByHostnamed, IsWrittenAllTheSameWhenItDoesNothing) {
    host.tool(kAsked, "");
    go(wayOfHostName("moon.example.com"));
    EXPECT_EQ(host.read(kName), "moon.example.com\n");
}

HOST_TEST_F(HostNameByHostnamed, IsNotAskedWhereSystemdDoesNotRun) {
    host.remove("/run/systemd/system");
    EXPECT_THAT(wayOfHostName("moon").callsBefore, IsEmpty());
}

HOST_TEST(OldNameFile, CountsWhereThereIsNoOther) {
    EXPECT_FALSE(isNameInOldFile());
    host.file("/etc/HOSTNAME", "earth.example.com");
    EXPECT_TRUE(isNameInOldFile());
    EXPECT_EQ(cvagent::keep::oldNameFileWith("earth.example.com"), "/etc/HOSTNAME");
    EXPECT_EQ(whyNot([] { cvagent::keep::oldNameFileWith("earth"); }), "/etc/HOSTNAME does not have it");
    host.file(kName, "earth\n");
    EXPECT_FALSE(isNameInOldFile());
    host.remove(kName);
    host.directory("/run/systemd/system");
    EXPECT_FALSE(isNameInOldFile());
}

HOST_TEST(Zone, HasItsNameInDebiansFile) {
    host.symlink("/etc/localtime", "/usr/share/zoneinfo/CET");
    EXPECT_THAT(wayOfZone("CET").files, IsEmpty());  // nobody reads such a file there
    host.file(kZoneName, "Etc/UTC\n");
    const Way way = wayOfZone("CET");
    go(way);
    EXPECT_EQ(host.read(kZoneName), "CET\n");
    EXPECT_TRUE(wayOfZone("CET").isEmpty());
    go(way.back());
    EXPECT_EQ(host.read(kZoneName), "Etc/UTC\n");
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST(Zone, IsNotKeptWhereTheLinkDoesNotHaveIt) {
    host.file(kZoneName, "Etc/UTC\n");
    EXPECT_EQ(whyNot([] { wayOfZone("CET"); }), "/etc/localtime does not lead to 'CET'");
    host.symlink("/etc/localtime", "/usr/share/zoneinfo/No/Such");
    EXPECT_EQ(whyNot([] { wayOfZone("No/Such"); }), "/etc/localtime does not lead to 'No/Such'");
    EXPECT_EQ(host.read(kZoneName), "Etc/UTC\n");
}

}  // namespace
