#include "agent/service/introspection.h"

#include <iterator>
#include <set>
#include <string_view>

#include "agent/service/interface_text.h"
#include "agent/service/names.h"
#include "agent/service/values.h"

namespace cvagent::service {

namespace {

constexpr std::string_view kHead =
    "<!DOCTYPE node PUBLIC \"-//freedesktop//DTD D-BUS Object Introspection 1.0//EN\"\n"
    "\"http://www.freedesktop.org/standards/dbus/1.0/introspect.dtd\">\n<node>\n";
constexpr std::string_view kEverywhere = R"(<interface name="org.freedesktop.DBus.Peer">
<method name="Ping"/>
<method name="GetMachineId"><arg type="s" name="machine_uuid" direction="out"/></method>
</interface>
<interface name="org.freedesktop.DBus.Introspectable">
<method name="Introspect"><arg name="xml_data" type="s" direction="out"/></method>
</interface>
<interface name="org.freedesktop.DBus.Properties">
<method name="Get">
<arg name="interface_name" direction="in" type="s"/>
<arg name="property_name" direction="in" type="s"/>
<arg name="value" direction="out" type="v"/>
</method>
<method name="GetAll">
<arg name="interface_name" direction="in" type="s"/>
<arg name="props" direction="out" type="a{sv}"/>
</method>
<method name="Set">
<arg name="interface_name" direction="in" type="s"/>
<arg name="property_name" direction="in" type="s"/>
<arg name="value" direction="in" type="v"/>
</method>
<signal name="PropertiesChanged">
<arg type="s" name="interface_name"/>
<arg type="a{sv}" name="changed_properties"/>
<arg type="as" name="invalidated_properties"/>
</signal>
</interface>
)";
constexpr std::string_view kManager = R"(<interface name="org.freedesktop.DBus.ObjectManager">
<method name="GetManagedObjects">
<arg type="a{oa{sa{sv}}}" name="object_paths_interfaces_and_properties" direction="out"/>
</method>
<signal name="InterfacesAdded">
<arg type="o" name="object_path"/>
<arg type="a{sa{sv}}" name="interfaces_and_properties"/>
</signal>
<signal name="InterfacesRemoved">
<arg type="o" name="object_path"/>
<arg type="as" name="interfaces"/>
</signal>
</interface>
)";

constexpr char kBehindSlash = '/' + 1;

/// The interface as the installed file describes it.
std::string_view described(const std::string& interface) {
    constexpr std::string_view kEnd = "</interface>";
    const std::string_view text = kInterfaceText;
    const std::size_t start = text.find("<interface name=\"" + interface + "\"");
    const std::size_t end = text.find(kEnd, start);
    return text.substr(start, end + kEnd.size() - start);
}

std::string classInterface(const NodeView& node) {
    std::string text = "<interface name=\"" + node.interface + "\">\n";
    for (const Reading& reading : node.readings) {
        if (isKnown(reading)) {
            text += "<property name=\"" + propertyNameOf(reading.id, reading.row) + "\" type=\"" +
                    typeOf(reading.value) + "\" access=\"read\"";
            text += isTrusted(reading)
                        ? "><annotation name=\"org.freedesktop.DBus.Property.EmitsChangedSignal"
                          "\" value=\"invalidates\"/></property>\n"
                        : "/>\n";
        }
    }
    return text + "</interface>\n";
}

/// The names of the objects right below it. Names that only go on after a child's ("a", "a_5") may stand
/// between the child and what is below it, so names that were told are remembered.
std::string children(const Model& model, const std::string& object) {
    const std::string start = object + "/";
    const auto& objects = model.objects();
    std::set<std::string> names;
    for (auto at = objects.lower_bound(start); at != objects.end() && at->first.starts_with(start);) {
        const std::size_t end = at->first.find('/', start.size());
        names.insert(at->first.substr(start.size(), end - start.size()));
        // From the first object below a child to behind the last one.
        at = end == std::string::npos ? std::next(at)
                                      : objects.lower_bound(at->first.substr(0, end) + kBehindSlash);
    }
    std::string text;
    for (const std::string& name : names) {
        text += "<node name=\"" + name + "\"/>\n";
    }
    return text;
}

}  // namespace

std::string introspect(const Model& model, const std::string& object, const NodeView* node) {
    std::string text(kHead);
    text += kEverywhere;
    if (object == kRootObject) {
        text += kManager;
        text += described(kAgentInterface);
        text += "\n";
    } else if (node != nullptr) {
        text += described(kNodeInterface);
        text += "\n" + classInterface(*node);
    }
    return text + children(model, object) + "</node>\n";
}

bool leadsSomewhere(const Model& model, const std::string& object) {
    const auto below = model.objects().lower_bound(object + "/");
    return object == kRootObject ||
           (below != model.objects().end() && below->first.starts_with(object + "/"));
}

}  // namespace cvagent::service
