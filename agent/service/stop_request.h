#pragma once

#include <csignal>

#include <array>

namespace cvagent::service {

/// Takes SIGTERM, SIGINT and SIGHUP from StopSignals until the service has brought what it does to an end: a
/// change of the host is not to be cut off in its middle. One at a time, made after the process is prepared.
class StopRequest {
public:
    StopRequest();
    StopRequest(const StopRequest&) = delete;
    StopRequest& operator=(const StopRequest&) = delete;
    ~StopRequest();

    /// Readable when a signal has come; take() reads it.
    int descriptor() const;
    /// The next signal; 0 for none.
    static int take();
    /// Gives the signals back: from now on they end the process within a second.
    void release();

private:
    static constexpr std::array<int, 3> kSignals = {SIGTERM, SIGINT, SIGHUP};
    std::array<struct sigaction, kSignals.size()> before_{};
    bool released_ = false;
};

}  // namespace cvagent::service
