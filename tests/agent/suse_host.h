#pragma once

#include <algorithm>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "tests/support/fake_host.h"

/// A SUSE host with one port and one drive, whose tools print the classic formats, and cvagent with the real
/// plug-in on it.
class SuseHost {
public:
    explicit SuseHost(FakeHost& host) : host_(host) {
        addTools();
        addPort();
        host.setHostName("linux");
        host.file(kInterfaceFile,
                  "# made by hand\nBOOTPROTO='static'\nIPADDR=192.0.2.10\nNETMASK=255.255.255.0\n"
                  "STARTMODE='onboot'\n");
        host.file("/etc/sysconfig/network/config", "A=1\nNETCONFIG_DNS_POLICY=\"\"\nB=2\n");
        host.file("/etc/sysconfig/network/routes", "default\t192.0.2.1\t-\n");
        host.file("/etc/sysconfig/clock", "HWCLOCK=\"-u\"\nTIMEZONE=\"UTC\"\n");
        host.file("/etc/resolv.conf", "# resolver\nsearch example.com\nnameserver 192.0.2.53\n");
        host.file("/etc/hosts", "127.0.0.1\tlocalhost\n");
        host.file("/etc/HOSTNAME", "linux.example.com");
    }

    /// Runs cvagent and gives the commands that it ran beside those that only look.
    Finished run(const std::vector<std::string>& words) {
        host_.clearCalls();
        return host_.run(commandLine(words));
    }
    /// @param variables for its environment, as NAME=VALUE
    std::vector<std::string> commandLine(const std::vector<std::string>& words,
                                         std::vector<std::string> variables = {}) const {
        std::vector<std::string> line = std::move(variables);
        if (!line.empty()) {
            line.insert(line.begin(), "env");
        }
        line.insert(line.end(),
                    {CVAGENT_PROGRAM, "--host-tools", "native", "--plugin", CORVISTA_PLUGIN_FILE});
        line.insert(line.end(), words.begin(), words.end());
        return line;
    }
    /// The commands of the last run that change something, in order.
    std::vector<std::string> changes() const {
        std::vector<std::string> calls = host_.calls();
        std::erase_if(calls, [this](const std::string& call) { return looks_.contains(call); });
        return calls;
    }
    std::string read(const std::string& path) const { return host_.read(path).value_or("(no file)"); }
    FakeHost& host() { return host_; }
    /// From here on one command of the host changes what another one answers.
    void follows(const std::string& question, const std::string& now, const std::string& change,
                 const std::string& then) const {
        const std::string answer = "/var/answers/" + std::to_string(answers_++);
        host_.file(answer, now);
        host_.file(answer + ".then", then);
        host_.tool(question, ToolAnswer{.out = "", .action = "cat " + answer});
        host_.tool(change, ToolAnswer{.out = "", .action = "cat " + answer + ".then > " + answer});
    }

    static constexpr const char* kInterfaceFile = "/etc/sysconfig/network/ifcfg-eth-id-02:00:00:aa:bb:01";

private:
    void look(const std::string& command, const std::string& output) {
        looks_.insert(command);
        host_.tool(command, output);
    }
    void addTools() {
        const std::string port =
            "eth0      Link encap:Ethernet  HWaddr 02:00:00:AA:BB:01  \n"
            "          inet addr:192.0.2.10  Bcast:192.0.2.255  Mask:255.255.255.0\n"
            "          inet6 addr: 2001:db8::10/64 Scope:Global\n"
            "          UP BROADCAST RUNNING MULTICAST  MTU:1500  Metric:1\n\n";
        for (const std::string command : {"ifconfig", "ifconfig -a", "ifconfig eth0"}) {
            look(command, port);
        }
        look("ethtool eth0",
             "Settings for eth0:\n\tSupported link modes:   10baseT/Half 10baseT/Full \n\tSpeed: 1000Mb/s\n"
             "\tDuplex: Full\n\tAuto-negotiation: on\n\tSupports Wake-on: g\n\tWake-on: g\n\tLink detected: "
             "yes\n");
        look("route -n",
             "Kernel IP routing table\nDestination     Gateway         Genmask         Flags Metric Ref    "
             "Use Iface\n"
             "0.0.0.0         192.0.2.1       0.0.0.0         UG    0      0        0 eth0\n");
        look("route -A inet6 -n", "Kernel IPv6 routing table\n::/0   fe80::1  UG   1024   0  0 eth0\n");
        look("ip -6 address show dev eth0", "    inet6 2001:db8::10/64 scope global \n");
        look("brctl show", "bridge name\tbridge id\t\tSTP enabled\tinterfaces\n");
        look("hostname", "linux\n");
        look("hostname -s", "linux\n");
        look("hostname -d", "example.com\n");
        look("rpm -qa", "");
        look("fdisk -ls",
             "\nDisk /dev/sda: 80.0 GB, 80026361856 bytes\n\n   Device Boot      Start         End      "
             "Blocks   Id  "
             "System\n/dev/sda1   *           1          13      104391+  83  Linux\n");
    }
    void addPort() {
        host_.file("/proc/net/dev", "Inter-|   Receive\n face |bytes\n  eth0:       1 0 0 0\n");
        host_.file("/proc/cpuinfo", "processor\t: 0\ncpu MHz\t\t: 2394.230\n");
        const std::string link = "/sys/class/net/eth0/";
        for (const auto& [name, content] :
             std::vector<std::pair<std::string, std::string>>{{"type", "1\n"},
                                                              {"flags", "0x1003\n"},
                                                              {"uevent", "INTERFACE=eth0\n"},
                                                              {"ifindex", "2\n"},
                                                              {"iflink", "2\n"},
                                                              {"addr_assign_type", "0\n"},
                                                              {"address", "02:00:00:aa:bb:01\n"}}) {
            host_.file(link + name, content);
        }
        host_.symlink(link + "device", "../../../0000:00:03.0");
    }

    FakeHost& host_;
    mutable int answers_ = 0;
    std::set<std::string> looks_;
};
