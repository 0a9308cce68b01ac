#include "agent/core/oshw/tables.h"

#include "framework/ic/link_state.h"

namespace cvagent::oshw {

namespace {

using Naming = NodeClass::Naming;

constexpr unsigned int kComputer[] = {108};
constexpr unsigned int kDrive[] = {37};
constexpr unsigned int kPartition[] = {112};
constexpr unsigned int kPort[] = {123, 57};
constexpr unsigned int kIpConfig[] = {123, 25, 26, 27};
constexpr unsigned int kTeam[] = {198, 165};
constexpr unsigned int kProcessor[] = {80};

// What is stored comes from elsewhere than what is read: the listing of interfaces where a read asks for the
// link, zeros where a read tells that there is no IPv4, what `hostname` prints where a read asks the kernel.
// A clock goes on.
constexpr unsigned int kComputerLive[] = {108, 126};
constexpr unsigned int kIpConfigLive[] = {25, 26, 123};

constexpr NodeClass kClasses[] = {
    {NodeType::osHardware, "oshw", Naming::single, 0},
    {NodeType::root, "root", Naming::single, 0},
    {NodeType::computer, "computer", Naming::single, 0, kComputer, false, kComputerLive},
    {NodeType::chassis, "chassis", Naming::single, 0},
    {NodeType::planar, "planar", Naming::single, 0},
    {NodeType::networkController, "network-controller", Naming::single, 0},
    {NodeType::diskController, "disk-controller", Naming::single, 0},
    {NodeType::hardDrive, "hard-drive", Naming::byProperty, 89, kDrive, true},
    {NodeType::partition, "partition", Naming::byProperty, 89, kPartition},
    {NodeType::networkPort, "network-port", Naming::byProperty, 108, kPort, true},
    {NodeType::ipConfig, "ip-config", Naming::byProperty, 108, kIpConfig, true, kIpConfigLive},
    {NodeType::lanEndpoint, "lan-endpoint", Naming::byProperty, 108},
    {NodeType::team, "team", Naming::byProperty, 197, kTeam},
    {NodeType::processor, "processor", Naming::byIndex, 0, kProcessor, true},
};

// An interface's states, as its state property has them. The two alerts of a bond's member carry the same
// codes; only their texts differ.
constexpr unsigned int kState = 123;

constexpr AlertRow kAlerts[] = {
    {"NIC is Online", kState, IC::LinkState::up},
    {"NIC is Offline", kState, IC::LinkState::down},
    {"NIC has Switched Over", kState, IC::LinkState::switchedOver},
    {"NIC has Switched Back", kState, IC::LinkState::switchedBack},
};

}  // namespace

const CatalogueTable& table() {
    static const CatalogueTable all{
        "the OS/hardware plug-in",
        kClasses,
        {hostProperties(), storageProperties(), networkPortProperties(), ipConfigProperties()},
        kAlerts,
        effects()};
    return all;
}

}  // namespace cvagent::oshw
