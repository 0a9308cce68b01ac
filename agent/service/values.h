#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "agent/bus/reader.h"
#include "agent/bus/writer.h"
#include "agent/core/event.h"
#include "agent/core/reading.h"

/// How the agent's values stand in messages; packaging/com.vantrel.Corvista1.xml describes them.
namespace cvagent::service {

/// Microseconds since 1970.
std::uint64_t wallClock();
/// The same of a moment of the steady clock. The same moment gives the same number until the clock is set.
std::uint64_t wallClock(std::chrono::steady_clock::time_point moment);

/// Whether there is a value to tell, be it an old one.
bool isKnown(const Reading& reading);
/// Whether only root and the trusted group may see it.
bool isTrusted(const Reading& reading);

/// The type that the value has as a property of its class's interface; "" for a value that is none.
std::string typeOf(const IC::PropertyValue& value);
/// As a variant of that type.
void putProperty(bus::Writer& writer, const IC::PropertyValue& value);

inline constexpr const char* kReadingType = "(uyvtus)";
inline constexpr const char* kEventType = "(tstusssussssssau)";

void putReading(bus::Writer& writer, const Reading& reading);
/// An array; those that are trusted are left out, or told as missing, for who may not see them.
enum class Withheld { nothing, leftOut, asMissing };
void putReadings(bus::Writer& writer, const std::vector<Reading>& readings, Withheld withheld);
void putEvent(bus::Writer& writer, const Event& event);

/// The words that a variant with a new value comes to, as a person would type them.
std::vector<std::string> takeWords(bus::Reader& reader);

}  // namespace cvagent::service
