#pragma once

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

/// A loaded and initialized plug-in. It knows the plug-in by OpenMI and by the exported builder of processor
/// nodes alone. Handles of nodes must be gone before the object is.
class Plugin {
public:
    /// Loads the library, hands over the callbacks, initializes it, gives every node its path.
    /// @param file its path; one without a slash would be looked for at the loader's own places
    /// @param listener hears of alerts, published and withdrawn nodes, from the moment when the start has
    ///                 succeeded: what came before it hears then. Null for none. Outlives the object.
    /// @param tell     hears of a stop that went wrong
    /// @param processors whether its builder of processor nodes is called
    /// Throws Problem, with a text of its own for each way in which a file can be no plug-in.
    Plugin(const std::string& file, Listener* listener, Tell tell = tellNobody, bool processors = true);
    /// The same in two steps, so that several can start at once while the order in which they were loaded
    /// decides their ids: loaded() loads the library and gives it its place, start() and tellEvents() do the
    /// rest.
    static std::unique_ptr<Plugin> loaded(const std::string& file, Listener* listener, Tell tell);
    /// At most once. Throws Problem; what is left then is good for nothing but its end.
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

    struct LoadOnly {};
    Plugin(const std::string& file, Listener* listener, Tell tell, LoadOnly tag);

    void load();
    void open();
    void takePlace();
    void initialize(bool processors, unsigned int firstNode);
    void checkIds() const;
    bool isOwnId(const IC::MutableNode& node) const;
    void stop();
    void close();

    std::string file_;
    mutable WithheldEvents events_;  // the callbacks have their context as const
    Tell tell_;
    void* library_ = nullptr;
    IC::ManagementInterface* interface_ = nullptr;
    std::optional<RunningPlugin> running_;
    bool begun_ = false;  // there is something to stop
    bool processors_ = false;
    unsigned int lastId_ = 0;  // the highest that was given away; of the thread that has the turn to write
};

}  // namespace cvagent
