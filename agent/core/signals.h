#pragma once

namespace cvagent {

/// SIGINT, SIGTERM and SIGHUP asked of the program. It ends within a second, whatever hangs:
/// - while somebody has said that it may end in order (OrderlyEnd) it goes on, to stop the plug-in and remove
///   the plug-in's files, but not for long;
/// - at any other time, and when that takes too long, no command begins any more, those that run are killed
///   with all they have started, and the program dies by the signal. Nobody waits for the other threads: what
///   they hang in may never return.
/// A second signal changes nothing. SIGHUP stays ignored where the caller ignores it (nohup). Handlers,
/// unlike ignored or blocked signals, do not reach the commands the plug-in starts.
class StopSignals {
public:
    /// Makes SIGPIPE and SIGXFSZ errors of the write.
    static void becomeWriteErrors();
    /// In place of install, for what has to come to its end: neither these nor the keys of a terminal end or
    /// stop the process any more.
    static void ignore();
    /// Installs the handlers, those as well, and starts the thread that ends the process. To be called once,
    /// before the first command begins and after what a process does before its first thread. Where the
    /// system gives no thread, signals keep ending the program at once.
    static void install();
    /// The signal that came first, 0 for none yet.
    static int received();
    /// Becomes readable when a signal comes. Nobody reads it. -1 when there are no descriptors left.
    static int descriptor();
    /// Ends the process by the signal that came, as its parent expects to see it.
    [[noreturn]] static void die();
};

/// While it lives, the thread that made it is at nothing that hangs, or knows how to end it: it looks for
/// StopSignals::received, or is about to leave anyway.
class OrderlyEnd {
public:
    OrderlyEnd();
    OrderlyEnd(const OrderlyEnd&) = delete;
    OrderlyEnd& operator=(const OrderlyEnd&) = delete;
    ~OrderlyEnd();
};

}  // namespace cvagent
