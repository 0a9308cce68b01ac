// The catalogue, facts, nodes and the plug-in itself on hosts that change.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <condition_variable>
#include <mutex>
#include <set>
#include <thread>
#include <tuple>

#include "plugins/hardware/hardware_mi.h"
#include "tests/hardware/golden.h"
#include "tests/hardware/recorded_host.h"
#include "tests/support/waiting.h"

namespace {

using hardware::Class;
using hardware::HardwareMI;
using hardware::HardwareNode;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

TEST(HardwareCatalogue, IdsAndNamesAreUniqueInTheirClass) {
    std::set<unsigned int> ids;
    std::set<std::pair<Class, std::string>> names;
    for (const hardware::Row& row : hardware::allRows()) {
        EXPECT_TRUE(ids.insert(row.id).second) << row.name;
        EXPECT_TRUE(names.insert({hardware::classOfId(row.id), row.name}).second) << row.name;
        EXPECT_NE(*row.source, '\0') << row.name;
        EXPECT_NE(*row.meaning, '\0') << row.name;
    }
}

TEST(HardwareCatalogue, SourcesBringTheirOwnRowsAndComeAfterTheirParents) {
    std::set<Class> seen;
    for (const hardware::Source& source : hardware::sources()) {
        EXPECT_TRUE(seen.insert(source.type).second);
        EXPECT_EQ(hardware::classRow(source.type).type, source.type);
        for (const hardware::Row& row : source.rows) {
            EXPECT_EQ(hardware::classOfId(row.id), source.type) << row.name;
        }
    }
    EXPECT_EQ(seen.size() + 1, hardware::classes().size());
}

TEST(HardwareFacts, WhatIsNotToldIsLeftOut) {
    hardware::Facts facts;
    facts.text(1, std::nullopt);
    facts.text(2, "");
    facts.texts(3, {});
    facts.number(4, std::nullopt);
    facts.real(5, std::nullopt);
    facts.flag(6, std::nullopt);
    EXPECT_THAT(facts.all(), IsEmpty());
    facts.number(7, 0);
    facts.flag(8, false);
    EXPECT_EQ(facts.all().size(), 2U);
}

TEST(HardwareFacts, TextsArePrintable) {
    hardware::Facts facts;
    facts.text(1, "a\x1b[0m");
    facts.texts(2, {"b\n", "c"});
    EXPECT_EQ(golden::text(facts.all().at(1)), "a?[0m");
    EXPECT_EQ(golden::text(facts.all().at(2)), "b? | c");
}

TEST(HardwareFacts, WhatIsUnansweredKeepsItsOldValue) {
    hardware::Facts before;
    before.number(1, 10);
    before.number(2, 20);
    before.number(3, 30);
    hardware::Facts facts;
    facts.number(1, 11);
    facts.unanswered(2);
    facts.unanswered(4);
    facts.keepOld(before);
    EXPECT_EQ(facts.all().size(), 2U) << "what is not told any more is forgotten";
    EXPECT_EQ(golden::text(facts.all().at(1)), "11");
    EXPECT_EQ(golden::text(facts.all().at(2)), "20");
    EXPECT_FALSE(facts.isUnanswered(1));
    EXPECT_TRUE(facts.isUnanswered(2));
}

/// A source whose one device hangs when it is told to, and counts how often it is asked.
struct Device {
    static inline std::mutex guard;
    static inline std::condition_variable changed;
    static inline bool hangs = false;
    static inline int asked = 0;
    static inline int inside = 0;

    static void describe(const hardware::Host& /*host*/, hardware::Found& found) {
        std::unique_lock lock(guard);
        found.facts.number(31001, ++asked);
        found.facts.number(31002, 7);
        found.description = "asked";
        ++inside;
        changed.wait(lock, [] { return !hangs; });
        --inside;
    }
    static void hang(bool now) {
        const std::lock_guard lock(guard);
        hangs = now;
        changed.notify_all();
    }
    static constexpr hardware::Row kRows[] = {
        {31001, "Live", hardware::Kind::number, "", "s", "m", hardware::kLive},
        {31002, "Fixed", hardware::Kind::number, "", "s", "m"},
    };
    static inline const hardware::Source kSource{Class::link, kRows, nullptr, describe, ""};
};

class OneNode : public testing::Test {
protected:
    explicit OneNode(std::chrono::milliseconds limit = std::chrono::milliseconds(250))
        : asking_(std::make_shared<hardware::Asking>(hardware::Host("/nowhere"), limit)) {
        Device::asked = 0;
    }
    ~OneNode() override {
        Device::hang(false);
        EXPECT_TRUE(eventually([] {
            const std::lock_guard lock(Device::guard);
            return Device::inside == 0;
        }));
    }
    std::string get(unsigned int id) const {
        IC::PropertyValue value;
        const IC::Error error = node_.getProperty(id, value);
        return error.getStatus() == 0 ? golden::text(value) : "status " + std::to_string(error.getStatus());
    }

