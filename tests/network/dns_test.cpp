#include "network/dns.h"

#include "network/ip_origin.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/network/killed_writer.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/plugin_access.h"
#include "tests/support/texts_are.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using Lines = std::vector<std::string>;

constexpr char kResolver[] = "/etc/resolv.conf";
constexpr char kNetconfig[] = "/etc/sysconfig/network/config";

/// What the file is after the values were written.
std::string afterServers(FakeHost& host, const std::string& content, const Lines& servers) {
    host.file(kResolver, content);
    IC::executeDNSChanges(servers, true);
    return host.read(kResolver).value_or("missing");
}

std::string afterSuffixes(FakeHost& host, const std::string& content, const Lines& suffixes) {
    host.file(kResolver, content);
    IC::executeDNSChanges(suffixes, false);
    return host.read(kResolver).value_or("missing");
}

IC::PropertyValue origin(unsigned int code) {
    return {IC::EnumValue(code), true};
}

std::string afterPolicy(FakeHost& host, const std::string& content, const IC::PropertyValue& value) {
    host.file(kNetconfig, content);
    IC::disableNetConfigDNSPolicy(value);
    return host.read(kNetconfig).value_or("missing");
}

struct Details {
    Lines servers;
    Lines suffixes;
};

Details detailsOf(FakeHost& host, const std::string& content) {
    host.file(kResolver, content);
    Details details;
    IC::getDNSDetails(details.servers, details.suffixes);
    return details;
}

HOST_TEST(NameServers, OverwriteTheLinesThatAreThereInOrder) {
    EXPECT_EQ(afterServers(host, "# head\nnameserver 1.1.1.1\nsearch a\nnameserver 2.2.2.2\noptions debug\n",
                           {"10.0.0.1", "10.0.0.2"}),
              "# head\nnameserver 10.0.0.1\nsearch a\nnameserver 10.0.0.2\noptions debug\n");
}

HOST_TEST(NameServers, FewerThanTheLinesDropTheLastOnes) {
    EXPECT_EQ(afterServers(host, "nameserver 1.1.1.1\nsearch a\nnameserver 2.2.2.2\nnameserver 3.3.3.3\n",
                           {"10.0.0.1"}),
              "nameserver 10.0.0.1\nsearch a\n");
}

HOST_TEST(NameServers, MoreThanTheLinesAreAppended) {
    EXPECT_EQ(afterServers(host, "search a\n", {"10.0.0.1", "fd00::1"}),
              "search a\nnameserver 10.0.0.1\nnameserver fd00::1\n");
    EXPECT_EQ(afterServers(host, "nameserver 1.1.1.1\n# tail", {"10.0.0.1", "10.0.0.2"}),
              "nameserver 10.0.0.1\n# tail\nnameserver 10.0.0.2\n");
    EXPECT_EQ(afterServers(host, "", {"10.0.0.1"}), "nameserver 10.0.0.1\n");
}

HOST_TEST(NameServers, AnEmptyListRemovesEveryServer) {
    EXPECT_EQ(afterServers(host, "nameserver 1.1.1.1\n# kept\nnameserver 2.2.2.2\n", {}), "# kept\n");
    EXPECT_EQ(afterServers(host, "nameserver 1.1.1.1\n", {}), "");
}

HOST_TEST(NameServers, AreToldBySixLettersAtTheLineStart) {
    EXPECT_EQ(
        afterServers(host, "names\nnamese\nnameserver\t9.9.9.9\n nameserver 1.1.1.1\nNAMESERVER 2.2.2.2\n",
                     {"10.0.0.1", "10.0.0.2"}),
        "names\nnameserver 10.0.0.1\nnameserver 10.0.0.2\n nameserver 1.1.1.1\nNAMESERVER 2.2.2.2\n");
}

HOST_TEST(NameServers, LeaveACommentWithAServerInPlace) {
    EXPECT_EQ(afterServers(host, "#nameserver 1.1.1.1\nnameserver 2.2.2.2 # main\n", {"10.0.0.1"}),
              "#nameserver 1.1.1.1\nnameserver 10.0.0.1\n");
}

HOST_TEST(NameServers, ReplaceALineOfAnyLength) {
    const std::string longLine = "nameserver " + std::string(5000, '1') + "\n";
    EXPECT_EQ(afterServers(host, longLine, {"10.0.0.1"}), "nameserver 10.0.0.1\n");
    EXPECT_EQ(afterServers(host, longLine + longLine, {"10.0.0.1"}), "nameserver 10.0.0.1\n");
}

