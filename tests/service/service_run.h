#pragma once

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "agent/bus/connection.h"
#include "agent/bus/reader.h"
#include "agent/bus/writer.h"
#include "tests/support/fake_host.h"

/// What a reading is on the bus: value is the variant's content as text, "" for none.
struct ToldReading {
    std::uint32_t id = 0;
    std::uint8_t kind = 0;
    std::string type;
    std::string value;
    std::uint64_t time = 0;
    std::uint32_t flags = 0;
    std::string error;
};

struct ToldEvent {
    std::uint64_t number = 0;
    std::string kind;
    std::uint32_t node = 0;
    std::string path;
    std::string message;
    std::string property;
    std::string before;
    std::string after;
    std::string caller;
    std::string wanted;
    std::string verdict;
};

/// cvagentd with the fake plug-in on a bus of its own, in the fake host, and a client of it.
namespace bus = cvagent::bus;

class ServiceRun {
public:
    explicit ServiceRun(FakeHost& host);
    /// Tells what the service has said when something is thrown, as when it is gone.
    ~ServiceRun();
    ServiceRun(const ServiceRun&) = delete;
    ServiceRun& operator=(const ServiceRun&) = delete;

    ServiceRun& telling(const std::string& words);
    ServiceRun& plugin(const std::string& file);
    /// One more.
    ServiceRun& andPlugin(const std::string& file);
    /// "native" without a word about it.
    ServiceRun& hostTools(const std::string& choice);
    ServiceRun& config(const std::string& text);
    /// Starts it and waits until it is on the bus.
    ServiceRun& start();
    std::vector<std::string> commandLine() const;

    RunningProgram& program() { return *program_; }
    static std::string address() { return "unix:path=/run/corvista/bus"; }
    bus::Connection& bus() { return *bus_; }
    std::string diary() const { return host_.read("/var/diary").value_or(""); }

    static constexpr const char* kRoot = "/com/vantrel/Corvista1";
    static constexpr const char* kComputer = "/com/vantrel/Corvista1/oshw/root/computer";
    static constexpr const char* kPort =
        "/com/vantrel/Corvista1/oshw/root/computer/chassis/network_2dcontroller/network_2dport_3aeth0";

private:
    FakeHost& host_;
    std::string words_;
    std::vector<std::string> plugins_{FAKE_PLUGIN_FILE};
    std::string hostTools_ = "native";
    std::unique_ptr<RunningProgram> program_;
    std::optional<bus::Connection> bus_;
};

namespace call {

namespace bus = cvagent::bus;
using Arguments = std::function<void(bus::Writer&)>;

constexpr const char* kAgent = "com.vantrel.Corvista1.Agent";
constexpr const char* kManager = "org.freedesktop.DBus.ObjectManager";
constexpr const char* kNode = "com.vantrel.Corvista1.Node";
constexpr const char* kProperties = "org.freedesktop.DBus.Properties";

bus::Message make(const bus::Connection& bus, const std::string& path, const std::string& interface,
                  const std::string& member, const Arguments& arguments = nullptr);
bus::Message ask(const bus::Connection& bus, const std::string& path, const std::string& interface,
                 const std::string& member, const Arguments& arguments = nullptr);
/// The name of the error that a call ends with; "" when it does not.
std::string errorOf(const bus::Connection& bus, const std::string& path, const std::string& interface,
                    const std::string& member, const Arguments& arguments = nullptr);
/// A property as text.
std::string get(const bus::Connection& bus, const std::string& path, const std::string& interface,
                const std::string& name);
/// The names of all properties of an interface, with their values.
std::map<std::string, std::string> getAll(const bus::Connection& bus, const std::string& path,
                                          const std::string& interface);
std::string variantText(bus::Reader& reader, std::string* type = nullptr);
ToldReading reading(bus::Reader& reader);
std::vector<ToldReading> readings(bus::Reader& reader);
ToldEvent event(bus::Reader& reader);
/// What EventsSince answers.
struct ToldEvents {
    std::vector<ToldEvent> events;
    std::uint64_t dropped = 0;
};
ToldEvents eventsSince(const bus::Connection& bus, std::uint64_t number);
std::vector<ToldReading> read(const bus::Connection& bus, const std::string& path,
                              const std::vector<std::uint32_t>& ids);
Arguments write(std::uint32_t property, const std::string& value);

/// Processes the connection until something comes true, for at most a minute.
bool until(bus::Connection& bus, const std::function<bool()>& condition);

/// What a function tells that runs as another user, in a process of its own; "?" when it does not end well.
std::string asUser(unsigned user, std::optional<unsigned> group,
                   const std::function<std::string()>& function);
/// The same, while something else is done again and again here.
std::string asUserBeside(unsigned user, const std::function<std::string()>& function,
                         const std::function<void()>& meanwhile, std::optional<unsigned> group = {});

}  // namespace call
