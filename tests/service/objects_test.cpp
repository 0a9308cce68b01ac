// The objects on the bus: the tree, properties, the list of objects.
#include <gmock/gmock.h>
#include <signal.h>

#include "tests/service/service_run.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;

constexpr const char* kComputerInterface = "com.vantrel.Corvista1.Computer";
constexpr const char* kPortInterface = "com.vantrel.Corvista1.NetworkPort";

class ServiceObjects : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        run.emplace(host);
        run->start();
    }
    std::string errorOfGet(const std::string& path, const std::string& interface, const std::string& name) {
        return call::errorOf(run->bus(), path, call::kProperties, "Get",
                             [&](bus::Writer& writer) { writer.put(interface).put(name); });
    }
    std::optional<ServiceRun> run;
};

HOST_TEST_F(ServiceObjects, ShowWhatIsKnownOfTheirNodes) {
    const auto own = call::getAll(run->bus(), ServiceRun::kComputer, kComputerInterface);
    EXPECT_EQ(own.at("HostName"), "fake");
    EXPECT_EQ(own.at("PowerAction"), "1");
    EXPECT_EQ(own.at("TimeZoneOffset"), "-210");
    EXPECT_EQ(call::get(run->bus(), ServiceRun::kPort, kPortInterface, "LinkSpeed"), "1000000");
    const auto node = call::getAll(run->bus(), ServiceRun::kPort, call::kNode);
    EXPECT_EQ(node.at("Path"), "/oshw/root/computer/chassis/network-controller/network-port:eth0");
    EXPECT_EQ(node.at("Class"), "network-port");
    EXPECT_EQ(node.at("Parent"), "/com/vantrel/Corvista1/oshw/root/computer/chassis/network_2dcontroller");
    EXPECT_EQ(call::get(run->bus(), "/com/vantrel/Corvista1/oshw", call::kNode, "Parent"), ServiceRun::kRoot);
    EXPECT_EQ(call::getAll(run->bus(), ServiceRun::kPort, "").size(), node.size());
    EXPECT_EQ(call::getAll(run->bus(), ServiceRun::kPort, call::kProperties).size(), 0U);
}

HOST_TEST_F(ServiceObjects, SayWhatIsWrongWithAQuestion) {
    EXPECT_EQ(errorOfGet(ServiceRun::kPort, kPortInterface, "TeamName"),
              "com.vantrel.Corvista1.Error.NotKnown");
    EXPECT_EQ(errorOfGet(ServiceRun::kPort, kPortInterface, "Nonsense"), bus::kUnknownProperty);
    EXPECT_EQ(errorOfGet(ServiceRun::kPort, call::kNode, "LinkSpeed"), bus::kUnknownProperty);
    EXPECT_EQ(errorOfGet(ServiceRun::kPort, kComputerInterface, "HostName"), bus::kUnknownInterface);
    EXPECT_EQ(errorOfGet(ServiceRun::kRoot, call::kNode, "Id"), bus::kUnknownInterface);
    EXPECT_EQ(errorOfGet("/com/vantrel/Corvista1/none", call::kNode, "Id"), bus::kUnknownObject);
    EXPECT_EQ(errorOfGet("/com/vantrel/Corvista1/osh", call::kNode, "Id"), bus::kUnknownObject);
    const auto set = [&](const std::string& name) {
        return call::errorOf(
            run->bus(), ServiceRun::kComputer, call::kProperties, "Set", [&](bus::Writer& writer) {
                writer.put(kComputerInterface).put(name).variant("s", [&] { writer.put("x"); });
            });
    };
    EXPECT_EQ(set("HostName"), bus::kPropertyReadOnly);
    EXPECT_EQ(set("Nonsense"), bus::kUnknownProperty);
    EXPECT_EQ(call::errorOf(run->bus(), ServiceRun::kComputer, call::kAgent, "Tree"), bus::kUnknownInterface);
    EXPECT_EQ(call::errorOf(run->bus(), ServiceRun::kRoot, call::kAgent, "Shrub"), bus::kUnknownMethod);
    EXPECT_EQ(call::errorOf(run->bus(), ServiceRun::kRoot, call::kAgent, "Tree",
                            [](bus::Writer& writer) { writer.put("too much"); }),
              bus::kInvalidArgs);
    EXPECT_EQ(call::errorOf(run->bus(), ServiceRun::kRoot, call::kAgent, "Read",
                            [](bus::Writer& writer) { writer.put("x").put(std::vector<std::uint32_t>()); }),
              bus::kInvalidArgs);
    EXPECT_EQ(run->diary().find('='), std::string::npos) << "something was written";
}

