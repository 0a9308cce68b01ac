#pragma once

#include "computer/computer_builder.h"
#include "cpu/processor_builder.h"
#include "indications/network_monitor.h"
#include "mi/node_tree.h"
#include "network/network_builder.h"
#include "storage/storage_builder.h"

namespace IC {

/// The plug-in object: builds the tree of the host's nodes, starts and stops the monitors. It is the tree and
/// the builders of all components in one; each component has the members that build its nodes, and what they
/// keep.
class OsHwMI : public NodeTree,
               public ComputerBuilder,
               public NetworkBuilder,
               public ProcessorBuilder,
               public Indications,
               public StorageBuilder {
public:
    OsHwMI();
    ~OsHwMI() override;

    /// Builds the tree and starts the monitors. A step that fails is logged and the next one runs.
    /// @return the result of the base class's initialize
    Error initialize(unsigned int miId, const Number& ownNodeId, const Number& firstNodeId) override;
    /// Stops the monitors, empties the list of nodes, removes the plug-in's own files. Safe without an
    /// initialize before it. The nodes themselves live as long as this object.
    Error unload() override;

    /// The agent may call it; nothing in the plug-in does.
    __attribute__((visibility("default"))) void createCpuNodes();

private:
    void stopMonitors();
    Error emptyTree();
};

/// The one plug-in object; its address is all the agent gets.
extern OsHwMI myoshwmi;

}  // namespace IC
