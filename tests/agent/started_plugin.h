#pragma once

#include <string>

#include "agent/core/plugin.h"

/// A plug-in that has started and tells its events.
class StartedPlugin : public cvagent::Plugin {
public:
    StartedPlugin(const std::string& file, cvagent::Listener* listener) : Plugin(file, listener) {
        start(true);
        tellEvents();
    }
};
