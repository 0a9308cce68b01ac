#pragma once

#include <atomic>

#include "framework/qx/event.h"
#include "framework/qx/thread.h"

namespace IC {

/// The thread that compares the link states with those of the last pass, every 30 seconds.
class NetworkMonitor : public QX::Thread {
public:
    /// @param ended signalled when run returns; not owned
    explicit NetworkMonitor(QX::Event* ended);
    /// Waits for a thread that still runs.
    ~NetworkMonitor() override;

    /// Asks the thread to end; a sleeping pass wakes at once.
    void stop() override;
    void* run(void* argument) override;

    /// Whether run has left its loop.
    bool isDone() const { return done_; }

private:
    void pass();
    bool ending() const { return done_ || stopRequested_; }

    QX::Event wake_{true};
    QX::Event* const ended_;
    std::atomic<bool> done_{false};
    std::atomic<bool> stopRequested_{false};
};

}  // namespace IC
