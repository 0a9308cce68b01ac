#pragma once

#include <atomic>

#include "framework/qx/event.h"
#include "framework/qx/thread.h"

namespace IC {

class StorageBuilder;

/// The thread that watches the disk layout: about two minutes after its start, and every minute from then on,
/// it has the builder compare the layout with the one last seen.
class HardDriveUpdateMonitor : public QX::Thread {
public:
    /// Both are the caller's and must outlive the monitor.
    /// @param completed signalled when run returns
    HardDriveUpdateMonitor(QX::Event* completed, StorageBuilder& builder);
    /// Stops and joins a monitor that still runs.
    ~HardDriveUpdateMonitor() override;

    /// Asks the thread to end. It does so within five seconds, or when the pass that is going on has ended;
    /// at once out of a sleep when it is joined.
    void stop() override;
    /// The thread's work; ends after stop or once HardDriveNodeUpdate is set.
    void* run(void* argument) override;
    /// Whether run has come to its end.
    bool isDone() const { return done; }

private:
    bool ending() const;
    void waitOneMinute() const;

    QX::Event stopSignal_{true};
    QX::Event* const completed_;
    StorageBuilder& builder_;
    std::atomic<bool> done{false};
    std::atomic<bool> stopRequested{false};
};

}  // namespace IC
