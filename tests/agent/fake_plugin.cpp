// A plug-in small enough to know all of: a tree of a few nodes, properties that are slow, failing or
// throwing, and threads that publish, withdraw and alert. CORVISTA_FAKE_PLUGIN, a list of words, tells it
// what to do besides:
//   fail, null, throw       OpenMI returns 7, hands out nothing, throws
//   throwseven              OpenMI throws what is no exception
//   badstart, throwstart    initialize fails, throws
//   throwstop, sevenstop    unload throws, throws what is no exception
//   find                    initialize asks the agent for nodes by name, hands it a node of another make;
//                           asks once more when the library is closed
//   manyerrors              initialize logs sixty different errors
//   hangstart, hangstop     initialize, unload never return
//   holdstart               initialize hangs while it is held
//   slowstop                unload takes a tenth of a second
//   pipe                    initialize runs a command and notes who else has its pipe, and its end
//   command                 initialize runs a command that hangs, and notes what it tells
//   errors                  initialize logs errors
//   churn                   a thread publishes and withdraws drives until unload
//   alert                   a thread sends one alert
//   heldalert               the same, once nothing is held any more
//   early                   initialize sends one alert, before the agent has seen any node
//   late                    unload sends one alert
//   longalert               alerts have a text of a megabyte
//   publish                 initialize publishes a drive of its own
//   drives                  there are twenty drives more
//   chatter                 the thread of churn reports an error each time
//   foreignids              initialize numbers its nodes from 1, whatever the agent says
// CORVISTA_FAKE_PLUGIN_HOLD names a file: while it is there, what waits for it hangs.
// CORVISTA_FAKE_PLUGIN_DIARY names a file that gets a line for each write and for the unload.
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <map>
#include <stdexcept>
#include <string>
#include <thread>

#include "framework/cvlog/logger.h"
#include "framework/ic/management_interface.h"

namespace {

using IC::Error;
using IC::Number;
using IC::PropertyValue;

bool told(const std::string& word) {
    const char* words = std::getenv("CORVISTA_FAKE_PLUGIN");
    return words != nullptr && (" " + std::string(words) + " ").find(" " + word + " ") != std::string::npos;
}

void note(const std::string& line) {
    if (const char* file = std::getenv("CORVISTA_FAKE_PLUGIN_DIARY")) {
        std::ofstream(file, std::ios::app) << line << std::endl;
    }
}

[[noreturn]] void hang() {
    note("hanging");
    for (;;) {
        std::this_thread::sleep_for(std::chrono::hours(1));
    }
}

/// The first word that a command prints, after its end.
std::string outputOf(const char* command) {
    std::array<char, 100> word{"nothing"};
    FILE* const pipe = popen(command, "r");
    const bool told = pipe != nullptr && fgets(word.data(), word.size(), pipe) != nullptr;
    return pipe == nullptr || pclose(pipe) != 0 || !told ? "nothing" : word.data();
}

/// How many descriptors are pipes that have all of these flags.
int pipesWith(int flags, int mask) {
    int count = 0;
    for (int descriptor = 3; descriptor < 256; ++descriptor) {
        struct stat file {};
        const bool pipe = fstat(descriptor, &file) == 0 && S_ISFIFO(file.st_mode);
        count += pipe && (fcntl(descriptor, F_GETFD) & mask) == flags ? 1 : 0;
    }
    return count;
}

int openPipes() {
    return pipesWith(0, 0);
}

/// Those that a program gets that is started now.
int pipesHandedOn() {
    return pipesWith(0, FD_CLOEXEC);
}

void logError(const std::string& message) {
    static const std::string component = "Fake";
    CVLog::CVLogger::logLevelMessage("fake", "fake_plugin", 1, component, 6000, nullptr, 0, 0, message);
    CVLog::CVLogger::traceLevelMessage("fake", "fake_plugin", 1, component, 6000, nullptr, 0, 0, message);
}

bool isHeld() {
    const char* file = std::getenv("CORVISTA_FAKE_PLUGIN_HOLD");
    return file != nullptr && access(file, F_OK) == 0;
}

void waitWhileHeld() {
    while (isHeld()) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
}

void appearBelow(unsigned int parent);

/// 900 is slow, 901 fails and logs, 902 throws, 903 throws what is no exception, 904 hangs while it is held,
/// 905 says then that nobody answers, 910 to 919 log an error of their own; 115 writes "room 5" with an error
/// line, 116 does not write, 74 makes a node. Writing "throw" or "seven" throws, writing "hold" hangs while
/// it is held.
class FakeNode : public IC::MutableNode {
public:
    using MutableNode::MutableNode;

