// Many threads at once, for ThreadSanitizer and AddressSanitizer to watch.
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <thread>

#include "framework/ic/management_interface.h"

namespace {

using IC::Error;
using IC::MutableNode;
using IC::Node;
using IC::Number;
using IC::PropertyValue;

class Interface : public IC::ManagementInterface {
public:
    using ManagementInterface::appendNode;
    using ManagementInterface::takeNodeId;
};

/// A node that knows when it is used after its end.
class FragileNode : public MutableNode {
public:
    using MutableNode::MutableNode;
    ~FragileNode() override { alive_ = false; }
    bool alive() const { return alive_; }

private:
    std::atomic<bool> alive_ = true;
};

constexpr auto kDuration = std::chrono::milliseconds(800);
constexpr unsigned int kProperties = 4;

class Stress : public testing::Test {
protected:
    Stress() {
        interface_.initialize(1, Number(1U), Number(2U));
        for (int count = 0; count < 20; ++count) {
            interface_.appendNode(newNode());
        }
        interface_.setLoadCallBack(&Stress::load, this, nullptr);
    }
    ~Stress() override { interface_.unload(); }

    MutableNode* newNode() {
        auto* const node = new FragileNode(interface_.takeNodeId(), 1, {1}, 12, 0);
        for (unsigned int id = 0; id < kProperties; ++id) {
            node->setProperty(id, PropertyValue(std::string("start"), true));
        }
        return node;
    }

    static Error load(Node* const& node, const void* context) {
        const auto& self = *static_cast<const Stress*>(context);
        self.loads_.fetch_add(1);
        return node->getDescription().empty() ? Error() : Error(1, Number(), "refused");
    }

    void repeat(const std::function<void(unsigned int)>& step) {
        threads_.emplace_back([this, step] {
            for (unsigned int round = 0; !done_; ++round) {
                step(round);
            }
        });
    }

    void readAndWrite(unsigned int round, unsigned int seed) {
        for (const auto& node : interface_.holdAll()) {
            PropertyValue value;
            if (node->getProperty(round % kProperties, value).getStatus() != Error::success ||
                value.empty() || !static_cast<const FragileNode&>(*node).alive()) {
                ++failures_;
            }
            node->setProperty((round + seed) % kProperties, PropertyValue(std::to_string(round), true));
            ++operations_;
        }
    }

    void publishAndWithdraw(unsigned int round) {
        auto* const node = newNode();
        if (round % 3 == 0) {
            node->setDescription("not wanted");
        }
        interface_.addNewNode(node);
        if (interface_.deleteNode(node).getStatus() != Error::success) {
            ++failures_;
        }
    }

    void walk() {
        std::vector<Node*> nodes;
        interface_.getMap(nodes);
        for (const auto& node : interface_.holdAll()) {
            std::map<unsigned int, PropertyValue> properties;
            node->getProperties(properties);
            node->setPath("/oshw/" + static_cast<std::string>(*node));
            if (node->getPath().empty() || properties.size() != kProperties) {
                ++failures_;
            }
            const auto held = interface_.hold(node->getNodeId());
            if (held && held != node) {
                ++failures_;
            }
        }
    }

    void finish() {
        std::this_thread::sleep_for(kDuration);
        done_ = true;
        for (std::thread& thread : threads_) {
            thread.join();
        }
    }

    Interface interface_;
    std::vector<std::thread> threads_;
    std::atomic<bool> done_ = false;
    std::atomic<int> failures_ = 0;
    std::atomic<long> operations_ = 0;
    mutable std::atomic<long> loads_ = 0;
};

TEST_F(Stress, NothingIsFreedUnderAReader) {
    for (unsigned int seed = 0; seed < 8; ++seed) {
        repeat([this, seed](unsigned int round) { readAndWrite(round, seed); });
    }
    repeat([this](unsigned int round) { publishAndWithdraw(round); });
    repeat([this](unsigned int /*round*/) { walk(); });
    finish();
    EXPECT_EQ(failures_, 0);
    EXPECT_GT(operations_, 100);
    EXPECT_GT(loads_, 10);
    EXPECT_EQ(interface_.holdAll().size(), 20U);
}

TEST_F(Stress, CallbacksComeAndGo) {
    repeat([this](unsigned int round) { publishAndWithdraw(round); });
    repeat([this](unsigned int round) {
        interface_.setLoadCallBack(round % 2 == 0 ? nullptr : &Stress::load, this, nullptr);
        interface_.setWithdrawCallBack([](const Node& node, const void* /*context*/) { node.getStatus(); },
                                       nullptr);
        interface_.registerForAlerts(nullptr, nullptr);
    });
    repeat([this](unsigned int /*round*/) { static_cast<void>(static_cast<std::string>(interface_)); });
    finish();
    EXPECT_EQ(failures_, 0);
}

}  // namespace
