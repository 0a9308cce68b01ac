#pragma once

#include <string>

#include "agent/service/objects.h"

/// The interfaces that every object on a bus has: properties, introspection, the list of objects.
namespace cvagent::service {

/// The object that a call is for.
struct Place {
    std::string object;
    const NodeView* node;  ///< null where there is none: the agent's object, or one on the way to others
    bool isAgent;
    const Standing& standing;
};

void introspectObject(const CallPointer& call, const Place& place);
void managedObjects(const CallPointer& call, const Place& place);
void getProperty(const CallPointer& call, const Place& place);
void getAllProperties(const CallPointer& call, const Place& place);
/// Answers that nothing can be set so.
void setProperty(const CallPointer& call, const Place& place);

}  // namespace cvagent::service
