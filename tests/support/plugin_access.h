#pragma once

#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "mi/os_hw_mi.h"

namespace IC {

/// What tests see of the plug-in object's insides, and set in the place of its builders.
struct OsHwMITestAccess {
    /// The containers as initialize makes them, without a tree and without monitors.
    static void makeInventory(OsHwMI& mi) { mi.inventory_ = std::make_unique<Inventory>(); }
    /// Lists a node and remembers it as an interface's.
    static void addInterface(OsHwMI& mi, const std::string& name, MutableNode* node) {
        mi.appendNode(node);
        mi.rememberByName(name, node);
    }
    /// The host's names as they were read last, line breaks included.
    static const std::string& hostName(const OsHwMI& mi) { return mi.hostName_; }
    static const std::string& domainName(const OsHwMI& mi) { return mi.domainName_; }
    static std::map<std::string, unsigned int>& current(OsHwMI& mi) { return mi.inventory_->currentStates; }
    static std::map<std::string, unsigned int>& previous(OsHwMI& mi) { return mi.inventory_->previousStates; }
};

}  // namespace IC
