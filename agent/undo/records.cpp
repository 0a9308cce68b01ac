#include "agent/undo/records.h"

#include "hosttools/files.h"

namespace cvagent::undo {

namespace {

constexpr std::size_t kLongestName = 32;

std::string_view takeUntil(std::string_view& text, char end, std::size_t most) {
    const std::size_t at = text.substr(0, most + 1).find(end);
    if (at == std::string_view::npos) {
        throw BadRecord("a record has no beginning");
    }
    const std::string_view taken = text.substr(0, at);
    text.remove_prefix(at + 1);
    return taken;
}

std::uint64_t numberIn(std::string_view text) {
    const std::string_view whole = text;
    const auto number = hosttools::takeNumber(text);
    if (!number || !text.empty()) {
        throw BadRecord("a record has \"" + std::string(whole.substr(0, kLongestName)) +
                        "\" where a number should be");
    }
    return *number;
}

}  // namespace

RecordWriter& RecordWriter::add(std::string_view name, std::string_view bytes) {
    text_ += name;
    text_ += ' ' + std::to_string(bytes.size()) + '\n';
    text_ += bytes;
    text_ += '\n';
    return *this;
}

RecordWriter& RecordWriter::add(std::string_view name, std::uint64_t number) {
    return add(name, std::string_view(std::to_string(number)));
}

std::uint64_t Record::number(std::uint64_t most) const {
    const std::uint64_t value = numberIn(bytes);
    if (value > most) {
        throw BadRecord("a number is too large");
    }
    return value;
}

std::optional<Record> RecordReader::next() {
    constexpr std::size_t kDigits = 20;
    if (left_.empty()) {
        return std::nullopt;
    }
    Record record;
    record.name = takeUntil(left_, ' ', kLongestName);
    const std::uint64_t length = numberIn(takeUntil(left_, '\n', kDigits));
    if (length >= left_.size() || left_[static_cast<std::size_t>(length)] != '\n') {
        throw BadRecord("a record is cut off");
    }
    record.bytes = left_.substr(0, static_cast<std::size_t>(length));
    left_.remove_prefix(static_cast<std::size_t>(length) + 1);
    return record;
}

}  // namespace cvagent::undo
