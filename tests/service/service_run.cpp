#include "tests/service/service_run.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <exception>
#include <stdexcept>

using namespace std::chrono_literals;

ServiceRun::ServiceRun(FakeHost& host) : host_(host) {
    host.realTool("dbus-daemon");
    host.directory("/run", 0755);
    host.file("/etc/passwd", "root:x:0:0::/root:/bin/sh\nalice:x:12345:12345::/:/bin/sh\n");
    host.file("/etc/group", "root:x:0:\ncorvista:x:12345:\n");
}

ServiceRun::~ServiceRun() {
    if (std::uncaught_exceptions() > 0 && program_) {
        ADD_FAILURE() << "the service has said: " << program_->err();
    }
}

ServiceRun& ServiceRun::telling(const std::string& words) {
    words_ = words;
    return *this;
}

ServiceRun& ServiceRun::plugin(const std::string& file) {
    plugins_ = {file};
    return *this;
}

ServiceRun& ServiceRun::andPlugin(const std::string& file) {
    plugins_.push_back(file);
    return *this;
}

ServiceRun& ServiceRun::hostTools(const std::string& choice) {
    hostTools_ = choice;
    return *this;
}

ServiceRun& ServiceRun::config(const std::string& text) {
    host_.file("/etc/corvista/agent.conf", text);
    return *this;
}

std::vector<std::string> ServiceRun::commandLine() const {
    std::vector<std::string> words = {"env",
                                      "CORVISTA_FAKE_PLUGIN_DIARY=/var/diary",
                                      "CORVISTA_FAKE_PLUGIN_HOLD=/var/hold",
                                      "CORVISTA_FAKE_PLUGIN=" + words_,
                                      CVAGENTD_PROGRAM,
                                      "--private-bus",
                                      "--host-tools",
                                      hostTools_};
    for (const std::string& plugin : plugins_) {
        words.insert(words.end(), {"--plugin", plugin});
    }
    return words;
}

ServiceRun& ServiceRun::start() {
    program_ = std::unique_ptr<RunningProgram>(new RunningProgram(host_.start(commandLine())));
    const auto end = std::chrono::steady_clock::now() + 60s;
    while (program_->err().find(" nodes on the bus as ") == std::string::npos) {
        if (std::chrono::steady_clock::now() > end) {
            throw std::runtime_error("the service does not start: " + program_->err());
        }
        usleep(2000);
    }
    bus_.emplace(address());
    bus_->uniqueName();  // greets the bus, which closes connections that leave it waiting for five seconds
    return *this;
}

