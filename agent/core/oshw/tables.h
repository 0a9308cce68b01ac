#pragma once

#include "agent/core/catalogue.h"

/// What the OS/hardware plug-in brings to the catalogue.
namespace cvagent::oshw {

const CatalogueTable& table();

// Its parts.
std::span<const Property> hostProperties();
std::span<const Property> storageProperties();
std::span<const Property> networkPortProperties();
std::span<const Property> ipConfigProperties();
std::span<const Effect> effects();

}  // namespace cvagent::oshw
