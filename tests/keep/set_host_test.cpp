// The host's own name, its name servers and its zone, kept by what keeps them: with the program.
#include <gmock/gmock.h>
#include <sys/mount.h>

#include <filesystem>
#include <nlohmann/json.hpp>

#include "tests/support/fake_host.h"

namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

constexpr const char* kNode = "ip-config:eth0";
constexpr const char* kCount = "systemctl reset-failed systemd-resolved";
constexpr const char* kReload = "systemctl try-reload-or-restart systemd-resolved";
constexpr const char* kStub = "/run/systemd/resolve/stub-resolv.conf";
constexpr const char* kDropIn = "/etc/systemd/resolved.conf.d/zz-cvagent.conf";

class SetOfHost : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        for (const char* tool : {"ip", "ifconfig", "hostname"}) {
            host.realTool(tool);
        }
        host.useKernelNetwork();
        EXPECT_EQ(host.run({"sh", "-c", "ip link add eth0 type veth peer name sw0"}).status, 0);
        EXPECT_EQ(host.run({"sh", "-c", "ip address add 192.0.2.10/24 dev eth0"}).status, 0);
        host.file("/etc/hosts", "127.0.0.1\tlocalhost\n");
        host.file("/etc/hostname", "localhost\n");
        host.file("/etc/resolv.conf", "nameserver 192.0.2.1\n");
    }
    static Finished cvagent(FakeHost& host, std::vector<std::string> words) {
        words.insert(words.begin(), CVAGENT_PROGRAM);
        return host.run(words);
    }
};

