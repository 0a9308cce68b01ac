#pragma once

#include "framework/ic/management_interface.h"

/// A management interface that holds what a test puts into it.
class NodeList : public IC::ManagementInterface {
public:
    NodeList() { initialize(1, IC::Number(1U), IC::Number(1U)); }

    /// @return the new node's id
    unsigned int add(unsigned int type, unsigned int parent, unsigned int index = 0) {
        const unsigned int id = takeNodeId();
        appendNode(new IC::MutableNode(id, parent, miIds(), type, index));
        return id;
    }
};
