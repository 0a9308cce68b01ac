#pragma once

#include <string>

#include "agent/event.h"
#include "framework/ic/management_interface.h"

namespace cvagent {

/// The plug-in beside this program: in its build tree or where it was installed. Throws Failure when it is at
/// neither place; nowhere else is it looked for.
std::string pluginBesideProgram();

/// A loaded and initialized plug-in. It knows the plug-in by OpenMI and by the exported builder of processor
/// nodes alone. Handles of nodes must be gone before the object is.
class Plugin {
public:
    /// Loads the library, hands over the callbacks, initializes it, gives every node its path.
    /// @param file its path; one without a slash would be looked for at the loader's own places
    /// @param listener hears of alerts, published and withdrawn nodes; null for none. Outlives the object.
    /// Throws Failure, with a text of its own for each way in which a file can be no plug-in.
    Plugin(const std::string& file, Listener* listener);
    Plugin(const Plugin&) = delete;
    Plugin& operator=(const Plugin&) = delete;
    /// Unloads the plug-in and closes the library.
    ~Plugin();

    IC::ManagementInterface& interface() { return *interface_; }

private:
    static IC::Error nodeLoaded(IC::Node* const& node, const void* plugin);
    static void nodeWithdrawn(const IC::Node& node, const void* plugin);
    static IC::Error alertsCame(const std::vector<IC::Alert>& alerts, const void* plugin);
    static std::string pathOfUnseen(const IC::Node& node);
    static IC::Error findByName(const std::string& name, IC::Node** node);

    void load();
    void open();
    void start();
    void stop();
    void close();

    std::string file_;
    Listener* listener_;
    void* library_ = nullptr;
    IC::ManagementInterface* interface_ = nullptr;
};

}  // namespace cvagent