HOST_TEST_F(SetOfHost, ItsNameIsInItsFile) {
    const Finished run = cvagent(host, {"set", kNode, "HostName", "moon"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.err, HasSubstr("kept over a restart in /etc/hostname\n"));
    EXPECT_EQ(host.read("/etc/hostname"), "moon\n");
    const Finished domain = cvagent(host, {"set", kNode, "DomainName", "example.com"});
    EXPECT_THAT(domain.err, HasSubstr("kept over a restart in /etc/hostname\n"));
    EXPECT_EQ(host.read("/etc/hostname"), "moon.example.com\n");
    EXPECT_EQ(host.run({"hostname"}).out, "moon.example.com\n");
}

HOST_TEST_F(SetOfHost, ANameThatTheHostHasNotTakenIsNotKept) {
    host.tool("hostname %any", "localhost\n");
    const Finished run = cvagent(host, {"set", kNode, "HostName", "moon"});
    EXPECT_THAT(run.err, HasSubstr("not kept over a restart: the running host has another name"));
    EXPECT_EQ(host.read("/etc/hostname"), "localhost\n");
}

HOST_TEST_F(SetOfHost, ANameIsTakenBackWithItsFile) {
    ASSERT_EQ(cvagent(host, {"set", kNode, "HostName", "moon", "--confirm-within", "600"}).status, 0);
    EXPECT_EQ(host.read("/etc/hostname"), "moon\n");
    EXPECT_EQ(cvagent(host, {"rollback"}).out, "change 1 is taken back\n");
    EXPECT_EQ(host.read("/etc/hostname"), "localhost\n");
    EXPECT_EQ(host.run({"hostname"}).out, "localhost\n");
}

HOST_TEST_F(SetOfHost, AFileOfAContainersEngineIsTold) {
    host.file("/srv/hostname", "localhost\n");
    ASSERT_EQ(mount("/srv/hostname", "/etc/hostname", nullptr, MS_BIND, nullptr), 0);
    const Finished run = cvagent(host, {"set", kNode, "HostName", "moon"});
    EXPECT_THAT(run.err, HasSubstr("not kept over a restart: cannot write /etc/hostname: "));
    EXPECT_EQ(host.read("/etc/hostname"), "localhost\n");
}

class SetByHostnamed : public SetOfHost {
protected:
    void setUpHost(FakeHost& host) override {
        SetOfHost::setUpHost(host);
        host.directory("/run/systemd/system");
        host.file("/usr/bin/hostnamectl", "");
    }
    static constexpr const char* kCall = "hostnamectl --no-ask-password --static set-hostname moon";
};

HOST_TEST_F(SetByHostnamed, ItsNameIsWrittenByIt) {
    host.tool(kCall, {"", 0, "", 0, "echo moon > /etc/hostname"});
    const Finished run = cvagent(host, {"set", kNode, "HostName", "moon"});
    EXPECT_THAT(run.err, HasSubstr("kept over a restart by systemd-hostnamed, in /etc/hostname\n"));
    EXPECT_EQ(host.read("/etc/hostname"), "moon\n");
    EXPECT_THAT(host.calls(), testing::ElementsAre(kCall));
}

HOST_TEST_F(SetByHostnamed, ItsNameIsKeptWhenThatDoesNotAnswer) {
    host.tool(kCall, "Failed to connect to bus", 1);
    const Finished run = cvagent(host, {"set", kNode, "HostName", "moon"});
    EXPECT_THAT(run.err, HasSubstr("kept over a restart in /etc/hostname\n"));
    EXPECT_EQ(host.read("/etc/hostname"), "moon\n");
}

HOST_TEST_F(SetByHostnamed, APlanShowsIt) {
    const Finished run = cvagent(host, {"plan", kNode, "HostName", "moon"});
    EXPECT_THAT(run.out, AllOf(HasSubstr("--- /etc/hostname\n"), HasSubstr("+moon\n"),
                               HasSubstr("hostnamectl --no-ask-password --static set-hostname moon")));
    EXPECT_THAT(host.calls(), IsEmpty());
    EXPECT_EQ(host.read("/etc/hostname"), "localhost\n");
}

HOST_TEST_F(SetOfHost, NameServersAreInTheFileItself) {
    const Finished run = cvagent(host, {"set", kNode, "DNSServers", "192.0.2.53"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.err, HasSubstr("kept over a restart in /etc/resolv.conf\n"));
}

HOST_TEST_F(SetOfHost, NameServersOfNetworkManagerAreAskedOfWhoKeepsTheInterface) {
    const std::string yaml = "network:\n  ethernets:\n    eth0:\n      addresses: [192.0.2.10/24]\n";
    const std::string index = host.run({"cat", "/sys/class/net/eth0/ifindex"}).out;
    host.file("/etc/resolv.conf", "# Generated by NetworkManager\nnameserver 192.0.2.1\n");
    host.file("/etc/netplan/50-host.yaml", yaml);
    host.file("/run/systemd/netif/links/" + index.substr(0, index.find('\n')),
              "ADMIN_STATE=configured\nNETWORK_FILE=/run/systemd/network/10-netplan-eth0.network\n");
    host.mountOver("/sys/fs/cgroup",
                   [] { ASSERT_EQ(mount("groups", "/sys/fs/cgroup", "tmpfs", 0, nullptr), 0); });
    host.file("/sys/fs/cgroup/system.slice/systemd-networkd.service/cgroup.procs", "312\n");
    const Finished run = cvagent(host, {"set", kNode, "DNSServers", "192.0.2.53"});
    EXPECT_THAT(run.err,
                HasSubstr("not kept over a restart: NetworkManager makes /etc/resolv.conf: "
                          "'/etc/netplan/50-host.yaml': name servers and domains are not written there\n"));
    EXPECT_EQ(host.read("/etc/netplan/50-host.yaml"), yaml);
}

/// ifupdown would have resolvconf make them, which is not there.
HOST_TEST_F(SetOfHost, NameServersOfAnotherMakerAreTold) {
    host.file("/run/network/ifstate", "eth0=eth0\n");
    host.file("/etc/network/interfaces", "iface eth0 inet static\n  address 192.0.2.10/24\n");
    host.file("/etc/resolv.conf", "# Generated by NetworkManager\nnameserver 192.0.2.1\n");
    const Finished run = cvagent(host, {"set", kNode, "DNSServers", "192.0.2.53"});
    EXPECT_THAT(
        run.err,
        HasSubstr(
            "not kept over a restart: NetworkManager makes /etc/resolv.conf, and does not keep 'eth0'\n"));
}

/// As it answers: the stub's address for the C library, and what it uses itself in a file of its own.
class SetByResolved : public SetOfHost {
protected:
    void setUpHost(FakeHost& host) override {
        SetOfHost::setUpHost(host);
        host.mountOver("/sys/fs/cgroup",
                       [] { ASSERT_EQ(mount("groups", "/sys/fs/cgroup", "tmpfs", 0, nullptr), 0); });
        host.file("/sys/fs/cgroup/system.slice/systemd-resolved.service/cgroup.procs", "312\n");
        host.file(kStub, kStubText);
        host.remove("/etc/resolv.conf");
        host.symlink("/etc/resolv.conf", "../run/systemd/resolve/stub-resolv.conf");
        for (const std::string directory : {"", "/usr/bin/"}) {
            host.tool(directory + kCount, "");
            host.tool(directory + kReload, {"", 0, "", 0, kResolved});
        }
    }
    static constexpr const char* kStubText = "nameserver 127.0.0.53\nsearch .\n";
    static constexpr const char* kResolved =
        "printf 'nameserver 127.0.0.53\\nsearch .\\n' > /run/systemd/resolve/stub-resolv.conf\n"
        "sed -n '/^DNS=./s/DNS=/nameserver /p' /etc/systemd/resolved.conf.d/zz-cvagent.conf "
        "> /run/systemd/resolve/resolv.conf 2>/dev/null; "
        "echo nameserver 192.0.2.1 >> /run/systemd/resolve/resolv.conf\n";
};

HOST_TEST_F(SetByResolved, NameServersAreInADropInAndInForce) {
    const Finished run = cvagent(host, {"set", kNode, "DNSServers", "192.0.2.53", "--verify-within", "0.1"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.err,
                HasSubstr(std::string("kept over a restart by systemd-resolved, in ") + kDropIn +
                          "; it uses them now, and /etc/resolv.conf goes on naming only systemd-resolved\n"));
    EXPECT_THAT(host.read(kDropIn).value_or(""), HasSubstr("\nDNS=192.0.2.53\nDomains=~.\n"));
    EXPECT_EQ(host.read(kStub), kStubText);
}

HOST_TEST_F(SetByResolved, WhatItUsesAlreadyIsUnchanged) {
    host.file("/run/systemd/resolve/resolv.conf", "nameserver 192.0.2.53\n");
    host.file("/changes",
              R"([{"node": "ip-config:eth0", "property": "DNSServers", "value": ["192.0.2.53"]}])");
    const Finished run = cvagent(host, {"apply", "/changes", "--yes"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.out, HasSubstr("unchanged"));
    EXPECT_THAT(host.calls(), IsEmpty());
    host.file("/run/systemd/resolve/resolv.conf", "nameserver 192.0.2.1\nnameserver 192.0.2.53\n");
    EXPECT_THAT(cvagent(host, {"diff", "/changes"}).out, HasSubstr("127.0.0.53"));
}

HOST_TEST_F(SetByResolved, NameServersThatItDoesNotUseAreNotInForce) {
    host.tool(kReload, {"", 0, "", 0, "echo nameserver 127.0.0.53 > /run/systemd/resolve/stub-resolv.conf"});
    const Finished run = cvagent(host, {"set", kNode, "DNSServers", "192.0.2.54"});
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(
        run.err,
        HasSubstr("was not changed, or only in part: it is kept for the next start, but the host has"));
}

/// Also where nothing has told beforehand what would be written.
HOST_TEST_F(SetByResolved, TheyAreTakenBackAndItIsTold) {
    ASSERT_EQ(mount("/dev/null", REHEARSAL_PROGRAM, nullptr, MS_BIND, nullptr), 0);
    ASSERT_EQ(cvagent(host, {"set", kNode, "DNSServers", "192.0.2.53", "--confirm-within", "600"}).status, 0);
    ASSERT_TRUE(host.exists(kDropIn));
    host.clearCalls();
    EXPECT_EQ(cvagent(host, {"rollback"}).out, "change 1 is taken back\n");
    EXPECT_FALSE(host.exists("/etc/systemd/resolved.conf.d"));
    EXPECT_EQ(host.read(kStub), kStubText);
    EXPECT_THAT(host.calls(),
                testing::ElementsAre(std::string("/usr/bin/") + kCount, std::string("/usr/bin/") + kReload));
}

HOST_TEST_F(SetByResolved, APlanShowsIt) {
    const Finished run = cvagent(host, {"plan", kNode, "DNSServers", "192.0.2.53"});
    EXPECT_THAT(run.out, AllOf(HasSubstr(kDropIn), HasSubstr("+DNS=192.0.2.53\n"), HasSubstr(kReload)));
    EXPECT_FALSE(host.exists(kDropIn));
    EXPECT_THAT(host.calls(), IsEmpty());
}

HOST_TEST_F(SetOfHost, ItsZoneIsInTheLinkAndInDebiansFile) {
    host.file("/etc/timezone", "Etc/UTC\n");
    host.symlink("/etc/localtime", "/usr/share/zoneinfo/Etc/UTC");
    const Finished run = cvagent(host, {"set", "computer", "TimeZoneOffset", "330"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.err, HasSubstr("kept over a restart in /etc/localtime and /etc/timezone\n"));
    EXPECT_EQ(host.read("/etc/timezone"), "Asia/Kolkata\n");
    EXPECT_THAT(host.clockCalls(), IsEmpty());
    const Finished back =
        cvagent(host, {"set", "computer", "TimeZoneOffset", "540", "--confirm-within", "600"});
    EXPECT_EQ(host.read("/etc/timezone"), "Japan\n") << back.err;
    EXPECT_EQ(cvagent(host, {"rollback"}).out, "change 2 is taken back\n");
    EXPECT_EQ(host.read("/etc/timezone"), "Asia/Kolkata\n");
    EXPECT_EQ(std::filesystem::read_symlink("/etc/localtime"), "/usr/share/zoneinfo/Asia/Kolkata");
    EXPECT_EQ(cvagent(host, {"rollback"}).out, "change 1 is taken back\n") << "without a confirmation";
    EXPECT_EQ(host.read("/etc/timezone"), "Etc/UTC\n");
    EXPECT_EQ(std::filesystem::read_symlink("/etc/localtime"), "/usr/share/zoneinfo/Etc/UTC");
}

HOST_TEST_F(SetOfHost, AZoneThatIsNotThereIsNotKept) {
    host.file("/etc/timezone", "Etc/UTC\n");
    host.mountOver("/usr/share/zoneinfo",
                   [] { ASSERT_EQ(mount("none", "/usr/share/zoneinfo", "tmpfs", 0, nullptr), 0); });
    const Finished run = cvagent(host, {"set", "computer", "TimeZoneOffset", "330"});
    EXPECT_THAT(run.err,
                HasSubstr("not kept over a restart: /etc/localtime does not lead to 'Asia/Kolkata'"));
    EXPECT_EQ(host.read("/etc/timezone"), "Etc/UTC\n");
}

std::string doctor(FakeHost& host, const std::vector<std::string>& options = {}) {
    std::vector<std::string> words = {CVAGENT_PROGRAM, "doctor", "--host-tools", "native"};
    words.insert(words.end(), options.begin(), options.end());
    const Finished run = host.run(words);
    EXPECT_EQ(run.status, 0) << run.err;
    return run.out;
}

HOST_TEST_F(SetOfHost, TheDoctorTellsTheFiles) {
    host.symlink("/etc/localtime", "/usr/share/zoneinfo/Etc/UTC");
    EXPECT_THAT(doctor(host), HasSubstr("  host name     /etc/hostname\n"
                                        "    systemd does not run, or there is no hostnamectl\n"
                                        "  time zone     /etc/localtime\n"
                                        "    it leads to /usr/share/zoneinfo/Etc/UTC\n"
                                        "  name servers  /etc/resolv.conf\n"
                                        "    nobody is known who makes it\n\n"));
    host.file("/etc/timezone", "Etc/UTC\n");
    host.remove("/etc/hostname");
    host.file("/etc/HOSTNAME", "linux\n");
    EXPECT_THAT(doctor(host), AllOf(HasSubstr("  host name     /etc/HOSTNAME\n"),
                                    HasSubstr("  time zone     /etc/localtime and /etc/timezone\n")));
}

HOST_TEST_F(SetOfHost, TheDoctorTellsWhatNobodyKeeps) {
    host.file("/srv/hostname", "localhost\n");
    ASSERT_EQ(mount("/srv/hostname", "/etc/hostname", nullptr, MS_BIND, nullptr), 0);
    host.mountOver("/usr/share", [] { ASSERT_EQ(mount("none", "/usr/share", "tmpfs", 0, nullptr), 0); });
    host.file("/etc/resolv.conf", "# Generated by dhcpcd\n");
    EXPECT_THAT(doctor(host), HasSubstr("  host name     nobody: what is changed holds until restart\n"
                                        "    something is mounted over /etc/hostname\n"
                                        "  time zone     nobody: what is changed holds until restart\n"
                                        "    there is no /usr/share/zoneinfo\n"
                                        "  name servers  nobody: what is changed holds until restart\n"
                                        "    dhcpcd makes /etc/resolv.conf\n\n"));
    host.file("/etc/resolv.conf", "# Generated by NetworkManager\n");
    EXPECT_THAT(doctor(host), HasSubstr("  name servers  NetworkManager\n"
                                        "    /etc/resolv.conf says '# Generated by NetworkManager'; with an "
                                        "interface that it keeps\n"));
}

HOST_TEST_F(SetByHostnamed, TheDoctorTellsIt) {
    EXPECT_THAT(doctor(host), HasSubstr("  host name     systemd-hostnamed\n"
                                        "    systemd runs; it writes /etc/hostname\n"));
}

HOST_TEST_F(SetByResolved, TheDoctorTellsIt) {
    EXPECT_THAT(doctor(host), HasSubstr(std::string("  name servers  systemd-resolved\n"
                                                    "    /etc/resolv.conf leads to ") +
                                        kStub + "\n"));
    const auto json = nlohmann::json::parse(doctor(host, {"--json"}));
    EXPECT_EQ(json["hostKeepers"][2],
              (nlohmann::json{{"setting", "name servers"},
                              {"keeper", "systemd-resolved"},
                              {"evidence", std::string("/etc/resolv.conf leads to ") + kStub}}));
    host.remove("/sys/fs/cgroup/system.slice/systemd-resolved.service/cgroup.procs");
    const auto stopped = nlohmann::json::parse(doctor(host, {"--json"}));
    EXPECT_TRUE(stopped["hostKeepers"][2]["keeper"].is_null());
    EXPECT_THAT(stopped["hostKeepers"][2]["evidence"], HasSubstr("but systemd-resolved does not run"));
}

}  // namespace
