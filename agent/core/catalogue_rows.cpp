// The command line reads such a file for a single name, so no tree of values is made of it.
#include "agent/core/catalogue_rows.h"

#include <algorithm>
#include <array>
#include <limits>
#include <nlohmann/json.hpp>

namespace cvagent {

namespace {

constexpr std::size_t kMostTelling = 10;

template <class Member>
struct RowKey {
    std::string_view name;
    Member member;
};

constexpr std::array<RowKey<std::optional<unsigned int> CatalogueRow::*>, 4> kNumberKeys = {
    {{"type", &CatalogueRow::type},
     {"class", &CatalogueRow::nodeClass},
     {"id", &CatalogueRow::id},
     {"nameProperty", &CatalogueRow::nameProperty}}};
constexpr std::array<RowKey<std::string CatalogueRow::*>, 5> kTextKeys = {
    {{"name", &CatalogueRow::name},
     {"kind", &CatalogueRow::kind},
     {"unit", &CatalogueRow::unit},
     {"meaning", &CatalogueRow::meaning},
     {"source", &CatalogueRow::source}}};
constexpr std::array<RowKey<bool CatalogueRow::*>, 2> kFlagKeys = {
    {{"several", &CatalogueRow::several}, {"trusted", &CatalogueRow::trusted}}};

/// Where the value of a key goes; null for none of the keys.
template <class Value, class Keys>
Value* placeIn(CatalogueRow& row, const Keys& keys, const std::string& name) {
    const auto found = std::ranges::find(keys, name, [](const auto& key) { return key.name; });
    if (found == keys.end()) {
        return nullptr;
    }
    Value& place = row.*(found->member);
    place = Value();  // what stands there twice is what stands there last
    return &place;
}

/// Hears the file's values one after the other.
class RowListener : public nlohmann::json_sax<nlohmann::json> {
public:
    bool null() override { return pass(); }
    bool boolean(bool value) override {
        if (atValueOfRow() && flag_ != nullptr) {
            *flag_ = value;
        }
        return pass();
    }
    bool number_integer(number_integer_t /*value*/) override { return pass(); }
    bool number_unsigned(number_unsigned_t value) override {
        if (value <= std::numeric_limits<unsigned int>::max()) {
            takeId(static_cast<unsigned int>(value));
        }
        return pass();
    }
    bool number_float(number_float_t /*value*/, const string_t& /*text*/) override { return pass(); }
    bool string(string_t& value) override {
        if (atValueOfRow() && text_ != nullptr) {
            *text_ = std::move(value);
        }
        return pass();
    }
    bool binary(binary_t& /*value*/) override { return pass(); }
    bool start_object(std::size_t /*size*/) override {
        isObject_ = isObject_ || depth_ == 0;
        if (depth_ == kInFile) {
            list_ = nullptr;
        }
        if (CatalogueRow* row = depth_ == kInList ? addRow() : nullptr) {
            row_ = row;
        }
        ++depth_;
        return true;
    }
    bool key(string_t& name) override {
        if (depth_ == kInFile) {
            list_ = name == "classes" ? &lists_.classes : name == "properties" ? &lists_.properties : nullptr;
            if (list_ != nullptr) {
                *list_ = {list_->most};
            }
        } else if (atValueOfRow()) {
            number_ = placeIn<std::optional<unsigned int>>(*row_, kNumberKeys, name);
            text_ = placeIn<std::string>(*row_, kTextKeys, name);
            flag_ = placeIn<bool>(*row_, kFlagKeys, name);
            isTelling_ = name == "telling";
            if (isTelling_) {
                row_->telling.clear();
            }
        }
        return true;
    }
    bool end_object() override { return leave(); }
    bool start_array(std::size_t /*size*/) override {
        if (depth_ == kInFile && list_ != nullptr) {
            list_->isThere = true;
        } else if (depth_ == kInList) {
            addRow();
        }
        inTelling_ = atValueOfRow() && isTelling_;
        ++depth_;
        return true;
    }
    bool end_array() override { return leave(); }
    bool parse_error(std::size_t /*place*/, const std::string& /*token*/,
                     const nlohmann::json::exception& /*error*/) override {
        return false;
    }

    bool isObject() const { return isObject_; }
    CatalogueLists take() && { return std::move(lists_); }

private:
    // How many objects and lists are open.
    static constexpr int kInFile = 1;
    static constexpr int kInList = 2;
    static constexpr int kInRow = 3;
    static constexpr int kInTelling = 4;

    bool atValueOfRow() const { return row_ != nullptr && depth_ == kInRow; }
    /// A value in the place of a row is one without anything.
    bool pass() {
        if (depth_ == kInList) {
            addRow();
        }
        return true;
    }
    void takeId(unsigned int value) {
        if (atValueOfRow() && number_ != nullptr) {
            *number_ = value;
        } else if (inTelling_ && depth_ == kInTelling && row_->telling.size() < kMostTelling) {
            row_->telling.push_back(value);
        }
    }
    CatalogueRow* addRow() {
        if (list_ == nullptr) {
            return nullptr;
        }
        list_->hasMore = list_->rows.size() == list_->most;
        return list_->hasMore ? nullptr : &list_->rows.emplace_back();
    }
    bool leave() {
        --depth_;
        row_ = depth_ <= kInList ? nullptr : row_;
        list_ = depth_ <= kInFile ? nullptr : list_;
        inTelling_ = inTelling_ && depth_ > kInRow;
        return true;
    }

    CatalogueLists lists_;
    bool isObject_ = false;
    int depth_ = 0;
    CatalogueRows* list_ = nullptr;  // whose rows come
    CatalogueRow* row_ = nullptr;    // whose values come
    // Where the next value goes.
    std::optional<unsigned int>* number_ = nullptr;
    std::string* text_ = nullptr;
    bool* flag_ = nullptr;
    bool isTelling_ = false;
    bool inTelling_ = false;
};

}  // namespace

std::optional<CatalogueLists> readCatalogueRows(std::string_view text) {
    RowListener listener;
    if (!nlohmann::json::sax_parse(text.begin(), text.end(), &listener) || !listener.isObject()) {
        return std::nullopt;
    }
    return std::move(listener).take();
}

}  // namespace cvagent
