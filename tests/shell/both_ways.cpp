#include "tests/shell/both_ways.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <fstream>
#include <ostream>
#include <sstream>

#include "agent/shell/runner.h"

namespace both_ways {

namespace {

/// While it lives, standard error goes to a file or nowhere.
class ErrorOutput {
public:
    explicit ErrorOutput(Complaints complaints) : before_(fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, 3)) {
        const char* const path = complaints == Complaints::seen ? kFile : "/dev/null";
        const int file = open(path, O_WRONLY | O_CREAT | O_TRUNC | O_APPEND, 0600);
        dup2(file, STDERR_FILENO);
        close(file);
    }
    ~ErrorOutput() {
        dup2(before_, STDERR_FILENO);
        close(before_);
    }
    static std::string text() {
        std::ostringstream text;
        text << std::ifstream(kFile).rdbuf();
        return text.str();
    }

private:
    static constexpr const char* kFile = "/var/complaints";
    int before_;
};

std::string readAll(FILE* stream) {
    std::string text;
    std::array<char, 4096> buffer{};
    for (std::size_t got = 0; (got = fread(buffer.data(), 1, buffer.size(), stream)) > 0;) {
        text.append(buffer.data(), got);
    }
    return text;
}

}  // namespace

void PrintTo(const Ran& ran, std::ostream* stream) {
    *stream << "status " << ran.status << ", out \"" << ran.out << "\", err \"" << ran.err << '"';
}

Ran inShell(const std::string& command, Complaints complaints) {
    // The C library's: the tests' own runs what a shell is to run as the product does.
    static const auto original =
        reinterpret_cast<FILE* (*)(const char*, const char*)>(dlsym(RTLD_NEXT, "popen"));
    Ran ran;
    {
        const ErrorOutput redirected(complaints);
        FILE* const pipe = original(command.c_str(), "r");
        ran.out = readAll(pipe);
        ran.status = pclose(pipe);
    }
    ran.err = complaints == Complaints::seen ? ErrorOutput::text() : "";
    ran.inShell = true;
    return ran;
}

Ran direct(const std::string& command, Complaints complaints) {
    Ran ran;
    {
        const ErrorOutput redirected(complaints);
        const auto stream = cvagent::shell::openCommand(command.c_str());
        ran.inShell = !stream;
        if (stream) {
            ran.out = readAll(*stream);
            ran.status = cvagent::shell::closeCommand(*stream).value_or(-1);
        }
    }
    ran.err = complaints == Complaints::seen ? ErrorOutput::text() : "";
    return ran;
}