    Error getProperty(unsigned int id, PropertyValue& out) const override {
        switch (id) {
            case 900:
                std::this_thread::sleep_for(std::chrono::milliseconds(200));
                out = PropertyValue("slow", true);
                return {};
            case 901:
                logError("no answer from the host");
                return {1, Number(), "the host does not answer"};
            case 902:
                throw std::runtime_error("thrown by the plug-in");
            case 903:
                throw 7;
            case 904:
                waitWhileHeld();
                out = PropertyValue(Number(++answers_), true);
                return {};
            case 905:
                if (isHeld()) {
                    out = PropertyValue("no answer", true);
                    return {Error::unanswered, Number(), "the device does not answer"};
                }
                out = PropertyValue(Number(++answers_), true);
                return {};
            default:
                if (id >= 910 && id < 920) {
                    logError("read of " + std::to_string(id));
                }
                return MutableNode::getProperty(id, out);
        }
    }
    Error setProperty(const unsigned int& id, const PropertyValue& value) override {
        if (!ready) {
            return MutableNode::setProperty(id, value);
        }
        note(std::to_string(id) + "=" + static_cast<std::string>(value));
        if (value == PropertyValue("throw", true)) {
            throw std::runtime_error("thrown while writing");
        }
        if (value == PropertyValue("seven", true)) {
            throw 7;
        }
        if (value == PropertyValue("hold", true)) {
            waitWhileHeld();
        }
        if (id == 74) {
            appearBelow(getNodeId());
        }
        if (id == 115 && value == PropertyValue("room 5", true)) {
            logError("the disk is nearly full");
        }
        if (id == 116) {
            return {1, Number(), "the disk is full"};
        }
        return MutableNode::setProperty(id, value);
    }

    static std::atomic<bool> ready;

private:
    mutable std::atomic<unsigned int> answers_{0};
};
std::atomic<bool> FakeNode::ready{false};

/// A node that an agent has not made its own.
class ForeignNode : public IC::Node {
public:
    unsigned int getStatus() const override { return 1; }
    std::string getDescription() const override { return "foreign"; }
    Error getProperty(unsigned int, PropertyValue&) const override { return {}; }
    Error getProperties(std::map<unsigned int, PropertyValue>&) const override { return {}; }
    Error setProperty(const unsigned int&, const PropertyValue&) override { return {}; }
    operator std::string() const override { return "foreign"; }
};

class FakeInterface : public IC::ManagementInterface {
public:
    ~FakeInterface() override {
        IC::Node* node = nullptr;
        if (told("find") && find_ != nullptr) {
            note("at the end: " + find_("computer", &node).text());
        }
    }

    void setLoadCallBack(IC::LoadCallBack load, const void* context, IC::FindCallBack find) override {
        load_ = load;
        context_ = context;
        find_ = find;
        ManagementInterface::setLoadCallBack(load, context, find);
    }

