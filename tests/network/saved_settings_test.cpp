#include "network/saved_settings.h"

#include <sys/mount.h>
#include <unistd.h>

#include <cstdlib>

#include "tests/network/killed_writer.h"
#include "tests/support/command_lines.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/no_descriptors.h"
#include "tests/support/texts_are.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr char kData[] = "/opt/vantrel/corvista/data";
constexpr char kEth0[] = "/opt/vantrel/corvista/data/ifcfg-eth0";
constexpr char kListing[] = "ls /opt/vantrel/corvista/data/ifcfg-* 2> /dev/null";

HOST_TEST(SavedSettings, AreOneSortedLineAKey) {
    host.directory(kData);
    IC::createSettingData("eth0", {{"IPv4ADDR", "10.0.0.7"},
                                   {"NETMASK", "255.255.255.0"},
                                   {"IPV6ADDR", "fd00::7"},
                                   {"PREFIX", "64"},
                                   {"HOSTNAME", "host"},
                                   {"DOMAINNAME", "example.com"},
                                   {"DNSSERVERS", "10.0.0.1 10.0.0.2 "},
                                   {"DNSSUFFIXES", "a.example "},
                                   {"BOOTPROTO", "static"},
                                   {"GATEWAY", "10.0.0.1"},
                                   {"IPV6GATEWAY", ""},
                                   {"CONFIG_NAME", "eth0"}});
    EXPECT_EQ(host.read(kEth0),
              "BOOTPROTO=static\nCONFIG_NAME=eth0\nDNSSERVERS=10.0.0.1 10.0.0.2 \nDNSSUFFIXES=a.example \n"
              "DOMAINNAME=example.com\nGATEWAY=10.0.0.1\nHOSTNAME=host\nIPV6ADDR=fd00::7\nIPV6GATEWAY=\n"
              "IPv4ADDR=10.0.0.7\nNETMASK=255.255.255.0\nPREFIX=64\n");
}

HOST_TEST(SavedSettings, ReplaceTheFileWhole) {
    host.file(kEth0, "OLD=a value that is much longer than all of the new file\n");
    IC::createSettingData("eth0", {{"K", "v"}});
    EXPECT_EQ(host.read(kEth0), "K=v\n");
    IC::createSettingData("eth0", {});
    EXPECT_EQ(host.read(kEth0), "");
}

HOST_TEST(SavedSettings, LoseTheLineBreaksAtAValuesEnd) {
    host.directory(kData);
    IC::createSettingData("eth0", {{"A", "one\n"}, {"B", "two\n\n"}, {"C", "\n"}, {"D", "in\nside"}});
    EXPECT_EQ(host.read(kEth0), "A=one\nB=two\nC=\nD=in\nside\n");
}

HOST_TEST(SavedSettings, HoldValuesOfAnyLength) {
    host.directory(kData);
    IC::createSettingData("eth0", {{"DNSSERVERS", std::string(2000, '1')}});
    EXPECT_EQ(host.read(kEth0), "DNSSERVERS=" + std::string(2000, '1') + "\n");
}

HOST_TEST(SavedSettings, AreNamedAfterTheInterface) {
    host.directory(kData);
    IC::createSettingData("eth0.10", {{"K", "v"}});
    EXPECT_THAT(host.listDirectory(kData), TextsAre("ifcfg-eth0.10"));
}

HOST_TEST(SavedSettings, GoToTheirOwnPlaceWhateverTheAgentUses) {
    setenv("CORVISTA_DATA_DIR", "/var/other", 1);
    host.directory("/var/other");
    host.directory(kData);
    IC::createSettingData("eth0", {{"K", "v"}});
    EXPECT_EQ(host.read(kEth0), "K=v\n");
    EXPECT_THAT(host.listDirectory("/var/other"), IsEmpty());
    IC::deleteSavedConfigurations();
    EXPECT_FALSE(host.exists(kEth0));
}

HOST_TEST(SavedSettings, LogTheirWay) {
    host.directory(kData);
    LogCapture capture;
    IC::createSettingData("eth0", {{"B", "2\n"}, {"A", "1"}});
    EXPECT_THAT(capture.messages(3000),
                TextsAre("createSettingData: entry", std::string("createSettingData: FileName ") + kEth0,
                         "createSettingData: bufferA=1\n", "createSettingData: bufferB=2\n",
                         "createSettingData: exit"));
    EXPECT_TRUE(capture.everyLineTwice());
}

