#pragma once

#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

namespace cvagent::undo {

/// A text that is none of ours, or is damaged.
class BadRecord : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// Named bytes, one behind the other: "NAME LENGTH\nBYTES\n". What the bytes of one are may be records again.
class RecordWriter {
public:
    RecordWriter& add(std::string_view name, std::string_view bytes);
    RecordWriter& add(std::string_view name, std::uint64_t number);
    const std::string& text() const { return text_; }

private:
    std::string text_;
};

struct Record {
    std::string_view name;
    std::string_view bytes;  ///< of the text that is read

    /// Throws BadRecord when they are no number or one that is too large.
    std::uint64_t number(std::uint64_t most = UINT64_MAX) const;
};

class RecordReader {
public:
    /// @param text outlives the reader and its records
    explicit RecordReader(std::string_view text) : left_(text) {}
    /// Nothing at the end. Throws BadRecord.
    std::optional<Record> next();

private:
    std::string_view left_;
};

}  // namespace cvagent::undo
