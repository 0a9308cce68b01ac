#include "agent/cli/json.h"

#include <algorithm>
#include <array>
#include <nlohmann/json.hpp>

#include "agent/cli/print.h"
#include "framework/qx/whole_number.h"

namespace cvagent::json {

namespace {

using Json = nlohmann::ordered_json;

std::string document(const Json& json, int indent) {
    return json.dump(indent, ' ', false, Json::error_handler_t::replace) + "\n";
}

Json numberValue(const IC::Number& number) {
    if (number.empty()) {
        return nullptr;
    }
    const std::string text = number.toString();
    switch (number.kind()) {
        case IC::Number::boolean:
            return text == "true";
        case IC::Number::real:
            return number.toDouble();
        case IC::Number::scaled:
            if (text.find('.') != std::string::npos) {
                return number.toDouble();
            }
            return QX::wholeNumber<long long>(text).value();
        default:
            return number.toUnsigned64();
    }
}

Json plainValue(const IC::PropertyValue& value) {
    if (const IC::Number* number = value.asNumber()) {
        return numberValue(*number);
    }
    if (const IC::EnumValue* code = value.asEnum()) {
        return code->code();
    }
    if (const std::string* text = value.asText()) {
        return *text;
    }
    if (const auto* texts = value.asTexts()) {
        return *texts;
    }
    if (const auto* numbers = value.asNumbers()) {
        Json list = Json::array();
        for (const IC::Number& number : *numbers) {
            list.push_back(numberValue(number));
        }
        return list;
    }
    return nullptr;
}

const char* kindOf(const IC::PropertyValue& value) {
    static constexpr std::array kNames = {"none", "number", "text", "enum", "texts", "numbers"};
    return kNames.at(value.kind());
}

/// A failed read has the kind the catalogue promises, since it brought no value. That a property can only be
/// written is no failure.
Json readingObject(const Reading& reading) {
    Json object{{"name", reading.name()}};
    if (reading.row != nullptr && reading.row->source != nullptr && *unitName(*reading.row) != '\0') {
        object["unit"] = unitName(*reading.row);
    }
    if (reading.row != nullptr && !reading.row->readable) {
        object["kind"] = kindName(reading.row->kind);
        object["value"] = nullptr;
    } else if (reading.failed()) {
        object["kind"] = reading.row != nullptr ? kindName(reading.row->kind) : "none";
        object["error"] = reading.error;
    } else {
        object["kind"] = kindOf(reading.value);
        object["value"] = plainValue(reading.value);
    }
    return object;
}

Json nodeObject(const IC::MutableNode& node, const std::vector<Reading>& readings) {
    Json properties = Json::object();
    for (const Reading& reading : readings) {
        properties[std::to_string(reading.id)] = readingObject(reading);
    }
    return {{"id", node.getNodeId()},
            {"parent", node.getLinkedId()},
            {"type", node.nodeType()},
            {"class", className(node.nodeType())},
            {"index", node.getIndex()},
            {"path", node.getPath()},
            {"description", node.getDescription()},
            {"status", node.getStatus()},
            {"properties", std::move(properties)}};
}

Json labelList(const Property& row) {
    Json list = Json::array();
    for (const Label& label : row.labels) {
        list.push_back({{"value", label.code}, {"label", label.text}});
    }
    return list;
}

void addProperty(Json& object, const Event& event) {
    if (!event.propertyName.empty()) {
        object["property"] = {{"id", event.property},
                              {"name", event.propertyName},
                              {"before", event.before},
                              {"after", event.after}};
    }
}

}  // namespace

std::string tree(const std::vector<std::string>& plugins, const std::vector<NodeRef>& nodes) {
    std::vector<std::vector<Reading>> readings(nodes.size());
    std::ranges::transform(nodes, readings.begin(),
                           [](const NodeRef& node) { return storedReadings(*node); });
    return tree(plugins, nodes, readings);
}

std::string tree(const std::vector<std::string>& plugins, const std::vector<NodeRef>& nodes,
                 const std::vector<std::vector<Reading>>& readings) {
    Json list = Json::array();
    for (std::size_t i = 0; i < nodes.size(); ++i) {
        list.push_back(nodeObject(*nodes[i], readings[i]));
    }
    Json whole{{"plugin", plugins.front()}};
    if (plugins.size() > 1) {
        whole["plugins"] = plugins;
    }
    whole["nodes"] = std::move(list);
    return document(whole, 2);
}

std::string node(const IC::MutableNode& node, const std::vector<Reading>& readings) {
    return document(nodeObject(node, readings), 2);
}

std::string change(const IC::MutableNode& node, const Reading& before, const Reading& after) {
    return document({{"id", node.getNodeId()},
                     {"path", node.getPath()},
                     {"property",
                      {{"id", after.id},
                       {"name", after.name()},
                       {"old", readingObject(before)},
                       {"new", readingObject(after)}}}},
                    2);
}

namespace {

Json eventObject(const Event& event) {
    Json object{{"time", timeText(event.time)}, {"event", eventName(event.kind)}};
    if (event.kind == Event::Kind::alert) {
        object["path"] = event.path;
        object["message"] = event.message;
        object["codes"] = {
            {"first", event.firstCode}, {"second", event.secondCode}, {"event", event.eventCode}};
        if (event.nodeId != 0) {
            object["id"] = event.nodeId;
            object["class"] = event.nodeClass;
        }
    } else {
        object["id"] = event.nodeId;
        object["class"] = event.nodeClass;
        object["path"] = event.path;
        object["description"] = event.message;
    }
    addProperty(object, event);
    if (!event.caller.empty()) {
        object["caller"] = event.caller;
    }
    if (!event.verdict.empty()) {
        object["wanted"] = event.wanted;
        object["verdict"] = event.verdict;
    }
    if (!event.plan.empty()) {
        const Json plan = Json::parse(event.plan, nullptr, false);
        object["plan"] = plan.is_discarded() ? Json(event.plan) : plan;  // a long one is kept in part
    }
    if (event.number != 0) {
        object["number"] = event.number;
    }
    return object;
}

}  // namespace

std::string event(const Event& event) {
    return document(eventObject(event), -1);
}

std::string event(const Event& event, const std::string& boot) {
    Json object = eventObject(event);
    object["boot"] = boot;
    return document(object, -1);
}

std::string catalogue(const std::vector<const Property*>& rows) {
    Json list = Json::array();
    for (const Property* each : rows) {
        const Property& row = *each;
        const auto type = static_cast<unsigned int>(row.type);
        Json object{{"class", className(type)},
                    {"type", type},
                    {"id", row.id},
                    {"name", row.name},
                    {"kind", kindName(row.kind)},
                    {"unit", unitName(row)},
                    {"readable", row.readable},
                    {"writable", row.writable()}};
        object["values"] = labelList(row);
        object["accepts"] = row.writable() ? Json(acceptedText(row)) : Json(nullptr);
        object["meaning"] = row.meaning;
        if (row.source != nullptr) {
            object["source"] = row.source;
            object["trusted"] = row.trusted;
        }
        list.push_back(std::move(object));
    }
    return document(list, 2);
}

namespace {

Json orNull(const std::string& text) {
    return text.empty() ? Json(nullptr) : Json(text);
}

Json serviceObject(const remote::ServiceReport& report) {
    return {{"running", report.problem.empty()}, {"problem", orNull(report.problem)},
            {"version", orNull(report.version)}, {"since", orNull(report.since)},
            {"looked", orNull(report.looked)},   {"consent", orNull(report.consent)}};
}

Json toolList(const std::vector<ToolReport>& reports) {
    Json list = Json::array();
    for (const ToolReport& report : reports) {
        list.push_back({{"tool", report.tool},
                        {"host", orNull(report.native)},
                        {"classic", report.classic},
                        {"adapter", orNull(report.adapter)},
                        {"used", orNull(report.used())},
                        {"package", report.package},
                        {"purpose", report.purpose}});
    }
    return list;
}

Json keeperList(const std::vector<keep::Keeper>& keepers) {
    Json list = Json::array();
    for (const keep::Keeper& keeper : keepers) {
        Json claims = Json::array();
        for (const keep::Claim& claim : keeper.claims) {
            claims.push_back(
                {{"system", claim.system}, {"evidence", claim.evidence}, {"source", orNull(claim.source)}});
        }
        list.push_back({{"interface", keeper.interface},
                        {"keeper", orNull(keeper.system())},
                        {"claims", std::move(claims)},
                        {"unknown", keeper.unknown}});
    }
    return list;
}

Json hostKeeperList(const std::vector<keep::HostKeeper>& keepers) {
    Json list = Json::array();
    for (const keep::HostKeeper& each : keepers) {
        list.push_back(
            {{"setting", each.setting}, {"keeper", orNull(each.keeper)}, {"evidence", each.evidence}});
    }
    return list;
}

}  // namespace

std::string doctor(const remote::ServiceReport& service, const PluginReport& plugins,
                   const std::vector<ToolReport>& tools, const KeeperReport& keepers) {
    return document({{"service", serviceObject(service)},
                     {"plugins", plugins.files},
                     {"leftOut", plugins.leftOut},
                     {"tools", toolList(tools)},
                     {"keepers", keeperList(keepers.interfaces)},
                     {"hostKeepers", hostKeeperList(keepers.host)}},
                    2);
}

std::string verdict(const verify::Result& result) {
    Json list = Json::array();
    for (const verify::Difference& each : result.differences) {
        list.push_back({{"path", each.path},
                        {"property", each.property},
                        {"shown", each.shown},
                        {"kernel", each.kernel},
                        {"why", each.why}});
    }
    return document({{"compared", result.compared}, {"differences", std::move(list)}}, 2);
}

}  // namespace cvagent::json
