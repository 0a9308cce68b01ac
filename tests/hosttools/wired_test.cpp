#include "hosttools/wired.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <net/if_arp.h>

#include "tests/hosttools/host_tree.h"
#include "tests/hosttools/network_namespace.h"

namespace {

using hosttools::haveClassicNames;
using hosttools::Interfaces;
using hosttools::Link;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

const std::string kHeader =
    "Inter-|   Receive                                                |  Transmit\n"
    " face |bytes    packets errs drop fifo frame compressed multicast|bytes    packets errs\n";

/// A host whose interfaces stand in sysfs.
class Wired : public testing::Test {
protected:
    /// @param files what stands in its directory besides the type, name to content
    void add(const std::string& name, const std::map<std::string, std::string>& files,
             unsigned type = ARPHRD_ETHER) {
        const std::string directory = "sys/class/net/" + name + "/";
        tree_.addBytes(directory + "type", std::to_string(type) + "\n");
        for (const auto& [file, content] : files) tree_.addBytes(directory + file, content);
        devices_ +=
            (name.size() < 6 ? std::string(6 - name.size(), ' ') : "") + name + ": 17 1 0 0 0 0 0 0 18 2\n";
    }
    void addHardware(const std::string& name) { add(name, {{"device/vendor", "0x8086\n"}}); }
    void addVeth(const std::string& name, const std::map<std::string, std::string>& more = {}) {
        std::map<std::string, std::string> files = {{"ifindex", "5\n"}, {"iflink", "9\n"}};
        files.insert(more.begin(), more.end());
        add(name, files);
    }

    std::string lines() const { return wiredLines(devices_, tree_.root() + "/sys/class/net", known_); }
    /// The names in the lines.
    std::vector<std::string> names() const {
        std::vector<std::string> found;
        std::istringstream in(lines());
        for (std::string line; std::getline(in, line);) {
            const std::string name = line.substr(0, line.find(':'));
            found.push_back(name.substr(name.find_first_not_of(' ')));
        }
        return found;
    }
    bool areClassic() const { return haveClassicNames(devices_, tree_.root() + "/sys/class/net", known_); }
    void know(const std::string& name, const std::string& kind, const std::string& memberOf = "") {
        Link link;
        link.name = name;
        link.kind = kind;
        link.memberOf = memberOf;
        known_.links.push_back(link);
    }