    const std::shared_ptr<hardware::Asking> asking_;
    HardwareNode node_{{5, 1, {1}, 1}, Device::kSource, "eth0", asking_};
};

/// One that has time to answer on a busy machine.
class OneNodeThatAnswers : public OneNode {
protected:
    OneNodeThatAnswers() : OneNode(std::chrono::seconds(30)) {}
};

TEST_F(OneNodeThatAnswers, ALivePropertyIsAskedForAFixedOneUntilItIsKnown) {
    EXPECT_EQ(get(31002), "7");
    EXPECT_EQ(get(31002), "7");
    EXPECT_EQ(get(31003), "status 1");
    EXPECT_EQ(Device::asked, 1);
    EXPECT_EQ(get(31000), "eth0");
}

TEST_F(OneNodeThatAnswers, ALivePropertyIsAskedForTwiceASecond) {
    constexpr std::chrono::milliseconds kFresh{500};
    get(31001);
    bool isLate = true;
    while (isLate) {  // this thread was held up between the two
        std::this_thread::sleep_for(kFresh);
        const std::string next = std::to_string(Device::asked + 1);
        const auto start = std::chrono::steady_clock::now();
        EXPECT_EQ(get(31001), next);
        const std::string again = get(31001);
        isLate = std::chrono::steady_clock::now() - start >= kFresh;
        EXPECT_TRUE(isLate || again == next) << again;
    }
}

TEST_F(OneNode, ThatHangsIsUnansweredAndKeepsWhatIsKnown) {
    hardware::Found found = hardware::nameOnly(Class::link, "eth0");
    found.facts.number(31001, 99);
    node_.store({found});
    Device::hang(true);
    EXPECT_EQ(get(31001), "status 2");
    EXPECT_EQ(get(31000), "eth0");
    EXPECT_EQ(get(31002), "status 2") << "it has never told whether it has one";
    hardware::Facts::Map stored;
    node_.getProperties(stored);
    EXPECT_EQ(golden::text(stored.at(31001)), "99");
    Device::hang(false);
    EXPECT_TRUE(eventually([this] { return get(31001) != "status 2"; }));
}

TEST_F(OneNode, APartThatDoesNotAnswerIsUnansweredAndKeepsWhatIsKnown) {
    const auto now = std::chrono::steady_clock::now() + std::chrono::hours(1);  // fresh until the end
    hardware::Found found = hardware::nameOnly(Class::link, "eth0");
    found.facts.number(31001, 99);
    found.facts.number(31002, 5);
    node_.store({found, now});
    hardware::Found later = hardware::nameOnly(Class::link, "eth0");
    later.facts.unanswered(31001);
    later.facts.number(31002, 6);
    node_.store({later, now});
    EXPECT_EQ(get(31001), "status 2");
    EXPECT_EQ(get(31002), "6");
    hardware::Facts::Map stored;
    node_.getProperties(stored);
    EXPECT_EQ(golden::text(stored.at(31001)), "99");
    node_.store({found, now});
    EXPECT_EQ(get(31001), "99");
}

TEST_F(OneNode, WhatWasAskedForEarlierDoesNotReplaceWhatIsKnown) {
    const auto now = std::chrono::steady_clock::now();
    hardware::Found found{Class::link, "eth0"};
    found.facts.number(31002, 2);
    node_.store({found, now});
    found.facts.number(31002, 1);
    node_.store({found, now - std::chrono::milliseconds(1)});
    EXPECT_EQ(get(31002), "2");
    found.facts.number(31002, 3);
    node_.store({found, now});
    EXPECT_EQ(get(31002), "3");
}

TEST_F(OneNodeThatAnswers, NothingCanBeWritten) {
    EXPECT_NE(node_.setProperty(31002, IC::PropertyValue(IC::Number(1U), true)).getStatus(), 0);
    EXPECT_EQ(get(31002), "7");
}

TEST_F(OneNode, ManyReadersGetAnswers) {
    std::vector<std::thread> readers;
    for (int reader = 0; reader < 8; ++reader) {
        readers.emplace_back([this] {
            for (int round = 0; round < 100; ++round) {
                EXPECT_NE(get(31001), "status 1");
            }
        });
    }
    for (std::thread& reader : readers) {
        reader.join();
    }
    EXPECT_LE(Device::asked, 8 * 4);
}

/// The plug-in on a host with links, whose tree is told to an agent.
class Plugin : public testing::Test {
protected:
    Plugin() {
        addLink("eth0", "1500");
        addLink("lo", "65536");
    }
    void addLink(const std::string& name, const std::string& mtu) {
        recorded_.file("/sys/class/net/" + name + "/mtu", mtu);
    }
    IC::Error start() {
        plugin_.setLoadCallBack(
            [](IC::Node* const& node, const void* context) {
                auto& loaded = *static_cast<std::vector<std::string>*>(const_cast<void*>(context));
                loaded.push_back(std::to_string(dynamic_cast<IC::MutableNode&>(*node).getNodeId()));
                return IC::Error();
            },
            &loaded_, nullptr);
        plugin_.setWithdrawCallBack(
            [](const IC::Node& node, const void* context) {
                auto& gone = *static_cast<std::vector<std::string>*>(const_cast<void*>(context));
                gone.push_back(std::to_string(dynamic_cast<const IC::MutableNode&>(node).getNodeId()));
            },
            &gone_);
        return plugin_.initialize(3, IC::Number(10U), IC::Number(100U));
    }
    std::vector<std::string> links() {
        std::vector<std::string> names;
        for (const auto& node : plugin_.holdAll()) {
            IC::PropertyValue name;
            if (node->getProperty(hardware::firstId(Class::link), name).getStatus() == 0) {
                names.push_back(golden::text(name));
            }
        }
        return names;
    }

