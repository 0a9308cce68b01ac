// What `ethtool` printed on many ports, through the machine's own grep, tr and cut.
#include "network/link_queries.h"
#include "tests/network/recording.h"
#include "tests/support/fake_host.h"

namespace {

using Speed = std::optional<unsigned long long>;
constexpr std::nullopt_t kNone = std::nullopt;

struct Recorded {
    const char* file;
    Speed kilobits;  ///< nothing: the tool told none
    bool fullDuplex;
    bool autoSense;
    bool linkUp;
};

constexpr Recorded kPorts[] = {
    {"1000-full", 1'000'000, true, true, true},
    {"1000-full-forced", 1'000'000, true, true, true},
    {"100-full", 100'000, true, true, true},
    {"100-half-forced", 100'000, false, true, true},
    {"10-half", 10'000, false, true, true},
    {"10000-fibre", 10'000'000, true, true, true},
    {"10000-copper", 10'000'000, true, true, true},
    {"2500-full", 2'500'000, true, true, true},
    {"25000-full", 25'000'000, true, true, true},
    {"40000-full", 40'000'000, true, true, true},
    {"100000-full", 100'000'000, true, true, true},
    {"400000-full", 400'000'000, true, true, true},
    {"no-link", 0, false, true, false},
    {"no-link-old-driver", 65'535'000, false, true, false},
    {"no-link-code-65535", 0, false, true, false},
    {"no-link-code-0", 0, false, true, false},
    {"no-link-reason", 0, false, true, false},
    {"no-link-autoneg-reason", 0, false, true, false},
    {"no-link-yet-speed", 1'000'000, true, true, false},
    {"link-unknown-speed", 0, false, true, true},
    {"without-negotiation-line", 1'000'000, true, false, true},
    {"without-link-line", 100'000, true, true, false},
    {"partner-modes", 100'000, true, true, true},
    {"virtio", 0, false, true, true},
    {"virtio-old-kernel", kNone, false, false, true},
    {"vmxnet3", 10'000'000, true, true, true},
    {"veth", 10'000'000, true, true, true},
    {"tap", 10'000, true, true, false},
    {"bridge", kNone, false, false, true},
    {"bridge-new", 1'000'000, false, true, true},
    {"loopback", kNone, false, false, true},
    {"wireless", kNone, false, false, false},
    {"no-permission", 1'000'000, true, true, true},
    {"no-permission-at-all", kNone, false, false, false},
    {"missing-device", kNone, false, false, false},
    {"nothing", kNone, false, false, false},
};

// What looks like an answer and is none, or is more than one.
constexpr Recorded kNearMisses[] = {
    {"lower-case-labels", kNone, false, false, false},
    {"lower-case-values", 1'000'000, false, true, false},
    {"blank-before-colon", 0, true, true, true},
    {"no-blank-behind-colon", 0, true, true, true},
    {"many-blanks", 1'000'000, true, true, false},
    {"tab-behind-colon", 0, false, true, true},
    {"empty-values", 0, false, true, false},
    {"truncated-in-speed", 100'000, false, false, false},
    {"truncated-in-label", kNone, false, false, false},
    {"carriage-returns", 1'000'000, true, true, true},
    {"gigabits", 1'000, true, true, true},
    {"unit-apart", 1'000'000, true, true, true},
    {"hexadecimal-speed", 0, true, true, true},
    {"negative-speed", 0xFFFF'FFFF'FFFF'FC18, true, true, true},
    {"speed-at-32-bits", 2'147'483'000, true, true, true},
    {"speed-over-32-bits", 0xFFFF'FFFF'8000'0160, true, true, true},
    {"speed-wraps-round", 704, true, true, true},
    {"speed-of-many-digits", 0xFFFF'FFFF'FFFF'FC18, true, true, true},
    {"two-ports-in-one", 100'000, false, true, false},
    {"supported-speeds-first", 0, true, false, true},
    {"long-line", 1'000'000, false, true, false},
    {"german", kNone, true, false, false},
};

Speed speedOf(const std::string& name) {
    unsigned long long speed = 12345;
    const bool read = IC::getNetworkSpeed(name, speed);
    EXPECT_TRUE(read || speed == 12345) << "touched without an answer";
    return read ? Speed(speed) : kNone;
}

void check(FakeHost& host, const Recorded& port) {
    SCOPED_TRACE(port.file);
    host.tool("ethtool eth0", recording(std::string("ethtool/") + port.file + ".txt"));
    EXPECT_EQ(speedOf("eth0"), port.kilobits);
    EXPECT_EQ(IC::getNetworkDuplex("eth0"), port.fullDuplex);
    EXPECT_EQ(IC::getAutoSense("eth0"), port.autoSense);
    EXPECT_EQ(IC::isNICUp("eth0"), port.linkUp);
}

HOST_TEST(RecordedEthtool, PortsOfManyKinds) {
    for (const Recorded& port : kPorts) {
        check(host, port);
    }
}

HOST_TEST(RecordedEthtool, NearMisses) {
    for (const Recorded& port : kNearMisses) {
        check(host, port);
    }
}

}  // namespace
