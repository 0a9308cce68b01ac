// The sample of a writer in docs/architecture.md, as it stands there.
#include <gmock/gmock.h>

#include "mi/log.h"
#include "network/interface_file.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace IC {
namespace {

#include "writer_sample.inc"

constexpr char kMac[] = "02:00:5e:00:00:01";
constexpr char kFile[] = "/etc/sysconfig/network/ifcfg-eth-id-02:00:5e:00:00:01";

HOST_TEST(WriterSample, ReplacesItsKeyAndAppendsItWhereItIsMissing) {
    host.file(kFile, "BOOTPROTO=static\nMTU='1500'\n");
    setMtu(9000, kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=static\nMTU=9000\n");
    host.file(kFile, "BOOTPROTO=static");
    setMtu(1400, kMac);
    EXPECT_EQ(host.read(kFile), "BOOTPROTO=static\nMTU=1400\n");
}

HOST_TEST(WriterSample, LogsAFileThatCannotBeWritten) {
    host.directory(kFile);
    LogCapture capture;
    setMtu(9000, kMac);
    EXPECT_THAT(capture.ownMessages(6000), TextsAre("Can not write the MTU."));
}

}  // namespace
}  // namespace IC
