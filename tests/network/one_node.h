#pragma once

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "network/ip_config_node.h"
#include "network/port_node.h"
#include "tests/network/port_host.h"

/// A recorded host whose interfaces get a node when a test asks for it, filled as the walk over the
/// interfaces fills it, without the rest of the tree. Writes act, as they do once the plug-in has started.
class OneNode {
public:
    OneNode(FakeHost& host, const std::string& recorded) : host_(host) {
        host.copyTree(recorded);
        IC::OSHWMI::bInitflag = true;
    }
    OneNode(const OneNode&) = delete;
    OneNode& operator=(const OneNode&) = delete;
    ~OneNode() { IC::OSHWMI::bInitflag = false; }

    std::shared_ptr<IC::NetworkPortNode> port(const std::string& name) const {
        const auto node = make<IC::NetworkPortNode>(12, name);
        node->fill();
        host_.clearCalls();
        return node;
    }
    /// One whose store is empty: enough for what is read live.
    static std::shared_ptr<IC::IPConfigNode> emptyConfig(const std::string& name) {
        return make<IC::IPConfigNode>(29, name);
    }
    std::shared_ptr<IC::IPConfigNode> config(const std::string& name) const {
        const auto node = emptyConfig(name);
        std::map<std::string, std::string> settings;
        node->fill({"linux-a", "example.com", {"192.0.2.53", "192.0.2.54"}, {"example.com"}}, settings);
        node->complete(&IC::myoshwmi);
        host_.clearCalls();
        return node;
    }

private:
    template <class Node>
    static std::shared_ptr<Node> make(unsigned int type, const std::string& name) {
        return std::make_shared<Node>(900, 1, std::vector<unsigned int>{1}, type, 1, name);
    }

    FakeHost& host_;
};