HOST_TEST_F(ServiceObjects, AreListedByTheirManager) {
    const bus::Message answer = call::ask(run->bus(), ServiceRun::kRoot, call::kManager, "GetManagedObjects");
    std::map<std::string, std::vector<std::string>> listed;
    bus::Reader reader(answer);
    reader.array("{oa{sa{sv}}}", [&] {
        reader.entry("oa{sa{sv}}", [&] {
            std::vector<std::string>& interfaces = listed[reader.path()];
            reader.array("{sa{sv}}", [&] {
                reader.entry("sa{sv}", [&] {
                    interfaces.push_back(reader.text());
                    reader.skip();
                });
            });
        });
    });
    EXPECT_THAT(listed[ServiceRun::kPort], ElementsAre(call::kNode, kPortInterface));
    EXPECT_THAT(listed[ServiceRun::kComputer], ElementsAre(call::kNode, kComputerInterface));
    EXPECT_FALSE(listed.contains(ServiceRun::kRoot));
    EXPECT_EQ(call::errorOf(run->bus(), ServiceRun::kPort, call::kManager, "GetManagedObjects"),
              bus::kUnknownInterface);
}

/// All that a tree shows, in the order of cvagent's.
HOST_TEST_F(ServiceObjects, AreToldByOneCall) {
    const bus::Message answer = call::ask(run->bus(), ServiceRun::kRoot, call::kAgent, "Tree");
    bus::Reader reader(answer);
    EXPECT_THAT(reader.texts(), ElementsAre(FAKE_PLUGIN_FILE));
    std::string paths;
    std::map<std::uint32_t, ToldReading> computer;
    reader.array("(uuuuosssua(uyvtus))", [&] {
        reader.structure("uuuuosssua(uyvtus)", [&] {
            for (int i = 0; i < 4; ++i) {
                reader.number();
            }
            reader.path();
            const std::string nodeClass = reader.text();
            paths += reader.text() + "\n";
            reader.text();
            reader.number();
            for (const ToldReading& told : call::readings(reader)) {
                if (nodeClass == "computer") {
                    computer[told.id] = told;
                }
            }
        });
    });
    run->program().signal(SIGTERM);
    run->program().wait();
    EXPECT_EQ(paths, host.run({TINY_FRONT_END, FAKE_PLUGIN_FILE}).out);
    EXPECT_EQ(computer[108].value, "fake");
    EXPECT_EQ(computer[108].kind, 2);
    EXPECT_GT(computer[108].time, 1600000000000000U);
    EXPECT_EQ(computer[123].kind, 3) << "an enumeration";
    EXPECT_EQ(computer[123].type, "u");
    EXPECT_EQ(computer[127].type, "d");
    EXPECT_EQ(computer[115].flags, 0U);
}

HOST_TEST_F(ServiceObjects, AreFoundByWordsOfPeople) {
    const auto find = [&](const std::string& word) -> std::string {
        try {
            const bus::Message answer = call::ask(run->bus(), ServiceRun::kRoot, call::kAgent, "Find",
                                                  [&](bus::Writer& writer) { writer.put(word); });
            std::string path;
            bus::Reader reader(answer);
            reader.structure("uuuuosssu", [&] {
                for (int i = 0; i < 4; ++i) {
                    reader.number();
                }
                path = reader.path();
                for (int i = 0; i < 4; ++i) {
                    reader.skip();
                }
            });
            return path;
        } catch (const bus::Error& error) {
            return error.name();
        }
    };
    EXPECT_EQ(find("computer"), ServiceRun::kComputer);
    EXPECT_EQ(find("network-port:eth0"), ServiceRun::kPort);
    EXPECT_EQ(find("nowhere"), "com.vantrel.Corvista1.Error.NotFound");
    EXPECT_EQ(find("eth0"), "com.vantrel.Corvista1.Error.Ambiguous");
}

/// The node's path and its readings, or the name of the error.
std::pair<std::string, std::vector<ToldReading>> foundAndRead(bus::Connection& bus, const std::string& word,
                                                              const std::vector<std::string>& properties) {
    std::pair<std::string, std::vector<ToldReading>> told;
    try {
        const bus::Message answer = call::ask(bus, ServiceRun::kRoot, call::kAgent, "FindAndRead",
                                              [&](bus::Writer& writer) { writer.put(word).put(properties); });
        bus::Reader reader(answer);
        reader.structure("uuuuosssu", [&] {
            for (int i = 0; i < 4; ++i) {
                reader.number();
            }
            told.first = reader.path();
            for (int i = 0; i < 4; ++i) {
                reader.skip();
            }
        });
        told.second = call::readings(reader);
        EXPECT_EQ(reader.texts(), std::vector<std::string>());
    } catch (const bus::Error& error) {
        told.first = error.name();
    }
    return told;
}

