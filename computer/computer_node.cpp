#include "computer/computer_node.h"

#include <sys/time.h>
#include <unistd.h>

#include <array>
#include <cstring>
#include <ctime>
#include <initializer_list>
#include <stdexcept>

#include "computer/computer_builder.h"
#include "computer/owner_data.h"
#include "computer/time_zone.h"
#include "framework/qx/corvista_utilities.h"
#include "framework/qx/date_time.h"
#include "mi/command.h"
#include "mi/globals.h"
#include "mi/node_types.h"
#include "mi/text.h"

namespace IC {

namespace {

namespace ComputerProperty {
enum : unsigned int {
    hostName = 108,        ///< text
    ownerContact = 115,    ///< text
    ownerName = 116,       ///< text
    powerAction = 123,     ///< enumeration: PowerAction; stored, not asked
    powerActions = 125,    ///< list of numbers: the values powerAction may have
    currentTime = 126,     ///< number: seconds since 1970; written as an ISO 8601 text
    timeZoneOffset = 127,  ///< number: minutes east of UTC
    constant200 = 200,     ///< number: 1
};
}  // namespace ComputerProperty

/// Values of ComputerProperty::powerAction.
namespace PowerAction {
constexpr unsigned int running = 1;  ///< the state of a host that answers; writing it does nothing
constexpr unsigned int restart = 9;
constexpr unsigned int halt = 12;
}  // namespace PowerAction

// A read or a change that the host does not grant throws: the node answers status 1.

PropertyValue hostNameOf(const std::string&) {
    log(kProgress) << "ComputerNode::getProperty Name Inside Case";
    std::array<char, 256> name{};
    if (gethostname(name.data(), name.size()) == -1) {
        log(kError) << "ComputerNode::getProperty Name::GetHostname Failed";
        throw std::runtime_error("no host name");
    }
    return {trimEnd(std::string(name.data(), strnlen(name.data(), name.size()))), true};
}

template <const wchar_t* key>
PropertyValue readOwner(const std::string&) {
    const char* directory = QX::CorvistaUtilities::getMoraineDataDir();
    if (directory == nullptr) {
        log(kNoAnswer) << "ComputerNode::getProperty : OwnerContact/OwnerName - NULL returned by "
                          "CorvistaUtilities::getMoraineDataDir();";
        throw std::runtime_error("no data directory");
    }
    try {
        return {OwnerData(directory).read(key), true};
    } catch (...) {
        log(kNoAnswer) << "ComputerNode::getProperty : OwnerContact/OwnerName - Cannot read asset dat file.";
        throw;
    }
}

template <const wchar_t* key>
void writeOwner(Change& change) {
    const char* directory = QX::CorvistaUtilities::getMoraineDataDir();
    if (directory == nullptr) {
        log(kNoAnswer) << "ComputerNode::setProperty : OwnerContact/OwnerName - NULL returned by "
                          "CorvistaUtilities::getMoraineDataDir()";
        throw std::runtime_error("no data directory");
    }
    try {
        OwnerData(directory).write(key, change.text());
    } catch (...) {
        log(kNoAnswer) << "ComputerNode::setProperty : OwnerContact/OwnerName - Cannot write asset dat file.";
        throw;
    }
}

void runAndForget(const Command& command) {
    const HostCommand run(command);
}

/// The result does not tell whether the host is going down: a reader asks whether it still answers.
void writePowerAction(Change& change) {
    switch (change.number()) {
        case PowerAction::restart:
            runAndForget("shutdown -r now");
            break;
        case PowerAction::halt:
            runAndForget("shutdown -h now");
            break;
        default:
            break;
    }
}

PropertyValue currentTimeOf(const std::string&) {
    return {Number(static_cast<long>(time(nullptr)), 0), true};
}

/// A time that a long cannot hold (on 32 bits those beyond January 2038) throws and leaves the clock alone.
void writeCurrentTime(Change& change) {
    const QX::DateTime wanted(change.text(), 3);
    const timeval seconds{static_cast<long>(wanted), 0};
    if (settimeofday(&seconds, nullptr) != 0) {
        throw std::runtime_error("the clock was not set");
    }
    change.isStored = false;
}

PropertyValue timeZoneOffsetOf(const std::string&) {
    // localtime_r alone looks at /etc/localtime once in the life of a process.
    tzset();
    const time_t now = time(nullptr);
    tm local{};
    localtime_r(&now, &local);
    constexpr long kSecondsPerMinute = 60;
    const long minutes = local.tm_gmtoff / kSecondsPerMinute;
    return {Number(static_cast<double>(minutes)), true};
}

void writeTimeZoneOffset(Change& change) {
    if (!setTimezone(change.number())) {
        throw std::runtime_error("the zone was not set");
    }
    change.isStored = false;
}

PropertyValue constant200(const std::string&) {
    return {Number(1U), true};
}

// The clock reads as a number and is set by a text, the zone reads with daylight saving included and is set
// by its standard offset: agents rely on both.
constexpr Property kComputerProperties[] = {
    {ComputerProperty::hostName, hostNameOf},
    {ComputerProperty::ownerContact, readOwner<OwnerData::contact>, writeOwner<OwnerData::contact>},
    {ComputerProperty::ownerName, readOwner<OwnerData::name>, writeOwner<OwnerData::name>},
    {ComputerProperty::powerAction, nullptr, writePowerAction},
    {ComputerProperty::currentTime, currentTimeOf, writeCurrentTime},
    {ComputerProperty::timeZoneOffset, timeZoneOffsetOf, writeTimeZoneOffset},
    {ComputerProperty::constant200, constant200},
};
static_assert(idsAscend(kComputerProperties));

/// Stores what the host answers now.
bool storeAnswer(MutableNode& computer, unsigned int id) {
    PropertyValue value;
    if (computer.getProperty(id, value).getStatus() != 0) {
        return false;
    }
    computer.setProperty(id, value);
    return true;
}

void primeOwner(MutableNode& computer) {
    for (const unsigned int id : {ComputerProperty::ownerName, ComputerProperty::ownerContact}) {
        if (!storeAnswer(computer, id)) {
            // Without their file neither is known: both are shown, and are empty.
            computer.setProperty(ComputerProperty::ownerName, PropertyValue("", true));
            computer.setProperty(ComputerProperty::ownerContact, PropertyValue("", true));
        }
    }
}

/// What is stored is the tool's answer; a reader gets the kernel's, which no tool is needed for.
void primeHostName(MutableNode& computer) {
    HostCommand command("hostname 2> /dev/null");
    const auto line = command.nextLine();
    if (line && !contains(*line, "Unknown")) {
        computer.setProperty(ComputerProperty::hostName, PropertyValue(trimEnd(*line), true));
    }
}

/// Fills the store of a new node, so that a reader of all its properties finds them there. Before the end of
/// start-up writing a property only stores it.
void prime(MutableNode& computer) {
    computer.setProperty(ComputerProperty::powerAction, PropertyValue(EnumValue(PowerAction::running), true));
    const std::vector<Number> accepted{PowerAction::running, PowerAction::restart, PowerAction::halt};
    computer.setProperty(ComputerProperty::powerActions, PropertyValue(accepted, true));
    primeOwner(computer);
    storeAnswer(computer, ComputerProperty::currentTime);
    storeAnswer(computer, ComputerProperty::timeZoneOffset);
    primeHostName(computer);
}

Error failed() {
    return {Error::failure, Number(), ""};
}

}  // namespace

constinit const NodeClass computerClass{"~ComputerNode", kComputerProperties};

Error ComputerNode::getProperty(unsigned int id, PropertyValue& out) const {
    out = PropertyValue();
    try {
        return HostNode::getProperty(id, out);
    } catch (...) {
        return failed();
    }
}

Error ComputerNode::setProperty(const unsigned int& id, const PropertyValue& value) {
    const LogScope scope = enter();
    const Property* row = OSHWMI::bInitflag ? computerClass.find(id) : nullptr;
    try {
        Change change{*this, name(), value};
        if (row != nullptr && row->write != nullptr) {
            row->write(change);
        }
        return change.isStored ? store(id, value) : Error();
    } catch (...) {
        return failed();
    }
}

void ComputerBuilder::createComputerNodes() {
    const LogScope scope;
    auto* computer = tree_.makeNode<ComputerNode>(tree_.fixed.root, NodeType::computer, 0);
    tree_.appendNode(computer);
    tree_.fixed.computer = computer;
    prime(*computer);
    computer->setStatus(kStatusGood);
    computer->setDescription("Computer");
}

}  // namespace IC