HOST_TEST(NameServers, LogTheirWay) {
    host.file(kResolver, "");
    LogCapture capture;
    IC::executeDNSChanges({}, true);
    EXPECT_THAT(capture.messages(3000),
                TextsAre("executeDNSChanges: Entering", "method: 1", "executeDNSChanges: exit"));
    EXPECT_THAT(capture.messages(6000), IsEmpty());
    EXPECT_TRUE(capture.everyLineTwice());
    EXPECT_EQ(capture.lines().front().function, "executeDNSChanges");
    EXPECT_EQ(capture.lines().front().source, "OsHwMI_ix86");
}

HOST_TEST(SearchSuffixes, ReplaceEverySearchLine) {
    EXPECT_EQ(afterSuffixes(host, "search old\n# c\nnameserver 1.1.1.1\nsearch older\n",
                            {"a.example", "b.example"}),
              "search a.example b.example\n# c\nnameserver 1.1.1.1\nsearch a.example b.example\n");
}

HOST_TEST(SearchSuffixes, AreAppendedToAFileWithoutThem) {
    EXPECT_EQ(afterSuffixes(host, "nameserver 1.1.1.1", {"a.example"}),
              "nameserver 1.1.1.1\nsearch a.example\n");
    EXPECT_EQ(afterSuffixes(host, "# search old\n search old\ndomain d\n", {"a"}),
              "# search old\n search old\ndomain d\nsearch a\n");
}

HOST_TEST(SearchSuffixes, AnEmptyListLeavesABareKeyword) {
    EXPECT_EQ(afterSuffixes(host, "search a b c\n", {}), "search\n");
    EXPECT_EQ(afterSuffixes(host, "", {}), "search\n");
}

HOST_TEST(SearchSuffixes, ReplaceALineOfAnyLengthAndMakeOne) {
    const std::string longSuffix(5000, 'x');
    EXPECT_EQ(afterSuffixes(host, "search " + longSuffix + "\n", {"a"}), "search a\n");
    EXPECT_EQ(afterSuffixes(host, "search a\n", {longSuffix}), "search " + longSuffix + "\n");
}

HOST_TEST(ResolverFile, WithADirectoryInItsPlaceCannotBeOpenedForWriting) {
    host.directory(kResolver);
    LogCapture capture;
    IC::executeDNSChanges({"a"}, false);
    EXPECT_THAT(capture.messages(6000), TextsAre("Can not open '/etc/resolv.conf' in write mode."));
}

HOST_TEST(SearchSuffixes, LogTheirWay) {
    host.file(kResolver, "");
    LogCapture capture;
    IC::executeDNSChanges({}, false);
    EXPECT_THAT(capture.messages(3000),
                TextsAre("executeDNSChanges: Entering", "method: 0", "executeDNSChanges: exit"));
}

HOST_TEST(ResolverFile, IsNotMadeWhenItIsMissing) {
    for (const bool servers : {true, false}) {
        LogCapture capture;
        IC::executeDNSChanges({"10.0.0.1"}, servers);
        EXPECT_THAT(capture.messages(6000), TextsAre("Can not open '/etc/resolv.conf' in read mode."));
        EXPECT_FALSE(host.exists(kResolver));
    }
}

HOST_TEST(ResolverFile, IsTheOldOneWhenItCannotBeWritten) {
    host.file(kResolver, "nameserver 1.1.1.1\n");
    host.readOnly(kResolver);
    for (const bool servers : {true, false}) {
        LogCapture capture;
        IC::executeDNSChanges({"10.0.0.1"}, servers);
        EXPECT_THAT(capture.messages(6000), TextsAre("Can not open '/etc/resolv.conf' in write mode."));
        EXPECT_EQ(host.read(kResolver), "nameserver 1.1.1.1\n");
    }
}

HOST_TEST(ResolverFile, IsTheOldOneWhenTheDiskIsFull) {
    host.file(kResolver, "nameserver 1.1.1.1\n");
    host.fullDisk("/etc");
    LogCapture capture;
    IC::executeDNSChanges(Lines(2000, "10.0.0.1"), true);
    EXPECT_EQ(capture.messages(6000).size(), 1U);
    EXPECT_EQ(host.read(kResolver), "nameserver 1.1.1.1\n");
}

HOST_TEST(ResolverFile, IsTheOldOneWhenTheWriterIsKilledBeforeItWrites) {
    host.file(kResolver, "nameserver 1.1.1.1\n");
    killBeforeItWrites(kResolver, [] { IC::executeDNSChanges({"10.0.0.1"}, true); });
    EXPECT_EQ(host.read(kResolver), "nameserver 1.1.1.1\n");
}