    Error initialize(unsigned int miId, const Number& ownNodeId, const Number& firstNodeId) override {
        note("initialize " + std::to_string(miId) + " " + ownNodeId.toString() + " " +
             firstNodeId.toString());
        const Error result = told("foreignids")
                                 ? ManagementInterface::initialize(miId, Number(1U), Number(2U))
                                 : ManagementInterface::initialize(miId, ownNodeId, firstNodeId);
        if (told("throwstart")) {
            throw std::runtime_error("cannot start");
        }
        build();
        if (told("hangstart")) {
            hang();
        }
        if (told("holdstart")) {
            waitWhileHeld();
            note("held no more");
        }
        if (told("pipe")) {
            const int before = openPipes();
            const int handedOn = pipesHandedOn();
            FILE* const pipe = popen("exit 7", "r");
            note(openPipes() > before && pipesHandedOn() == handedOn ? "closed on exec" : "left open");
            note("ended with " + std::to_string(WEXITSTATUS(pclose(pipe))));
        }
        if (told("command")) {
            note(outputOf("echo command >> \"$CORVISTA_FAKE_PLUGIN_DIARY\"; exec sleep 1000"));
        }
        if (told("find")) {
            askTheAgent();
        }
        for (int i = 0; told("manyerrors") && i < 60; ++i) {
            logError("error " + std::to_string(i));
        }
        if (told("errors")) {
            logError("first error");
            logError("second error");
            logError("second error");
        }
        FakeNode::ready = true;
        running_ = true;
        if (told("churn")) {
            churn_ = std::thread([this] { churn(); });
        }
        if (told("alert")) {
            alert_ = std::thread([this] {
                std::this_thread::sleep_for(std::chrono::milliseconds(50));
                sendAlert();
            });
        }
        if (told("heldalert")) {
            alert_ = std::thread([this] {
                waitWhileHeld();
                sendAlert();
            });
        }
        if (told("early")) {
            sendAlert();
        }
        if (told("publish")) {
            addNewNode(makeDrive("/dev/sdc"));
        }
        return told("badstart") ? Error(1, Number(), "no host here") : result;
    }

    Error unload() override {
        running_ = false;
        for (std::thread* thread : {&churn_, &alert_}) {
            if (thread->joinable()) {
                thread->join();
            }
        }
        if (told("late")) {
            sendAlert();
        }
        if (told("hangstop")) {
            hang();
        }
        if (told("slowstop")) {
            note("slow");
            std::this_thread::sleep_for(std::chrono::milliseconds(100));
        }
        FakeNode::ready = false;
        note("unload");
        const Error result = ManagementInterface::unload();
        if (told("throwstop")) {
            throw std::runtime_error("cannot stop");
        }
        if (told("sevenstop")) {
            throw 7;
        }
        return result;
    }

    /// As a writer makes nodes: the agent is not told.
    void appear(unsigned int parent) {
        auto* port = make(parent, 12, 2, "Network Port");
        port->MutableNode::setProperty(108, PropertyValue("eth1", true));
        appendNode(port);
    }

    /// What the exported builder makes: one processor.
    void addProcessor() {
        auto* processor = make(planar_, 4, 1, "Processor");
        processor->MutableNode::setProperty(80, PropertyValue(Number(2400U), true));
        appendNode(processor);
    }

private:
    FakeNode* make(unsigned int parent, unsigned int type, unsigned int index,
                   const std::string& description) {
        const unsigned int id = type == 38 ? ownNodeId() : takeNodeId();
        auto* node = new FakeNode(id, parent, miIds(), type, index);
        node->setStatus(1);
        node->setDescription(description);
        return node;
    }
    unsigned int add(FakeNode* node) {
        appendNode(node);
        return node->getNodeId();
    }
    FakeNode* makeDrive(const std::string& device) {
        auto* drive = make(disks_, 11, 0, "Hard Drive");
        drive->MutableNode::setProperty(89, PropertyValue(device, true));
        drive->MutableNode::setProperty(37, PropertyValue(Number(80026361ULL), true));
        return drive;
    }

