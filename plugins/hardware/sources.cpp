#include "plugins/hardware/sources.h"

#include <algorithm>

#include "plugins/hardware/memory/memory.h"
#include "plugins/hardware/network/links.h"
#include "plugins/hardware/processor/processors.h"
#include "plugins/hardware/sensor/sensors.h"
#include "plugins/hardware/storage/storage.h"
#include "plugins/hardware/system/system.h"

namespace hardware {

namespace {

constexpr ClassRow kClasses[] = {
    {Class::hardware, "hardware", false},
    {Class::system, "system", false, "Maker Model VirtualKind"},
    {Class::memory, "memory", false, "TotalMemory"},
    {Class::memoryModule, "memory-module", true, "Size MemoryType"},
    {Class::processor, "cpu", true, "Model"},
    {Class::drive, "drive", true, "Model Size"},
    {Class::partition, "drive-part", true, "Size Label"},
    {Class::fileSystem, "file-system", true, "FileSystemType Size MountPoints"},
    {Class::array, "array", true, "Level State Size"},
    {Class::mapping, "mapping", true, "MappingName MappingKind Size"},
    {Class::link, "link", true, "State Speed"},
    {Class::sensor, "sensor", true, "Label Temperature FanSpeed Voltage Current Power Energy Humidity"},
};

constexpr Row nameRow(Class type) {
    return {firstId(type), "Name", Kind::text, "", "the kernel", "what it is called"};
}

const Source kSources[] = {
    {Class::system, systemRows(), listSystem, describeSystem, ""},
    {Class::memory, memoryRows(), listMemory, describeMemory, "memory"},
    {Class::memoryModule, memoryModuleRows(), listMemoryModules, describeMemoryModule, ""},
    {Class::processor, processorRows(), listProcessors, describeProcessor, "cpu"},
    {Class::drive, driveRows(), listDrives, describeDrive, "block"},
    {Class::array, arrayRows(), listArrays, describeArray, "block"},
    {Class::mapping, mappingRows(), listMappings, describeMapping, "block"},
    {Class::partition, partitionRows(), listPartitions, describePartition, "block"},
    {Class::fileSystem, fileSystemRows(), listFileSystems, describeFileSystem, "block"},
    {Class::link, linkRows(), listLinks, describeLink, "net"},
    {Class::sensor, sensorRows(), listSensors, describeSensor, "hwmon", chipOf},
};

}  // namespace

std::span<const ClassRow> classes() {
    return kClasses;
}

const ClassRow& classRow(Class type) {
    return *std::ranges::find(kClasses, type, &ClassRow::type);
}

std::span<const Source> sources() {
    return kSources;
}

std::vector<Row> allRows() {
    std::vector<Row> all;
    for (const Source& source : sources()) {
        if (classRow(source.type).several) {
            all.push_back(nameRow(source.type));
        }
        all.insert(all.end(), source.rows.begin(), source.rows.end());
    }
    return all;
}

}  // namespace hardware
