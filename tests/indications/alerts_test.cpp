#include <gmock/gmock.h>

#include "indications/globals.h"
#include "tests/indications/interfaces.h"
#include "tests/support/fake_host.h"
#include "tests/support/log_capture.h"
#include "tests/support/texts_are.h"

namespace {

using testing::IsEmpty;

/// The agent: keeps what it is sent.
struct Agent {
    static IC::Error hear(const std::vector<IC::Alert>& alerts, const void* context) {
        auto* agent = const_cast<Agent*>(static_cast<const Agent*>(context));
        EXPECT_EQ(alerts.size(), 1U) << "one alert a call";
        agent->alerts.insert(agent->alerts.end(), alerts.begin(), alerts.end());
        return {agent->answer, IC::Number(), "agent's answer"};
    }
    explicit Agent(IC::OsHwMI& mi) { mi.registerForAlerts(hear, this); }
    std::vector<std::string> messages() const {
        std::vector<std::string> found;
        for (const IC::Alert& alert : alerts) {
            found.push_back(alert.message());
        }
        return found;
    }

    std::vector<IC::Alert> alerts;
    unsigned char answer = 0;
};

/// Keeps what a node said when its alert came.
struct Listener {
    static IC::Error hear(const std::vector<IC::Alert>&, const void* context) {
        auto* listener = const_cast<Listener*>(static_cast<const Listener*>(context));
        listener->status = listener->node.getStatus();
        listener->node.getProperty(123, listener->state);
        return {};
    }

    InterfaceNode& node;
    unsigned int status = 0;
    IC::PropertyValue state = {};
};

/// An agent that throws at every alert: a number, then exceptions.
struct BrokenAgent {
    static IC::Error hear(const std::vector<IC::Alert>&, const void* context) {
        if (++const_cast<BrokenAgent*>(static_cast<const BrokenAgent*>(context))->calls == 1) {
            throw 7;
        }
        throw std::runtime_error("the agent is broken");
    }

    int calls = 0;
};

struct Change {
    unsigned int before, now;
    const char* message;
    unsigned char firstCode;
    unsigned int eventCode;
    unsigned int status;    ///< of the node afterwards
    unsigned int property;  ///< 123 of the node afterwards
};

/// One interface that was in one state and is in another.
class OneChange {
public:
    OneChange(unsigned int before, unsigned int now)
        : node(interfaces.add("eth0", 77)), agent(interfaces.mi()) {
        node.setStatus(12);
        interfaces.previous() = {{"eth0", before}};
        interfaces.current() = {{"eth0", now}};
    }
    void check() { interfaces.mi().checkAndSendNetAlert(); }