    RecordedHost recorded_;
    std::vector<std::string> loaded_;
    std::vector<std::string> gone_;
    HardwareMI plugin_{recorded_.host()};
};

TEST_F(Plugin, ItsOwnNodeIsTheRootAndTheOthersHangBelow) {
    ASSERT_EQ(start().getStatus(), 0);
    const auto all = plugin_.holdAll();
    EXPECT_EQ(all.front()->getNodeId(), 10U);
    EXPECT_EQ(all.front()->getLinkedId(), 0U);
    EXPECT_EQ(all.front()->nodeType(), 300U);
    unsigned int next = 100;
    for (std::size_t place = 1; place < all.size(); ++place) {
        EXPECT_EQ(all[place]->getNodeId(), next++);
        EXPECT_EQ(all[place]->getLinkedId(), 10U);
        EXPECT_THAT(all[place]->getMIIds(), ElementsAre(3U));
    }
    EXPECT_THAT(loaded_, IsEmpty()) << "what the start finds is in the map";
}

TEST_F(Plugin, NewThingsArePublishedAndGoneOnesWithdrawn) {
    start();
    const unsigned int last = plugin_.holdAll().back()->getNodeId();
    addLink("eth1", "9000");
    recorded_.remove("/sys/class/net/eth0");
    plugin_.lookAgain("net");
    EXPECT_THAT(links(), UnorderedElementsAre("lo", "eth1"));
    EXPECT_THAT(loaded_, ElementsAre(std::to_string(last + 1)));
    EXPECT_THAT(gone_, ElementsAre(std::to_string(last - 1)));
    EXPECT_EQ(plugin_.hold(last + 1)->getIndex(), 3U);
}

TEST_F(Plugin, WhatChangesIsToldByTheSameNode) {
    start();
    const std::string before = golden::tree(plugin_);
    addLink("eth0", "1400");
    plugin_.lookAgain("net");
    EXPECT_THAT(loaded_, IsEmpty());
    EXPECT_THAT(gone_, IsEmpty());
    EXPECT_THAT(before, HasSubstr("eth0\n    MTU: 1500"));
    EXPECT_THAT(golden::tree(plugin_), HasSubstr("eth0\n    MTU: 1400"));
}

TEST_F(Plugin, NewsOfOtherThingsChangeNothing) {
    start();
    addLink("eth1", "1500");
    plugin_.lookAgain("hwmon");
    plugin_.lookAgain("usb");
    EXPECT_THAT(links(), UnorderedElementsAre("eth0", "lo"));
    plugin_.lookAgain("");
    EXPECT_THAT(links(), UnorderedElementsAre("eth0", "eth1", "lo"));
}

TEST_F(Plugin, ThingsOfAllKindsCanBePluggedIn) {
    start();
    const std::string kFirst = "/sys/devices/system/cpu/cpu0/topology/physical_package_id";
    const std::tuple<const char*, std::string, std::string, Class> kThings[] = {
        {"hwmon", "/sys/class/hwmon/hwmon0/name", "x", Class::sensor},
        {"cpu", kFirst, "0", Class::processor},
    };
    recorded_.file("/sys/class/hwmon/hwmon0/temp1_input", "1");
    for (const auto& [subsystem, file, text, type] : kThings) {
        loaded_.clear();
        recorded_.file(file, text);
        plugin_.lookAgain("net");
        EXPECT_THAT(loaded_, IsEmpty()) << subsystem;
        plugin_.lookAgain(subsystem);
        EXPECT_EQ(loaded_.size(), 1U) << subsystem;
        EXPECT_EQ(plugin_.holdAll().back()->nodeType(), static_cast<unsigned int>(type)) << subsystem;
    }
    recorded_.file("/proc/meminfo", "MemTotal: 1 kB");
    plugin_.lookAgain("memory");
    EXPECT_THAT(golden::tree(plugin_), HasSubstr("TotalMemory: 1024 bytes"));
}

TEST_F(Plugin, ASecondStartMakesTheTreeAnew) {
    start();
    const std::string tree = golden::tree(plugin_);
    ASSERT_EQ(start().getStatus(), 0);
    EXPECT_EQ(golden::tree(plugin_), tree);
    EXPECT_EQ(plugin_.holdAll()[1]->getNodeId(), 100U);
    EXPECT_EQ(plugin_.holdAll()[1]->getIndex(), 1U) << "they are counted anew";
    addLink("eth1", "1500");
    plugin_.lookAgain("net");
    EXPECT_EQ(links().size(), 3U);
}

TEST_F(Plugin, AfterTheStopNothingIsLookedFor) {
    start();
    const auto node = plugin_.holdAll().back();
    EXPECT_EQ(plugin_.unload().getStatus(), 0);
    addLink("eth1", "1500");
    plugin_.lookAgain("");
    EXPECT_THAT(plugin_.holdAll(), IsEmpty());
    EXPECT_EQ(plugin_.unload().getStatus(), 0) << "again";
    IC::PropertyValue value;
    EXPECT_EQ(node->getProperty(hardware::firstId(Class::link), value).getStatus(), 0) << "it lives on";
    ASSERT_EQ(start().getStatus(), 0);
    EXPECT_EQ(links().size(), 3U);
}

TEST_F(Plugin, AStartWithoutANumberFails) {
    EXPECT_NE(plugin_.initialize(1, IC::Number(), IC::Number(1U)).getStatus(), 0);
    plugin_.lookAgain("");
    EXPECT_THAT(plugin_.holdAll(), IsEmpty());
}

TEST_F(Plugin, NamesThatNobodyExpects) {
    for (const char* name :
         {"\x01\x02\x1b[31m", "blank ", "-", "a=b", "\xff\xfe", "%s%n", "$(x)", "eth0:1"}) {
        addLink(name, "1");
    }
    start();
    EXPECT_THAT(links(), UnorderedElementsAre("eth0", "lo", "???[31m", "blank ", "-", "a=b", "??", "%s%n",
                                              "$(x)", "eth0:1"));
    recorded_.remove("/sys/class/net/\xff\xfe");
    plugin_.lookAgain("net");
    EXPECT_EQ(links().size(), 9U);
}

TEST_F(Plugin, ManyThingsStartQuickly) {
    for (int number = 0; number < 1000; ++number) {
        addLink("veth" + std::to_string(number), "1500");
    }
    const auto begin = std::chrono::steady_clock::now();
    start();
    const auto end = std::chrono::steady_clock::now();
    EXPECT_EQ(links().size(), 1002U);
    EXPECT_LT(end - begin, std::chrono::seconds(5));
    RecordProperty(
        "milliseconds",
        static_cast<int>(std::chrono::duration_cast<std::chrono::milliseconds>(end - begin).count()));
}

}  // namespace
