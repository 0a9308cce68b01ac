// What is told of a change after somebody has looked at it for a while.
#include "agent/change/outcome.h"

#include <gmock/gmock.h>

#include "agent/core/node_copy.h"

namespace {

using cvagent::NodeRef;
using cvagent::Reading;
using cvagent::change::MeantChange;
using cvagent::change::Outcome;

constexpr unsigned int kOwnerContact = 115;

/// A host whose property reads as the next of these words, and as the last of them from then on.
class HostThatReads : public cvagent::change::ChangedHost {
public:
    explicit HostThatReads(std::vector<std::string> words) : words_(std::move(words)) {}

    NodeRef find(const std::string&) override { throw std::logic_error("nobody looks for nodes"); }
    std::vector<Reading> read(const NodeRef&, const std::vector<std::string>&,
                              const cvagent::Request&) override {
        Reading reading;
        reading.id = kOwnerContact;
        reading.value = IC::PropertyValue(words_.front(), true);
        if (words_.size() > 1) {
            words_.erase(words_.begin());
        }
        return {reading};
    }
    cvagent::WriteResult write(const NodeRef&, const cvagent::Property&, const std::vector<std::string>&,
                               const cvagent::Request&) override {
        throw std::logic_error("nobody writes");
    }
    void announce(const cvagent::Event& event) override { verdicts.push_back(event.verdict); }
    void showErrors(const cvagent::Request&) override {}

    std::vector<std::string> verdicts;

private:
    std::vector<std::string> words_;
};

/// What is told of "room 6" at the second look, when it was so at the first.
Outcome lookedAt(HostThatReads& host) {
    cvagent::NodeCopy computer;
    computer.type = static_cast<unsigned int>(cvagent::NodeType::computer);
    computer.path = "/oshw/root/computer";
    const MeantChange change{computer.reference(),
                             cvagent::findProperty(computer.type, kOwnerContact),
                             {"room 6"},
                             IC::PropertyValue("room 6", true),
                             ""};
    std::vector<Outcome> outcomes(1);
    outcomes[0].kind = Outcome::applied;
    verifyWithin(host, {change}, outcomes, 0.3, cvagent::Request("root"));
    return outcomes[0];
}

TEST(Outcome, IsALossWhenSomebodyHasChangedItBack) {
    HostThatReads host({"room 6", "room 5"});
    const Outcome outcome = lookedAt(host);
    EXPECT_EQ(outcome.kind, Outcome::differs);
    EXPECT_THAT(host.verdicts, testing::ElementsAre("differs: " + outcome.reason));
}

/// A daemon that sets an interface up anew takes its address away for a moment.
TEST(Outcome, IsNoLossWhenItIsSoAgainAtTheNextLook) {
    HostThatReads host({"room 6", "", "room 6"});
    EXPECT_EQ(lookedAt(host).kind, Outcome::applied);
    EXPECT_THAT(host.verdicts, testing::IsEmpty());
}

/// What is told is what the host has in the end, not what it had in between.
TEST(Outcome, TellsWhatTheHostHasAtTheNextLook) {
    HostThatReads host({"room 6", "", "room 5"});
    EXPECT_EQ(lookedAt(host).reason, "it reads 'room 5'; somebody has changed it back");
}

}  // namespace
