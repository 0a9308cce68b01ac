// A plan as it travels.
#include "agent/change/plan.h"

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>

#include "agent/change/base64.h"
#include "agent/change/proposal.h"

namespace {

using namespace cvagent::change;

Plan wholePlan() {
    Plan plan;
    plan.changes = {{"ip-config:eth0", 94, {"192.0.2.1", ""}}, {"computer", 115, {"a\nb\x1b[2J"}}};
    plan.answers = {{"/a/b", "DNSServers", "", {"one", "two"}, "x", "y", ""},
                    {"/a", "OwnerContact", "refused", {}, "", "", "no file"}};
    FileState state;
    state.content = std::string("bytes \xff\xfe\0 and \x1b", 16);
    state.mode = 0640;
    state.owner = 1;
    state.group = 4294967295U;
    FileState link{FileState::Type::link, "../run/a", 0777, 0, 0, false};
    plan.files = {{"/etc/a\nb", std::nullopt, state}, {"/etc/c", link, std::nullopt}};
    plan.commands = {{"ip -6 route", false, 1}, {"service network restart", true, 0}};
    plan.kernelBefore = {"link lo"};
    plan.kernelAfter = {"link lo", "route default"};
    plan.unforeseen = {"The clock."};
    return plan;
}

TEST(Plan, ComesBackAsItWent) {
    const Plan plan = wholePlan();
    const Plan back = planFromJson(toJson(plan));
    EXPECT_EQ(toJson(back), toJson(plan));
    ASSERT_EQ(back.files.size(), 2U);
    EXPECT_EQ(back.files[0].path, "/etc/a\nb");
    EXPECT_EQ(back.files[0].before, std::nullopt);
    EXPECT_EQ(back.files[0].after, plan.files[0].after);
    EXPECT_EQ(back.files[1].before, plan.files[1].before);
    EXPECT_EQ(back.changes[0].words, plan.changes[0].words);
    EXPECT_EQ(back.answers[0].errors, plan.answers[0].errors);
    EXPECT_TRUE(back.commands[1].recorded);
    EXPECT_EQ(back.kernelAfter, plan.kernelAfter);
    EXPECT_EQ(back.unforeseen, plan.unforeseen);
}

TEST(Plan, HasItsKernelStateInOrderWhateverWasTold) {
    Plan plan = wholePlan();
    plan.kernelAfter = {"route default", "link lo"};
    EXPECT_THAT(planFromJson(toJson(plan)).kernelAfter, testing::ElementsAre("link lo", "route default"));
}

TEST(Plan, IsNotReadFromWhatIsNone) {
    const std::string whole = toJson(wholePlan());
    EXPECT_NO_THROW(planFromJson(whole));
    EXPECT_THROW(planFromJson(""), BadPlan);
    EXPECT_THROW(planFromJson("[]"), BadPlan);
    EXPECT_THROW(planFromJson("{}"), BadPlan);
    EXPECT_THROW(planFromJson(whole.substr(0, whole.size() / 2)), BadPlan);
    const auto with = [&whole](const std::string& is, const std::string& becomes) {
        std::string text = whole;
        text.replace(text.find(is), is.size(), becomes);
        return text;
    };
    EXPECT_THROW(planFromJson(with("\"link\"", "\"door\"")), BadPlan);
    const std::string nested = std::string(1'000'000, '[') + std::string(1'000'000, ']');
    EXPECT_THAT([&] { planFromJson(nested); }, testing::ThrowsMessage<BadPlan>(testing::HasSubstr("levels")));
    EXPECT_THROW(planFromJson(with("\"change\": 1", "\"change\": 2")), BadPlan);
    EXPECT_THROW(planFromJson(with("\"change\": 1", "\"change\": \"x\"")), BadPlan);
    EXPECT_THROW(planFromJson(with("\"base64\": \"", "\"base64\": \"*")), BadPlan);
    EXPECT_THROW(planFromJson(with("\"answers\": [", "\"answers\": {}, \"others\": [")), BadPlan);
}

TEST(Preview, TravelsAsItIs) {
    const Preview preview{
        {{"/a\xff", "IPv4Address", "in no\nsubnet"}}, {{"/b", "OwnerName", ""}}, wholePlan()};
    const std::string text = toJson(preview);
    const Preview back = previewFromJson(text);
    EXPECT_EQ(toJson(back), text);
    EXPECT_EQ(back.objections[0].path, "/a\xff");
    EXPECT_EQ(back.objections[0].reason, "in no\nsubnet");
    EXPECT_EQ(back.unchanged[0].property, "OwnerName");
    EXPECT_EQ(back.plan.changes.size(), 2U);
}

TEST(Preview, IsNotReadFromWhatIsNone) {
    for (const std::string& text :
         {std::string(), std::string("{}"), std::string("[]"), std::string("{\"objections\": []"),
          std::string(R"({"objections": {}, "unchanged": [], "plan": {}})"),
          std::string(R"({"objections": [{"path": 1}], "unchanged": [], "plan": {}})"),
          std::string(100'000, '[')}) {
        EXPECT_THROW(previewFromJson(text), BadPlan) << text.substr(0, 40);
    }
}

TEST(Plan, ShowsEverybodyNothingThatNotEverybodyMayRead) {
    Plan plan;
    const FileState open{FileState::Type::file, "open", 0644, 0, 0, false};
    const FileState closed{FileState::Type::file, "secret", 0640, 0, 0, false};
    plan.files = {
        {"/etc/open", open, open}, {"/etc/opened", closed, open}, {"/etc/new", std::nullopt, closed}};
    const Plan shown = withoutSecrets(plan);
    EXPECT_EQ(shown.files[0].after, open);
    EXPECT_EQ(toJson(shown).find("secret"), std::string::npos);
    EXPECT_TRUE(shown.files[1].before->withheld);
    EXPECT_TRUE(shown.files[1].after->withheld);
    EXPECT_EQ(shown.files[2].after->content, "");
}

/// The file's own mode means nothing where nobody gets to it.
TEST(Plan, ShowsEverybodyNothingBelowAClosedDirectory) {
    std::string place = "/tmp/planXXXXXX";  // $TMPDIR may lie below a closed one
    ASSERT_NE(mkdtemp(place.data()), nullptr);
    Plan plan;
    const FileState open{FileState::Type::file, "secret", 0644, 0, 0, false};
    plan.files = {{place + "/below/file", open, open}};
    EXPECT_EQ(toJson(withoutSecrets(plan)).find("secret"), std::string::npos);
    chmod(place.c_str(), 0755);
    EXPECT_NE(toJson(withoutSecrets(plan)).find("secret"), std::string::npos);
    rmdir(place.c_str());
}

TEST(Base64, IsThatOfEverybody) {
    EXPECT_EQ(toBase64(""), "");
    EXPECT_EQ(toBase64("f"), "Zg==");
    EXPECT_EQ(toBase64("fo"), "Zm8=");
    EXPECT_EQ(toBase64("foo"), "Zm9v");
    EXPECT_EQ(toBase64("foobar"), "Zm9vYmFy");
    for (const char* text : {"", "Zg==", "Zm8=", "Zm9v", "Zm9vYmFy", "//79"}) {
        EXPECT_EQ(toBase64(fromBase64(text).value_or("?")), text);
    }
    for (const char* text : {"Z", "Zg=", "Z===", "Zg==Zg==", "Zm 9", "Zm9\n"}) {
        EXPECT_EQ(fromBase64(text), std::nullopt) << text;
    }
}

}  // namespace
