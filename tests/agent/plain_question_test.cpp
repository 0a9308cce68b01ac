#include "agent/cli/plain_question.h"

#include <gmock/gmock.h>

namespace {

using cvagent::Command;
using cvagent::Options;
using testing::ElementsAre;
using testing::IsEmpty;
using Words = std::vector<const char*>;

std::optional<Options> plain(Words words) {
    words.insert(words.begin(), "cvagent");
    return cvagent::plainQuestion(static_cast<int>(words.size()), words.data());
}

TEST(PlainQuestion, IsReadWithoutTheParser) {
    EXPECT_EQ(plain({"tree"}).value().command, Command::tree);
    EXPECT_FALSE(plain({"tree"}).value().json);
    EXPECT_TRUE(plain({"--json", "tree"}).value().json);
    const Options all = plain({"get", "computer"}).value();
    EXPECT_EQ(all.command, Command::get);
    EXPECT_EQ(all.node, "computer");
    EXPECT_THAT(all.properties, IsEmpty());
    EXPECT_FALSE(all.json);
    const Options some = plain({"get", "[a,b]", "--json", "108", "tree"}).value();
    EXPECT_EQ(some.node, "[a,b]");
    EXPECT_THAT(some.properties, ElementsAre("108", "tree"));
    EXPECT_TRUE(some.json);
}

/// What has options, and what may be wrong, is the parser's.
TEST(PlainQuestion, IsNothingElse) {
    for (const Words& words : std::vector<Words>{{},
                                                 {"get"},
                                                 {"tree", "x"},
                                                 {"--json"},
                                                 {"tree", "--json", "--json"},
                                                 {"set", "computer", "OwnerName", "a"},
                                                 {"doctor"},
                                                 {"tre"},
                                                 {"get", ""},
                                                 {"get", "computer", ""},
                                                 {"get", "-h"},
                                                 {"get", "computer", "--bus"},
                                                 {"--bus", "none", "tree"},
                                                 {"get", "--", "computer"},
                                                 {"get", "++", "computer"}}) {
        EXPECT_FALSE(plain(words).has_value()) << (words.empty() ? "" : words.back());
    }
    EXPECT_FALSE(cvagent::plainQuestion(0, nullptr).has_value());
}

}  // namespace
