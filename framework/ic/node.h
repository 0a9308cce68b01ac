#pragma once

#include <map>
#include <shared_mutex>
#include <string>
#include <vector>

#include "framework/export.h"
#include "framework/ic/error.h"
#include "framework/ic/property_value.h"

namespace IC {

/// A node of the tree as the agent sees it. Every operation may be called from any thread at any time.
/// The order of the virtual operations is part of the binary contract between agent and plug-in.
class CORVISTA_API Node {
public:
    Node() = default;
    Node(const Node&) = delete;
    Node& operator=(const Node&) = delete;

    virtual ~Node();
    virtual unsigned int getStatus() const = 0;
    virtual std::string getDescription() const = 0;
    virtual Error getProperty(unsigned int id, PropertyValue& out) const = 0;
    /// Every stored property by id; nothing is asked of the host.
    virtual Error getProperties(std::map<unsigned int, PropertyValue>& out) const = 0;
    virtual Error setProperty(const unsigned int& id, const PropertyValue& value) = 0;
    /// "path (type T, id N)", for log lines.
    virtual operator std::string() const = 0;

    /// The node's place in the tree ("/oshw/root/computer"), as the agent set it; before that what the path
    /// source says, "" without one.
    std::string getPath() const;
    /// The agent's answer for nodes that it has not seen yet: the plug-in's monitors run, and send alerts
    /// about nodes, before the agent reads the map. It may be called on any thread. Null for none.
    static void setPathSource(std::string (*source)(const Node& node));

protected:
    void storePath(const std::string& path);

private:
    mutable std::shared_mutex pathGuard_;
    std::string path_;
};

}  // namespace IC