HOST_TEST(SavedSettings, WithoutAPlaceAreLogged) {
    LogCapture capture;
    IC::createSettingData("eth0", {{"K", "v"}});
    EXPECT_THAT(capture.messages(),
                TextsAre("createSettingData: entry", std::string("createSettingData: FileName ") + kEth0,
                         "Can not open Setting File", "createSettingData: exit"));
    EXPECT_THAT(capture.messages(6000), TextsAre("Can not open Setting File"));
    EXPECT_FALSE(host.exists("/opt/vantrel"));
}

HOST_TEST(SavedSettings, AreTheOldOnesWhenTheyCannotBeWritten) {
    host.file(kEth0, "K=old\n");
    host.readOnly(kData);
    LogCapture capture;
    IC::createSettingData("eth0", {{"K", "v"}});
    EXPECT_THAT(capture.messages(6000), TextsAre("Can not open Setting File"));
    EXPECT_EQ(host.read(kEth0), "K=old\n");
}

HOST_TEST(SavedSettings, AreTheOldOnesWhenTheDiskIsFull) {
    host.file(kEth0, "K=old\n");
    host.fullDisk(kData);
    LogCapture capture;
    IC::createSettingData("eth0", {{"K", std::string(100000, 'v')}});
    EXPECT_EQ(capture.messages(6000).size(), 1U);
    EXPECT_EQ(host.read(kEth0), "K=old\n");
}

HOST_TEST(SavedSettings, AreToldBeforeTheyAreWritten) {
    host.directory(kData);
    ASSERT_EQ(mount("small", kData, "tmpfs", 0, "size=16k"), 0);
    LogCapture capture;
    const std::string value(20000, 'v');
    IC::createSettingData("eth0", {{"K", value}});
    EXPECT_THAT(capture.messages(),
                TextsAre("createSettingData: entry", std::string("createSettingData: FileName ") + kEth0,
                         "createSettingData: bufferK=" + value + "\n",
                         std::string("Could not write all of '") + kEth0 + "'.", "createSettingData: exit"));
    EXPECT_EQ(capture.lines().at(4).function, "createSettingData");
}

HOST_TEST(SavedSettings, AreTheOldOnesWhenTheWriterIsKilledBeforeItWrites) {
    host.file(kEth0, "K=old\n");
    killBeforeItWrites(kEth0, [] { IC::createSettingData("eth0", {{"K", "v"}}); });
    EXPECT_EQ(host.read(kEth0), "K=old\n");
}

HOST_TEST(SavedSettings, AreAllDeleted) {
    host.file(kEth0, "");
    host.file("/opt/vantrel/corvista/data/ifcfg-eth0.10", "");
    host.file("/opt/vantrel/corvista/data/asset.dat", "kept");
    const CommandLines commands;
    LogCapture capture;
    IC::deleteSavedConfigurations();
    const std::string vlan = std::string(kEth0) + ".10";
    EXPECT_THAT(commands.all(), ElementsAre(kListing, std::string("rm ") + kEth0 + " 2> /dev/null",
                                            "rm " + vlan + " 2> /dev/null"));
    EXPECT_THAT(host.listDirectory(kData), TextsAre("asset.dat"));
    EXPECT_THAT(capture.messages(3000),
                TextsAre("deleteSavedConfigurations: entry", std::string("Deleting ") + kEth0,
                         "Deleting " + vlan, "deleteSavedConfigurations: exit"));
}

HOST_TEST(SavedSettings, DeleteRunsNoRmWithoutFiles) {
    for (const bool directory : {false, true}) {
        if (directory) {
            host.directory(kData);
        }
        const CommandLines commands;
        LogCapture capture;
        IC::deleteSavedConfigurations();
        EXPECT_THAT(commands.all(), ElementsAre(kListing));
        EXPECT_THAT(capture.messages(),
                    TextsAre("deleteSavedConfigurations: entry", "deleteSavedConfigurations: exit"));
    }
}

