#include "agent/cli/remote/values.h"

#include <utility>

#include "agent/service/values.h"
#include "framework/qx/whole_number.h"

namespace cvagent::remote {

namespace {

using IC::PropertyValue;

enum Flag : std::uint32_t { stale = 1, missing = 2, timedOut = 4, noValue = 8 };

[[noreturn]] void failUnknown() {
    throw bus::Error(bus::kInvalidArgs, "a value of a kind that is not known");
}

template <class Number>
Number wholeOf(const std::string& word) {
    const auto number = QX::wholeNumber<Number>(word);
    return number ? *number : (failUnknown(), Number());
}

IC::Number takeScaled(bus::Reader& reader) {
    IC::Number number;
    reader.structure("xq", [&] {
        const auto value = wholeOf<long>(reader.asWord());
        number = IC::Number(value, wholeOf<unsigned short>(reader.asWord()));
    });
    return number;
}

/// What a variant of that type holds.
IC::Number takeNumber(bus::Reader& reader, const std::string& type) {
    if (type == "(xq)") {
        return takeScaled(reader);
    }
    if (type == "b") {
        return {reader.flag()};
    }
    if (type == "d") {
        return {reader.real()};
    }
    const std::string word = reader.asWord();
    if (type == "u") {
        return {wholeOf<unsigned int>(word)};
    }
    if (type == "t") {
        return {wholeOf<unsigned long long>(word)};
    }
    return word.empty() ? IC::Number() : (failUnknown(), IC::Number());
}

std::string takeText(bus::Reader& reader, const std::string& type) {
    return type == "ay" ? reader.bytes() : reader.text();
}

/// A list of one type, or of variants where one of them needs another.
template <class Item, class Take>
std::vector<Item> takeList(bus::Reader& reader, const std::string& type, const Take& take) {
    std::vector<Item> items;
    if (type.size() != 2 || type.front() != 'a') {
        failUnknown();
    }
    const std::string contents = type.substr(1);
    reader.array(contents.c_str(), [&] {
        if (contents == "v") {
            reader.variant([&](const std::string& own) { items.push_back(take(reader, own)); });
        } else {
            items.push_back(take(reader, contents));
        }
    });
    return items;
}

PropertyValue takeValue(bus::Reader& reader, unsigned int kind, const std::string& type) {
    switch (kind) {
        case PropertyValue::number:
            return {takeNumber(reader, type), true};
        case PropertyValue::text:
            return {takeText(reader, type), true};
        case PropertyValue::enumeration:
            return {IC::EnumValue(reader.number()), true};
        case PropertyValue::texts:
            return {takeList<std::string>(reader, type, takeText), true};
        case PropertyValue::numbers:
            return {takeList<IC::Number>(reader, type, takeNumber), true};
        default:
            failUnknown();
    }
}

/// The flags stand behind the value and tell whether it is one: without one there is a stand-in.
Reading takeContents(bus::Reader& reader) {
    Reading reading;
    reading.id = reader.number();
    const unsigned int kind = reader.byte();
    reader.variant([&](const std::string& type) {
        if (kind == PropertyValue::none) {
            reader.skip();
        } else {
            reading.value = takeValue(reader, kind, type);
        }
    });
    reader.longNumber();  // when the host said so, which is not shown
    const std::uint32_t flags = reader.number();
    reading.error = reader.text();
    reading.stale = (flags & Flag::stale) != 0;
    reading.missing = (flags & Flag::missing) != 0;
    reading.timedOut = (flags & Flag::timedOut) != 0;
    if ((flags & Flag::noValue) != 0) {
        reading.value = PropertyValue(static_cast<PropertyValue::KindType>(kind), false);
    }
    return reading;
}

std::optional<Event::Kind> kindOf(const std::string& name) {
    for (std::size_t i = 0; i < kEventKinds; ++i) {
        if (const auto kind = static_cast<Event::Kind>(i); name == eventName(kind)) {
            return kind;
        }
    }
    return std::nullopt;
}

void takeCodes(bus::Reader& reader, Event& event) {
    const std::vector<std::uint32_t> codes = reader.numbers();
    if (codes.size() == 3) {
        event.firstCode = codes[0];
        event.secondCode = codes[1];
        event.eventCode = codes[2];
    }
}

}  // namespace

NodeCopy takeNode(bus::Reader& reader) {
    NodeCopy node;
    for (unsigned int* number : {&node.id, &node.parent, &node.type, &node.index}) {
        *number = reader.number();
    }
    reader.path();
    reader.text();  // its class, which the type tells
    node.path = reader.text();
    node.description = reader.text();
    node.status = reader.number();
    return node;
}

Reading takeReading(bus::Reader& reader) {
    Reading reading;
    reader.structure("uyvtus", [&] { reading = takeContents(reader); });
    return reading;
}

std::vector<Reading> takeReadings(bus::Reader& reader) {
    std::vector<Reading> readings;
    reader.array(service::kReadingType, [&] { readings.push_back(takeReading(reader)); });
    return readings;
}

void findRows(std::vector<Reading>& readings, unsigned int nodeType) {
    for (Reading& reading : readings) {
        reading.row = findProperty(nodeType, reading.id);
    }
}

void putWords(bus::Writer& writer, const std::vector<std::string>& words) {
    if (words.size() == 1) {
        writer.variant("s", [&] { writer.put(words.front()); });
    } else {
        writer.variant("as", [&] { writer.put(words); });
    }
}

NumberedEvent takeEvent(bus::Reader& reader) {
    constexpr std::uint64_t kMicroseconds = 1000000;
    NumberedEvent taken;
    Event event;
    std::optional<Event::Kind> kind;
    reader.structure("tstusssussssssau", [&] {
        event.number = reader.longNumber();
        kind = kindOf(reader.text());
        event.time = static_cast<std::time_t>(reader.longNumber() / kMicroseconds);
        event.nodeId = reader.number();
        for (std::string* text : {&event.nodeClass, &event.path, &event.message}) {
            *text = reader.text();
        }
        event.property = reader.number();
        for (std::string* text : {&event.propertyName, &event.before, &event.after, &event.caller,
                                  &event.wanted, &event.verdict}) {
            *text = reader.text();
        }
        takeCodes(reader, event);
    });
    taken.number = event.number;
    if (kind) {
        event.kind = *kind;
        taken.event = std::move(event);
    }
    return taken;
}

}  // namespace cvagent::remote
