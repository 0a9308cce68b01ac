#include <blkid/blkid.h>

#include <array>
#include <memory>

#include "plugins/hardware/host.h"
#include "plugins/hardware/library_function.h"
#include "plugins/hardware/storage/own_devices.h"

namespace hardware {

namespace {

/// The functions of libblkid that are used here. It is loaded when it is first needed: a host without it only
/// lacks what it alone knows.
struct Library {
    decltype(&blkid_new_probe) makeProbe = nullptr;
    decltype(&blkid_free_probe) freeProbe = nullptr;
    decltype(&blkid_probe_set_device) setDevice = nullptr;
    decltype(&blkid_probe_enable_superblocks) enable = nullptr;
    decltype(&blkid_probe_set_superblocks_flags) setFlags = nullptr;
    decltype(&blkid_do_safeprobe) probe = nullptr;
    decltype(&blkid_probe_lookup_value) value = nullptr;
    bool whole = false;
};

Library load() {
    Library found;
    void* const library = dlopen("libblkid.so.1", RTLD_NOW | RTLD_LOCAL);
    found.whole = findFunction(library, "blkid_new_probe", found.makeProbe) &&
                  findFunction(library, "blkid_free_probe", found.freeProbe) &&
                  findFunction(library, "blkid_probe_set_device", found.setDevice) &&
                  findFunction(library, "blkid_probe_enable_superblocks", found.enable) &&
                  findFunction(library, "blkid_probe_set_superblocks_flags", found.setFlags) &&
                  findFunction(library, "blkid_do_safeprobe", found.probe) &&
                  findFunction(library, "blkid_probe_lookup_value", found.value);
    return found;
}

}  // namespace

DeviceAccess::Contents probe(int descriptor) {
    static const Library library = load();
    DeviceAccess::Contents contents;
    if (!library.whole) {
        return contents;
    }
    const std::unique_ptr<std::remove_pointer_t<blkid_probe>, decltype(library.freeProbe)> probe(
        library.makeProbe(), library.freeProbe);
    const bool found = probe != nullptr && library.setDevice(probe.get(), descriptor, 0, 0) == 0 &&
                       library.enable(probe.get(), 1) == 0 &&
                       library.setFlags(probe.get(), BLKID_SUBLKS_TYPE | BLKID_SUBLKS_USAGE |
                                                         BLKID_SUBLKS_LABEL | BLKID_SUBLKS_UUID) == 0 &&
                       library.probe(probe.get()) == 0;
    for (const char* const key : {"TYPE", "USAGE", "LABEL", "UUID"}) {
        const char* text = nullptr;
        if (found && library.value(probe.get(), key, &text, nullptr) == 0 && text != nullptr) {
            contents[key] = printable(trimmed(text));
        }
    }
    return contents;
}

}  // namespace hardware
