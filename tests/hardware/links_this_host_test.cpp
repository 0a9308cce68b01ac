// The links of the machine that the tests run on, beside what ip and ethtool tell of them.
#include <gmock/gmock.h>

#include "tests/hardware/beside_ip.h"

namespace {

using hardware::Class;
using hardware_test::factsOf;
using hardware_test::Told;
using Json = nlohmann::json;

/// Whether what the tool counted lies between two looks of the plug-in.
void expectBetween(const Told& before, const Told& theirs, const Told& after) {
    for (const auto& [property, value] : theirs) {
        EXPECT_LE(hardware::asNumber(before.at(property)), hardware::asNumber(value)) << property;
        EXPECT_GE(hardware::asNumber(after.at(property)), hardware::asNumber(value)) << property;
    }
}

TEST(ThisHostsLinks, AreThoseOfIpAndEthtool) {
    const hardware::Host host;
    std::map<std::string, Told> before;
    for (const std::string& name : listed(host, Class::link)) {
        before[name] = factsOf(host, Class::link, name);
    }
    const Json links = hardware_test::printedJson("ip -j -d -s -s link");
    if (!links.is_array()) {
        GTEST_SKIP() << "no ip";
    }
    EXPECT_EQ(links.size(), before.size());
    for (const Json& link : links) {
        const std::string name = link["ifname"];
        SCOPED_TRACE(name);
        const Told own = factsOf(host, Class::link, name);
        EXPECT_THAT(hardware_test::differences(own, hardware_test::toldByIp(link)), testing::IsEmpty());
        EXPECT_THAT(hardware_test::differences(own, hardware_test::toldByEthtool(name)), testing::IsEmpty());
        expectBetween(before[name], hardware_test::countedByIp(link), own);
    }
}

}  // namespace
