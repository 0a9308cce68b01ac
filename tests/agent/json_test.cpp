#include "agent/cli/json.h"

#include <gmock/gmock.h>

#include <nlohmann/json.hpp>

#include "tests/agent/node_list.h"

namespace {

using IC::Number;
using IC::PropertyValue;
using Json = nlohmann::ordered_json;

/// The properties of a node that holds one value, as JSON.
Json written(const PropertyValue& value) {
    IC::MutableNode node(3, 2, {1}, 12, 1);
    node.setProperty(5, value);
    return Json::parse(cvagent::json::node(node, cvagent::storedReadings(node)))["properties"]["5"];
}

TEST(Json, ANodeHasItsFieldsInOrder) {
    IC::MutableNode node(3, 2, {1}, 12, 7);
    node.setPath("/oshw/network-port:eth0");
    node.setDescription("Network Port");
    node.setStatus(12);
    node.setProperty(108, PropertyValue("eth0", true));
    node.setProperty(57, PropertyValue(Number(1000000ULL), true));
    EXPECT_EQ(
        Json::parse(cvagent::json::node(node, cvagent::storedReadings(node))).dump(),
        R"({"id":3,"parent":2,"type":12,"class":"network-port","index":7,"path":"/oshw/network-port:eth0",)"
        R"("description":"Network Port","status":12,"properties":{)"
        R"("57":{"name":"LinkSpeed","kind":"number","value":1000000},)"
        R"("108":{"name":"InterfaceName","kind":"text","value":"eth0"}}})");
}

TEST(Json, TheTreeNamesThePluginAndEveryNode) {
    NodeList list;
    list.add(38, 0);
    list.add(59, 1);
    const Json tree = Json::parse(cvagent::json::tree({"/lib/plugin.so"}, list.nodes()));
    EXPECT_EQ(tree["plugin"], "/lib/plugin.so");
    ASSERT_EQ(tree["nodes"].size(), 2U);
    EXPECT_EQ(tree["nodes"][1]["parent"], 1);
    EXPECT_EQ(tree["nodes"][1]["class"], "root");
    EXPECT_EQ(tree["nodes"][1]["properties"], Json::object());
}

TEST(Json, EveryKindHasItsForm) {
    EXPECT_EQ(written({Number(7U), true}).dump(), R"({"name":"5","kind":"number","value":7})");
    EXPECT_EQ(written({Number(18446744073709551615ULL), true})["value"].dump(), "18446744073709551615");
    EXPECT_EQ(written({Number(true), true})["value"].dump(), "true");
    EXPECT_EQ(written({Number(-210.0), true})["value"].dump(), "-210.0");
    EXPECT_EQ(written({Number(-60L, 0), true})["value"].dump(), "-60");
    EXPECT_EQ(written({Number(12345L, 2), true})["value"].dump(), "123.45");
    EXPECT_EQ(written({IC::EnumValue(3), true}).dump(), R"({"name":"5","kind":"enum","value":3})");
    EXPECT_EQ(written({"a\"b\n", true}).dump(), R"({"name":"5","kind":"text","value":"a\"b\n"})");
    EXPECT_EQ(written({std::vector<std::string>{"a", "b"}, true}).dump(),
              R"({"name":"5","kind":"texts","value":["a","b"]})");
    EXPECT_EQ(written({std::vector<Number>{Number(0U), Number(12U)}, true}).dump(),
              R"({"name":"5","kind":"numbers","value":[0,12]})");
    EXPECT_EQ(written(PropertyValue()).dump(), R"({"name":"5","kind":"none","value":null})");
    EXPECT_EQ(written({PropertyValue::text, true}).dump(), R"({"name":"5","kind":"text","value":null})");
    EXPECT_EQ(written({PropertyValue::number, true}).dump(), R"({"name":"5","kind":"number","value":null})");
    EXPECT_EQ(written({std::vector<Number>{Number(), Number(1U)}, true})["value"].dump(), "[null,1]");
    EXPECT_EQ(written({std::vector<std::string>(), true})["value"].dump(), "[]");
}

TEST(Json, DamagedTextIsStillJson) {
    EXPECT_EQ(written({"a\xff"
                       "b",
                       true})["value"],
              "a\ufffd"
              "b");
}

TEST(Json, AFailedReadHasAnErrorInPlaceOfItsValue) {
    const IC::MutableNode node(3, 2, {1}, 40, 0);
    const cvagent::Reading failed{115, cvagent::findProperty(40, 115), {}, "status 1", false};
    const Json json = Json::parse(cvagent::json::node(node, {failed}));
    EXPECT_EQ(json["properties"].dump(),
              R"({"115":{"name":"OwnerContact","kind":"text","error":"status 1"}})");
}

TEST(Json, EventsAreOneLine) {
    cvagent::Event event = cvagent::alertEvent(IC::Alert(1, 0, {"/a/b"}, 12, "NIC is Offline "));
    event.time = 0;
    EXPECT_EQ(cvagent::json::event(event),
              R"({"time":"1970-01-01T00:00:00Z","event":"alert","path":"/a/b","message":"NIC is Offline ",)"
              R"("codes":{"first":1,"second":0,"event":12}})"
              "\n");
    IC::MutableNode node(9, 2, {1}, 11, 0);
    node.setPath("/x\ny");
    node.setDescription("Hard Drive");
    event = cvagent::nodeEvent(cvagent::Event::Kind::withdrawn, node);
    event.time = 0;
    EXPECT_EQ(
        cvagent::json::event(event),
        R"({"time":"1970-01-01T00:00:00Z","event":"withdrawn","id":9,"class":"hard-drive","path":"/x\ny",)"
        R"("description":"Hard Drive"})"
        "\n");
}

TEST(Json, AWrittenEventNamesItsCaller) {
    cvagent::Event event;
    event.kind = cvagent::Event::Kind::written;
    event.caller = "somebody";
    EXPECT_EQ(Json::parse(cvagent::json::event(event))["caller"], "somebody");
    event.caller.clear();
    EXPECT_FALSE(Json::parse(cvagent::json::event(event)).contains("caller"));
}

TEST(Json, TheCatalogueTellsAllOfARow) {
    const Json json = Json::parse(cvagent::json::catalogue({cvagent::findProperty(29, 24)}));
    ASSERT_EQ(json.size(), 1U);
    EXPECT_EQ(json[0]["class"], "ip-config");
    EXPECT_EQ(json[0]["id"], 24);
    EXPECT_EQ(json[0]["kind"], "enum");
    EXPECT_EQ(json[0]["writable"], true);
    EXPECT_EQ(json[0]["accepts"], "1 (DHCP), 3 (static)");
    EXPECT_EQ(json[0]["values"][1].dump(), R"({"value":1,"label":"DHCP"})");
}

}  // namespace
