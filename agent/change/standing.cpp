#include "agent/change/standing.h"

#include <algorithm>
#include <ctime>
#include <filesystem>
#include <iterator>
#include <system_error>

#include "agent/change/interface_settings.h"
#include "agent/change/ip.h"
#include "agent/change/kept.h"
#include "agent/change/kept_host.h"
#include "agent/change/kernel_network.h"
#include "agent/core/catalogue.h"
#include "agent/core/node_copy.h"
#include "framework/qx/date_time.h"
#include "framework/qx/whole_number.h"

namespace cvagent::change {

namespace {

constexpr unsigned int kInterfaceName = 108;
constexpr unsigned int kStateOfLink = 123;
constexpr unsigned int kZoneOffset = 127;
constexpr long kClockTolerance = 10;  // seconds
constexpr int kSummerTime = 60;       // minutes

// Of an ip-config.
constexpr unsigned int kWithFixedOrigin[] = {25, 26, 27, 100, 101, 102};
constexpr unsigned int kOfHost[] = {94, 97, 98, 99};

template <class Table>
bool isAmong(const Property& row, const Table& table) {
    return row.type == NodeType::ipConfig && std::ranges::find(table, row.id) != std::end(table);
}

bool isClock(const Property& row) {
    return row.unit == Unit::secondsSinceEpoch;
}

/// What is known of an interface by its files is looked up by its name, which a node of another process's
/// agent has not stored.
NodeRef named(const IC::MutableNode& node) {
    const NodeCopy copy{
        node.getNodeId(), node.getLinkedId(), node.nodeType(), node.getIndex(), 0, node.getPath(), ""};
    Reading name;
    name.id = kInterfaceName;
    name.value = IC::PropertyValue(interfaceNameOf(node), true);
    return copy.reference({name});
}

bool isSameText(const IC::PropertyValue& value, const IC::PropertyValue& read) {
    const std::string wanted = static_cast<std::string>(value);
    const std::string found = static_cast<std::string>(read);
    const auto ip = Ip::parse(wanted);
    return wanted == found || (ip && ip == Ip::parse(found));
}

/// Hosts without this file have their name, which is as wanted, in another one.
bool isKeptElsewhere(const Property& row, const IC::PropertyValue& value, const IC::PropertyValue& read) {
    constexpr unsigned int kNames[] = {97, 98};
    std::error_code unknown;
    return isAmong(row, kNames) && isSameText(value, read) &&
           !std::filesystem::exists("/etc/HOSTNAME", unknown);
}

bool isDuplicate(const IC::MutableNode& node, const Property& row, const IC::PropertyValue& value) {
    constexpr unsigned int kAskedFor[] = {27};
    const auto ip = isAmong(row, kAskedFor) ? Ip::parse(static_cast<std::string>(value)) : std::nullopt;
    return ip && duplicateOf(interfaceNameOf(node), *ip) == Duplicate::yes;
}

bool isSameTime(const IC::PropertyValue& value, const IC::PropertyValue& read) {
    const long wanted = QX::DateTime(static_cast<std::string>(value), 3);
    const auto found = QX::wholeNumber<long>(static_cast<std::string>(read));
    return found && *found >= wanted - kClockTolerance && *found <= wanted + kClockTolerance;
}

std::string readsAs(const Reading& reading) {
    const std::string text = static_cast<std::string>(reading.value);
    return text.empty() ? "it reads as empty" : "it reads " + text;
}

bool isSummer() {
    const std::time_t now = std::time(nullptr);
    std::tm fields{};
    return localtime_r(&now, &fields) != nullptr && fields.tm_isdst > 0;
}

std::vector<std::string> plainWords(const Reading& reading) {
    if (const auto* texts = reading.value.asTexts()) {
        return texts->empty() ? std::vector<std::string>(1) : *texts;
    }
    if (const auto* code = reading.value.asEnum()) {
        return {std::to_string(code->code())};
    }
    const std::string text = static_cast<std::string>(reading.value);
    const auto minutes = QX::wholeNumber<int>(text);
    const bool isSummers =
        reading.row->type == NodeType::computer && reading.row->id == kZoneOffset && isSummer();
    return {isSummers && minutes ? std::to_string(*minutes - kSummerTime) : text};
}

}  // namespace

bool isDeed(const Property& row) {
    return !row.readable || isClock(row) || std::ranges::any_of(row.labels, &Label::drastic);
}

bool needsFixedOrigin(const Property& row) {
    return isAmong(row, kWithFixedOrigin);
}

bool isHosts(const Property& row) {
    return isAmong(row, kOfHost);
}

Standing standingOf(const IC::MutableNode& node, const Property& row, const IC::PropertyValue& value,
                    const Reading& reading) {
    if (!row.readable || reading.failed()) {
        return {WriteResult::notKnown, row.readable ? reading.complaint() : "it can only be written"};
    }
    if (isClock(row)) {
        const bool isSame = isSameTime(value, reading.value);
        return {isSame ? WriteResult::applied : WriteResult::differs, isSame ? "" : readsAs(reading)};
    }
    const Effect* effect = findEffect(row);
    if (effect != nullptr) {
        const NodeRef copy = named(node);
        const std::string lacking = effect->lacking({*copy, value, &reading.value});
        if (!lacking.empty() && !isKeptElsewhere(row, value, reading.value) &&
            !isInForceBySystem(row, value) && !isKeptAlready(node, row, value)) {
            return {WriteResult::differs, lacking};
        }
    }
    if (isDuplicate(node, row, value)) {
        return {WriteResult::differs, "another host has it, so this one does not use it"};
    }
    const bool isRead = effect == nullptr || needsFixedOrigin(row);
    if (isRead && !isSameText(value, reading.value)) {
        return {WriteResult::differs, readsAs(reading)};
    }
    return {WriteResult::applied, ""};
}

std::optional<std::vector<std::string>> wordsToSetBack(const Reading& reading) {
    const bool isLink =
        reading.row != nullptr && reading.row->type == NodeType::ipConfig && reading.id == kStateOfLink;
    if (reading.row == nullptr || reading.failed() || !reading.row->writable() || isDeed(*reading.row) ||
        isLink) {
        return std::nullopt;
    }
    const std::vector<std::string> words = plainWords(reading);
    return reading.row->check(*reading.row, words) ? std::optional(words) : std::nullopt;
}

}  // namespace cvagent::change
