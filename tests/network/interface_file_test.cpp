#include "network/interface_file.h"

#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"

namespace {

using IC::InterfaceFile;
using IC::KeyLine;

constexpr char kMac[] = "00:0c:29:00:00:01";
constexpr char kPath[] = "/etc/sysconfig/network/ifcfg-eth-id-00:0c:29:00:00:01";

HOST_TEST(InterfaceFile, IsNamedAfterTheHardwareAddress) {
    EXPECT_EQ(InterfaceFile::pathOf(kMac), kPath);
}

HOST_TEST(InterfaceFile, ReplacesEveryLineOfAKeyInPlaceAndAppendsTheMissing) {
    host.file(kPath, "A=1\n# A=2\nB=3");
    KeyLine a{"A=", "A=new\n"};
    KeyLine c{"C=", "C=new\n"};
    InterfaceFile file(kMac);
    file.replace({&a, &c});
    EXPECT_TRUE(a.seen);
    EXPECT_FALSE(c.seen);
    EXPECT_EQ(file.lastLine(), "B=3");
    file.appendMissing({&c, &a});
    EXPECT_TRUE(file.write());
    EXPECT_EQ(host.read(kPath), "A=new\nA=new\nB=3\nC=new\n");
}

HOST_TEST(InterfaceFile, ALaterKeySeesWhatAnEarlierOneMadeOfTheLine) {
    host.file(kPath, "A=1 B=2\n");
    KeyLine a{"A=", "A=new\n"};
    KeyLine b{"B=", "B=new\n"};
    InterfaceFile file(kMac);
    file.replace({&a, &b});
    EXPECT_FALSE(b.seen);
    file.appendMissing({&b});
    file.write();
    EXPECT_EQ(host.read(kPath), "A=new\nB=new\n");
}

HOST_TEST(InterfaceFile, AKeptLineIsOpenToLaterKeysAndAnUntouchedOneIsNot) {
    host.file(kPath, "A=1 B=2\n");
    KeyLine b{"B=", "B=new\n"};
    KeyLine untouched{"A=", "", KeyLine::Held::keptUntouched};
    InterfaceFile first(kMac);
    first.replace({&untouched, &b});
    EXPECT_TRUE(untouched.seen);
    EXPECT_FALSE(b.seen);
    EXPECT_EQ(first.lastLine(), "A=1 B=2\n");
    KeyLine kept{"A=", "", KeyLine::Held::kept};
    InterfaceFile second(kMac);
    second.replace({&kept, &b});
    EXPECT_TRUE(kept.seen);
    EXPECT_TRUE(b.seen);
    EXPECT_EQ(second.lastLine(), "B=new\n");
}

HOST_TEST(InterfaceFile, AppendsNothingForAKeyWithoutALine) {
    KeyLine none{"A=", ""};
    InterfaceFile file(kMac);
    EXPECT_EQ(file.lastLine(), "");
    file.replace({&none});
    file.appendMissing({&none});
    host.directory("/etc/sysconfig/network");
    EXPECT_TRUE(file.write());
    EXPECT_EQ(host.read(kPath), "");
}

HOST_TEST(InterfaceFile, SeesAKeyWhereverItStandsInALongLine) {
    host.file(kPath, std::string(5000, 'x') + "A=1\n# end\n");
    KeyLine a{"A=", "A=new\n"};
    InterfaceFile file(kMac);
    file.replace({&a});
    EXPECT_TRUE(a.seen);
    file.write();
    EXPECT_EQ(host.read(kPath), "A=new\n# end\n");
}

HOST_TEST(InterfaceFile, WithADirectoryInItsPlaceIsNotWrittenAndTellsNothingItself) {
    host.directory(kPath);
    const LogCapture capture;
    InterfaceFile file(kMac);
    EXPECT_EQ(file.lastLine(), "");
    EXPECT_FALSE(file.write("opened"));
    EXPECT_TRUE(capture.messages().empty()) << "the writer says what it makes of it";
}

}  // namespace
