#pragma once

/// System calls that a host refuses only when something is badly wrong: refused here on demand, else done.
struct FailingCalls {
    static inline bool getHostName = false;
    static inline bool symbolicLink = false;
};
