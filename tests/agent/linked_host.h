#pragma once

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/support/fake_host.h"
#include "tests/support/waiting.h"

/// A SUSE host whose port is a link of a real kernel, eth0 at the switch's sw0, and cvagent with the real
/// plug-in on it.
class LinkedHost : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        for (const char* tool : {"ip", "hostname"}) {
            host.realTool(tool);
        }
        host.useKernelNetwork();
        host.setHostName("linux");
        host.file("/etc/HOSTNAME", "linux.example.com");
        host.file("/etc/hosts", "127.0.0.1\tlocalhost\n192.0.2.10\tlinux.example.com linux\n");
        host.file("/etc/resolv.conf", "nameserver 192.0.2.53\n");
        host.file("/etc/sysconfig/network/routes", "default\t192.0.2.1\t-\n");
        host.file("/etc/sysconfig/network/config", "NETCONFIG_DNS_POLICY=\"\"\n");
        for (const std::string words :
             {"link add eth0 type veth peer name sw0", "link set eth0 addrgenmode none",
              "link set sw0 addrgenmode none", "link set eth0 up", "link set sw0 up",
              "address add 192.0.2.10/24 broadcast + dev eth0", "route add default via 192.0.2.1"}) {
            ip(host, words);
        }
        ASSERT_TRUE(carrierComes("eth0") && carrierComes("sw0"));
        std::string hardware = host.run({"cat", "/sys/class/net/eth0/address"}).out;
        hardware.pop_back();
        file_ = "/etc/sysconfig/network/ifcfg-eth-id-" + hardware;
        host.file(file_, "BOOTPROTO=static\nIPADDR=192.0.2.10\nNETMASK=255.255.255.0\n", 0640);
    }

    static std::string ip(FakeHost& host, const std::string& words) {
        const Finished done = host.run({"sh", "-c", "ip " + words});
        EXPECT_EQ(done.status, 0) << words << ": " << done.err;
        return done.out;
    }
    static Finished cvagent(FakeHost& host, std::vector<std::string> words) {
        words.insert(words.begin(), {CVAGENT_PROGRAM, "--plugin", CORVISTA_PLUGIN_FILE});
        return host.run(words);
    }

    std::string file_;  ///< the interface's
};
