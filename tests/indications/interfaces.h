#pragma once

#include <string>
#include <utility>
#include <vector>

#include "framework/ic/mutable_node.h"
#include "indications/globals.h"
#include "mi/command.h"
#include "oshwmi/os_hw_mi.h"
#include "tests/support/plugin_access.h"

/// An interface's node whose state a test sets.
class InterfaceNode : public IC::MutableNode {
public:
    InterfaceNode(unsigned int id, const std::string& name, unsigned int state)
        : MutableNode(id, 1, {1}, 12, 0) {
        setPath("/ports/" + name);
        MutableNode::setProperty(108, {name, true});
        is(state);
    }
    void is(unsigned int state) { MutableNode::setProperty(123, {IC::Number(state), true}); }
};

/// An interface that is asked by a command; somebody ends that by force when `hangs`, or the next one.
class AskedNode : public InterfaceNode {
public:
    using InterfaceNode::InterfaceNode;
    IC::Error getProperty(unsigned int id, IC::PropertyValue& value) const override {
        if (id == 123 && (hangs || std::exchange(hangsOnce, false))) {
            const IC::HostCommand command("kill -KILL $$");
        }
        return MutableNode::getProperty(id, value);
    }
    bool hangs = false;
    mutable bool hangsOnce = false;
};

/// The plug-in object with interfaces of the test's own and no monitor.
class Interfaces {
public:
    Interfaces() { IC::OsHwMITestAccess::makeInventory(mi_); }
    Interfaces(const Interfaces&) = delete;
    Interfaces& operator=(const Interfaces&) = delete;
    ~Interfaces() { mi_.unload(); }

    template <class NodeT = InterfaceNode>
    NodeT& add(const std::string& name, unsigned int state) {
        auto* node = new NodeT(++lastId_, name, state);
        IC::OsHwMITestAccess::addInterface(mi_, name, node);
        return *node;
    }
    IC::OsHwMI& mi() { return mi_; }
    /// What the steps of a pass work on when a test calls them.
    static IC::LinkStates& current() { return IC::OsHwMITestAccess::pass().now.current; }
    static IC::LinkStates& previous() { return IC::OsHwMITestAccess::pass().previous; }
    static std::vector<std::string>& slaves() { return IC::OsHwMITestAccess::pass().now.slaves; }
    static std::vector<std::string>& untold() { return IC::OsHwMITestAccess::pass().now.untold; }

private:
    IC::OsHwMI& mi_ = IC::myoshwmi;
    unsigned int lastId_ = 100;
};
