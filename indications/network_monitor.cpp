#include "indications/network_monitor.h"

#include <memory>
#include <utility>

#include "indications/contained.h"
#include "indications/globals.h"
#include "mi/stopped_thread.h"

namespace IC {

namespace {

constexpr unsigned long kSecondsBetweenPasses = 30;
constexpr unsigned int kLongestWait = 10;  // seconds for the thread to end

}  // namespace

NetworkMonitor::NetworkMonitor(QX::Event* ended, const NodeTree& tree) : ended_(ended), tree_(tree) {
    const LogScope scope("NetworkMonitor::NetworkMonitor", indicationsLogSource);
}

NetworkMonitor::~NetworkMonitor() {
    const LogScope scope("NetworkMonitor::~NetworkMonitor", indicationsLogSource);
    join();  // the thread still reads our members when it says that it is done
}

void NetworkMonitor::stop() {
    const LogScope scope("NetworkMonitor::stop", indicationsLogSource);
    stopRequested_ = true;
    wake_.signal();
    QX::Thread::sleep(1);
}

void* NetworkMonitor::run(void*) {
    const LogScope scope("NetworkMonitor: run entry", "NetworkMonitor: run exit", indicationsLogSource);
    Pass own;
    while (!ending()) {
        contained([&] { pass(own); });
        if (!ending()) {
            wake_.wait(kSecondsBetweenPasses);
        }
    }
    done_ = true;
    if (!QX::Thread::isLeft()) {
        ended_->signal();
    }
    return nullptr;
}

void NetworkMonitor::pass(Pass& own) const {
    readPrevNetNodeMap(own);
    createCurNetNodeMap(tree_, own);
    if (isLeftBehind() || stopRequested_) {
        return;  // the stop may have ended commands: what they answered is not the host's state
    }
    for (const std::string& name : own.now.untold) {
        logInd(kError) << "Link state of " << name << " not told, a command was ended: it stays as it was";
    }
    checkAndSendNetAlert(tree_, own);
    if (isLeftBehind()) {
        return;  // the file is a later monitor's
    }
    writePrevNetNodeMap(own);
}

void Indications::enableIndications() {
    const LogScope scope("enableIndications", indicationsLogSource);
    // A library that is closed without an unload ends its monitor here: an object made this late is destroyed
    // before the globals that the monitor uses.
    static const struct AtTheEnd {
        Indications& indications;
        ~AtTheEnd() {
            leaveNoThreads();
            if (indications.networkMonitor_ != nullptr) {
                indications.disableIndications();
            }
        }
    } atTheEnd{*this};
    contained([this] {
        logInd(kProgress) << "Creating NetworkMonitor thread.";
        networkMonitorEnded_.wait(0);  // an earlier monitor's end is not this one's
        networkMonitor_ =
            new NetworkMonitor(&networkMonitorEnded_, tree_);  // first: what it calls may stop it
        if (!networkMonitor_->start(nullptr)) {
            logInd(kError) << "NetworkMonitor thread failed.";
            delete std::exchange(networkMonitor_, nullptr);
            return;
        }
        logInd(kProgress) << "NetworkMonitor thread created.";
    });
}

void Indications::disableIndications() {
    const LogScope scope("disableIndications", indicationsLogSource);
    if (networkMonitor_ == nullptr) {
        return;
    }
    logInd(kProgress) << "eventThreadNetIndications: Stopping thread...";
    networkMonitor_->stop();
    // A callback of the agent may stop us on the monitor's own thread: then there is nothing to wait for.
    const bool ownThread = networkMonitor_->isThisThread();
    if (!networkMonitor_->isDone() && !ownThread) {
        logInd(kProgress) << "eventThreadNetIndications: Aborting thread...";
        networkMonitor_->abort();
    }
    for (unsigned int waits = 0; !networkMonitor_->isDone() && !ownThread && waits < kLongestWait; ++waits) {
        logInd(kProgress) << "eventThreadNetIndications: Waiting for thread " << waits << " seconds so far";
        networkMonitorEnded_.wait(1);
    }
    const bool done = networkMonitor_->isDone();
    logInd(kProgress) << (done ? "eventThreadNetIndicationsThread terminated."
                               : "eventThreadNetIndications termination failed.");
    std::unique_ptr<QX::Thread> monitor(std::exchange(networkMonitor_, nullptr));
    if (!done) {
        dropStopped(std::move(monitor));
    }
}

}  // namespace IC
