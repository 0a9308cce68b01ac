#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace cvagent {

/// What stands in a row of a catalogue file under the keys that are known, as far as it is of the right kind.
struct CatalogueRow {
    std::optional<unsigned int> type;
    std::optional<unsigned int> nodeClass;  ///< "class"
    std::optional<unsigned int> id;
    std::optional<unsigned int> nameProperty;
    // "" where there is none.
    std::string name;
    std::string kind;
    std::string unit;
    std::string meaning;
    std::string source;
    bool several = false;
    bool trusted = false;
    std::vector<unsigned int> telling;  ///< the first ten
};

/// A list of rows.
struct CatalogueRows {
    static constexpr std::size_t kMostClasses = 200;
    static constexpr std::size_t kMostProperties = 5000;

    std::size_t most;
    bool isThere = false;
    bool hasMore = false;  ///< than the most that are kept
    std::vector<CatalogueRow> rows{};
};

struct CatalogueLists {
    CatalogueRows classes{CatalogueRows::kMostClasses};
    CatalogueRows properties{CatalogueRows::kMostProperties};
};

/// Both lists of a file's text; nothing when it is no JSON object. Everything else in it is passed over.
std::optional<CatalogueLists> readCatalogueRows(std::string_view text);

}  // namespace cvagent