    std::string devices_ = kHeader;
    Interfaces known_;

private:
    HostTree tree_;
};

TEST_F(Wired, TodaysNamesOfHardware) {
    for (const char* name :
         {"enp0s31f6", "ens18", "eno1np0", "enx001122334455", "wan0", "em1", "p1p2", "lan"}) {
        addHardware(name);
    }
    EXPECT_THAT(names(), ElementsAre("enp0s31f6", "ens18", "eno1np0", "enx001122334455", "wan0", "em1",
                                     "p1p2", "lan"));
    EXPECT_FALSE(areClassic());
}

TEST_F(Wired, LinesAreTheKernelsOwnInItsOrder) {
    addHardware("zz");
    add("lo", {}, ARPHRD_LOOPBACK);
    addHardware("exactly15chars0");
    EXPECT_EQ(lines(), "    zz: 17 1 0 0 0 0 0 0 18 2\nexactly15chars0: 17 1 0 0 0 0 0 0 18 2\n");
    devices_ = kHeader + "    zz:17 1\n  lo: 1\nexactly15chars0:99 2";
    EXPECT_EQ(lines(), "    zz:17 1\nexactly15chars0:99 2\n") << "older kernels print no blank there";
}

TEST_F(Wired, VLANsAndBondsWhateverTheirName) {
    add("vlan10", {{"uevent", "DEVTYPE=vlan\nINTERFACE=vlan10\n"}, {"lower_ens18/type", "1\n"}});
    add("uplink", {{"uevent", "DEVTYPE=bond\n"}, {"bonding/mode", "active-backup 1\n"}});
    add("oldbnd", {{"bonding/mode", "balance-rr 0\n"}});
    EXPECT_THAT(names(), ElementsAre("vlan10", "uplink", "oldbnd"));
}

TEST_F(Wired, USBLinks) {
    add("usb0", {{"uevent", "DEVTYPE=gadget\n"}, {"device/x", ""}});
    add("ncm0", {{"device/x", ""}});
    EXPECT_THAT(names(), ElementsAre("usb0", "ncm0"));
}

TEST_F(Wired, WirelessStaysOutWhateverItsName) {
    add("wlp3s0", {{"uevent", "DEVTYPE=wlan\n"}, {"device/x", ""}, {"phy80211/name", "phy0\n"}});
    add("wlbond0", {{"device/x", ""}, {"wireless/x", ""}});
    add("eth5", {{"device/x", ""}, {"phy80211/name", "phy1\n"}});
    add("wwan0", {{"uevent", "DEVTYPE=wwan\n"}, {"device/x", ""}});
    EXPECT_THAT(names(), IsEmpty());
    EXPECT_TRUE(areClassic()) << "of wired interfaces there is none";
}

TEST_F(Wired, TunnelsStayOutWhateverTheirName) {
    add("tap0", {{"tun_flags", "0x1002\n"}});
    add("tapeth0", {{"tun_flags", "0x1002\n"}});
    add("vxlan-eth0", {{"uevent", "DEVTYPE=vxlan\n"}});
    add("gre-bond", {}, ARPHRD_IPGRE);
    add("sit-usb0", {}, ARPHRD_SIT);
    add("etherip0", {});
    know("etherip0", "gretap");
    add("wg-eth", {{"uevent", "DEVTYPE=wireguard\n"}}, ARPHRD_NONE);
    EXPECT_THAT(names(), IsEmpty());
}

TEST_F(Wired, VethsButNoBridgesMember) {
    addVeth("uplink0");
    addVeth("veth1a2b3c", {{"brport/state", "3\n"}});
    addVeth("vethovs");
    know("vethovs", "veth", "openvswitch");
    addVeth("ceth0");
    know("ceth0", "veth");
    addVeth("same", {{"lower_x/type", "1\n"}});
    know("same", "veth");
    EXPECT_THAT(names(), ElementsAre("uplink0", "ceth0", "same"));
}

TEST_F(Wired, OtherKindsByTheirName) {
    add("dummy0", {{"ifindex", "5\n"}, {"iflink", "5\n"}});
    add("ethdummy", {{"ifindex", "6\n"}, {"iflink", "6\n"}});
    add("mac0", {{"uevent", "DEVTYPE=macvlan\n"},
                 {"lower_ens18/type", "1\n"},
                 {"ifindex", "7\n"},
                 {"iflink", "2\n"}});
    add("ethmac", {{"lower_ens18/type", "1\n"}, {"ifindex", "8\n"}, {"iflink", "2\n"}});
    add("br0", {{"uevent", "DEVTYPE=bridge\n"}, {"bridge/stp_state", "0\n"}});
    add("ib0", {{"device/x", ""}}, ARPHRD_INFINIBAND);
    EXPECT_THAT(names(), ElementsAre("ethdummy", "ethmac"));
    EXPECT_TRUE(areClassic());
    addHardware("ens18");
    EXPECT_THAT(names(), ElementsAre("ethdummy", "ethmac", "ens18")) << "another card takes nothing away";
    EXPECT_FALSE(areClassic());
}

TEST_F(Wired, ClassicHostsHaveClassicNames) {
    for (const char* name : {"eth0", "eth10", "usb0"}) addHardware(name);
    add("eth0.10", {{"uevent", "DEVTYPE=vlan\n"}});
    add("bond0", {{"uevent", "DEVTYPE=bond\n"}});
    add("br0", {{"uevent", "DEVTYPE=bridge\n"}});
    addVeth("veth7", {{"brport/state", "3\n"}});
    EXPECT_TRUE(areClassic());
    addHardware("et0");
    EXPECT_FALSE(areClassic());
}

TEST_F(Wired, WithoutSysfsTheNameDecides) {
    devices_ = kHeader + "  eth0: 1\n ens18: 1\n../../eth: 1\n .eth: 1\nno colon eth\n : 1\n";
    EXPECT_EQ(lines(), "  eth0: 1\n .eth: 1\n");
    EXPECT_TRUE(areClassic());
    devices_ = "";
    EXPECT_EQ(lines(), "");
}

TEST_F(Wired, OnTheKernelsOwnLinks) {
    if (!canUnshare()) GTEST_SKIP() << "namespaces are not available";
    const NetworkNamespace network;
    EXPECT_EQ(network
                  .shell("set -e; ip link add ens18 type veth peer name far0; ip link add br0 type bridge\n"
                         "ip link add vethc1 type veth peer name inner; ip link set vethc1 master br0\n"
                         "ip link add vxeth type vxlan id 5 dstport 4789 remote 10.0.0.1\n"
                         "ip tuntap add tapeth mode tap; ip link add link ens18 name ethmac type macvlan\n"
                         "ip link add link ens18 name mac0 type macvlan")
                  .errors,
              "");
    const auto ask = [&](const std::string& command) {
        return network.run({"unshare", "-m", "sh", "-c", "mount -t sysfs none /sys && " + command});
    };
    const Outcome found =
        ask(adapter("egrep 'eth|bond|usb' /proc/net/dev | cut -d: -f1 | tr -d ' ' | sort | xargs"));
    EXPECT_EQ(found.output, "ens18 ethmac far0 inner\n");
    const Outcome own = ask("grep -E '^ *(ens18|ethmac|far0|inner):' /proc/net/dev");
    EXPECT_EQ(ask(adapter("egrep 'eth|bond|usb' /proc/net/dev")).output, own.output);
    EXPECT_EQ(network
                  .shell("ip link del ens18; ip link del vethc1; " +
                         adapter("egrep 'eth|bond|usb' /proc/net/dev; echo $?"))
                  .output,
              "1\n");
}

}  // namespace
