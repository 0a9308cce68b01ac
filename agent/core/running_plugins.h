#pragma once

#include <string>

#include "framework/ic/management_interface.h"

namespace cvagent {

/// The numbers that a plug-in is given: no two that run in this process ever use the same one.
struct IdRange {
    unsigned int interfaceId;
    unsigned int ownNode;
    unsigned int firstNode;
    unsigned int last;
};

/// The place of one plug-in among those that run in this process. The framework asks for nodes and paths
/// without saying which plug-in it is about; while a place is taken, its plug-in is found. Any thread.
class RunningPlugin {
public:
    /// Throws Problem (refused) when the interface has a place already or all are taken.
    explicit RunningPlugin(IC::ManagementInterface& interface);
    RunningPlugin(const RunningPlugin&) = delete;
    RunningPlugin& operator=(const RunningPlugin&) = delete;
    /// Returns when nobody looks into the plug-in any more.
    ~RunningPlugin();

    /// The first place has 1, 1 and 2.
    IdRange ids() const;
    /// Looks nodes up by name: among the plug-in's own, and when it has none of that name, among the others'.
    IC::FindCallBack finder() const;

private:
    std::size_t place_ = 0;
};

}  // namespace cvagent
