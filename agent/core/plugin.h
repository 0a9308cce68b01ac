#pragma once

#include <dlfcn.h>

#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "agent/core/event.h"
#include "agent/core/running_plugins.h"
#include "agent/core/withheld_events.h"
#include "framework/ic/management_interface.h"

namespace cvagent {

/// Hears of what belongs to no call: a message for whoever looks after the agent.
using Tell = std::function<void(const std::string& text)>;
void tellNobody(const std::string& text);

/// A plug-in from its load to its unload. It knows the plug-in by OpenMI and by the exported builder of
/// processor nodes alone. Handles of nodes must be gone before the object is.
class Plugin {
public:
    /// Loads the library and gives it its place: several can then start at once, while the order in which
    /// they were loaded decides their ids.
    /// @param file its path; one without a slash would be looked for at the loader's own places
    /// @param listener hears of alerts, published and withdrawn nodes, see tellEvents(). Null for none.
    ///                 Outlives the object.
    /// @param tell     hears of a stop that went wrong
    /// Throws Problem, with a text of its own for each way in which a file can be no plug-in.
    explicit Plugin(std::string file, Listener* listener = nullptr, Tell tell = tellNobody);
    /// Hands over the callbacks, initializes the plug-in, gives every node its path. At most once. Throws
    /// Problem; what is left then is good for nothing but its end.
    /// @param processors whether its builder of processor nodes is called
    void start(bool processors);
    /// Stops it and starts it anew, with ids of its nodes that none has had before; the former nodes live for
    /// as long as somebody holds them. Throws Problem; it then has no nodes.
    void startAgain();
    /// Takes note of the ids that the plug-in has given away by now.
    void noteIds();
    /// After the start: the listener hears what came meanwhile, and from now on everything.
    void tellEvents() { events_.release(); }
    /// Instead of that: the listener never hears anything, and nobody waits for him. While it starts, too.
    void tellNothing() { events_.abandon(); }
    Plugin(const Plugin&) = delete;
    Plugin& operator=(const Plugin&) = delete;
    /// Unloads the plug-in and closes the library.
    ~Plugin();

    IC::ManagementInterface& interface() const { return *interface_; }
    const std::string& file() const { return file_; }

private:
    static IC::Error nodeLoaded(IC::Node* const& node, const void* plugin);
    static void nodeWithdrawn(const IC::Node& node, const void* plugin);
    static IC::Error alertsCame(const std::vector<IC::Alert>& alerts, const void* plugin);

    void load();
    void open();
    void takePlace();
    void initialize(bool processors, unsigned int firstNode);
    void checkIds() const;
    bool isOwnId(const IC::MutableNode& node) const;
    void stop();

    std::string file_;
    mutable WithheldEvents events_;  // the callbacks have their context as const
    Tell tell_;
    std::unique_ptr<void, int (*)(void*)> library_{nullptr, dlclose};  // outlives what follows
    IC::ManagementInterface* interface_ = nullptr;
    std::optional<RunningPlugin> running_;
    bool begun_ = false;  // there is something to stop
    bool processors_ = false;
    unsigned int lastId_ = 0;  // the highest that was given away; of the thread that has the turn to write
};

}  // namespace cvagent