    void build() {
        const unsigned int top = add(make(0, 38, 0, "OsHw Management Interface"));
        const unsigned int root = add(make(top, 59, 0, "ROOT Node"));
        auto* computer = make(root, 40, 0, "Computer");
        computer->setProperty(108, PropertyValue("fake", true));
        computer->setProperty(115, PropertyValue("", true));
        computer->setProperty(123, PropertyValue(IC::EnumValue(1), true));
        computer->setProperty(127, PropertyValue(Number(-210.0), true));
        const unsigned int chassis = add(make(add(computer), 1, 0, ""));
        planar_ = add(make(chassis, 41, 0, "Planar"));
        disks_ = add(make(planar_, 50, 1, "Disk Controller"));
        add(makeDrive("/dev/sda"));
        for (int i = 0; told("drives") && i < 20; ++i) {
            add(makeDrive("/dev/x" + std::to_string(i)));
        }
        const unsigned int network = add(make(chassis, 49, 0, "Network Controller"));
        auto* port = make(network, 12, 1, "Network Port");
        port->setProperty(108, PropertyValue("eth0", true));
        port->setProperty(57, PropertyValue(Number(1000000ULL), true));
        port->setProperty(123, PropertyValue(Number(12U), true));
        port->setStatus(12);
        auto* ip = make(add(port), 29, 1, "IP Configuration");
        ip->setStatus(12);
        ip->setProperty(108, PropertyValue("eth0", true));
        ip->setProperty(24, PropertyValue(IC::EnumValue(3), true));
        ip->setProperty(94, PropertyValue(std::vector<std::string>{"192.0.2.53"}, true));
        ip->setProperty(125, PropertyValue(std::vector<Number>{Number(0U), Number(1U), Number(12U)}, true));
        add(ip);
    }

    void askTheAgent() {
        for (const std::string name : {"hard-drive:sda", "nowhere"}) {
            IC::Node* node = nullptr;
            const Error result = find_(name, &node);
            note(name + ": " + (node != nullptr ? node->getDescription() : result.text()));
        }
        ForeignNode foreign;
        note("foreign: " + load_(&foreign, context_).text());
    }

    void churn() {
        while (running_) {
            FakeNode* drive = makeDrive("/dev/sdb");
            addNewNode(drive);
            if (told("chatter")) {
                logError("the monitor's own");
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
            deleteNode(drive);
        }
    }

    void sendAlert() {
        std::string path;
        for (const auto& node : holdAll()) {
            path = node->nodeType() == 12 ? node->getPath() : path;
        }
        const auto [handler, context] = alertHandler();
        if (handler != nullptr) {
            const std::string text = told("longalert") ? std::string(1 << 20, 'x') : "NIC is Offline ";
            handler({IC::Alert(1, 0, {path}, 12, text)}, context);
        }
    }

    IC::LoadCallBack load_ = nullptr;
    const void* context_ = nullptr;
    IC::FindCallBack find_ = nullptr;
    unsigned int planar_ = 0;
    unsigned int disks_ = 0;
    std::atomic<bool> running_{false};
    std::thread churn_;
    std::thread alert_;
};

FakeInterface fakeInterface;

void appearBelow(unsigned int parent) {
    fakeInterface.appear(parent);
}

Error fakeError;

}  // namespace

extern "C" __attribute__((visibility("default"))) int OpenMI(IC::ManagementInterface** mi, Error** error) {
    if (told("throw")) {
        throw std::runtime_error("not today");
    }
    if (told("throwseven")) {
        throw 7;
    }
    if (told("fail")) {
        fakeError = Error(1, Number(), "not licensed");
        *error = &fakeError;
        return 7;
    }
    *mi = told("null") ? nullptr : &fakeInterface;
    *error = &fakeError;
    return 0;
}

// The agent asks for the builder of processor nodes by its linker name.
extern "C" __attribute__((visibility("default"))) void createProcessors(IC::ManagementInterface* mi) __asm__(
    "_ZN2IC6OsHwMI14createCpuNodesEv");
extern "C" void createProcessors(IC::ManagementInterface* mi) {
    static_cast<FakeInterface*>(mi)->addProcessor();
}