HOST_TEST(ResolverFile, KeepsItsModeAndALinkToIt) {
    host.file("/run/resolv.conf", "nameserver 1.1.1.1\n", 0640);
    host.symlink(kResolver, "/run/resolv.conf");
    IC::executeDNSChanges({"10.0.0.1"}, true);
    EXPECT_EQ(host.read("/run/resolv.conf"), "nameserver 10.0.0.1\n");
    EXPECT_EQ(host.run({"stat", "-c", "%a %F", kResolver, "/run/resolv.conf"}).out,
              "777 symbolic link\n640 regular file\n");
}

HOST_TEST(DNSPolicy, IsEmptiedForAFixedAddressAndAutoForDhcp) {
    const std::string others = "# policy\nNETCONFIG_MODULES_ORDER=\"dns\"\n";
    EXPECT_EQ(afterPolicy(host, others + "NETCONFIG_DNS_POLICY=\"auto\"\nLAST=1", origin(3)),
              others + "NETCONFIG_DNS_POLICY=\"\"\nLAST=1");
    EXPECT_EQ(afterPolicy(host, others + "NETCONFIG_DNS_POLICY=\"\"", origin(1)),
              others + "NETCONFIG_DNS_POLICY=\"auto\"\n");
}

HOST_TEST(DNSPolicy, ReplacesEveryLineThatHoldsTheKey) {
    EXPECT_EQ(
        afterPolicy(host, "# NETCONFIG_DNS_POLICY=x\n export NETCONFIG_DNS_POLICY=y\nNETCONFIG_DNS_POLICY \n",
                    origin(3)),
        "NETCONFIG_DNS_POLICY=\"\"\nNETCONFIG_DNS_POLICY=\"\"\nNETCONFIG_DNS_POLICY \n");
}

HOST_TEST(DNSPolicy, StaysForAnyOtherOrigin) {
    const std::string content = "NETCONFIG_DNS_POLICY=\"STATIC_FALLBACK\"\n";
    EXPECT_EQ(afterPolicy(host, content, origin(2)), content);
    EXPECT_EQ(afterPolicy(host, content, origin(0)), content);
    EXPECT_EQ(afterPolicy(host, content, IC::PropertyValue("static", true)), content);
    EXPECT_EQ(afterPolicy(host, content, IC::PropertyValue()), content);
}

HOST_TEST(DNSPolicy, IsNotAddedAndTheFileNotTouchedWithoutTheKey) {
    host.file(kNetconfig, "OTHER=1\n");
    host.readOnly(kNetconfig);
    LogCapture capture;
    IC::disableNetConfigDNSPolicy(origin(3));
    EXPECT_EQ(host.read(kNetconfig), "OTHER=1\n");
    EXPECT_THAT(capture.messages(), TextsAre("disableNetConfigDNSPolicy: Entering", "bootproto: 3",
                                             "disableNetConfigDNSPolicy: exit"));
}

HOST_TEST(DNSPolicy, MissingFileIsNeitherMadeNorLogged) {
    LogCapture capture;
    IC::disableNetConfigDNSPolicy(origin(3));
    EXPECT_FALSE(host.exists("/etc/sysconfig"));
    EXPECT_THAT(capture.messages(), TextsAre("disableNetConfigDNSPolicy: Entering", "bootproto: 3",
                                             "disableNetConfigDNSPolicy: exit"));
}

HOST_TEST(DNSPolicy, UnwritableFileIsSkippedSilently) {
    host.file(kNetconfig, "NETCONFIG_DNS_POLICY=\"auto\"\n");
    host.readOnly("/etc/sysconfig/network");
    LogCapture capture;
    IC::disableNetConfigDNSPolicy(origin(3));
    EXPECT_EQ(host.read(kNetconfig), "NETCONFIG_DNS_POLICY=\"auto\"\n");
    EXPECT_THAT(capture.messages(6000), IsEmpty());
}

HOST_TEST(DNSPolicy, IsTheOldOneWhenTheWriterIsKilledBeforeItWrites) {
    host.file(kNetconfig, "NETCONFIG_DNS_POLICY=\"auto\"\n");
    killBeforeItWrites(kNetconfig, [] { IC::disableNetConfigDNSPolicy(origin(3)); });
    EXPECT_EQ(host.read(kNetconfig), "NETCONFIG_DNS_POLICY=\"auto\"\n");
}

HOST_TEST(DNSPolicy, LogsTheLineAndBothOrigins) {
    host.file(kNetconfig, "OTHER=1\nNETCONFIG_DNS_POLICY=\"auto\"\n");
    LogCapture capture;
    IC::disableNetConfigDNSPolicy(origin(3));
    EXPECT_THAT(capture.messages(3000), TextsAre("disableNetConfigDNSPolicy: Entering", "bootproto: 3",
                                                 "buffer: NETCONFIG_DNS_POLICY=\"\"\n", "DHCP: 1",
                                                 "Static: 3", "disableNetConfigDNSPolicy: exit"));
    for (const LogLine& line : capture.lines()) {
        EXPECT_EQ(line.function, "disableNetConfigDNSPolicy");
    }
}

