#include "agent/undo/journal.h"

#include <array>

#include "agent/undo/boot_clock.h"
#include "agent/undo/records.h"

namespace cvagent::undo {

namespace {

constexpr std::uint64_t kJournalVersion = 1;

struct NumberPart {
    const char* name;
    std::uint64_t Journal::*part;
    std::uint64_t most;
};
constexpr std::array kNumbers{
    NumberPart{"window", &Journal::window, kLongestWindow},
    NumberPart{"deadline", &Journal::deadline, UINT64_MAX},
    NumberPart{"settling", &Journal::settling, kLongestWindow},
    NumberPart{"step", &Journal::step, UINT32_MAX},
    NumberPart{"steps", &Journal::steps, UINT32_MAX},
    NumberPart{"began", &Journal::began, UINT64_MAX},
};

struct TextPart {
    const char* name;
    std::string Journal::*part;
};
constexpr std::array kTexts{TextPart{"boot", &Journal::boot}, TextPart{"caller", &Journal::caller},
                            TextPart{"summary", &Journal::summary}};

void takePart(const Record& record, Journal& journal) {
    for (const NumberPart& each : kNumbers) {
        if (record.name == each.name) {
            journal.*each.part = record.number(each.most);
            return;
        }
    }
    for (const TextPart& each : kTexts) {
        if (record.name == each.name) {
            journal.*each.part = record.bytes;
            return;
        }
    }
    if (record.name == "stage") {
        journal.stage = static_cast<Stage>(record.number(static_cast<std::uint64_t>(Stage::failed)));
    } else if (record.name == "note") {
        journal.notes.emplace_back(record.bytes);
    } else {
        throw BadRecord("a journal has a part that is not known");
    }
}

}  // namespace

const char* stageText(Stage stage) {
    static constexpr std::array kTextsOfStages{
        "was not begun",       "is under way",  "waits for its confirmation", "is kept",
        "is being taken back", "is taken back", "cannot be taken back",
    };
    return kTextsOfStages.at(static_cast<std::size_t>(stage));
}

bool Journal::isDue() const {
    return window != 0 && (boot != bootId() || bootMilliseconds() >= deadline);
}

std::string textOf(const Journal& journal) {
    RecordWriter text;
    text.add("corvista-change", kJournalVersion).add("stage", static_cast<std::uint64_t>(journal.stage));
    for (const NumberPart& each : kNumbers) {
        text.add(each.name, journal.*each.part);
    }
    for (const TextPart& each : kTexts) {
        text.add(each.name, journal.*each.part);
    }
    for (const std::string& note : journal.notes) {
        text.add("note", note);
    }
    return text.text();
}

Journal journalFrom(std::string_view text) {
    RecordReader reader(text);
    const auto head = reader.next();
    if (!head || head->name != "corvista-change" || head->number() != kJournalVersion) {
        throw BadRecord("this is no journal of this version");
    }
    Journal journal;
    while (const auto record = reader.next()) {
        takePart(*record, journal);
    }
    return journal;
}

}  // namespace cvagent::undo
