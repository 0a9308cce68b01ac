#include "agent/core/oshw/tables.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <fstream>
#include <map>
#include <regex>
#include <set>

#include "tests/support/fake_host.h"

namespace {

using cvagent::Kind;
using cvagent::NodeType;
using cvagent::propertiesOf;
using cvagent::Property;
using cvagent::Unit;
using testing::ElementsAre;

std::vector<unsigned int> ids(NodeType type, bool (*wanted)(const Property&)) {
    std::vector<unsigned int> found;
    for (const Property* row : propertiesOf(static_cast<unsigned int>(type))) {
        if (wanted(*row)) {
            found.push_back(row->id);
        }
    }
    return found;
}

std::vector<unsigned int> readable(NodeType type) {
    return ids(type, [](const Property& row) { return row.readable; });
}

std::vector<unsigned int> writable(NodeType type) {
    return ids(type, [](const Property& row) { return row.writable(); });
}

std::vector<Property> allRows() {
    std::vector<Property> rows;
    for (const cvagent::NodeClass& nodeClass : cvagent::nodeClasses()) {
        const auto own = propertiesOf(static_cast<unsigned int>(nodeClass.type));
        std::ranges::transform(own, std::back_inserter(rows), [](const Property* row) { return *row; });
    }
    return rows;
}

/// The properties that the trees of the recorded hosts show, by their nodes' type.
std::map<NodeType, std::set<unsigned int>> shownOnRecordedHosts() {
    static const std::regex typeLine(R"re(^      "type": (\d+))re");
    static const std::regex idLine(R"re(^        "(\d+)": )re");
    std::map<NodeType, std::set<unsigned int>> shown;
    for (const auto& host : std::filesystem::directory_iterator(testsDirectory() + "/hosts")) {
        std::ifstream file(host.path() / "expected-tree.json");
        NodeType type{};
        for (std::string line; std::getline(file, line);) {
            std::smatch match;
            if (std::regex_search(line, match, typeLine)) {
                type = static_cast<NodeType>(std::stoul(match[1]));
            } else if (std::regex_search(line, match, idLine)) {
                shown[type].insert(static_cast<unsigned int>(std::stoul(match[1])));
            }
        }
    }
    return shown;
}

TEST(Catalogue, HoldsWhatTheRecordedHostsShow) {
    auto shown = shownOnRecordedHosts();
    // What no tree shows: nodes that nobody builds by himself, and what is answered but never stored.
    shown[NodeType::lanEndpoint] = {108};
    shown[NodeType::partition].insert(123);
    shown[NodeType::computer].insert(200);
    for (const cvagent::NodeClass& nodeClass : cvagent::nodeClasses()) {
        const auto rows = readable(nodeClass.type);
        EXPECT_EQ(std::set(rows.begin(), rows.end()), shown[nodeClass.type]) << nodeClass.name;
    }
}

TEST(Catalogue, TellsWhatCanBeWritten) {
    EXPECT_THAT(writable(NodeType::computer), ElementsAre(115, 116, 123, 126, 127));
    EXPECT_THAT(writable(NodeType::ipConfig),
                ElementsAre(24, 25, 26, 27, 74, 94, 97, 98, 99, 100, 101, 102, 123));
    for (const NodeType type :
         {NodeType::hardDrive, NodeType::partition, NodeType::networkPort, NodeType::team,
          NodeType::processor, NodeType::lanEndpoint, NodeType::chassis}) {
        EXPECT_THAT(writable(type), testing::IsEmpty());
    }
}

TEST(Catalogue, IdsAscendInEveryClass) {
    for (const cvagent::NodeClass& nodeClass : cvagent::nodeClasses()) {
        const auto rows = propertiesOf(static_cast<unsigned int>(nodeClass.type));
        for (std::size_t i = 1; i < rows.size(); ++i) {
            EXPECT_LT(rows[i - 1]->id, rows[i]->id) << nodeClass.name;
        }
    }
}

TEST(Catalogue, NamesAreUniqueInEveryClassAndNoNumbers) {
    std::set<std::pair<NodeType, std::string>> names;
    for (const Property& row : allRows()) {
        EXPECT_TRUE(names.emplace(row.type, row.name).second) << row.name;
        EXPECT_TRUE(std::isupper(static_cast<unsigned char>(row.name[0])) != 0) << row.name;
        EXPECT_STRNE(row.meaning, "") << row.name;
    }
}

TEST(Catalogue, EveryRowBelongsToAClass) {
    std::size_t rows = 0;
    for (const auto part : {cvagent::oshw::hostProperties(), cvagent::oshw::storageProperties(),
                            cvagent::oshw::networkPortProperties(), cvagent::oshw::ipConfigProperties()}) {
        rows += part.size();
    }
    EXPECT_EQ(allRows().size(), rows);
}

TEST(Catalogue, ClassesHaveUniqueNumbersAndNames) {
    std::set<NodeType> types;
    std::set<std::string> names;
    for (const cvagent::NodeClass& nodeClass : cvagent::nodeClasses()) {
        EXPECT_TRUE(types.insert(nodeClass.type).second) << nodeClass.name;
        EXPECT_TRUE(names.insert(nodeClass.name).second) << nodeClass.name;
    }
    EXPECT_EQ(names.size(), 14U);
}

TEST(Catalogue, LabelsHaveCodesOfTheirOwn) {
    for (const Property& row : allRows()) {
        std::set<unsigned int> codes;
        for (const cvagent::Label& label : row.labels) {
            EXPECT_TRUE(codes.insert(label.code).second) << row.name << label.code;
        }
    }
}

TEST(Catalogue, WhatIsWritableSaysWhatItAccepts) {
    for (const Property& row : allRows()) {
        EXPECT_EQ(row.writable(), !cvagent::acceptedText(row).empty() && row.check != nullptr) << row.name;
    }
}

TEST(Catalogue, ARowIsFoundByNumberAndByNameInAnyCase) {
    const auto computer = static_cast<unsigned int>(NodeType::computer);
    for (const std::string text : {"115", "OwnerContact", "ownercontact", "OWNERCONTACT"}) {
        const Property* row = cvagent::findProperty(computer, text);
        ASSERT_TRUE(row) << text;
        EXPECT_EQ(row->id, 115U);
    }
    for (const std::string text : {"", "999", "Owner", "115 ", " 115", "+115", "0x73", "DriveSize"}) {
        EXPECT_FALSE(cvagent::findProperty(computer, text)) << text;
    }
    EXPECT_FALSE(cvagent::findProperty(77, 115));
}

TEST(Catalogue, UnitsOfSizesDiffer) {
    EXPECT_EQ(cvagent::findProperty(11, 37)->unit, Unit::thousandBytes);
    EXPECT_EQ(cvagent::findProperty(45, 112)->unit, Unit::kibibytes);
    EXPECT_EQ(cvagent::findProperty(12, 57)->unit, Unit::kilobitsPerSecond);
}

TEST(Catalogue, AcceptedCodesAreToldWithTheirMeaning) {
    EXPECT_EQ(cvagent::acceptedText(*cvagent::findProperty(40, 123)), "1 (on), 9 (restart), 12 (halt)");
    EXPECT_EQ(cvagent::acceptedText(*cvagent::findProperty(29, 24)), "1 (DHCP), 3 (static)");
    EXPECT_EQ(cvagent::acceptedText(*cvagent::findProperty(29, 123)), "1 (up), 9 (up), 12 (down), 16 (down)");
}

TEST(Catalogue, TimeZonesAreAllListed) {
    EXPECT_EQ(cvagent::acceptedText(*cvagent::findProperty(40, 127)),
              "an offset in minutes out of -660, -600, -540, -480, -420, -360, -300, -240, -210, -180, -120, "
              "-60, 0, "
              "60, 120, 180, 210, 240, 270, 300, 330, 360, 420, 480, 540, 570, 600, 660, 720");
}

}  // namespace
