#pragma once

#include <string>
#include <vector>

#include "agent/core/event.h"
#include "agent/core/node_ref.h"
#include "agent/core/request.h"
#include "agent/core/writer.h"

namespace cvagent::change {

/// The host that changes are looked up on and made, as its agent shows it: one of this process or another
/// one. Everything may throw Problem.
class ChangedHost {
public:
    ChangedHost() = default;
    ChangedHost(const ChangedHost&) = delete;
    ChangedHost& operator=(const ChangedHost&) = delete;
    virtual ~ChangedHost() = default;

    /// The node a person means; see findNode in agent/core/tree.h.
    virtual NodeRef find(const std::string& word) = 0;
    /// @param properties see readableIds in agent/core/property_words.h
    virtual std::vector<Reading> read(const NodeRef& node, const std::vector<std::string>& properties,
                                      const Request& request) = 0;
    /// @param words the value, as acceptedValue in agent/core/property_words.h has accepted it
    virtual WriteResult write(const NodeRef& node, const Property& row, const std::vector<std::string>& words,
                              const Request& request) = 0;
    /// What has been found out by looking becomes an event of the agent's.
    virtual void announce(const Event& event) = 0;
    /// Tells what the plug-in has reported because of a call.
    virtual void showErrors(const Request& request) = 0;
};

}  // namespace cvagent::change
