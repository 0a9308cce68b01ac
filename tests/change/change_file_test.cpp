// Files of changes: what is read, what is refused and where, what is written.
#include "agent/change/change_file.h"

#include <gmock/gmock.h>

namespace {

using cvagent::change::BadChangeFile;
using cvagent::change::NamedChange;
using cvagent::change::parseChanges;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;

/// What is wrong with a text; "" for nothing.
std::string errorIn(const std::string& text) {
    try {
        parseChanges(text);
        return "";
    } catch (const BadChangeFile& bad) {
        return bad.what();
    }
}

TEST(ChangeFile, IsAListOrADocumentWithOne) {
    const std::string list =
        R"([{"node": "ip-config:eth0", "property": "IPv4Address", "value": "192.0.2.7"},)"
        R"( {"node": "computer", "property": 127, "value": -60},)"
        R"( {"node": "7", "property": "94", "value": ["192.0.2.53", "2001:db8::53"]},)"
        R"( {"node": "7", "property": "99", "value": []}])";
    for (const std::string& text : {list, "{\"changes\": " + list + "}"}) {
        const std::vector<NamedChange> changes = parseChanges(text);
        ASSERT_EQ(changes.size(), 4U);
        EXPECT_EQ(changes[0].node, "ip-config:eth0");
        EXPECT_EQ(changes[0].property, "IPv4Address");
        EXPECT_THAT(changes[0].words, ElementsAre("192.0.2.7"));
        EXPECT_EQ(changes[1].property, "127");
        EXPECT_THAT(changes[1].words, ElementsAre("-60"));
        EXPECT_EQ(changes[1].place, "changes[1]");
        EXPECT_THAT(changes[2].words, ElementsAre("192.0.2.53", "2001:db8::53"));
        EXPECT_THAT(changes[3].words, ElementsAre("")) << "an empty list empties one";
    }
    EXPECT_TRUE(parseChanges("[]").empty());
}

TEST(ChangeFile, IsReadAsItWasWritten) {
    const std::vector<NamedChange> changes = {{"a\"b", "OwnerName", {"x\ny\x01"}, "changes[0]"},
                                              {"b", "94", {"1", "2"}, "changes[1]"},
                                              {"c", "99", {""}, "changes[2]"}};
    const std::vector<NamedChange> again = parseChanges(changeFileText(changes));
    ASSERT_EQ(again.size(), changes.size());
    for (std::size_t i = 0; i < changes.size(); ++i) {
        EXPECT_EQ(again[i].node, changes[i].node);
        EXPECT_EQ(again[i].property, changes[i].property);
        EXPECT_EQ(again[i].words, changes[i].words);
        EXPECT_EQ(again[i].place, changes[i].place);
    }
}

TEST(ChangeFile, ThatIsNoneIsRefusedWithThePlace) {
    const std::string good = R"("node": "a", "property": "b", "value": "c")";
    for (const auto& [text, error] : std::vector<std::pair<std::string, std::string>>{
             {"", "line 1, column 1"},
             {"[\n{\"node\": oops}]", "line 2, column 10"},
             {"7", "there is no list of changes"},
             {"{}", "the document has no 'changes'"},
             {R"({"changes": [], "more": 1})", "the document has a key 'more'"},
             {R"({"changes": {}})", "there is no list of changes"},
             {"[{" + good + "}, 7]", "changes[1] is no object"},
             {R"([{"node": "a", "property": "b"}])", "changes[0] has no 'value'"},
             {"[{" + good + R"(, "why": 1}])", "changes[0] has a key 'why'"},
             {"[{" + good + R"(, "node": "x"}])", "the key 'node' stands twice in one object"},
             {R"([{"node": 7, "property": "b", "value": "c"}])", "changes[0].node is no text"},
             {R"([{"node": "a", "property": [], "value": "c"}])", "changes[0].property is neither"},
             {R"([{"node": "a", "property": "b", "value": null}])", "changes[0].value is neither"},
             {R"([{"node": "a", "property": "b", "value": true}])", "changes[0].value is neither"},
             {R"([{"node": "a", "property": "b", "value": 1.5}])", "changes[0].value is neither"},
             {R"([{"node": "a", "property": "b", "value": ["x", {}]}])", "changes[0].value[1] is neither"},
             {R"([{"node": "a", "property": "b", "value": [["x"]]}])", "changes[0].value[0] is neither"}}) {
        EXPECT_THAT(errorIn(text), HasSubstr(error)) << text;
    }
}

TEST(ChangeFile, OfAStrangerCostsNothing) {
    EXPECT_THAT(errorIn(std::string(100000, '[')), HasSubstr("more levels"));
    EXPECT_THAT(errorIn(std::string((1 << 20) + 1, ' ')), HasSubstr("longer than"));
    std::string many = "[";
    for (int i = 0; i < 1001; ++i) {
        many += (i == 0 ? "" : ",") + std::string(R"({"node":"a","property":"b","value":"c"})");
    }
    EXPECT_THAT(errorIn(many + "]"), HasSubstr("more than 1000 changes"));
    std::string words = R"([{"node":"a","property":"b","value":["w")";
    for (int i = 0; i < 256; ++i) {
        words += R"(,"w")";
    }
    EXPECT_THAT(errorIn(words + "]}]"), HasSubstr("more than 256 words"));
}

TEST(ChangeFile, CannotSteerTheTerminalWithItsErrors) {
    for (const std::string text : {"[\x1b[2J]", "{\"\\u001b[2J\": 1}", "[{\"\\u202ekey\": 1}]", "\xff\xfe"}) {
        const std::string error = errorIn(text);
        EXPECT_FALSE(error.empty()) << text;
        EXPECT_THAT(error, Not(HasSubstr("\x1b")));
        EXPECT_THAT(error, Not(HasSubstr("\u202e")));
        EXPECT_THAT(error, Not(HasSubstr("\xff")));
        EXPECT_LT(error.size(), 500U);
    }
    EXPECT_LT(errorIn("[\"" + std::string(100000, 'x')).size(), 500U);
}

}  // namespace
