#include "computer/computer_node.h"

#include <sys/time.h>
#include <unistd.h>

#include <array>
#include <cstring>
#include <ctime>
#include <string>
#include <utility>

#include "computer/owner_data.h"
#include "computer/time_zone.h"
#include "framework/qx/corvista_utilities.h"
#include "framework/qx/date_time.h"
#include "mi/command.h"
#include "mi/globals.h"
#include "mi/log.h"
#include "mi/property_table.h"
#include "mi/text.h"

namespace IC {

namespace {

Error readHostName(const ComputerNode&, PropertyValue& out) {
    log(kProgress) << "ComputerNode::getProperty Name Inside Case";
    std::array<char, 256> name{};
    if (gethostname(name.data(), name.size()) == -1) {
        log(kError) << "ComputerNode::getProperty Name::GetHostname Failed";
        return result(false);
    }
    const std::string text(name.data(), strnlen(name.data(), name.size()));
    out = PropertyValue(trimEnd(text), true);
    return result(true);
}

template <const wchar_t* key>
Error readOwner(const ComputerNode&, PropertyValue& out) {
    const char* directory = QX::CorvistaUtilities::getMoraineDataDir();
    if (directory == nullptr) {
        log(kNoAnswer) << "ComputerNode::getProperty : OwnerContact/OwnerName - NULL returned by "
                          "CorvistaUtilities::getMoraineDataDir();";
        return result(false);
    }
    try {
        out = PropertyValue(OwnerData(directory).read(key), true);
    } catch (...) {
        log(kNoAnswer) << "ComputerNode::getProperty : OwnerContact/OwnerName - Cannot read asset dat file.";
        return result(false);
    }
    return result(true);
}

template <const wchar_t* key, unsigned int id>
Error writeOwner(ComputerNode& node, const PropertyValue& value) {
    const char* directory = QX::CorvistaUtilities::getMoraineDataDir();
    if (directory == nullptr) {
        log(kNoAnswer) << "ComputerNode::setProperty : OwnerContact/OwnerName - NULL returned by "
                          "CorvistaUtilities::getMoraineDataDir()";
        return result(false);
    }
    try {
        OwnerData(directory).write(key, static_cast<std::string>(value));
    } catch (...) {
        log(kNoAnswer) << "ComputerNode::setProperty : OwnerContact/OwnerName - Cannot write asset dat file.";
        return result(false);
    }
    return node.MutableNode::setProperty(id, value);
}

void runAndForget(const Command& command) {
    const HostCommand run(command);
}

/// The result does not tell whether the host is going down: a reader asks whether it still answers.
Error writePowerAction(ComputerNode& node, const PropertyValue& value) {
    switch (static_cast<unsigned int>(value)) {
        case PowerAction::restart:
            runAndForget("shutdown -r now");
            break;
        case PowerAction::halt:
            runAndForget("shutdown -h now");
            break;
        default:
            break;
    }
    return node.MutableNode::setProperty(ComputerProperty::powerAction, value);
}

Error readCurrentTime(const ComputerNode&, PropertyValue& out) {
    out = PropertyValue(Number(static_cast<long>(time(nullptr)), 0), true);
    return result(true);
}

/// A time that a long cannot hold (on 32 bits those beyond January 2038) throws and leaves the clock alone.
Error writeCurrentTime(ComputerNode&, const PropertyValue& value) {
    const QX::DateTime wanted(static_cast<std::string>(value), 3);
    const timeval seconds{static_cast<long>(wanted), 0};
    return result(settimeofday(&seconds, nullptr) == 0);
}

Error readTimeZoneOffset(const ComputerNode&, PropertyValue& out) {
    // localtime_r alone looks at /etc/localtime once in the life of a process.
    tzset();
    const time_t now = time(nullptr);
    tm local{};
    localtime_r(&now, &local);
    constexpr long kSecondsPerMinute = 60;
    const long minutes = local.tm_gmtoff / kSecondsPerMinute;
    out = PropertyValue(Number(static_cast<double>(minutes)), true);
    return result(true);
}

Error writeTimeZoneOffset(ComputerNode&, const PropertyValue& value) {
    return result(setTimezone(static_cast<unsigned int>(value)));
}

Error readConstant200(const ComputerNode&, PropertyValue& out) {
    out = PropertyValue(Number(1U), true);
    return result(true);
}

// The clock reads as a number and is set by a text, the zone reads with daylight saving included and is set
// by its standard offset: agents rely on both.
constexpr Property<ComputerNode> kProperties[] = {
    {ComputerProperty::hostName, "HostName", readHostName},
    {ComputerProperty::ownerContact, "OwnerContact", readOwner<OwnerData::contact>,
     writeOwner<OwnerData::contact, ComputerProperty::ownerContact>},
    {ComputerProperty::ownerName, "OwnerName", readOwner<OwnerData::name>,
     writeOwner<OwnerData::name, ComputerProperty::ownerName>},
    {ComputerProperty::powerAction, "PowerAction", nullptr, writePowerAction},
    {ComputerProperty::currentTime, "CurrentTime", readCurrentTime, writeCurrentTime},
    {ComputerProperty::timeZoneOffset, "TimeZoneOffset", readTimeZoneOffset, writeTimeZoneOffset},
    {ComputerProperty::constant200, "ComputerConstant200", readConstant200},
};
static_assert(idsAscend(kProperties));

}  // namespace

ComputerNode::ComputerNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                           unsigned int nodeType, unsigned int index)
    : MutableNode(nodeId, linkedId, std::move(miIds), nodeType, index) {
    const LogScope scope("ComputerNode::ComputerNode");
}

ComputerNode::~ComputerNode() {
    const LogScope scope("ComputerNode::~ComputerNode");
}

Error ComputerNode::getProperty(unsigned int id, PropertyValue& out) const {
    const LogScope scope("ComputerNode::getProperty");
    out = PropertyValue();
    const auto* property = findProperty(kProperties, id);
    try {
        return property != nullptr && property->read != nullptr ? property->read(*this, out)
                                                                : MutableNode::getProperty(id, out);
    } catch (...) {
        return result(false);
    }
}

Error ComputerNode::setProperty(const unsigned int& id, const PropertyValue& value) {
    const LogScope scope("ComputerNode::setProperty");
    const auto* property = OSHWMI::bInitflag ? findProperty(kProperties, id) : nullptr;
    try {
        return property != nullptr && property->write != nullptr ? property->write(*this, value)
                                                                 : MutableNode::setProperty(id, value);
    } catch (...) {
        return result(false);
    }
}

}  // namespace IC
