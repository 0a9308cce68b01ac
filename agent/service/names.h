#pragma once

#include <string>

#include "agent/core/catalogue.h"

/// How nodes, classes and properties are called on the bus.
namespace cvagent::service {

inline constexpr const char* kBusName = "com.vantrel.Corvista1";
inline constexpr const char* kRootObject = "/com/vantrel/Corvista1";
inline constexpr const char* kAgentInterface = "com.vantrel.Corvista1.Agent";
inline constexpr const char* kNodeInterface = "com.vantrel.Corvista1.Node";
inline constexpr const char* kErrorPrefix = "com.vantrel.Corvista1.Error.";
inline constexpr const char* kNotKnown = "com.vantrel.Corvista1.Error.NotKnown";

/// The object of a node's path: each part escaped, cut where it is longer than any sensible name.
std::string objectOf(const std::string& nodePath);
/// The interface of a class of nodes: "network-port" is com.vantrel.Corvista1.NetworkPort.
std::string interfaceOf(const std::string& className);
/// @param row null for a property that the catalogue does not know
std::string propertyNameOf(unsigned int id, const Property* row);

}  // namespace cvagent::service