namespace call {

bus::Message make(const bus::Connection& bus, const std::string& path, const std::string& interface,
                  const std::string& member, const Arguments& arguments) {
    const bus::Message message = bus.newCall({"com.vantrel.Corvista1", path, interface, member});
    if (arguments) {
        bus::Writer writer(message);
        arguments(writer);
    }
    return message;
}

bus::Message ask(const bus::Connection& bus, const std::string& path, const std::string& interface,
                 const std::string& member, const Arguments& arguments) {
    return bus.ask(make(bus, path, interface, member, arguments), 30s);
}

std::string errorOf(const bus::Connection& bus, const std::string& path, const std::string& interface,
                    const std::string& member, const Arguments& arguments) {
    try {
        ask(bus, path, interface, member, arguments);
        return "";
    } catch (const bus::Error& error) {
        return error.name();
    }
}

std::string get(const bus::Connection& bus, const std::string& path, const std::string& interface,
                const std::string& name) {
    const bus::Message answer =
        ask(bus, path, kProperties, "Get", [&](bus::Writer& writer) { writer.put(interface).put(name); });
    bus::Reader reader(answer);
    return variantText(reader);
}

std::map<std::string, std::string> getAll(const bus::Connection& bus, const std::string& path,
                                          const std::string& interface) {
    const bus::Message answer =
        ask(bus, path, kProperties, "GetAll", [&](bus::Writer& writer) { writer.put(interface); });
    std::map<std::string, std::string> all;
    bus::Reader reader(answer);
    reader.array("{sv}", [&] {
        reader.entry("sv", [&] {
            const std::string name = reader.text();
            all[name] = variantText(reader);
        });
    });
    return all;
}

std::string variantText(bus::Reader& reader, std::string* type) {
    std::string text;
    reader.variant([&](const std::string& contents) {
        if (type != nullptr) {
            *type = contents;
        }
        if (contents == "ay") {
            text = reader.bytes();
        } else if (contents.size() == 2 && contents.front() == 'a') {
            reader.array(contents.c_str() + 1, [&] {
                text +=
                    (text.empty() ? "" : " ") + (contents == "av" ? variantText(reader) : reader.asWord());
            });
        } else if (contents == "(xq)") {
            reader.structure("xq", [&] {
                text = reader.asWord();
                text += "e-" + reader.asWord();
            });
        } else {
            text = reader.asWord();
        }
    });
    return text;
}

ToldReading reading(bus::Reader& reader) {
    ToldReading told;
    reader.structure("uyvtus", [&] {
        told.id = reader.number();
        told.kind = reader.byte();
        told.value = variantText(reader, &told.type);
        told.time = reader.longNumber();
        told.flags = reader.number();
        told.error = reader.text();
    });
    return told;
}

std::vector<ToldReading> readings(bus::Reader& reader) {
    std::vector<ToldReading> all;
    reader.array("(uyvtus)", [&] { all.push_back(reading(reader)); });
    return all;
}

ToldEvent event(bus::Reader& reader) {
    ToldEvent told;
    reader.structure("tstusssussssssau", [&] {
        told.number = reader.longNumber();
        told.kind = reader.text();
        reader.skip();
        told.node = reader.number();
        reader.skip();
        told.path = reader.text();
        told.message = reader.text();
        reader.skip();
        told.property = reader.text();
        told.before = reader.text();
        told.after = reader.text();
        told.caller = reader.text();
        told.wanted = reader.text();
        told.verdict = reader.text();
        reader.skip();
    });
    return told;
}

ToldEvents eventsSince(const bus::Connection& bus, std::uint64_t number) {
    const bus::Message answer =
        ask(bus, ServiceRun::kRoot, kAgent, "EventsSince", [&](bus::Writer& writer) { writer.put(number); });
    ToldEvents told;
    bus::Reader reader(answer);
    reader.array("(tstusssussssssau)", [&] { told.events.push_back(event(reader)); });
    told.dropped = reader.longNumber();
    return told;
}

std::vector<ToldReading> read(const bus::Connection& bus, const std::string& path,
                              const std::vector<std::uint32_t>& ids) {
    const bus::Message answer = ask(bus, path, kNode, "Read", [&](bus::Writer& writer) { writer.put(ids); });
    bus::Reader reader(answer);
    return readings(reader);
}

Arguments write(std::uint32_t property, const std::string& value) {
    return [property, value](bus::Writer& writer) {
        writer.put(property).variant("s", [&] { writer.put(value); });
    };
}

bool until(bus::Connection& bus, const std::function<bool()>& condition) {
    const auto end = std::chrono::steady_clock::now() + 60s;
    try {
        bus.process();
        while (!condition() && std::chrono::steady_clock::now() < end) {
            pollfd ready{bus.descriptor(), POLLIN, 0};
            poll(&ready, 1, 10);
            bus.process();
        }
    } catch (const bus::Error&) {
        // The bus is gone; what came before counts.
    }
    return condition();
}

std::string asUser(unsigned user, std::optional<unsigned> group,
                   const std::function<std::string()>& function) {
    return asUserBeside(
        user, function, [] {}, group);
}

std::string asUserBeside(unsigned user, const std::function<std::string()>& function,
                         const std::function<void()>& meanwhile, std::optional<unsigned> group) {
    std::array<int, 2> pipe{};
    if (pipe2(pipe.data(), O_CLOEXEC) != 0) {
        return "?";
    }
    const pid_t child = fork();
    if (child == 0) {
        std::string told = "?";
        try {
            // In a user namespace without further groups the main one has to do.
            if ((!group || setgid(*group) == 0) && setuid(user) == 0) {
                told = function();
            } else {
                told = "no other user";
            }
        } catch (const bus::Error& error) {
            told = error.name();
        } catch (const std::exception& exception) {
            told = exception.what();
        }
        [[maybe_unused]] const ssize_t written = ::write(pipe[1], told.data(), told.size());
        _exit(0);
    }
    close(pipe[1]);
    std::string told;
    std::array<char, 4096> block{};
    for (ssize_t size = 1; size > 0;) {
        pollfd ready{pipe[0], POLLIN, 0};
        while (poll(&ready, 1, 2) == 0) {
            meanwhile();
        }
        size = ::read(pipe[0], block.data(), block.size());
        told.append(block.data(), size > 0 ? static_cast<std::size_t>(size) : 0);
    }
    close(pipe[0]);
    waitpid(child, nullptr, 0);
    return told;
}

}  // namespace call
