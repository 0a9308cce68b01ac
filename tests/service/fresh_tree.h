#pragma once

#include <gmock/gmock.h>
#include <sys/mount.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <nlohmann/json.hpp>
#include <sstream>

#include "tests/service/service_run.h"

/// What the service knows of a host, beside what a fresh cvagent finds there at the same moment.
using Json = nlohmann::json;
using Lines = std::vector<std::string>;
/// By path: description, status and the properties by id, as text.
using Tree = std::map<std::string, std::map<std::string, std::string>>;

inline std::string textOf(const Json& value) {
    if (value.is_array()) {
        std::string text;
        for (const Json& each : value) {
            text += (text.empty() ? "" : " ") + textOf(each);
        }
        return text;
    }
    if (value.is_boolean()) {
        return value.get<bool>() ? "1" : "0";
    }
    if (value.is_number_float()) {
        std::ostringstream text;  // "60", not "60.0"
        text << value.get<double>();
        return text.str();
    }
    return value.is_string() ? value.get<std::string>() : value.dump();
}

/// What goes on by itself: the clock.
inline bool isMoving(const std::string& nodeClass, const std::string& property) {
    return nodeClass == "computer" && property == "126";
}

class Freshness : public HostFixture {
protected:
    void setUpHost(FakeHost& host) override {
        for (const char* tool : {"ip", "ethtool", "brctl", "hostname"}) {
            host.realTool(tool);
        }
        host.useKernelNetwork();
        host.setHostName("linux-k");
        host.directory("/opt");
        host.file("/etc/hosts", "127.0.0.1 localhost\n127.0.1.1 linux-k.example.com linux-k\n");
        host.file("/etc/resolv.conf", "search example.com\nnameserver 192.0.2.53\n");
    }

    static void ip(FakeHost& host, const Lines& commands) {
        for (const std::string& command : commands) {
            const Finished done = host.run({"sh", "-c", "ip " + command});
            ASSERT_EQ(done.status, 0) << command << ": " << done.err;
        }
    }
    static Lines cable(const std::string& near, const std::string& far) {
        return {"link add " + near + " type veth peer name " + far, "link set " + near + " up",
                "link set " + far + " up"};
    }

    /// The other agents have another data directory: two would lock each other out.
    static void start(FakeHost& host, ServiceRun& run) {
        run.plugin(CORVISTA_PLUGIN_FILE).hostTools("auto").start();
        host.mountOver("/opt", [] { ASSERT_EQ(mount("data", "/opt", "tmpfs", 0, nullptr), 0); });
    }

    static Tree fresh(FakeHost& host) {
        const Finished run = host.run({CVAGENT_PROGRAM, "--plugin", CORVISTA_PLUGIN_FILE, "tree", "--json"});
        EXPECT_EQ(run.status, 0) << run.err;
        Tree tree;
        const Json all = Json::parse(run.out);
        for (const Json& node : all["nodes"]) {
            auto& facts = tree[node["path"]];
            facts["description"] = node["description"];
            facts["status"] = textOf(node["status"]);
            for (const auto& [id, property] : node["properties"].items()) {
                if (!isMoving(node["class"], id)) {
                    facts[id] = property.contains("value") ? textOf(property["value"]) : "failed";
                }
            }
        }
        return tree;
    }

    static Tree known(ServiceRun& run) {
        const bus::Message answer = call::ask(run.bus(), ServiceRun::kRoot, call::kAgent, "Tree");
        bus::Reader reader(answer);
        Tree tree;
        reader.skip();
        reader.array("(uuuuosssua(uyvtus))", [&] {
            reader.structure("uuuuosssua(uyvtus)", [&] {
                for (int head = 0; head < 5; ++head) {
                    reader.skip();
                }
                const std::string nodeClass = reader.text();
                const std::string path = reader.text();
                std::map<std::string, std::string> facts;
                facts["description"] = reader.text();
                facts["status"] = std::to_string(reader.number());
                for (const ToldReading& each : call::readings(reader)) {
                    if (const std::string id = std::to_string(each.id); !isMoving(nodeClass, id)) {
                        facts[id] = each.error.empty() ? each.value : "failed";
                    }
                }
                tree[path] = facts;
            });
        });
        return tree;
    }

    static long linkNodesIn(const Tree& tree) {
        return std::ranges::count_if(tree, [](const auto& node) {
            return node.first.find("/network-port:") != std::string::npos ||
                   node.first.find("/ip-config:") != std::string::npos;
        });
    }

    static std::string differences(const Tree& known, const Tree& fresh) {
        std::string text;
        for (const auto& [path, facts] : fresh) {
            const auto own = known.find(path);
            if (own == known.end()) {
                text += "not known: " + path + "\n";
                continue;
            }
            for (const auto& [name, value] : facts) {
                const auto fact = own->second.find(name);
                const std::string had = fact == own->second.end() ? "nothing" : "'" + fact->second + "'";
                text += had == "'" + value + "'" ? ""
                                                 : path + " " + name + ": " + had + ", not '" + value + "'\n";
            }
            for (const auto& [name, value] : own->second) {
                text += facts.contains(name) ? "" : path + " " + name + ": '" + value + "', not nothing\n";
            }
        }
        for (const auto& [path, facts] : known) {
            text += fresh.contains(path) ? "" : "gone: " + path + "\n";
        }
        return text;
    }

    /// Waits until the service knows what a fresh agent finds; what comes of a change by itself, as a carrier
    /// does, may come between the two.
    /// @return what still differs after half a minute
    static std::string awaitFresh(FakeHost& host, ServiceRun& run) {
        using Clock = std::chrono::steady_clock;
        std::string text;
        const auto last = Clock::now() + std::chrono::seconds(30);
        do {
            const Tree wanted = fresh(host);
            const auto end = Clock::now() + std::chrono::seconds(1);
            do {
                text = differences(known(run), wanted);
                usleep(5000);
            } while (!text.empty() && Clock::now() < end);
        } while (!text.empty() && Clock::now() < last);
        return text;
    }
};
