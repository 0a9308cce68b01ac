#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <thread>

#include "agent/core/plugin.h"
#include "agent/core/problem.h"

namespace cvagent {

/// A plug-in on its way into the tree: loaded, then started, maybe on a thread of its own. Used by one
/// thread.
class PluginStart {
public:
    /// Done with a plug-in that has started, before anybody else sees it.
    using Started = std::function<void(const Plugin&)>;

    /// Loads the library; what goes wrong is kept as the problem.
    /// @param listener, started see Plugin; not touched any more once the start has been given up
    PluginStart(std::string file, Listener* listener, Tell tell, Started started);
    PluginStart(PluginStart&&) = default;
    PluginStart(const PluginStart&) = delete;
    PluginStart& operator=(const PluginStart&) = delete;
    PluginStart& operator=(PluginStart&&) = delete;
    ~PluginStart() = default;

    /// Starts it on the calling thread, for as long as that takes.
    void here(bool processors);
    /// Starts it on a thread of its own. False when the system gives none.
    bool aside(bool processors);
    /// Returns when it has started or failed, or when it has taken too long since it began: then it is left
    /// to itself, library, thread and all, and has failed.
    /// @param longest after a sixth of it somebody is told what is waited for
    void await(std::chrono::milliseconds longest);

    const std::string& file() const { return file_; }
    /// Null when it has failed.
    std::unique_ptr<Plugin> take();
    std::optional<Problem> problem() const;

private:
    struct State;
    static void run(State& state, const std::string& file, bool processors);

    std::string file_;
    std::shared_ptr<State> state_;  // the thread's, too
    std::thread thread_;
};

}  // namespace cvagent
