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
    /// As they were set last; 0 and "" before.
    virtual unsigned int getStatus() const;
    virtual std::string getDescription() const;
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
    void storeStatus(unsigned int status);
    void storeDescription(const std::string& description);

private:
    mutable std::shared_mutex factsGuard_;  // guards everything below
    std::string path_;
    unsigned int status_ = 0;
    std::string description_;
};

}  // namespace IC
