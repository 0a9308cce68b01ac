// The page that says what each value is compared with.
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <regex>
#include <sstream>

#include "tests/hardware/recorded_host.h"

namespace {

namespace fs = std::filesystem;

const fs::path kTests = CORVISTA_TESTS_DIR;

std::string content(const fs::path& file) {
    std::ostringstream text;
    text << std::ifstream(file).rdbuf();
    return text.str();
}

struct PageRow {
    std::string node;
    std::string begin;  ///< property, unit and source
    std::string compared;
};

std::vector<PageRow> rowsOfPage() {
    std::istringstream page(content(kTests.parent_path() / "docs/hardware.md"));
    std::vector<PageRow> rows;
    std::string node;
    for (std::string line; std::getline(page, line);) {
        if (line.starts_with("## ")) {
            node = line.substr(3);
        } else if (!node.empty() && line.starts_with("| ") && !line.starts_with("| Property |")) {
            const std::string inside = line.substr(0, line.size() - 2);
            const std::size_t last = inside.rfind(" | ");
            rows.push_back({node, inside.substr(0, last), inside.substr(last + 3)});
        }
    }
    return rows;
}

/// The text of all tests that compare with tools.
std::string comparingTests() {
    std::string all;
    for (const auto& entry : fs::directory_iterator(kTests / "hardware")) {
        const std::string name = entry.path().filename();
        if (name.find("beside") != name.npos || name.find("this_host") != name.npos ||
            name == "links_test.cpp" || name == "tools.h") {
            all += content(entry.path());
        }
    }
    return all;
}

TEST(HardwarePage, HasTheRowsOfTheCatalogue) {
    const std::vector<PageRow> page = rowsOfPage();
    const std::vector<hardware::Row> rows = hardware::allRows();
    ASSERT_EQ(page.size(), rows.size());
    std::size_t at = 0;
    for (const hardware::ClassRow& type : hardware::classes()) {
        for (const hardware::Row& row : rows) {
            if (hardware::classOfId(row.id) == type.type) {
                EXPECT_EQ(page[at].node, type.name);
                EXPECT_EQ(page[at++].begin,
                          std::string("| ") + row.name + " | " + row.unit + " | " + row.source);
            }
        }
    }
}

TEST(HardwarePage, NamesTestsThatAreThere) {
    const std::string tests = comparingTests();
    const std::regex quoted("`(\\w+)\\.(\\w+)`");
    for (const PageRow& row : rowsOfPage()) {
        const bool inGuest = row.compared.find("`tests/system/checks_hardware.py`") != row.compared.npos;
        bool named = inGuest || row.compared.starts_with("nothing: ");
        for (std::sregex_iterator at(row.compared.begin(), row.compared.end(), quoted), end; at != end;
             ++at) {
            const std::string test = "(" + (*at)[1].str() + ", " + (*at)[2].str() + ")";
            EXPECT_NE(tests.find(test), tests.npos) << test;
            named = true;
        }
        EXPECT_TRUE(named) << row.begin;
    }
}

/// A property's own name, or in the guest its number, stands in a test that compares.
TEST(HardwarePage, NamesPropertiesThatAreCompared) {
    const std::string here = comparingTests();
    const std::string guest = content(kTests / "system/checks_hardware.py");
    const std::vector<PageRow> page = rowsOfPage();
    for (const hardware::Row& row : hardware::allRows()) {
        const auto said = std::find_if(page.begin(), page.end(), [&](const PageRow& one) {
            return one.node == hardware::classRow(hardware::classOfId(row.id)).name &&
                   one.begin.starts_with(std::string("| ") + row.name + " |");
        });
        ASSERT_NE(said, page.end()) << row.name;
        const bool inGuest = said->compared.find("checks_hardware.py") != said->compared.npos;
        const bool isHere = std::regex_search(said->compared, std::regex("`\\w+\\.\\w+`"));
        if (row.id != hardware::firstId(hardware::classOfId(row.id))) {  // names are compared as lists
            EXPECT_TRUE(!isHere || here.find('"' + std::string(row.name) + '"') != here.npos) << row.name;
            const std::string number = std::to_string(row.id);
            EXPECT_TRUE(!inGuest || guest.find(number) != guest.npos) << row.name << " " << number;
        }
    }
}

}  // namespace
