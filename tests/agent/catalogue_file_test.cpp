// The file of names that a plug-in brings along, at its best and at its worst.
#include "agent/core/catalogue_file.h"

#include <gmock/gmock.h>

#include <chrono>
#include <fstream>
#include <sstream>

#include "agent/cli/print.h"

namespace {

using cvagent::catalogueFileOf;
using cvagent::CatalogueTable;
using cvagent::Kind;
using cvagent::parseCatalogue;
using cvagent::ParsedCatalogue;
using cvagent::Property;
using cvagent::Unit;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

const std::string kClass = R"("classes": [{"type": 700, "name": "thing", "nameProperty": 70000}])";

ParsedCatalogue parsed(const std::string& text) {
    return parseCatalogue("a test", text);
}

/// What is left of one property with these members beside a good class, number, kind and name.
ParsedCatalogue withProperty(const std::string& members) {
    return parsed("{" + kClass + R"(, "properties": [)" + members + "]}");
}

Property onlyProperty(const ParsedCatalogue& parsed) {
    EXPECT_THAT(parsed.complaints, IsEmpty());
    EXPECT_EQ(parsed.table->properties.front().size(), 1U);
    return parsed.table->properties.front().front();
}

TEST(CatalogueFile, LiesBesideTheLibrary) {
    EXPECT_EQ(catalogueFileOf("/usr/lib/corvista/plug-ins/libx.so.1"),
              "/usr/lib/corvista/plug-ins/libx.json");
    EXPECT_EQ(catalogueFileOf("libx.so"), "libx.json");
    EXPECT_EQ(catalogueFileOf("/a.so/libx"), "/a.so/libx.json");
}

TEST(CatalogueFile, MakesRowsLikeThoseInTheProgram) {
    const auto all = parsed(R"({"classes": [
          {"type": 701, "name": "one"}, {"type": 702, "name": "many", "several": true},
          {"type": 703, "name": "named", "nameProperty": 7, "telling": [8, 4294967304, -1, "7", 9]}],
        "properties": [
          {"class": 703, "id": 9, "name": "Weight", "kind": "number", "unit": "degrees Celsius",
           "source": "/sys/x", "meaning": "how warm", "trusted": true},
          {"class": 703, "id": 7, "name": "Name", "kind": "text"}]})");
    ASSERT_THAT(all.complaints, IsEmpty());
    using Naming = cvagent::NodeClass::Naming;
    const auto classes = all.table->classes;
    ASSERT_THAT(classes, SizeIs(3));
    EXPECT_EQ(classes[0].naming, Naming::single);
    EXPECT_EQ(classes[1].naming, Naming::byIndex);
    EXPECT_EQ(classes[2].naming, Naming::byProperty);
    EXPECT_EQ(classes[2].nameProperty, 7U);
    EXPECT_THAT(classes[2].telling, ElementsAre(8U, 9U));
    const auto rows = all.table->properties.front();
    ASSERT_THAT(rows, SizeIs(2));
    EXPECT_EQ(rows[0].id, 7U);  // ids ascend
    EXPECT_STREQ(rows[1].name, "Weight");
    EXPECT_STREQ(cvagent::unitName(rows[1]), "°C");
    EXPECT_STREQ(rows[1].source, "/sys/x");
    EXPECT_STREQ(rows[1].meaning, "how warm");
    EXPECT_TRUE(rows[1].trusted);
    EXPECT_FALSE(rows[1].writable());
    EXPECT_FALSE(rows[0].trusted);
}

TEST(CatalogueFile, UnitsAreShownAsPeopleWriteThem) {
    const auto shown = [](const std::string& unit, const IC::Number& number) {
        const Property row = onlyProperty(withProperty(
            R"({"class": 700, "id": 1, "name": "A", "kind": "number", "unit": ")" + unit + "\"}"));
        return cvagent::valueText(&row, IC::PropertyValue(number, true));
    };
    EXPECT_EQ(shown("bytes", IC::Number(1500U)), "1500 bytes");
    EXPECT_EQ(shown("bytes", IC::Number(274877906944ULL)), "274877906944 bytes, 274.9 GB (256.0 GiB)");
    EXPECT_EQ(shown("degrees Celsius", IC::Number(41.5)), "41.5 °C");
    EXPECT_EQ(shown("revolutions per minute", IC::Number(900U)), "900 RPM");
    EXPECT_EQ(shown("volts", IC::Number(3.3)), "3.3 V");
    EXPECT_EQ(shown("kilohertz", IC::Number(2400000U)), "2400000 kHz, 2.40 GHz");
    EXPECT_EQ(shown("megabits per second", IC::Number(1000U)), "1000 Mbit/s");
    EXPECT_EQ(shown("seconds since 1970", IC::Number(0U)), "0 s since 1970, 1970-01-01T00:00:00Z");
    EXPECT_EQ(shown("apples", IC::Number(2U)), "2 apples");
    EXPECT_EQ(shown("as the value", IC::Number(2U)), "2");
    EXPECT_EQ(shown("", IC::Number(2U)), "2");
}

