#pragma once

#include <memory>
#include <string>
#include <vector>

#include "mi/globals.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/support/fake_host.h"
#include "tests/support/plugin_access.h"

/// A recorded host with the plug-in's tree built on it down to the interfaces, and no monitor.
class PortHost {
public:
    PortHost(FakeHost& host, const std::string& recorded) : host_(host) {
        host.copyTree(recorded);
        host.directory("/opt/vantrel/corvista/data");
        IC::OsHwMITestAccess::makeInventory(mi_);
        mi_.updateHostAndDomainName();
        mi_.createOsHwNodes();
        mi_.createRootNode();
        mi_.createComputerNodes();
        mi_.createChassisNodes();
        mi_.createPlanarNodes();
        mi_.createNetworkControllerNodes();
        host.clearCalls();
    }
    PortHost(const PortHost&) = delete;
    PortHost& operator=(const PortHost&) = delete;
    ~PortHost() { mi_.unload(); }

    PortHost& build() {
        mi_.createNetworkPortNodes(false);
        IC::OSHWMI::bInitflag = true;
        host_.clearCalls();
        return *this;
    }

    /// The first node of a type for an interface, null when there is none.
    std::shared_ptr<IC::MutableNode> node(unsigned int type, const std::string& name) const {
        for (const auto& candidate : mi_.holdAll()) {
            if (candidate->nodeType() == type && text(stored(*candidate, 108)) == name) {
                return candidate;
            }
        }
        return nullptr;
    }
    std::shared_ptr<IC::MutableNode> port(const std::string& name) const { return node(12, name); }
    std::shared_ptr<IC::MutableNode> config(const std::string& name) const { return node(29, name); }
    /// The interfaces with nodes of a type, in the order they were made.
    std::vector<std::string> names(unsigned int type) const {
        std::vector<std::string> found;
        for (const auto& candidate : mi_.holdAll()) {
            if (candidate->nodeType() == type) {
                found.push_back(text(stored(*candidate, 108)));
            }
        }
        return found;
    }
    unsigned int controller() const {
        for (const auto& candidate : mi_.holdAll()) {
            if (candidate->nodeType() == 49) {
                return candidate->getNodeId();
            }
        }
        return 0;
    }

    /// What the node holds, without asking the host; an empty value when it holds nothing.
    static IC::PropertyValue stored(const IC::MutableNode& node, unsigned int id) {
        IC::PropertyValue value;
        node.IC::MutableNode::getProperty(id, value);
        return value;
    }
    static IC::PropertyValue live(const IC::MutableNode& node, unsigned int id) {
        IC::PropertyValue value;
        EXPECT_EQ(node.getProperty(id, value).getStatus(), 0) << "property " << id;
        return value;
    }
    static std::string text(const IC::PropertyValue& value) { return static_cast<std::string>(value); }

    IC::OsHwMI& mi() { return mi_; }

private:
    FakeHost& host_;
    IC::OsHwMI& mi_ = IC::myoshwmi;
};

inline IC::PropertyValue text(const std::string& value) {
    return {value, true};
}
inline IC::PropertyValue texts(const std::vector<std::string>& value) {
    return {value, true};
}
inline IC::PropertyValue number(unsigned int value) {
    return {IC::Number(value), true};
}
inline IC::PropertyValue number64(unsigned long long value) {
    return {IC::Number(value), true};
}
inline IC::PropertyValue flag(bool value) {
    return {IC::Number(value), true};
}
inline IC::PropertyValue enumeration(unsigned int value) {
    return {IC::EnumValue(value), true};
}
inline IC::PropertyValue numbers(const std::vector<IC::Number>& value) {
    return {value, true};
}
