// What the service knows, and what it tells of changes.
#include <gmock/gmock.h>

#include "agent/service/late_readings.h"
#include "agent/service/model.h"
#include "tests/agent/node_list.h"

namespace {

using cvagent::NodeRef;
using cvagent::NodeRefOfTest;
using cvagent::Reading;
using cvagent::service::LateReadings;
using cvagent::service::Look;
using cvagent::service::Model;
using cvagent::service::ModelListener;
using cvagent::service::NodeView;
using testing::ElementsAre;
using testing::IsEmpty;

class Notes : public ModelListener {
public:
    std::vector<std::string> taken() { return std::exchange(notes_, {}); }

    void nodeAdded(const NodeView& node) override { notes_.push_back("+" + node.object.substr(22)); }
    void nodeRemoved(const NodeView& node) override { notes_.push_back("-" + node.object.substr(22)); }
    void propertyChanged(const NodeView& node, const std::string& property) override {
        notes_.push_back(std::to_string(node.id) + "." + property);
    }
    void nodePropertyChanged(const NodeView& node, const char* property) override {
        notes_.push_back(std::to_string(node.id) + ":" + property);
    }

private:
    std::vector<std::string> notes_;
};

Reading known(unsigned int id, unsigned int value) {
    return {id, nullptr, IC::PropertyValue(IC::Number(value), true), {}};
}

NodeView view(std::uint32_t id, const std::string& path, std::vector<Reading> readings = {}) {
    const auto node = std::make_shared<IC::MutableNode>(id, 0, std::vector<unsigned int>{1}, 99, 0);
    return {NodeRefOfTest::of(node), id, 0, 99, 0, 1, "type-99", "x.Type99", path, {}, "",
            std::move(readings),     1};
}

class ModelTest : public testing::Test {
protected:
    void look(std::vector<NodeView> nodes, bool whole = true) {
        Look look{++number, whole, {}, {}};
        for (NodeView& node : nodes) {
            if (std::ranges::find(order, node.id) == order.end()) {
                order.push_back(node.id);
            }
            look.nodes.push_back(std::move(node));
        }
        look.order = order;
        model.apply(std::move(look));
    }

