#include "tests/storage/storage_host.h"
#include "oshwmi/os_hw_mi.h"

#include <chrono>
#include <fstream>
#include <sstream>
#include <thread>

#include "mi/globals.h"
#include "mi/node_types.h"
#include "storage/storage_nodes.h"
#include "tests/support/command_lines.h"

namespace {

bool refusing = false;
std::unique_ptr<CommandLines> started;

std::string pathOf(const IC::Node& node) {
    IC::PropertyValue path;
    node.getProperty(89, path);
    return std::string(path);
}

unsigned long long numberOf(const IC::Node& node, unsigned int id) {
    IC::PropertyValue value;
    EXPECT_EQ(node.getProperty(id, value).getStatus(), 0) << "property " << id;
    EXPECT_NE(value.asNumber(), nullptr) << "property " << id;
    return value.asNumber() != nullptr ? value.asNumber()->toUnsigned64() : 0;
}

std::vector<Seen> look(unsigned int type, unsigned int sizeProperty) {
    std::vector<Seen> seen;
    for (const auto& node : IC::myoshwmi.holdAll()) {
        if (node->nodeType() == type) {
            seen.push_back(
                {node->getNodeId(), node->getIndex(), pathOf(*node), numberOf(*node, sizeProperty)});
        }
    }
    return seen;
}

}  // namespace

std::string listing(const std::string& name) {
    const std::string path = testsDirectory() + "/storage/listings/" + name + ".txt";
    std::ifstream file(path);
    if (!file) {
        throw std::runtime_error("no such listing: " + path);
    }
    std::ostringstream text;
    text << file.rdbuf();
    return text.str();
}

std::vector<std::string> commands() {
    return started->all();
}

void clearCommands() {
    started->clear();
}

void forgetCommands() {
    started.reset();
}

bool fileLockIsHeld() {
    bool taken = false;
    // A thread of its own: nobody may try a lock that he may be holding.
    std::thread([&taken] {
        taken = IC::OSHWMI::myfileLock.lock(0);
        if (taken) {
            IC::OSHWMI::myfileLock.unlock();
        }
    }).join();
    return !taken;
}

bool fileLockIsFreeWhile(FakeHost& host, const std::string& toolRuns) {
    const auto wait = [] { std::this_thread::sleep_for(std::chrono::milliseconds(1)); };
    while (host.callsOf(toolRuns).empty()) {
        wait();
    }
    bool held = fileLockIsHeld();  // still, perhaps: the tool may run before its starter does again
    const auto giveUp = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    while (held && std::chrono::steady_clock::now() < giveUp) {
        wait();
        held = fileLockIsHeld();
    }
    host.file("/go-on", "");
    return !held;
}

std::vector<std::string> withoutPropertyLines(const std::vector<std::string>& messages) {
    std::vector<std::string> kept;
    for (const std::string& message : messages) {
        if (message.find("::setProperty: ") == std::string::npos &&
            message.find("::getProperty: ") == std::string::npos) {
            kept.push_back(message);
        }
    }
    return kept;
}

void StorageHost::setUpHost(FakeHost&) {
    started = std::make_unique<CommandLines>();
    IC::OsHwMITestAccess::plantDiskController(kControllerId);
    IC::myoshwmi.setLoadCallBack(
        [](IC::Node* const& node, const void*) -> IC::Error {
            if (refusing) {
                return {1, IC::Number(), "the agent is full"};
            }
            diary().push_back("published " + pathOf(*node));
            return {};
        },
        nullptr, nullptr);
    IC::myoshwmi.setWithdrawCallBack(
        [](const IC::Node& node, const void*) { diary().push_back("withdrawn " + pathOf(node)); }, nullptr);
}

void StorageHost::tearDownHost(FakeHost&) {
    IC::OsHwMITestAccess::stopMonitor();
    shell_stub::failWhen({});
    shell_stub::beforeEach({});
    IC::myoshwmi.ManagementInterface::unload();
    started.reset();
}

std::vector<Seen> StorageHost::drives() {
    return look(IC::NodeType::hardDrive, 37);
}

std::vector<Seen> StorageHost::partitions() {
    return look(IC::NodeType::partition, 112);
}

std::vector<std::shared_ptr<IC::MutableNode>> StorageHost::nodesOfType(unsigned int type) {
    auto nodes = IC::myoshwmi.holdAll();
    std::erase_if(nodes, [type](const auto& node) { return node->nodeType() != type; });
    return nodes;
}

std::vector<std::string>& StorageHost::diary() {
    static std::vector<std::string> entries;
    return entries;
}

void StorageHost::agentRefuses() {
    refusing = true;
}