    Interfaces interfaces;
    InterfaceNode& node;
    Agent agent;
};

void expectAlert(const Change& expected) {
    OneChange change(expected.before, expected.now);
    change.check();
    ASSERT_EQ(change.agent.alerts.size(), 1U);
    const IC::Alert& alert = change.agent.alerts[0];
    EXPECT_EQ(alert.message(), expected.message);
    EXPECT_EQ(alert.firstCode(), expected.firstCode);
    EXPECT_EQ(alert.secondCode(), 0);
    EXPECT_EQ(alert.eventCode(), expected.eventCode);
    EXPECT_THAT(alert.substitutions(), TextsAre("/ports/eth0"));
    IC::PropertyValue state;
    change.node.getProperty(123, state);
    EXPECT_EQ(state, IC::PropertyValue(IC::Number(expected.property), true));
    EXPECT_EQ(change.node.getStatus(), expected.status);
}

HOST_TEST(Alerts, TellAPortThatComesUp) {
    expectAlert({12, 1, "NIC is Online ", 3, 1, 12, 77});
}

HOST_TEST(Alerts, TellAPortThatGoesDown) {
    expectAlert({1, 12, "NIC is Offline ", 1, 12, 12, 77});
}

HOST_TEST(Alerts, TellASwitchOverAndMarkTheNodeFirst) {
    expectAlert({1, 32, "NIC has Switched Over ", 1, 32, 1, 32});
    OneChange change(1, 32);
    Listener listener{change.node};
    change.interfaces.mi().registerForAlerts(Listener::hear, &listener);
    change.check();
    EXPECT_EQ(listener.status, 1U);
    EXPECT_EQ(listener.state, IC::PropertyValue(IC::Number(32U), true));
}

HOST_TEST(Alerts, TellASwitchBackUnderTheCodeOfASwitchOver) {
    expectAlert({1, 33, "NIC has Switched Back ", 1, 32, 1, 33});
}

/// A look that finds nothing to tell says no more than that it looked.
const std::vector<std::string> kOneLook = {"checkAndSendNetAlert: entry", "Slaves Map Size : 0",
                                           "Returning from checkAndSendNetAlert"};

HOST_TEST(Alerts, AreNoneWithoutAChange) {
    OneChange change(12, 12);
    LogCapture capture;
    change.check();
    EXPECT_THAT(change.agent.alerts, IsEmpty());
    EXPECT_EQ(capture.ownMessages(3000), kOneLook);
}

HOST_TEST(Alerts, AreNoneForAPortSeenForTheFirstTimeOrGone) {
    OneChange change(1, 1);
    change.interfaces.previous() = {{"gone", 1}};
    change.interfaces.current() = {{"new", 12}};
    LogCapture capture;
    change.check();
    EXPECT_THAT(change.agent.alerts, IsEmpty());
    EXPECT_EQ(capture.ownMessages(3000), kOneLook);
}

HOST_TEST(Alerts, AreNoneForAnInterfaceWithoutANode) {
    OneChange change(1, 1);
    change.interfaces.previous() = {{"eth7", 1}};
    change.interfaces.current() = {{"eth7", 12}};
    LogCapture capture;
    change.check();
    EXPECT_THAT(change.agent.alerts, IsEmpty());
    EXPECT_THAT(capture.ownMessages(),
                testing::Not(testing::Contains(testing::HasSubstr("entering switch case"))));
}

HOST_TEST(Alerts, AreNoneForAMemberOfABondWhateverItsState) {
    for (const unsigned int now : {1U, 12U, 32U, 33U}) {
        OneChange change(99, now);
        Interfaces::slaves() = {"eth5", "eth0"};
        LogCapture capture;
        change.check();
        EXPECT_THAT(change.agent.alerts, IsEmpty());
        EXPECT_THAT(capture.ownMessages(3000),
                    TextsAre("checkAndSendNetAlert: entry", "Slaves Map Size : 2", "Slaves Found in the Map",
                             "Returning from checkAndSendNetAlert"));
    }
}

HOST_TEST(Alerts, AreNoneForAnUnknownStateWhichIsLogged) {
    for (const unsigned int now : {0U, 2U, 34U}) {
        OneChange change(1, now);
        LogCapture capture;
        change.check();
        EXPECT_THAT(change.agent.alerts, IsEmpty());
        EXPECT_THAT(capture.ownMessages(3000),
                    TextsAre("checkAndSendNetAlert: entry", "Slaves Map Size : 0", "findNetworkPort: entry",
                             "findNetworkPort: exit", "OsHwMI::checkAndSendNetAlert() entering switch case",
                             "Unknown status: curitr->first= eth0", "Returning from checkAndSendNetAlert"));
    }
}

/// Is withdrawn while it is marked.
class LeavingNode : public InterfaceNode {
public:
    using InterfaceNode::InterfaceNode;
    LeavingNode(const LeavingNode&) = delete;
    LeavingNode& operator=(const LeavingNode&) = delete;
    ~LeavingNode() override { gone = true; }
    IC::Error setProperty(const unsigned int& /*id*/, const IC::PropertyValue& /*value*/) override {
        IC::Error result = IC::myoshwmi.deleteNode(this);
        goneTooSoon = gone;
        return result;
    }
    static inline bool gone = false;
    static inline bool goneTooSoon = false;
};

HOST_TEST(Alerts, HoldTheNodeTheyAreAbout) {
    Interfaces interfaces;
    Agent agent(interfaces.mi());
    interfaces.add<LeavingNode>("eth0", 77);
    interfaces.previous() = {{"eth0", 1}};
    interfaces.current() = {{"eth0", 32}};
    interfaces.mi().checkAndSendNetAlert();
    ASSERT_EQ(agent.alerts.size(), 1U);
    EXPECT_THAT(agent.alerts[0].substitutions(), TextsAre("/ports/eth0"));
    EXPECT_FALSE(LeavingNode::goneTooSoon);
    EXPECT_TRUE(LeavingNode::gone);
}

HOST_TEST(Alerts, GoOutInTheOrderOfTheNamesOneByOne) {
    OneChange change(12, 1);
    change.interfaces.add("bond0", 1);
    change.interfaces.add("eth1", 1);
    change.interfaces.previous() = {{"eth0", 12}, {"bond0", 1}, {"eth1", 1}};
    change.interfaces.current() = {{"eth0", 1}, {"bond0", 32}, {"eth1", 12}};
    change.check();
    EXPECT_THAT(change.agent.messages(),
                TextsAre("NIC has Switched Over ", "NIC is Online ", "NIC is Offline "));
}

HOST_TEST(Alerts, GoOnWhenTheAgentRefusesOne) {
    OneChange change(12, 1);
    change.agent.answer = 5;
    change.interfaces.add("eth1", 1);
    change.interfaces.previous()["eth1"] = 1;
    change.interfaces.current()["eth1"] = 12;
    LogCapture capture;
    change.check();
    EXPECT_EQ(change.agent.alerts.size(), 2U);
    EXPECT_THAT(capture.ownMessages(),
                testing::Contains("checkAndSendNetAlert: _alerthandler return codeagent's answer").Times(2));
    EXPECT_THAT(capture.ownMessages(6000), IsEmpty());
    for (const LogLine& line : capture.ownLines()) {
        const bool ofTheLookUp = line.message.starts_with("findNetworkPort");
        EXPECT_EQ(line.source, ofTheLookUp ? "OsHwMI_ix86" : "OsHwMIInd_ix86") << line.message;
        EXPECT_EQ(line.component, ofTheLookUp ? "Corvista.IC.MI.OsHwMI" : "Corvista.IC.MI.OsHwMIInd");
    }
    EXPECT_TRUE(capture.everyLineTwice());
}

HOST_TEST(Alerts, GoOnWhenTheAgentThrows) {
    OneChange change(12, 1);
    change.interfaces.add("eth1", 1);
    change.interfaces.previous()["eth1"] = 1;
    change.interfaces.current()["eth1"] = 12;
    BrokenAgent agent;
    change.interfaces.mi().registerForAlerts(BrokenAgent::hear, &agent);
    LogCapture capture;
    change.check();
    EXPECT_EQ(agent.calls, 2);
    EXPECT_THAT(capture.ownMessages(6000),
                TextsAre("OsHwMIInd Caught unknown exception",
                         "OsHwMIInd Caught the agent is broken Type St13runtime_error"));
    EXPECT_THAT(capture.ownMessages(), testing::Not(testing::Contains(testing::HasSubstr("return code"))));
}

HOST_TEST(Alerts, AreNeitherSentNorLoggedWithoutACallback) {
    OneChange change(1, 32);
    change.interfaces.mi().deRegisterForAlerts();
    LogCapture capture;
    change.check();
    EXPECT_THAT(change.agent.alerts, IsEmpty());
    EXPECT_THAT(capture.ownMessages(), testing::Not(testing::Contains(testing::HasSubstr("_alerthandler"))));
    EXPECT_EQ(change.node.getStatus(), 1U) << "the node is marked all the same";
}

}  // namespace