HOST_TEST_F(ServiceObjects, AreFoundAndReadByOneCall) {
    const auto found = foundAndRead(run->bus(), "computer", {"904", "HostName", "77777"});
    EXPECT_EQ(found.first, ServiceRun::kComputer);
    ASSERT_EQ(found.second.size(), 3U);
    EXPECT_EQ(found.second[0].value, "1") << "its first answer";
    EXPECT_EQ(found.second[1].id, 108U);
    EXPECT_EQ(found.second[1].value, "fake");
    EXPECT_EQ(found.second[2].flags, 2U | 8U) << "the node has no such property, and no value";
    EXPECT_EQ(foundAndRead(run->bus(), "computer", {"904"}).second.front().value, "2");
    EXPECT_EQ(foundAndRead(run->bus(), "computer", {}).second.size(),
              call::read(run->bus(), ServiceRun::kComputer, {}).size());
    const std::string longText(20000, 'x');
    EXPECT_EQ(foundAndRead(run->bus(), "computer", {"Nix"}).first, "com.vantrel.Corvista1.Error.NotFound");
    EXPECT_EQ(foundAndRead(run->bus(), "eth0", {}).first, "com.vantrel.Corvista1.Error.Ambiguous");
    EXPECT_EQ(foundAndRead(run->bus(), longText, {}).first, "com.vantrel.Corvista1.Error.NotFound");
    EXPECT_EQ(foundAndRead(run->bus(), "computer", {longText}).first, bus::kLimitsExceeded);
    EXPECT_EQ(foundAndRead(run->bus(), "computer", std::vector<std::string>(1025, "1")).first,
              bus::kLimitsExceeded);
}

/// A getter answers while the host hangs, and for who has hung it up, too.
HOST_TEST_F(ServiceObjects, AnswerFromMemoryWhileTheHostHangs) {
    host.file("/var/hold", "");
    std::size_t answers = 0;
    std::vector<bus::Slot> hanging;
    for (int i = 0; i < 20; ++i) {
        hanging.push_back(run->bus().askLater(
            call::make(run->bus(), ServiceRun::kComputer, call::kNode, "Read",
                       [](bus::Writer& writer) { writer.put(std::vector<std::uint32_t>{904}); }),
            std::chrono::seconds(30), [&](const bus::Message&) { ++answers; }));
    }
    bus::Connection other(ServiceRun::address());
    EXPECT_EQ(call::get(other, ServiceRun::kComputer, kComputerInterface, "HostName"), "fake");
    EXPECT_EQ(answers, 0U);
    host.remove("/var/hold");
    EXPECT_TRUE(call::until(run->bus(), [&] { return answers == 20; }));
}

HOST_TEST_F(ServiceObjects, ReadTheHostWhenAsked) {
    const auto readings = call::read(run->bus(), ServiceRun::kComputer, {904, 108, 901, 77777});
    ASSERT_EQ(readings.size(), 4U);
    EXPECT_EQ(readings[0].value, "1") << "its first answer";
    EXPECT_EQ(readings[1].value, "fake");
    EXPECT_EQ(readings[2].error, "the host does not answer");
    EXPECT_EQ(readings[2].flags, 8U);
    EXPECT_EQ(readings[3].flags, 2U | 8U) << "the node has no such property, and no value";
    EXPECT_EQ(call::read(run->bus(), ServiceRun::kComputer, {904}).front().value, "2");
    EXPECT_GT(call::read(run->bus(), ServiceRun::kComputer, {}).size(), 5U);
    EXPECT_EQ(call::errorOf(run->bus(), ServiceRun::kRoot, call::kAgent, "Read",
                            [](bus::Writer& writer) {
                                writer.put(std::uint32_t{999999}).put(std::vector<std::uint32_t>());
                            }),
              "com.vantrel.Corvista1.Error.NotFound");
    EXPECT_EQ(call::errorOf(run->bus(), ServiceRun::kComputer, call::kNode, "Read",
                            [](bus::Writer& writer) { writer.put(std::vector<std::uint32_t>(5000, 108)); }),
              bus::kLimitsExceeded);
}

}  // namespace