TEST(CatalogueFile, ADamagedRowCostsOnlyItself) {
    const std::string good = R"({"class": 700, "id": 1, "name": "Good", "kind": "text"})";
    for (const std::string bad : {R"({})", R"(7)", R"(null)", R"([[[[[[1]]]]]])",
                                  R"({"class": 700, "id": -1, "name": "A", "kind": "text"})",
                                  R"({"class": 700, "id": 4294967296, "name": "A", "kind": "text"})",
                                  R"({"class": 700, "id": 1.5, "name": "A", "kind": "text"})",
                                  R"({"class": "700", "id": 2, "name": "A", "kind": "text"})",
                                  R"({"class": 700, "id": 2, "name": "A", "kind": "colour"})",
                                  R"({"class": 700, "id": 2, "name": "12", "kind": "text"})",
                                  R"({"class": 700, "id": 2, "name": "a", "kind": "text"})",
                                  R"({"class": 700, "id": 2, "name": "A b", "kind": "text"})",
                                  R"({"class": 700, "id": 2, "name": "A\u001b[2J", "kind": "text"})",
                                  R"({"class": 700, "id": 2, "name": ["A"], "kind": "text"})",
                                  R"({"class": 700, "id": 1, "name": "A", "kind": "text"})",
                                  R"({"class": 700, "id": 2, "name": "GOOD", "kind": "text"})",
                                  R"({"class": 12, "id": 57, "name": "A", "kind": "text"})"}) {
        const ParsedCatalogue parsed = withProperty(good + "," + bad);
        EXPECT_THAT(parsed.complaints, SizeIs(1)) << bad;
        ASSERT_NE(parsed.table, nullptr) << bad;
        ASSERT_THAT(parsed.table->properties.front(), SizeIs(1)) << bad;
        EXPECT_STREQ(parsed.table->properties.front().front().name, "Good");
    }
}

TEST(CatalogueFile, ADamagedClassCostsOnlyItself) {
    for (const std::string bad :
         {R"({"type": 0, "name": "zero"})", R"({"type": 40, "name": "mine"})",
          R"({"type": 702, "name": "computer"})", R"({"type": 702, "name": "a/b"})",
          R"({"type": 702, "name": "a:b"})", R"({"type": 702, "name": "7"})", R"({"type": 702, "name": "A"})",
          R"({"type": 702, "name": ""})", R"({"type": 702, "name": "type-38"})",
          R"({"type": 700, "name": "other"})", R"({"type": 702, "name": "thing"})", R"({"name": "none"})"}) {
        const ParsedCatalogue all = parsed(R"({"classes": [{"type": 700, "name": "thing"},)" +
                                           std::string(bad) + R"(], "properties": []})");
        EXPECT_THAT(all.complaints, SizeIs(1)) << bad;
        ASSERT_NE(all.table, nullptr);
        EXPECT_THAT(all.table->classes, SizeIs(1)) << bad;
    }
}

TEST(CatalogueFile, WhatIsNoCatalogueIsRefused) {
    for (const std::string& text :
         {std::string(), std::string("{"), std::string("[]"), std::string("\xff\xfe"), std::string("{}"),
          std::string(1000000, '['), std::string(1000000, '{'), std::string(1000, '\0'),
          std::string("{\"classes\": 7, \"properties\": {}}")}) {
        const ParsedCatalogue all = parsed(text);
        EXPECT_EQ(all.table, nullptr) << text.substr(0, 20);
        EXPECT_FALSE(all.complaints.empty()) << text.substr(0, 20);
    }
}

TEST(CatalogueFile, NothingOfItIsUnboundedOrUnprintable) {
    std::string rows;
    for (int i = 0; i < 6000; ++i) {
        rows += (i == 0 ? "" : ",") + std::string(R"({"class": 700, "id": )") + std::to_string(i) +
                R"(, "name": "N)" + std::to_string(i) + R"(", "kind": "text"})";
    }
    const ParsedCatalogue many = withProperty(rows);
    EXPECT_THAT(many.table->properties.front(), SizeIs(5000));
    EXPECT_THAT(many.complaints, SizeIs(1));
    std::string bad = "1";
    for (int i = 0; i < 500; ++i) {
        bad += ",1";
    }
    EXPECT_THAT(withProperty(bad).complaints, SizeIs(11));
    const Property row = onlyProperty(withProperty(
        R"({"class": 700, "id": 1, "name": "A", "kind": "text", "unit": "\u001b[2J", "source": "a\nb", "meaning": ")" +
        std::string(5000, 'x') + "\"}"));
    EXPECT_STREQ(cvagent::unitName(row), "\\x1b[2J");
    EXPECT_STREQ(row.source, "a\\x0ab");
    EXPECT_EQ(std::string(row.meaning).size(), 500U);
}

}  // namespace