std::vector<std::string> productCommands(const std::string& name) {
    const std::string hardware =
        "ifconfig " + name + " 2> /dev/null |grep HWaddr |awk '{print $5}'|tr '[A-Z]' '[a-z]'";
    const std::string bonding = "cat /proc/net/bonding/" + name + " 2> /dev/null | grep ";
    std::vector<std::string> commands = {
        "fdisk -ls 2>/dev/null > /tmp/fdisk_tmp",
        "cat /tmp/fdisk_tmp | grep ^Disk",
        "cat /tmp/fdisk_tmp | grep ^Disk |md5sum |awk '{print $1}'",
        "cat /tmp/fdisk_tmp | grep ^/dev |sha1sum |awk '{print $1}'",
        "rm /tmp/fdisk_tmp 2> /dev/null",
        "rm /tmp/fdisk_tmp 2> /dev/null",
        "hostname 2> /dev/null",
        "hostname -s 2> /dev/null",
        "hostname -d 2> /dev/null",
        "echo \"Disk /dev/sda: 80.0 GB, 80026361856 bytes\" | cut -d \" \" -f2",
        "echo \"/dev/sda1   *        2048   156301311    78149632   83  Linux\" |  tr -s '*' ' '  | cut -d ' "
        "' -f4",
        "echo \"    inet6 2001:db8::7/64 scope global\n\" | tr -s ' ' | cut -d ' ' -f3 2> /dev/null",
        "echo 2001:db8::a00:7 | cut -d: -f4 2> /dev/null",
        "cat /etc/vmware-release | grep 4",
        "egrep 'eth|bond|usb' /proc/net/dev > /tmp/__tmp; brctl show |grep -vw 'bridge name' >>/tmp/__tmp 2> "
        "/dev/null; cat /tmp/__tmp; rm /tmp/__tmp",
        "brctl show | awk '{print $NF}' | grep -v interfaces",
        "route -n | grep \"^0.0.0.0\" | tr -s ' ' | cut -d ' ' -f2 2> /dev/null",
        "route -n | grep " + name + " | tr -s ' ' 2> /dev/null",
        "route -A inet6 -n 2> /dev/null | grep " + name +
            " | grep UG | tr -s ' ' | cut -d ' ' -f2 2> /dev/null",
        "route -A inet6 -n 2> /dev/null | grep " + name +
            " | grep UG | grep -v UGDA | tr -s ' ' | cut -d ' ' -f2 2> /dev/null",
        "ifconfig > /tmp/CVIfconfig.txt",
        "cat /tmp/CVIfconfig.txt | grep " + name,
        "rm -rf /tmp/CVIfconfig.txt",
        "rm -rf /tmp/CVIfconfig.txt",
        "ifconfig | grep " + name,
        "ifconfig | grep " + name + " 2> /dev/null",
        "ifconfig -a | grep " + name + " 2> /dev/null",
        hardware + " 2> /dev/null",
        "ifconfig " + name +
            " 2> /dev/null | grep \"Scope:\" | tr -s ' ' | cut -d ' ' -f5 | cut -d ':' -f2 2> /dev/null",
        "ifconfig " + name +
            " 2> /dev/null | grep \"inet addr:\" | tr -s ' ' | cut -d: -f2 | cut -d ' ' -f1 2> /dev/null",
        "ifconfig " + name + " 2> /dev/null | grep \"inet addr:\" | tr -s ' ' | cut -d: -f4 2> /dev/null",
        "ip -6 address show dev " + name + " | grep \"global\"",
        "cat /var/lib/dhcpcd/dhcpcd-" + name + ".info 2> /dev/null",
        "cat /var/lib/dhcpv6/client6.leases* 2> /dev/null | grep SDUID | cut -d ' ' -f3 2> /dev/null",
        "cat /var/lib/dhcpcd/dhcpcd-" + name +
            ".info 2> /dev/null | grep DHCPSID | cut -d '=' -f2 2> /dev/null",
        "ethtool " + name + " 2> /dev/null | grep Speed | tr -s ' ' | cut -d ' ' -f2 2> /dev/null",
        "ethtool " + name + " 2> /dev/null | grep Duplex",
        "ethtool " + name + " 2> /dev/null | grep Auto-negotiation",
        "ethtool " + name + " 2> /dev/null | grep \"Link detected\"",
        "ethtool " + name + " 2> /dev/null | grep \"Supported link modes\" | tr -s ' ' | cut -d ' ' -f4",
        "ethtool " + name + " 2> /dev/null | grep \"Wake-on\"",
        bonding + "\"MII Status:\"",
        bonding + "\"Slave Interface:\"",
        bonding + "\"Slave Interface: \" 2> /dev/null",
        bonding + "\"Slave Interface: \" | cut -d ':' -f2 2> /dev/null",
        bonding + "\"Bonding Mode: \" | cut -d ':' -f2 2> /dev/null",
        bonding + "-i \"Currently Active Slave: ETH0\" 2> /dev/null",
        bonding +
            "-P \"Slave Interface: eth0\\nMII Status\" 2> /dev/null | grep \"MII Status: \" 2> /dev/null | "
            "cut -d' ' -f3 2> /dev/null",
        bonding +
            "-P \"Slave Interface: eth0\\nMII Status: up\\n\" 2> /dev/null | grep \"Link Failure Count: \" "
            "2> /dev/null | cut -d ' ' -f4 2> /dev/null",
        "/usr/sbin/vpdupdate 2> /dev/null",
    };
    for (const char* key : {"MASTER", "SLAVE", "BOOTPROTO", "MTU="}) {
        commands.push_back("cat /etc/sysconfig/network/ifcfg-eth-id-`" + hardware + "` | grep " + key +
                           " | cut -d '=' -f2 2> /dev/null");
    }
    return commands;
}

}  // namespace both_ways
