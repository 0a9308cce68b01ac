#include "hosttools/netlink.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <linux/rtnetlink.h>
#include <cerrno>

#include "tests/hosttools/netlink_message.h"

namespace hosttools {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

using Seen = std::vector<std::pair<unsigned, std::string>>;

Seen attributesOf(const std::string& area) {
    Seen seen;
    eachAttribute(area, [&](unsigned type, std::string_view data) { seen.emplace_back(type, data); });
    return seen;
}

TEST(Netlink, Attributes) {
    const std::string area =
        message::attribute(3, std::string("abc")) + message::attribute(4, std::string("defg"));
    EXPECT_THAT(attributesOf(area), ElementsAre(Pair(3, "abc"), Pair(4, "defg")));
    EXPECT_THAT(attributesOf(message::attribute(5 | NLA_F_NESTED, std::string())), ElementsAre(Pair(5, "")));
}

TEST(Netlink, DamagedAttributesEndTheWalk) {
    const std::string good = message::attribute(3, std::string("abc"));
    EXPECT_THAT(attributesOf(""), IsEmpty());
    EXPECT_THAT(attributesOf(good.substr(0, 3)), IsEmpty());
    EXPECT_THAT(attributesOf(good.substr(0, 6)), IsEmpty());
    EXPECT_THAT(attributesOf(good + message::bytes(nlattr{2, 9})), ElementsAre(Pair(3, "abc")));
    EXPECT_THAT(attributesOf(good + message::bytes(nlattr{0, 9})), ElementsAre(Pair(3, "abc")));
    EXPECT_THAT(attributesOf(good + message::bytes(nlattr{60000, 9})), ElementsAre(Pair(3, "abc")));
    // The last one need not be padded.
    EXPECT_THAT(attributesOf(good + good.substr(0, 7)), ElementsAre(Pair(3, "abc"), Pair(3, "abc")));
}

struct Walk {
    bool done = false;
    Seen seen;
    int error;
    explicit Walk(const std::string& datagram)
        : error(eachMessage(
              datagram, [this](unsigned type, std::string_view body) { seen.emplace_back(type, body); },
              done)) {}
};

TEST(Netlink, AnAnswerOfManyMessages) {
    const std::string first = message::whole(RTM_NEWLINK, NLM_F_MULTI, "one.");
    const Walk open(first + message::whole(RTM_NEWADDR, NLM_F_MULTI, "two"));
    EXPECT_EQ(open.error, 0);
    EXPECT_FALSE(open.done);
    EXPECT_THAT(open.seen, ElementsAre(Pair(RTM_NEWLINK, "one."), Pair(RTM_NEWADDR, "two")));
    const Walk closed(first + message::whole(NLMSG_DONE, NLM_F_MULTI, message::bytes(0)));
    EXPECT_TRUE(closed.done);
    EXPECT_THAT(closed.seen, ElementsAre(Pair(RTM_NEWLINK, "one.")));
}

TEST(Netlink, AnAnswerOfOneMessage) {
    const Walk walk(message::whole(RTM_NEWLINK, 0, "only"));
    EXPECT_EQ(walk.error, 0);
    EXPECT_TRUE(walk.done);
}

TEST(Netlink, Errors) {
    const Walk missing(message::whole(NLMSG_ERROR, 0, message::bytes(nlmsgerr{-ENODEV, {}})));
    EXPECT_EQ(missing.error, ENODEV);
    EXPECT_TRUE(missing.done);
    EXPECT_EQ(Walk(message::whole(NLMSG_ERROR, 0, "")).error, EPROTO);
    const Walk changed(message::whole(RTM_NEWLINK, NLM_F_MULTI | NLM_F_DUMP_INTR, ""));
    EXPECT_EQ(changed.error, EINTR);
    EXPECT_FALSE(changed.done);
}

TEST(Netlink, DamagedMessages) {
    const std::string good = message::whole(RTM_NEWLINK, NLM_F_MULTI, "body");
    EXPECT_EQ(Walk(good.substr(0, good.size() - 1)).error, EPROTO);
    nlmsghdr tooShort{};
    tooShort.nlmsg_len = 8;
    EXPECT_EQ(Walk(message::bytes(tooShort)).error, EPROTO);
}

TEST(Netlink, StructuresOfOtherKernels) {
    struct Newer {
        std::uint32_t first, second;
    };
    const Newer padded = readPadded<Newer>(message::bytes(std::uint32_t{7}));
    EXPECT_EQ(padded.first, 7u);
    EXPECT_EQ(padded.second, 0u);
    EXPECT_EQ(readPadded<std::uint32_t>(message::bytes(Newer{7, 8})), 7u);
    EXPECT_FALSE(readPlain<Newer>(message::bytes(std::uint32_t{7})).has_value());
}

}  // namespace
}  // namespace hosttools
