#pragma once

#include <string>

#include "framework/qx/event.h"
#include "indications/pass.h"

namespace IC {

class NetworkMonitor;

/// Watches the link states and tells the agent of their changes.
class Indications {
public:
    explicit Indications(NodeTree& tree) : tree_(tree) {}

    /// Starts the network monitor.
    void enableIndications();
    /// Stops it, if there is one.
    void disableIndications();

    void readPrevNetNodeMap() { IC::readPrevNetNodeMap(pass_); }
    void createCurNetNodeMap() { IC::createCurNetNodeMap(tree_, pass_); }
    unsigned int bondedNetNodeStatus(const std::string& bond) {
        return IC::bondedNetNodeStatus(tree_, pass_.previous, bond, pass_.now.slaves);
    }
    void checkAndSendNetAlert() { IC::checkAndSendNetAlert(tree_, pass_); }
    void writePrevNetNodeMap() { IC::writePrevNetNodeMap(pass_); }

private:
    friend struct OsHwMITestAccess;

    NodeTree& tree_;
    Pass pass_;  ///< of the steps that are called by name; the monitor's thread has its own
    QX::Event networkMonitorEnded_{true};
    NetworkMonitor* networkMonitor_ = nullptr;
};

}  // namespace IC
