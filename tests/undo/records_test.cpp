// What is read back of a saved state may be anything.
#include "agent/undo/records.h"

#include <gmock/gmock.h>

#include "agent/undo/saved_state.h"

namespace {

using cvagent::undo::BadRecord;
using cvagent::undo::FileState;
using cvagent::undo::RecordReader;
using cvagent::undo::RecordWriter;
using cvagent::undo::SavedState;
using cvagent::undo::savedStateFrom;
using cvagent::undo::textOf;

std::string readAll(const std::string& text) {
    std::string all;
    RecordReader reader(text);
    while (const auto record = reader.next()) {
        all += std::string(record->name) + "=" + std::string(record->bytes) + ";";
    }
    return all;
}

TEST(Records, ComeBackAsTheyWere) {
    const std::string bytes("a\nb 3\n\0c", 8);
    EXPECT_EQ(readAll(RecordWriter().add("one", bytes).add("two", 7).add("three", "").text()),
              "one=" + bytes + ";two=7;three=;");
    EXPECT_EQ(readAll(""), "");
}

TEST(Records, OfAStrangerAreRefused) {
    for (const char* text :
         {"x", "x ", "x 1", "x 1\n", "x 1\na", "x 1\nab\n", "x 1\naX", "x -1\n\n", "x 2\na\n", "x 0\n",
          "x 99999999999999999999\n", "x 18446744073709551615\na\n", "x 18446744073709551616\na\n",
          "x 1a\na\n", "x  1\na\n", "averyveryverylongnamethatnobodyhasever 1\na\n",
          "x 123456789012345678901\na\n"}) {
        EXPECT_THROW(readAll(text), BadRecord) << text;
    }
    RecordReader reader("n 3\n300\n");
    const auto record = reader.next();
    EXPECT_EQ(record->number(300), 300U);
    EXPECT_THROW(record->number(299), BadRecord);
}

SavedState someState() {
    SavedState state;
    state.files.push_back(
        {"/etc/hosts", FileState::Type::file, "text\n", 0640, 1, 2, {3, 4}, {-5, 6}, {{"user.a", "b"}}});
    state.files.push_back({"/etc/none", FileState::Type::absent, "", 0, 0, 0, {}, {}, {}});
    state.network.network.links = {{0, "link"}};
    state.network.network.rules = {{0, "rule"}, {0, ""}};
    state.network.neighbours = {{0, "neighbour"}};
    state.hostName = std::string(64, 'h');
    state.boot = "one";
    state.milliseconds = 77;
    return state;
}

TEST(SavedStates, ComeBackAsTheyWere) {
    const SavedState state = savedStateFrom(textOf(someState()));
    EXPECT_EQ(textOf(state), textOf(someState()));
    ASSERT_EQ(state.files.size(), 2U);
    EXPECT_EQ(state.files[0].attributes.at("user.a"), "b");
    EXPECT_EQ(state.files[0].modified.tv_sec, -5);
    EXPECT_EQ(state.files[0].modified.tv_nsec, 6);
    EXPECT_TRUE(state.files[0].isAs(someState().files[0]));
    EXPECT_EQ(state.network.network.rules.size(), 2U);
    EXPECT_EQ(state.hostName, std::string(64, 'h'));
}

TEST(SavedStates, ThatAreDamagedAreRefused) {
    const std::string whole = textOf(someState());
    for (std::size_t length = 0; length < whole.size() - std::string("end 0\n\n").size() + 7; ++length) {
        EXPECT_THROW(savedStateFrom(whole.substr(0, length)), BadRecord) << length;
    }
    const auto file = [](const char* name, const std::string& value) {
        return RecordWriter()
            .add("corvista-saved", 1)
            .add("file", RecordWriter().add("path", "/etc/x").add(name, value).text())
            .add("end", "")
            .text();
    };
    EXPECT_NO_THROW(savedStateFrom(file("mode", "420")));
    for (const auto& [name, value] :
         std::vector<std::pair<const char*, std::string>>{{"path", "etc/x"},
                                                          {"path", "/etc/"},
                                                          {"path", ""},
                                                          {"path", std::string("/a\0b", 4)},
                                                          {"type", "5"},
                                                          {"type", "2"},
                                                          {"mode", "4096"},
                                                          {"owner", "4294967296"},
                                                          {"modified", "x"},
                                                          {"what", "1"},
                                                          {"attribute", "x"},
                                                          {"attribute", ""}}) {
        EXPECT_THROW(savedStateFrom(file(name, value)), BadRecord) << name << " " << value;
    }
    EXPECT_THROW(savedStateFrom(RecordWriter().add("corvista-saved", 2).add("end", "").text()), BadRecord);
    EXPECT_THROW(savedStateFrom(RecordWriter().add("other", 1).add("end", "").text()), BadRecord);
}

}  // namespace
