// What an adapter is asked for besides goes to the host's own tool.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

#include "tests/hosttools/network_namespace.h"

namespace {

namespace fs = std::filesystem;

using testing::HasSubstr;

/// A directory of scripts that stands behind the adapters' on PATH.
class HandedOver : public testing::Test {
protected:
    void SetUp() override {
        directory_ = testing::TempDir() + "/handed-over." + std::to_string(getpid());
        fs::create_directories(directory_);
        network_.emplace();
    }
    void TearDown() override { fs::remove_all(directory_); }

    const std::string& directory() const { return directory_; }
    /// A tool that prints its name and words.
    void install(const std::string& name, const std::string& script = "") {
        const std::string path = directory_ + "/" + name;
        std::ofstream(path) << "#!/bin/sh\n"
                            << (script.empty() ? "echo host-" + name + " \"$@\"; echo err >&2; exit 7"
                                               : script)
                            << "\n";
        fs::permissions(path, fs::perms::owner_all);
    }
    /// Runs a command with all adapters in front of the scripts, and of nothing else.
    Outcome ask(const std::string& command, const std::string& front = "") {
        std::string path = front;
        for (const auto& entry : fs::directory_iterator(HOSTTOOLS_ADAPTERS))
            path += entry.path().string() + ":";
        return network_->shell("PATH=" + path + directory_ + "; " + command);
    }

private:
    std::string directory_;
    std::optional<NetworkNamespace> network_;
};

constexpr const char* kBeyond[] = {
    "ifconfig lo mtu 1400",
    "ifconfig -s",
    "ifconfig lo 10.0.0.1/8",
    "ifconfig lo hw ether 02:00:00:00:00:01",
    "route",
    "route -e",
    "route add -net 10.9.0.0 netmask 255.255.0.0 reject",
    "route flush",
    "ethtool -i lo",
    "ethtool '*'",
    "ethtool",
    "ethtool --version",
    "brctl show br0",
    "brctl addbr br0",
    "egrep lo /proc/net/dev",
    "egrep -c 'eth|bond|usb' /proc/net/dev",
    "fdisk -x",
};

TEST_F(HandedOver, ToTheHostsOwnToolWithAllWords) {
    for (const char* name : {"ifconfig", "route", "ethtool", "brctl", "egrep", "fdisk"}) install(name);
    for (const std::string command : kBeyond) {
        const Outcome outcome = ask(command);
        std::string plain = command;
        std::erase(plain, '\'');
        EXPECT_EQ(outcome.output, "host-" + plain + "\n");
        EXPECT_EQ(outcome.errors, "err\n") << command;
        EXPECT_EQ(outcome.status, 7) << command;
    }
}

TEST_F(HandedOver, ToNobodyWhereThereIsNoneAndSaysSo) {
    for (const std::string command : kBeyond) {
        const Outcome outcome = ask(command);
        EXPECT_EQ(outcome.output, "") << command;
        EXPECT_NE(outcome.status, 0) << command;
        const std::string tool = command.substr(0, command.find(' '));
        EXPECT_THAT(outcome.errors, HasSubstr(tool + ": not done here: '")) << command;
        EXPECT_THAT(outcome.errors, HasSubstr("', and there is no other " + tool + "\n")) << command;
    }
    EXPECT_THAT(ask("ifconfig lo 10.0.0.1 mtu 1400").errors, HasSubstr("'mtu'"));
    EXPECT_THAT(ask("route add -net 10.9.0.0 netmask 255.255.0.0 reject").errors, HasSubstr("'reject'"));
}

TEST_F(HandedOver, WithTheStreamsAndTheEnvironmentAsTheyAre) {
    install("egrep", "read line; echo \"$line $WORD\"");
    EXPECT_EQ(ask("echo in | WORD=out egrep x").output, "in out\n");
}

TEST_F(HandedOver, ToGrepWhereThereIsNoOtherEgrep) {
    install("grep");
    EXPECT_EQ(ask("egrep -v 'a b' file").output, "host-grep -E -v a b file\n");
    install("egrep");
    EXPECT_EQ(ask("egrep -v 'a b' file").output, "host-egrep -v a b file\n");
}

TEST_F(HandedOver, NeverToThisProgramOrACopyOfIt) {
    const std::string program = fs::canonical(adapter("ifconfig"));
    fs::copy_file(program, directory() + "/ifconfig");
    fs::create_symlink(program, directory() + "/route");
    fs::create_directory(directory() + "/more");
    fs::copy_file(program, directory() + "/more/ifconfig");
    for (const std::string command : {"ifconfig lo mtu 1400", "route -e"}) {
        const Outcome outcome = ask(command, directory() + "/more:");
        EXPECT_EQ(outcome.status, 1) << command;
        EXPECT_THAT(outcome.errors, HasSubstr("and there is no other")) << command;
    }
}

TEST_F(HandedOver, ToNoDirectoryOfPathThatDependsOnTheCurrentOne) {
    install("ifconfig");
    const std::string here = "cd " + directory() + "; ";
    const std::string beside = "../" + fs::path(directory()).filename().string();
    for (const std::string& path : {std::string(), std::string("."), std::string("bin:."), beside}) {
        const Outcome outcome = shell(here + "PATH=" + path + " " + adapter("ifconfig lo mtu 1400"));
        EXPECT_EQ(outcome.output, "") << path;
        EXPECT_EQ(outcome.status, 1) << path;
    }
}

TEST_F(HandedOver, NothingThatIsDoneHere) {
    for (const char* name : {"ifconfig", "route", "ethtool", "brctl", "egrep", "fdisk"}) install(name);
    for (const std::string command :
         {"ifconfig lo", "ifconfig nosuch", "ifconfig ''", "route -n", "ethtool lo", "ethtool nosuch",
          "brctl show", "egrep 'eth|bond|usb' /proc/net/dev", "route add default gw 10.0.0.1 gw 10.0.0.2",
          "ifconfig lo netmask"}) {
        const Outcome outcome = ask(command);
        EXPECT_THAT(outcome.output, testing::Not(HasSubstr("host-"))) << command;
        EXPECT_NE(outcome.status, 7) << command;
    }
}

}  // namespace
