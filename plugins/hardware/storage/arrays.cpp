#include "plugins/hardware/storage/block.h"
#include "plugins/hardware/storage/storage.h"

namespace hardware {

namespace {

constexpr auto kType = Class::array;

enum : Id {
    kLevel = firstId(kType) + 1,
    kState,
    kSize,
    kDisks,
    kDegraded,
    kMembers,
    kAction,
    kProgress,
    kMismatches,
};

constexpr Row kRows[] = {
    {kLevel, "Level", Kind::text, "", "md/level", "how the members work together"},
    {kState, "State", Kind::text, "", "md/array_state", "clean, active, readonly and others", kLive},
    {kSize, "Size", Kind::number, "bytes", "size", "how much it holds"},
    {kDisks, "Disks", Kind::number, "", "md/raid_disks", "members that a whole array has"},
    {kDegraded, "Missing", Kind::number, "", "md/degraded", "members that are missing or failed", kLive},
    {kMembers, "Members", Kind::texts, "", "md/dev-*/state", "each member with its state", kLive},
    {kAction, "Action", Kind::text, "", "md/sync_action", "idle, resync, recover, check or repair", kLive},
    {kProgress, "Progress", Kind::text, "sectors", "md/sync_completed", "how far it has got: done / all",
     kLive},
    {kMismatches, "Mismatches", Kind::number, "sectors", "md/mismatch_cnt",
     "what the last check found to differ", kLive},
};

std::vector<std::string> members(const Host& host, const std::string& directory) {
    constexpr std::string_view kPrefix = "dev-";
    std::vector<std::string> texts;
    for (const std::string& entry : host.entries(directory)) {
        if (entry.starts_with(kPrefix)) {
            texts.push_back(printable(entry.substr(kPrefix.size())) + ": " +
                            host.line(directory + "/" + entry + "/state").value_or("state not known"));
        }
    }
    return texts;
}

}  // namespace

Rows arrayRows() {
    return kRows;
}

std::vector<std::string> listArrays(const Host& host) {
    return block::ofClass(host, kType);
}

void describeArray(const Host& host, Found& found) {
    const std::string directory = block::directory(found.name) + "/md";
    Facts& facts = found.facts;
    facts.text(kLevel, host.line(directory + "/level"));
    facts.text(kState, host.line(directory + "/array_state"));
    facts.number(kSize, block::sizeOf(host, found.name));
    facts.number(kDisks, host.number(directory + "/raid_disks"));
    facts.number(kDegraded, host.number(directory + "/degraded"));
    facts.texts(kMembers, members(host, directory));
    facts.text(kAction, host.line(directory + "/sync_action"));
    const auto progress = host.line(directory + "/sync_completed");
    facts.text(kProgress, progress == "none" ? std::nullopt : progress);
    facts.number(kMismatches, host.number(directory + "/mismatch_cnt"));
}

}  // namespace hardware