HOST_TEST(SavedSettings, DeleteGoesOnBehindAFileThatStays) {
    host.file(kEth0, "");
    host.file("/opt/vantrel/corvista/data/ifcfg-eth1", "");
    host.readOnly(kEth0);
    LogCapture capture;
    IC::deleteSavedConfigurations();
    EXPECT_THAT(host.listDirectory(kData), TextsAre("ifcfg-eth0"));
    EXPECT_THAT(capture.messages(6000), IsEmpty());
}

HOST_TEST(SavedSettings, DeleteRemovesNothingOfTheDirectoryItStandsIn) {
    host.directory("/var/mine");
    for (const char* name : {"no", "x", "veth1", "inside"}) {
        host.file(std::string("/var/mine/") + name, "");
    }
    ASSERT_EQ(chdir("/var/mine"), 0);
    host.file(std::string(kData) + "/ifcfg-eth9/no", "");     // listed as "no"
    host.file(std::string(kData) + "/ifcfg-dir/inside", "");  // and its directory as "...ifcfg-dir:"
    host.file(std::string(kData) + "/ifcfg-a\nx", "");        // listed as "...ifcfg-a" and "x"
    host.file(std::string(kData) + "/ifcfg-a", "");
    const CommandLines commands;
    IC::deleteSavedConfigurations();
    EXPECT_THAT(host.listDirectory("/var/mine"), TextsAre("inside", "no", "veth1", "x"));
    EXPECT_THAT(host.listDirectory(kData), TextsAre("ifcfg-a\nx", "ifcfg-dir", "ifcfg-eth9"));
    for (const std::string& command : commands.all()) {
        EXPECT_TRUE(command == kListing || command.starts_with("rm /opt/vantrel/corvista/data/ifcfg-"))
            << command;
    }
}

HOST_TEST(SavedSettings, DeleteTakesALineForAFileOfOursOnlyWhenItIsOne) {
    const std::string data = kData;
    host.tool("ls %any", "no\n\n*\n/etc/passwd\n" + data + "\n" + data + "/asset.dat\n" + data +
                             "/ifcfg-../asset.dat\n" + data + "/ifcfg-/../../x\n" + data + "/xifcfg-a\n ." +
                             data + "/ifcfg-b\n" + data + "/ifcfg-eth0\n");
    const CommandLines commands;
    IC::deleteSavedConfigurations();
    EXPECT_THAT(commands.all(), ElementsAre(kListing, std::string("rm ") + kEth0 + " 2> /dev/null"));
}

HOST_TEST(SavedSettings, AreNotWrittenOutsideTheirPlace) {
    host.directory(std::string(kData) + "/ifcfg-x");
    const auto before = host.listDirectory("/opt/vantrel/corvista");
    for (const std::string name : {"x/eth0", "x/../../asset.dat", "../eth0", "..", "/etc/passwd"}) {
        LogCapture capture;
        IC::createSettingData(name, {{"K", "v"}});
        EXPECT_THAT(capture.messages(6000), TextsAre("Can not open Setting File")) << name;
    }
    EXPECT_THAT(host.listDirectory(kData), TextsAre("ifcfg-x"));
    EXPECT_THAT(host.listDirectory(std::string(kData) + "/ifcfg-x"), IsEmpty());
    EXPECT_EQ(host.listDirectory("/opt/vantrel/corvista"), before);
}

HOST_TEST(SavedSettings, DeleteLogsAnRmThatCannotBeRun) {
    // Fits the listing's line, but not a command together with `rm`.
    const std::string tooLong = std::string(kData) + "/ifcfg-" + std::string(494 - sizeof(kData), 'x');
    host.tool("ls %any", tooLong + "\n" + kEth0 + "\n");
    host.file(kEth0, "");
    LogCapture capture;
    IC::deleteSavedConfigurations();
    EXPECT_THAT(capture.messages(3000), testing::Contains("Could not delete " + tooLong));
    EXPECT_FALSE(host.exists(kEth0));
}

HOST_TEST(SavedSettings, DeleteGivesUpWhenTheListingCannotBeRun) {
    host.file(kEth0, "");
    LogCapture capture;
    {
        const NoDescriptors none;
        IC::deleteSavedConfigurations();
    }
    EXPECT_THAT(capture.messages(),
                TextsAre("deleteSavedConfigurations: entry", "deleteSavedConfigurations: exit"));
    EXPECT_TRUE(host.exists(kEth0));
}

}  // namespace
