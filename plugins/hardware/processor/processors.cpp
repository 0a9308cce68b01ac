#include "plugins/hardware/processor/processors.h"

#include <algorithm>
#include <array>
#include <map>
#include <set>
#include <string_view>
#include <utility>

namespace hardware {

namespace {

constexpr auto kType = Class::processor;
// Constants of this plug-in have no end: a look that hangs may outlive the program's.
constexpr const char* kAll = "/sys/devices/system/cpu/";

enum : Id {
    kMaker = firstId(kType) + 1,
    kModel,
    kCores,
    kThreads,
    kLevel1Data,
    kLevel1Instructions,
    kLevel2,
    kLevel3,
    kFrequency,
    kTopFrequency,
    kMicrocode,
    kWeaknesses,
};

constexpr Row kRows[] = {
    {kMaker, "Maker", Kind::text, "", "vendor_id or CPU implementer in /proc/cpuinfo", "who made it"},
    {kModel, "Model", Kind::text, "", "model name or CPU part in /proc/cpuinfo", "the model's name"},
    {kCores, "Cores", Kind::number, "",
     "topology/core_cpus_list of each processor in /sys/devices/system/cpu", "cores that are in use"},
    {kThreads, "Threads", Kind::number, "", "processors of the package in /sys/devices/system/cpu",
     "processors that the kernel schedules on"},
    {kLevel1Data, "Level1DataCache", Kind::number, "bytes", "cache/index* in /sys/devices/system/cpu",
     "all first-level data caches together"},
    {kLevel1Instructions, "Level1InstructionCache", Kind::number, "bytes",
     "cache/index* in /sys/devices/system/cpu", "all first-level instruction caches together"},
    {kLevel2, "Level2Cache", Kind::number, "bytes", "cache/index* in /sys/devices/system/cpu",
     "all second-level caches together"},
    {kLevel3, "Level3Cache", Kind::number, "bytes", "cache/index* in /sys/devices/system/cpu",
     "all third-level caches together"},
    {kFrequency, "Frequency", Kind::number, "kilohertz",
     "cpufreq/scaling_cur_freq, else cpu MHz in /proc/cpuinfo", "how fast its first processor runs now",
     kLive},
    {kTopFrequency, "TopFrequency", Kind::number, "kilohertz", "cpufreq/cpuinfo_max_freq",
     "how fast it can run"},
    {kMicrocode, "Microcode", Kind::text, "", "microcode in /proc/cpuinfo", "version of its microcode"},
    {kWeaknesses, "Weaknesses", Kind::texts, "", "/sys/devices/system/cpu/vulnerabilities",
     "known weaknesses that it has, and what the kernel does about them"},
};

/// Where the kernel tells of a processor, by its number.
std::string placeOf(const std::string& processor, const char* file) {
    return kAll + ("cpu" + processor) + file;
}

/// The sections of these processors in /proc/cpuinfo, one after the other; where there are none, what stands
/// for all.
std::vector<TextMap> sectionsOf(const Host& host, const std::vector<std::string>& processors) {
    static constexpr std::array<std::string_view, 8> kWanted = {
        "processor", "vendor_id", "model name", "cpu MHz", "microcode", "CPU implementer", "CPU part", "cpu"};
    const std::set<std::string> asked(processors.begin(), processors.end());
    std::vector<TextMap> sections;
    TextMap fields;
    const auto keep = [&] {
        if (fields.contains("processor") && asked.contains(fields["processor"])) {
            sections.push_back(fields);
        }
    };
    for (const std::string& line : host.lines("/proc/cpuinfo")) {
        const std::size_t colon = std::min(line.find(':'), line.size());
        const std::string key = trimmed(line.substr(0, colon));
        if (std::ranges::find(kWanted, key) == kWanted.end()) {
            continue;
        }
        if (key == "processor") {
            keep();
            fields.clear();
        }
        fields[key] = printable(trimmed(line.substr(std::min(colon + 1, line.size()))));
    }
    keep();
    return sections.empty() ? std::vector{fields} : sections;
}

/// The package of a processor that is in use; nothing for others. Where the kernel knows no packages, there
/// is one.
std::optional<std::string> packageOf(const Host& host, const std::string& name) {
    const bool processor = name.starts_with("cpu") && asNumber(name.substr(3));
    if (!processor || host.flag(kAll + name + "/online") == false) {
        return std::nullopt;
    }
    const std::string package = host.line(kAll + name + "/topology/physical_package_id").value_or("0");
    return package.starts_with('-') ? "0" : package;
}

/// The processors of a package, by their numbers.
std::vector<std::string> processorsOf(const Host& host, const std::string& package) {
    std::vector<std::string> numbers;
    for (const std::string& name : host.entries(kAll)) {
        if (packageOf(host, name) == package) {
            numbers.push_back(name.substr(3));
        }
    }
    return numbers;
}

/// Of each core its first processor.
std::vector<std::string> coresOf(const Host& host, const std::vector<std::string>& processors) {
    std::set<std::string> known;
    std::vector<std::string> cores;
    for (const std::string& number : processors) {
        const std::string topology = placeOf(number, "/topology/");
        const auto siblings = host.line(topology + "core_cpus_list");
        if (known.insert(siblings ? *siblings : host.line(topology + "thread_siblings_list").value_or(number))
                .second) {
            cores.push_back(number);
        }
    }
    return cores;
}

/// "32K", in bytes.
std::optional<unsigned long long> cacheSize(const std::string& text) {
    const auto size = text.ends_with("K") ? asNumber(text.substr(0, text.size() - 1)) : std::nullopt;
    return size ? std::optional(*size * 1024) : std::nullopt;
}

/// Sizes by property; a cache that several cores share counts once.
std::map<Id, unsigned long long> cachesOf(const Host& host, const std::vector<std::string>& cores) {
    using Sort = std::pair<std::string_view, Id>;
    static constexpr std::array<Sort, 4> kSorts = {{{"1Data", kLevel1Data},
                                                    {"1Instruction", kLevel1Instructions},
                                                    {"2Unified", kLevel2},
                                                    {"3Unified", kLevel3}}};
    std::map<Id, unsigned long long> sizes;
    std::set<std::string> counted;
    for (const std::string& number : cores) {
        const std::string caches = placeOf(number, "/cache/");
        for (const std::string& index : host.entries(caches)) {
            const std::string cache = caches + index + "/";
            const auto* const sort = std::ranges::find(
                kSorts, host.line(cache + "level").value_or("") + host.line(cache + "type").value_or(""),
                &Sort::first);
            const auto size = cacheSize(host.line(cache + "size").value_or(""));
            const std::string shared = host.line(cache + "shared_cpu_list").value_or(number);
            if (sort != kSorts.end() && size &&
                counted.insert(std::string(sort->first) + " " + shared).second) {
                sizes[sort->second] += *size;
            }
        }
    }
    return sizes;
}

/// "2100.000" megahertz, in kilohertz.
std::optional<unsigned long long> kilohertz(const std::optional<std::string>& megahertz) {
    if (!megahertz) {
        return std::nullopt;
    }
    const std::size_t point = std::min(megahertz->find('.'), megahertz->size());
    std::string fraction = point < megahertz->size() ? megahertz->substr(point + 1) : "";
    fraction.resize(3, '0');
    return asNumber(megahertz->substr(0, point) + fraction);
}

struct Part {
    const char* implementer;
    const char* part;
    const char* name;
};

// 64-bit ARM kernels tell numbers only; those of the servers and boards that are met.
constexpr Part kParts[] = {
    {"0x41", "0xb76", "ARM1176"},     {"0x41", "0xc07", "Cortex-A7"},   {"0x41", "0xd03", "Cortex-A53"},
    {"0x41", "0xd05", "Cortex-A55"},  {"0x41", "0xd07", "Cortex-A57"},  {"0x41", "0xd08", "Cortex-A72"},
    {"0x41", "0xd0b", "Cortex-A76"},  {"0x41", "0xd0c", "Neoverse-N1"}, {"0x41", "0xd40", "Neoverse-V1"},
    {"0x41", "0xd49", "Neoverse-N2"}, {"0x41", "0xd4f", "Neoverse-V2"}, {"0xc0", "0xac3", "Ampere-1"},
};

// Those who make processors after the same architecture.
constexpr std::array<std::pair<const char*, const char*>, 10> kImplementers = {{{"0x41", "ARM"},
                                                                                {"0x42", "Broadcom"},
                                                                                {"0x43", "Cavium"},
                                                                                {"0x46", "Fujitsu"},
                                                                                {"0x48", "HiSilicon"},
                                                                                {"0x4e", "NVIDIA"},
                                                                                {"0x50", "APM"},
                                                                                {"0x51", "Qualcomm"},
                                                                                {"0x61", "Apple"},
                                                                                {"0xc0", "Ampere"}}};

std::optional<std::string> modelOf(const TextMap& fields) {
    for (const Part& part : kParts) {
        if (textOf(fields, "CPU implementer") == part.implementer &&
            textOf(fields, "CPU part") == part.part) {
            return part.name;
        }
    }
    return firstTold({textOf(fields, "model name"), textOf(fields, "cpu")});  // the latter on PowerPC
}

/// The model; a processor with cores of several kinds is named after all of them.
std::string modelsOf(const std::vector<TextMap>& sections) {
    std::vector<std::string> models;
    for (const TextMap& fields : sections) {
        const std::optional<std::string> model = modelOf(fields);
        if (model && std::find(models.begin(), models.end(), *model) == models.end()) {
            models.push_back(*model);
        }
    }
    std::string text;
    for (const std::string& model : models) {
        text += (text.empty() ? "" : ", ") + model;
    }
    return text;
}

std::optional<std::string> makerOf(const TextMap& fields) {
    const auto implementer = textOf(fields, "CPU implementer");
    const auto known = std::find_if(kImplementers.begin(), kImplementers.end(),
                                    [&](const auto& one) { return implementer == one.first; });
    if (known != kImplementers.end()) {
        return known->second;
    }
    return firstTold({implementer, textOf(fields, "vendor_id")});
}

/// The fastest of them, in kilohertz.
std::optional<unsigned long long> topFrequency(const Host& host, const std::vector<std::string>& cores) {
    std::optional<unsigned long long> top;
    for (const std::string& number : cores) {
        top = std::max(top, host.number(placeOf(number, "/cpufreq/cpuinfo_max_freq")));
    }
    return top;
}

std::vector<std::string> weaknesses(const Host& host) {
    const std::string all = std::string(kAll) + "vulnerabilities/";
    std::vector<std::string> texts;
    for (const std::string& name : host.entries(all)) {
        const auto text = host.line(all + name);
        if (text && *text != "Not affected") {
            texts.push_back(name + ": " + *text);
        }
    }
    return texts;
}

}  // namespace

Rows processorRows() {
    return kRows;
}

std::vector<std::string> listProcessors(const Host& host) {
    std::set<std::string, decltype(&comesBefore)> packages(comesBefore);
    for (const std::string& name : host.entries(kAll)) {
        if (const auto package = packageOf(host, name)) {
            packages.insert(*package);
        }
    }
    return {packages.begin(), packages.end()};
}

void describeProcessor(const Host& host, Found& found) {
    const std::vector<std::string> processors = processorsOf(host, found.name);
    if (processors.empty()) {
        return;
    }
    const std::vector<TextMap> sections = sectionsOf(host, processors);
    const TextMap& first = sections.front();
    const std::vector<std::string> cores = coresOf(host, processors);
    Facts& facts = found.facts;
    facts.text(kMaker, makerOf(first));
    facts.text(kModel, modelsOf(sections));
    facts.number(kCores, cores.size());
    facts.number(kThreads, processors.size());
    for (const auto& [property, size] : cachesOf(host, cores)) {
        facts.number(property, size);
    }
    const auto scaled = host.number(placeOf(processors.front(), "/cpufreq/scaling_cur_freq"));
    facts.number(kFrequency, scaled ? scaled : kilohertz(textOf(first, "cpu MHz")));
    facts.number(kTopFrequency, topFrequency(host, cores));
    facts.text(kMicrocode, textOf(first, "microcode"));
    facts.texts(kWeaknesses, weaknesses(host));
}

}  // namespace hardware
