// docs/changes.md: its table has a row for each property that can be written, and no other.
#include <gmock/gmock.h>

#include <fstream>
#include <set>
#include <sstream>

#include "agent/core/catalogue.h"

namespace {

using Rows = std::set<std::pair<std::string, std::string>>;

std::vector<std::string> cellsOf(const std::string& line) {
    std::istringstream in(line);
    std::vector<std::string> cells;
    for (std::string cell; std::getline(in, cell, '|');) {
        const std::size_t first = cell.find_first_not_of(' ');
        cells.push_back(
            first == std::string::npos ? "" : cell.substr(first, cell.find_last_not_of(' ') + 1 - first));
    }
    return cells;
}

TEST(ChangesPage, HasARowForEachPropertyThatCanBeWritten) {
    Rows written;
    std::ifstream page(CORVISTA_CHANGES_PAGE);
    for (std::string line; std::getline(page, line);) {
        const std::vector<std::string> cells = cellsOf(line);
        if (cells.size() == 7 && cells[1] != "Class" && cells[1].find("---") == std::string::npos) {
            EXPECT_TRUE(written.insert({cells[1], cells[2]}).second) << line;
            for (std::size_t i = 3; i < cells.size(); ++i) {
                EXPECT_NE(cells[i], "") << line;
            }
        }
    }
    Rows catalogue;
    for (const cvagent::NodeClass& nodeClass : cvagent::nodeClasses()) {
        for (const cvagent::Property* row :
             cvagent::propertiesOf(static_cast<unsigned int>(nodeClass.type))) {
            if (row->writable()) {
                catalogue.insert({nodeClass.name, row->name});
            }
        }
    }
    EXPECT_EQ(written, catalogue);
}

}  // namespace
