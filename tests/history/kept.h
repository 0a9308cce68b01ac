#pragma once

#include <string>
#include <vector>

#include "agent/history/history.h"

/// What the tests of the history share.
namespace kept {

inline const cvagent::HistoryPlace kPlace{"/var/lib/corvista/", true};

inline cvagent::Event event(const std::string& message,
                            cvagent::Event::Kind kind = cvagent::Event::Kind::written,
                            std::time_t time = std::time(nullptr)) {
    cvagent::Event event;
    event.kind = kind;
    event.time = time;
    event.path = "/oshw/root/network-port:eth0";
    event.message = message;
    return event;
}

inline cvagent::Event alert(const std::string& message, const std::string& path = "/network-port:eth0") {
    cvagent::Event told = event(message, cvagent::Event::Kind::alert);
    told.path = path;
    told.firstCode = 1;
    told.eventCode = 12;
    return told;
}

/// @return the event's number
inline std::uint64_t append(cvagent::History& history, const cvagent::Event& event) {
    std::vector<cvagent::Event> one = {event};
    history.append(one);
    return one.front().number;
}

inline std::vector<std::string> messages(const std::vector<cvagent::HistoryEntry>& entries) {
    std::vector<std::string> all;
    for (const cvagent::HistoryEntry& entry : entries) {
        all.push_back(entry.event.message);
    }
    return all;
}

inline std::vector<std::uint64_t> numbers(const std::vector<cvagent::HistoryEntry>& entries) {
    std::vector<std::uint64_t> all;
    for (const cvagent::HistoryEntry& entry : entries) {
        all.push_back(entry.event.number);
    }
    return all;
}

}  // namespace kept
