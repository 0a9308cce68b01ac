// What our ethtool and brctl print beside what the system's own print, for links of every kind of this
// kernel.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/hosttools/network_namespace.h"

namespace {

struct Links {
    const char* name;
    const char* commands;  ///< the first line says whether this kernel has them
};

class AgainstRealTools : public testing::TestWithParam<Links> {
protected:
    void SetUp() override {
        for (const char* tool : {"ethtool", "brctl", "ip"}) {
            if (!hasProgram(tool)) GTEST_SKIP() << tool << " is not installed";
        }
        if (!canUnshare()) GTEST_SKIP() << "namespaces are not available";
    }

    /// With the namespace's own links in sysfs, too.
    Outcome inside(const std::string& command) const {
        return network_.run({"unshare", "-m", "sh", "-c", "mount -t sysfs none /sys && " + command});
    }
    void expectSame(const std::string& command) const {
        const Outcome real = inside(command);
        const Outcome ours = inside(adapter(command));
        EXPECT_EQ(ours.output, real.output) << command;
        EXPECT_EQ(ours.errors, real.errors) << command;
        EXPECT_EQ(ours.status, real.status) << command;
    }
    const NetworkNamespace& network() const { return network_; }

private:
    NetworkNamespace network_;
};

TEST_P(AgainstRealTools, ToldAlike) {
    const std::string commands = GetParam().commands;
    const std::size_t end = commands.find('\n');
    if (network().shell(commands.substr(0, end)).status != 0) GTEST_SKIP() << "this kernel has no such links";
    const std::string rest = end != commands.npos ? commands.substr(end + 1) : "true";
    ASSERT_EQ(network().shell("set -e\n" + rest).errors, "");
    std::istringstream names(inside("ls -A /sys/class/net").output);
    for (std::string name; std::getline(names, name);) expectSame("ethtool '" + name + "'");
    expectSame("brctl show");
}

constexpr Links kLinks[] = {
    {"loopback", "ip link set lo up"},
    {"no_link", "true"},
    {"veth", "ip link add v0 type veth peer name v1\nip link set v0 up\nip link set v1 up"},
    {"one_end_down", "ip link add v0 type veth peer name v1\nip link set v0 up"},
    {"bridges",
     "ip link add br0 type bridge\nip link add v0 type veth peer name v1\nip link add v2 type veth peer name "
     "v3\n"
     "ip link set v0 master br0\nip link set v2 master br0\nip link set v3 master br0\nip link set br0 up\n"
     "ip link set v0 up\nip link set v1 up\nip link add averylongbridge type bridge stp_state 1 priority "
     "4096\n"
     "ip link set averylongbridge address 02:00:00:00:00:0a\nip link add Z9 type bridge\n"
     "ip tuntap add tap0 mode tap\nip link set tap0 master averylongbridge"},
    {"odd_names",
     "ip link add .br type bridge\nip link add .m type veth peer name .n\nip link set .m master .br\n"
     "ip link add '**' type veth peer name abcdefghijklmno\nip link add '日本語日本' type bridge\n"
     "ip link set abcdefghijklmno master '日本語日本'\nip link set .m up\nip link set .n up"},
    {"bond",
     "ip link add bond0 type bond\nip link add v0 type veth peer name v1\nip link set v0 master bond0\n"
     "ip link set bond0 up\nip link set v1 up"},
    {"vlan",
     "ip link add v0 type veth peer name v1 && ip link add link v0 name v0.10 type vlan id 10\n"
     "ip link set v0 up\nip link set v1 up\nip link set v0.10 up"},
    {"macvlan",
     "ip link add v0 type veth peer name v1 && ip link add link v0 name m0 type macvlan mode bridge\n"
     "ip link set v0 up\nip link set v1 up\nip link set m0 up"},
    {"dummy", "ip link add d0 type dummy\nip link set d0 up"},
    {"ifb", "ip link add f0 type ifb\nip link set f0 up"},
    {"vxlan", "ip link add x0 type vxlan id 5 dstport 4789 remote 10.0.0.1\nip link set x0 up"},
    {"tun_and_tap",
     "ip tuntap add tun0 mode tun\nip tuntap add tap0 mode tap\nip link set tun0 up\nip link set tap0 up"},
};

INSTANTIATE_TEST_SUITE_P(Links, AgainstRealTools, testing::ValuesIn(kLinks),
                         [](const auto& links) { return links.param.name; });

TEST_F(AgainstRealTools, Names) {
    ASSERT_EQ(network()
                  .shell("ip link add v0 type veth peer name v1; ip link property add dev v0 altname "
                         "another_name_of_v0")
                  .errors,
              "");
    for (const std::string& name :
         {std::string("another_name_of_v0"), std::string("nosuch"), std::string("averylongname0123"),
          std::string("v0:1"), std::string("\"\""), std::string("'a b'"), std::string(127, 'x'),
          std::string(128, 'x')}) {
        expectSame("ethtool '" + name + "'");
    }
}

/// The machine's own card.
TEST(RealTools, TellOfThisMachinesCardsWhatTheAdapterTells) {
    if (!hasProgram("ethtool")) GTEST_SKIP() << "ethtool is not installed";
    std::istringstream names(shell("ls /sys/class/net").output);
    for (std::string name; std::getline(names, name);) {
        EXPECT_EQ(shell(adapter("ethtool " + name)).output, shell("ethtool " + name).output);
    }
}

}  // namespace
