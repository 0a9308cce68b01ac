#pragma once

#include <atomic>

#include "framework/qx/event.h"
#include "framework/qx/thread.h"
#include "indications/pass.h"

namespace IC {

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

}  // namespace IC