    std::uint64_t number = 0;
    std::vector<std::uint32_t> order;
    Notes notes;
    Model model{notes};
};

TEST_F(ModelTest, TellsNodesThatComeAndGo) {
    look({view(1, "/a"), view(2, "/a/b")});
    EXPECT_THAT(notes.taken(), ElementsAre("+/a", "+/a/b"));
    order = {2};
    look({view(2, "/a/b")});
    EXPECT_THAT(notes.taken(), ElementsAre("-/a"));
    EXPECT_EQ(model.byId(1), nullptr);
    EXPECT_EQ(model.byObject("/com/vantrel/Corvista1/a/b")->id, 2U);
    look({view(3, "/c")}, false);
    EXPECT_THAT(notes.taken(), ElementsAre("+/c"));
    EXPECT_EQ(model.all().size(), 2U);
}

TEST_F(ModelTest, TellsPropertiesThatAreOthers) {
    look({view(1, "/a", {known(5, 1), known(6, 1), known(7, 1)})});
    notes.taken();
    Reading lost{6, nullptr, {}, "no answer"};
    look({view(1, "/a", {known(4, 9), known(5, 1), lost})}, false);
    EXPECT_THAT(notes.taken(), ElementsAre("1.Property4", "1.Property6", "1.Property7"));
    look({view(1, "/a", {known(4, 9), known(5, 1), lost})}, false);
    EXPECT_THAT(notes.taken(), IsEmpty());
    NodeView other = view(1, "/a", {known(4, 9), known(5, 1), lost});
    other.description = "new";
    other.status = 2;
    other.parent = 7;
    look({other}, false);
    EXPECT_THAT(notes.taken(), ElementsAre("1:Parent", "1:Description", "1:Status"));
}

/// The last value of a host that does not answer is still the value.
TEST_F(ModelTest, AStaleValueIsNoChange) {
    look({view(1, "/a", {known(5, 1)})});
    notes.taken();
    Reading stale = known(5, 1);
    stale.stale = true;
    stale.error = "no answer";
    look({view(1, "/a", {stale})}, false);
    EXPECT_THAT(notes.taken(), IsEmpty());
    EXPECT_TRUE(model.byId(1)->find(5)->stale);
}

TEST_F(ModelTest, GivesEachNodeAnObjectOfItsOwn) {
    look({view(1, "/a"), view(2, "/a"), view(3, "/a")});
    EXPECT_THAT(notes.taken(), ElementsAre("+/a", "+/a_2", "+/a_3"));
    model.withdraw(1, number);
    look({view(4, "/a")}, false);
    EXPECT_THAT(notes.taken(), ElementsAre("-/a", "+/a"));
    EXPECT_EQ(model.byObject("/com/vantrel/Corvista1/a")->id, 4U);
    EXPECT_EQ(model.byObject("/com/vantrel/Corvista1/a_2")->id, 2U);
}

TEST_F(ModelTest, ARenamedNodeIsAnotherObject) {
    look({view(1, "/a")});
    notes.taken();
    look({view(1, "/b")}, false);
    EXPECT_THAT(notes.taken(), ElementsAre("-/a", "+/b"));
}

/// A look that had begun when the node went must not bring it back; a later one may.
TEST_F(ModelTest, AWithdrawnNodeStaysGone) {
    look({view(1, "/a")});
    model.withdraw(1, 2);  // while look 2 is under way
    notes.taken();
    look({view(1, "/a")}, false);
    EXPECT_THAT(notes.taken(), IsEmpty());
    EXPECT_EQ(model.byId(1), nullptr);
    look({view(1, "/a")}, false);
    EXPECT_THAT(notes.taken(), ElementsAre("+/a"));
}

TEST_F(ModelTest, LearnsFromReads) {
    const auto now = std::chrono::steady_clock::now();
    Reading first = known(5, 1);
    first.asOf = now;
    look({view(1, "/a", {first})});
    notes.taken();
    Reading later = known(5, 2);
    later.asOf = now + std::chrono::seconds(1);
    Reading earlier = known(5, 3);
    earlier.asOf = now - std::chrono::seconds(1);
    model.learn(1, {later, known(8, 8)});
    model.learn(1, {earlier});
    model.learn(2, {later});
    EXPECT_THAT(notes.taken(), ElementsAre("1.Property5"));
    EXPECT_EQ(model.byId(1)->find(5)->value, later.value);
    EXPECT_EQ(model.byId(1)->find(8), nullptr) << "a look does not show it";
}

/// As one that a write has overtaken.
TEST_F(ModelTest, ALookThatIsOlderThanAReadTakesNothingBack) {
    const auto now = std::chrono::steady_clock::now();
    Reading first = known(5, 1);
    first.asOf = now;
    look({view(1, "/a", {first, known(6, 1)})});
    Reading written = known(5, 2);
    written.asOf = now + std::chrono::seconds(1);
    model.learn(1, {written});
    notes.taken();
    look({view(1, "/a", {first, known(6, 2)})}, false);
    EXPECT_EQ(model.byId(1)->find(5)->value, written.value);
    EXPECT_THAT(notes.taken(), ElementsAre("1.Property6"));
}

/// What a plug-in stored at its start is as old as its node to the agent, and as the first look here.
TEST_F(ModelTest, WhatTheHostDoesNotTellInTimeIsStaleThoughItIsNewer) {
    const auto now = std::chrono::steady_clock::now();
    Reading first = known(5, 1);
    first.asOf = now;
    look({view(1, "/a", {first})});
    notes.taken();
    Reading late = known(5, 1);
    late.asOf = now - std::chrono::seconds(1);
    late.stale = true;
    look({view(1, "/a", {late})}, false);
    EXPECT_TRUE(model.byId(1)->find(5)->stale);
    EXPECT_EQ(model.byId(1)->find(5)->asOf, now);
    look({view(1, "/a", {first})}, false);
    EXPECT_FALSE(model.byId(1)->find(5)->stale);
    model.learn(1, {late});
    EXPECT_TRUE(model.byId(1)->find(5)->stale);
    EXPECT_THAT(notes.taken(), IsEmpty());
}

class LateReadingsTest : public testing::Test {
protected:
    /// A look, some seconds from the start, at the properties of node 1 that are named, of which these are
    /// late.
    void lookAt(int seconds, const std::vector<unsigned int>& asked, const std::vector<unsigned int>& late) {
        const auto now = start + std::chrono::seconds(seconds);
        Look look{1, false, {1, 2}, {view(1, "/a", {known(5, 1)})}};
        look.nodes.front().asked = asked;
        for (const unsigned int id : late) {
            Reading reading = known(id, 1);
            reading.timedOut = true;
            look.nodes.front().readings.push_back(reading);
        }
        readings.beginLook(now);
        again = readings.of(1);
        readings.endLook(look, now);
    }
    /// In seconds from the start; 0 for never.
    long due() const {
        return readings.due()
                   ? std::chrono::duration_cast<std::chrono::seconds>(*readings.due() - start).count()
                   : 0;
    }

    const LateReadings::Clock::time_point start = LateReadings::Clock::now();
    LateReadings readings;
    LateReadings::Properties again;
};

TEST_F(LateReadingsTest, AreAskedForAgainUntilTheyCome) {
    lookAt(0, {}, {7, 9});
    EXPECT_EQ(due(), 2);
    lookAt(1, {8}, {8});
    EXPECT_THAT(again, IsEmpty()) << "before it is due";
    EXPECT_EQ(due(), 2);
    lookAt(2, {7, 8, 9}, {9});
    EXPECT_THAT(again, ElementsAre(7, 8, 9));
    EXPECT_EQ(due(), 6) << "a pause twice as long";
    lookAt(6, {9}, {});
    EXPECT_THAT(again, ElementsAre(9));
    EXPECT_EQ(due(), 0);
    lookAt(7, {9}, {9});
    EXPECT_EQ(due(), 9) << "the first pause again";
}

TEST_F(LateReadingsTest, AreAskedForSeldomWhereTheyNeverCome) {
    lookAt(0, {9}, {9});
    long pause = 0;
    for (int looks = 0; looks < 12; ++looks) {
        const long before = due();
        lookAt(static_cast<int>(before), {9}, {9});
        pause = due() - before;
    }
    EXPECT_EQ(pause, 600);
}

TEST_F(LateReadingsTest, OfANodeThatIsGoneAreForgotten) {
    lookAt(0, {9}, {9});
    readings.endLook({1, false, {2}, {}}, start);
    EXPECT_EQ(due(), 0);
}

}  // namespace
