#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"
#include "agent/core/event.h"
#include "agent/core/node_copy.h"
#include "agent/core/reading.h"

/// The agent's values as they stand in the service's messages; packaging/com.vantrel.Corvista1.xml describes
/// them. All throw bus::Error when something else is there.
namespace cvagent::remote {

inline constexpr const char* kNodeContents = "uuuuosssu";

/// What a structure of a node begins with.
NodeCopy takeNode(bus::Reader& reader);
/// Their rows of the catalogue are still to be found: it may have to be read first.
std::vector<Reading> takeReadings(bus::Reader& reader);
Reading takeReading(bus::Reader& reader);
void findRows(std::vector<Reading>& readings, unsigned int nodeType);

/// A value, as a person has typed it: the service judges it once more.
void putWords(bus::Writer& writer, const std::vector<std::string>& words);

/// An event of a kind that this program does not know has its number alone.
struct NumberedEvent {
    std::uint64_t number = 0;
    std::optional<Event> event;
};
NumberedEvent takeEvent(bus::Reader& reader);

}  // namespace cvagent::remote
