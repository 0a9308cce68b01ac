#pragma once

#include <atomic>
#include <string>
#include <vector>

#include "framework/qx/event.h"
#include "framework/qx/thread.h"
#include "indications/comparison.h"
#include "mi/node_tree.h"

namespace IC {

/// What the steps of a pass hand on to each other, and a pass to the next.
struct Pass {
    LinkStates previous;  ///< as the pass before found them
    Settled now;
    BondMembers members;
};

// The steps, in the order of a pass. Indications has them by the same names.

/// Reads the states of the last pass from the state file.
void readPrevNetNodeMap(Pass& pass);
/// Takes the states of now from the published nodes.
void createCurNetNodeMap(const NodeTree& tree, Pass& pass);
/// Asks for a bond's members, and those that the last pass knew for their states.
/// @param members receives those that the kernel lists
/// @return what the first member whose change means something means for the bond; LinkState::noVerdict
unsigned int bondedNetNodeStatus(const NodeTree& tree, const LinkStates& previous, const std::string& bond,
                                 std::vector<std::string>& members);
/// Tells the agent what is not as it was.
void checkAndSendNetAlert(const NodeTree& tree, const Pass& pass);
/// Keeps the states of now across restarts of the agent.
void writePrevNetNodeMap(const Pass& pass);

/// The thread that compares the link states with those of the last pass, every 30 seconds.
class NetworkMonitor : public QX::Thread {
public:
    /// @param ended signalled when run returns; not owned
    NetworkMonitor(QX::Event* ended, const NodeTree& tree);
    /// Waits for a thread that still runs.
    ~NetworkMonitor() override;

    /// Asks the thread to end; a sleeping pass wakes at once.
    void stop() override;
    void* run(void* argument) override;

    /// Whether run has left its loop.
    bool isDone() const { return done_; }

private:
    void pass(Pass& own) const;
    bool ending() const { return done_ || stopRequested_; }

    QX::Event wake_{true};
    QX::Event* const ended_;
    const NodeTree& tree_;
    std::atomic<bool> done_{false};
    std::atomic<bool> stopRequested_{false};
};

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
