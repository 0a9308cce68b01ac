#include "storage/drive_monitor.h"

#include "mi/globals.h"
#include "mi/log.h"
#include "mi/stopped_thread.h"
#include "storage/storage_builder.h"

namespace IC {

namespace {

constexpr int kSlices = 12;
constexpr unsigned int kSliceMilliseconds = 5000;

}  // namespace

HardDriveUpdateMonitor::HardDriveUpdateMonitor(QX::Event* completed, StorageBuilder& builder)
    : completed_(completed), builder_(builder) {
    const Operation operation;
    log(kProgress) << "HardDriveUpdateMonitor::const: entry";
    log(kProgress) << "HardDriveUpdateMonitor::Const: exit";
}

HardDriveUpdateMonitor::~HardDriveUpdateMonitor() {
    const LogScope scope("HardDriveUpdateMonitor::~HardDriveUpdateMonitor");
    // Before the members that run uses are gone.
    stopRequested = true;
    joinWithPatience(*this);
}

void HardDriveUpdateMonitor::stop() {
    const LogScope scope("HardDriveUpdateMonitor::stop");
    stopRequested = true;
    stopSignal_.signal();
    QX::Thread::sleep(1);
}

void* HardDriveUpdateMonitor::run(void*) {
    {
        const LogScope scope("HardDriveUpdateMonitor::run");
        // One minute more before the first pass: start-up has only just read the layout.
        waitOneMinute();
        while (!ending()) {
            waitOneMinute();
            // Also after a stop that came during this wait: a loop once begun ends with its comparison.
            guarded("HDDThreadProcess", [this] { builder_.HDDThreadProcess(); });
        }
    }
    done = true;
    if (!QX::Thread::isLeft()) {
        completed_->signal();
    }
    return nullptr;
}

bool HardDriveUpdateMonitor::ending() const {
    return done || stopRequested || HardDriveNodeUpdate;
}

void HardDriveUpdateMonitor::waitOneMinute() const {
    for (int slice = 0; slice < kSlices; ++slice) {
        if (!ending()) {
            QX::Thread::sleep(kSliceMilliseconds);
        }
    }
}

void StorageBuilder::startHDDThread() {
    const LogScope scope;
    // An earlier monitor would take what it has just published for known to this one.
    driveMonitor_.reset();
    driveMonitorRuns_ = false;
    // Also after an earlier start and stop the first pass publishes everything once.
    driveFingerprints_ = {};
    partitionFingerprints_ = {};
    try {
        driveMonitor_ = std::make_unique<HardDriveUpdateMonitor>(&driveMonitorEnded_, *this);
        if (driveMonitor_->start(nullptr)) {
            driveMonitorRuns_ = true;
            log(kProgress) << "HardDriveUpdateThread thread created.";
        } else {
            log(kError) << "HardDriveUpdateThread thread failed.";
        }
    } catch (...) {
        log(kError) << "HardDriveUpdateThread Caught unknown exception";
    }
}

void StorageBuilder::stopHardDriveMonitor() {
    if (!driveMonitorRuns_) {
        return;
    }
    driveMonitorRuns_ = false;
    driveMonitor_->stop();
    log(kProgress) << "disable Hard Drive updates: waiting for HardDriveUpdateMonitor Termination ";
    joinWithPatience(*driveMonitor_);
    log(kProgress) << "disable Hard Drive updates: HardDriveUpdateMonitor terminated.";
    dropStopped(std::move(driveMonitor_));
}

}  // namespace IC
