#pragma once

namespace cvagent {

/// SIGINT, SIGTERM and SIGHUP asked of the program: remembered, so that the plug-in is unloaded in order, and
/// shown on a descriptor, so that a wait for events ends. The handlers do nothing else. SIGPIPE is made an
/// error of the write. Handlers, unlike ignored or blocked signals, do not reach the commands the plug-in
/// starts.
class StopSignals {
public:
    /// Installs the handlers, once for the process.
    static void install();
    /// The signal that came, 0 for none yet.
    static int received();
    /// Becomes readable when a signal comes. Nobody reads it.
    static int descriptor();
    /// Ends the process by the signal that came, as its parent expects to see it.
    [[noreturn]] static void die();
};

}  // namespace cvagent