HOST_TEST(DNSDetails, AreTheValuesBehindTheKeywords) {
    const Details details = detailsOf(
        host, "domain d\nsearch a.example b.example c.example\nnameserver 10.0.0.1\nnameserver fd00::1");
    EXPECT_THAT(details.servers, TextsAre("10.0.0.1", "fd00::1"));
    EXPECT_THAT(details.suffixes, TextsAre("a.example", "b.example", "c.example"));
}

HOST_TEST(DNSDetails, PassOverEveryLineWithANumberSign) {
    const Details details =
        detailsOf(host, "#nameserver 1.1.1.1\nnameserver 2.2.2.2 # main\n search a#b\nsearch c\n");
    EXPECT_THAT(details.servers, IsEmpty());
    EXPECT_THAT(details.suffixes, TextsAre("c"));
}

HOST_TEST(DNSDetails, FindTheKeywordAnywhereAndTheServerFirst) {
    const Details details =
        detailsOf(host, "  nameserver 1.1.1.1\noptions search a nameserver 2.2.2.2\nx research b\n");
    EXPECT_THAT(details.servers, TextsAre("1.1.1.1", "2.2.2.2"));
    EXPECT_THAT(details.suffixes, TextsAre("b"));
}

HOST_TEST(DNSDetails, SplitAtEverySingleBlank) {
    const Details details = detailsOf(host, "nameserver  1.1.1.1\nsearch a b \n");
    EXPECT_THAT(details.servers, TextsAre("", "1.1.1.1"));
    EXPECT_THAT(details.suffixes, TextsAre("a", "b", ""));
}

HOST_TEST(DNSDetails, AreNoneBehindABareKeyword) {
    const Details details = detailsOf(host, "nameserver\nsearch\nnameserver\t1.1.1.1\n");
    EXPECT_THAT(details.servers, IsEmpty());
    EXPECT_THAT(details.suffixes, IsEmpty());
}

HOST_TEST(DNSDetails, AreReadFromLinesOfAnyLength) {
    const std::string suffix(600, 'x');
    EXPECT_THAT(detailsOf(host, "search a " + suffix + "\n").suffixes, ElementsAre("a", suffix));
}

HOST_TEST(DNSDetails, AreAppendedAndLeftAloneWithoutAFile) {
    Lines servers{"first"};
    Lines suffixes{"suffix"};
    LogCapture capture;
    IC::getDNSDetails(servers, suffixes);
    EXPECT_THAT(capture.messages(), TextsAre("getDNSDetails: entry", "getDNSDetails: exit"));
    host.file(kResolver, "nameserver 1.1.1.1\n");
    IC::getDNSDetails(servers, suffixes);
    EXPECT_THAT(servers, TextsAre("first", "1.1.1.1"));
    EXPECT_THAT(suffixes, TextsAre("suffix"));
}

HOST_TEST(DNSDetails, ReadBackWhatTheWritersWrote) {
    host.file(kResolver, "");
    IC::executeDNSChanges({"10.0.0.1", "10.0.0.2"}, true);
    IC::executeDNSChanges({"a", "b"}, false);
    Details details;
    IC::getDNSDetails(details.servers, details.suffixes);
    EXPECT_THAT(details.servers, TextsAre("10.0.0.1", "10.0.0.2"));
    EXPECT_THAT(details.suffixes, TextsAre("a", "b"));
    IC::executeDNSChanges({}, true);
    IC::executeDNSChanges({}, false);
    Details none;
    IC::getDNSDetails(none.servers, none.suffixes);
    EXPECT_THAT(none.servers, IsEmpty());
    EXPECT_THAT(none.suffixes, IsEmpty());
}

TEST(DNSText, IsAppendedWithABlankBehindEveryEntry) {
    IC::OsHwMI mi;
    IC::OsHwMITestAccess::setLists(mi, {"10.0.0.1", "10.0.0.2"}, {"a.example"});
    std::string servers = "before ";
    std::string suffixes;
    mi.stringFormatForDNSServersAndSuffixes(servers, suffixes);
    EXPECT_EQ(servers, "before 10.0.0.1 10.0.0.2 ");
    EXPECT_EQ(suffixes, "a.example ");
    IC::OsHwMITestAccess::setLists(mi, {}, {});
    mi.stringFormatForDNSServersAndSuffixes(servers, suffixes);
    EXPECT_EQ(servers, "before 10.0.0.1 10.0.0.2 ");
}

}  // namespace
