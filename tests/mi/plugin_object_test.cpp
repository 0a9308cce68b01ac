// The plug-in object is put together from the builders of all components. What it offers by name, and where
// the agent finds it, must not depend on that.
#include <gtest/gtest.h>

#include <cstdint>
#include <type_traits>

#include "oshwmi/os_hw_mi.h"
#include "tests/support/fake_host.h"

extern "C" int OpenMI(IC::ManagementInterface** mi, IC::Error** err);

namespace {

using IC::OsHwMI;

/// A member of the object, whichever of its bases defines it. One that is not public does not compile.
template <class Result, class... Arguments>
using Member = Result (OsHwMI::*)(Arguments...);

[[maybe_unused]] constexpr Member<void> kSteps[] = {
    &OsHwMI::createOsHwNodes,
    &OsHwMI::createRootNode,
    &OsHwMI::createComputerNodes,
    &OsHwMI::createChassisNodes,
    &OsHwMI::createPlanarNodes,
    &OsHwMI::createNetworkControllerNodes,
    &OsHwMI::createDiskControllerNodes,
    &OsHwMI::createNetworkTeamingNodes,
    &OsHwMI::createLANEndPointNodes,
    &OsHwMI::createCpuNodeAndMap,
    &OsHwMI::createCpuNodes,
    &OsHwMI::updateHostAndDomainName,
    &OsHwMI::vpdUpdate,
    &OsHwMI::startHDDThread,
    &OsHwMI::HDDThreadProcess,
    &OsHwMI::enableIndications,
    &OsHwMI::disableIndications,
    &OsHwMI::readPrevNetNodeMap,
    &OsHwMI::createCurNetNodeMap,
    &OsHwMI::checkAndSendNetAlert,
    &OsHwMI::writePrevNetNodeMap,
};
[[maybe_unused]] constexpr Member<void, bool> kStepsWithAFlag[] = {
    &OsHwMI::createHardDriveNodes, &OsHwMI::createPartitionNodes, &OsHwMI::createNetworkPortNodes,
    &OsHwMI::HardDrive_Checksum,   &OsHwMI::Partition_Checksum,
};
[[maybe_unused]] constexpr Member<void, IC::Node*> kPublishNode = &OsHwMI::publishNode;
[[maybe_unused]] constexpr Member<unsigned int, const std::string&> kBondedStatus =
    &OsHwMI::bondedNetNodeStatus;
[[maybe_unused]] constexpr Member<void, std::string&, std::string&> kDnsTexts =
    &OsHwMI::stringFormatForDNSServersAndSuffixes;
[[maybe_unused]] constexpr Member<void, std::vector<CIPInfo*>*, std::string, IC::MutableNode*, unsigned int&>
    kConfigNodes = &OsHwMI::createIPConfigNodes;
[[maybe_unused]] constexpr bool (OsHwMI::*kFindPort)(std::string,
                                                     IC::MutableNode**) const = &OsHwMI::findNetworkPort;

static_assert(!std::is_copy_constructible_v<OsHwMI>);

HOST_TEST(PluginObject, IsWhatTheAgentIsHanded) {
    IC::ManagementInterface* mi = nullptr;
    IC::Error* error = nullptr;
    OpenMI(&mi, &error);
    // The agent calls the processor builder with this very address.
    EXPECT_EQ(reinterpret_cast<std::uintptr_t>(mi), reinterpret_cast<std::uintptr_t>(&IC::myoshwmi));
}

}  // namespace
