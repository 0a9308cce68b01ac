// What the service says of itself is what the installed file says, and what it does.
#include <gmock/gmock.h>

#include <fstream>
#include <regex>
#include <sstream>

#include "agent/service/names.h"
#include "agent/service/objects.h"
#include "tests/service/service_run.h"

namespace {

using cvagent::service::interfaceOf;
using cvagent::service::objectOf;
using testing::Contains;
using testing::HasSubstr;
using testing::Not;

/// Read before there is a fake host, which does not show it.
const std::string interfaceFile = [] {
    std::ostringstream text;
    text << std::ifstream(INTERFACE_FILE).rdbuf();
    return text.str();
}();

std::string withoutBlanks(const std::string& text) {
    return std::regex_replace(std::regex_replace(text, std::regex("<!--[^]*?-->"), ""), std::regex("\\s+"),
                              " ");
}

/// The text of an interface, blanks made one.
std::string interfaceIn(const std::string& xml, const std::string& name) {
    const std::string text = withoutBlanks(xml);
    const std::size_t start = text.find("<interface name=\"" + name + "\"");
    const std::size_t end = text.find("</interface>", start);
    return start == std::string::npos ? "none" : text.substr(start, end - start);
}

TEST(ServiceNames, AreEscapedPaths) {
    EXPECT_EQ(objectOf("/oshw/root"), "/com/vantrel/Corvista1/oshw/root");
    EXPECT_EQ(objectOf("/oshw/network-port:eth0.5"), "/com/vantrel/Corvista1/oshw/network_2dport_3aeth0_2e5");
    EXPECT_EQ(objectOf(""), "/com/vantrel/Corvista1/_");
    EXPECT_EQ(objectOf("/a//b\xFF_"), "/com/vantrel/Corvista1/a/_/b_ff_5f");
    EXPECT_EQ(objectOf("/" + std::string(5000, 'x')).size(),
              std::string("/com/vantrel/Corvista1/").size() + 200);
}

TEST(ServiceNames, OfClassesAreInterfaces) {
    EXPECT_EQ(interfaceOf("network-port"), "com.vantrel.Corvista1.NetworkPort");
    EXPECT_EQ(interfaceOf("oshw"), "com.vantrel.Corvista1.Oshw");
    EXPECT_EQ(interfaceOf("type-99"), "com.vantrel.Corvista1.Type99");
    EXPECT_EQ(interfaceOf("node"), "com.vantrel.Corvista1.ClassNode");
    EXPECT_EQ(interfaceOf("agent"), "com.vantrel.Corvista1.ClassAgent");
    EXPECT_EQ(interfaceOf("3d"), "com.vantrel.Corvista1.Class3d");
    EXPECT_EQ(interfaceOf("-"), "com.vantrel.Corvista1.Class");
}

/// Each method of the file is there with the arguments of the file, and none besides.
TEST(ServiceInterface, HasTheMethodsOfTheFile) {
    const std::string xml = withoutBlanks(interfaceFile);
    std::vector<std::string> described;
    for (const char* interface : {call::kAgent, call::kNode}) {
        const std::string text = interfaceIn(xml, interface);
        const std::regex method(R"re(<method name="(\w+)">([^]*?)</method>)re");
        const std::regex in(R"re(type="([^"]+)" direction="in")re");
        for (std::sregex_iterator at(text.begin(), text.end(), method), end; at != end; ++at) {
            const std::string arguments = (*at)[2];
            std::string types;
            for (std::sregex_iterator each(arguments.begin(), arguments.end(), in); each != end; ++each) {
                types += (*each)[1];
            }
            described.push_back(std::string(interface) + " " + (*at)[1].str() + " " + types);
        }
    }
    std::vector<std::string> known;
    for (const std::string& method : cvagent::service::Objects::methods()) {
        if (method.starts_with("com.vantrel")) {
            known.push_back(method);
        }
    }
    EXPECT_THAT(known, testing::UnorderedElementsAreArray(described));
    EXPECT_EQ(known.size(), 13U);
}

/// Every member has a comment of its own that begins with its name, and each argument is named in it.
TEST(ServiceInterface, DescribesEveryMember) {
    const std::regex member(
        R"re(<!--\s*(\w+):([^]*?)-->\s*<(method|signal|property) name="(\w+)"([^]*?)</\3>)re");
    const std::regex any(R"re(<(method|signal|property) name=)re");
    const std::regex argument(R"re(<arg name="(\w+)")re");
    const std::sregex_iterator end;
    std::ptrdiff_t count = 0;
    for (std::sregex_iterator at(interfaceFile.begin(), interfaceFile.end(), member); at != end;
         ++at, ++count) {
        EXPECT_EQ((*at)[1], (*at)[4]);
        const std::string body = (*at)[5];
        for (std::sregex_iterator each(body.begin(), body.end(), argument); each != end; ++each) {
            EXPECT_THAT((*at)[2].str(), HasSubstr("@" + (*each)[1].str() + ":")) << (*at)[1];
        }
    }
    EXPECT_EQ(std::distance(std::sregex_iterator(interfaceFile.begin(), interfaceFile.end(), any), end),
              count + 3)
        << "Parent, Description and Status have no annotation and end differently";
}

HOST_TEST(ServiceInterface, IsWhatObjectsSayOfThemselves) {
    ServiceRun run(host);
    run.start();
    const auto introspected = [&](const std::string& path) {
        return bus::Reader(call::ask(run.bus(), path, "org.freedesktop.DBus.Introspectable", "Introspect"))
            .text();
    };
    const std::string root = introspected(ServiceRun::kRoot);
    EXPECT_EQ(interfaceIn(root, call::kAgent), interfaceIn(interfaceFile, call::kAgent));
    EXPECT_THAT(root, HasSubstr("org.freedesktop.DBus.ObjectManager"));
    EXPECT_THAT(root, HasSubstr("<node name=\"oshw\"/>"));
    EXPECT_THAT(root, Not(HasSubstr("<node name=\"oshw/")));
    const std::string port = introspected(ServiceRun::kPort);
    EXPECT_EQ(interfaceIn(port, call::kNode), interfaceIn(interfaceFile, call::kNode));
    EXPECT_THAT(port, HasSubstr("<interface name=\"com.vantrel.Corvista1.NetworkPort\">"));
    EXPECT_THAT(port, HasSubstr("<property name=\"LinkSpeed\" type=\"t\" access=\"read\"/>"));
    EXPECT_THAT(port, HasSubstr("<property name=\"InterfaceName\" type=\"s\" access=\"read\"/>"));
    EXPECT_THAT(port, HasSubstr("<node name=\"ip_2dconfig"));
    EXPECT_THAT(port, Not(HasSubstr("ObjectManager")));
}

/// What the file says of a property's type is what the answer has.
HOST_TEST(ServiceInterface, HasThePropertiesOfTheFile) {
    ServiceRun run(host);
    run.start();
    const std::pair<const char*, std::string> places[] = {{call::kAgent, ServiceRun::kRoot},
                                                          {call::kNode, ServiceRun::kComputer}};
    for (const auto& [interface, path] : places) {
        const std::string text = interfaceIn(interfaceFile, interface);
        const std::regex property(R"re(<property name="(\w+)" type="(\w+)")re");
        std::size_t count = 0;
        for (std::sregex_iterator at(text.begin(), text.end(), property), end; at != end; ++at, ++count) {
            const bus::Message answer = call::ask(
                run.bus(), path, call::kProperties, "Get",
                [&, name = (*at)[1].str()](bus::Writer& writer) { writer.put(interface).put(name); });
            std::string type;
            bus::Reader reader(answer);
            call::variantText(reader, &type);
            EXPECT_EQ(type, (*at)[2].str()) << (*at)[1];
        }
        EXPECT_EQ(call::getAll(run.bus(), path, interface).size(), count);
    }
}

}  // namespace
