// The firmware's tables: every structure and every fact of the modules they list.
#include "plugins/hardware/memory/smbios.h"
#include "tests/fuzz/lines.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string table(data, data + size);
    for (const hardware::SmbiosRecord& record : hardware::readSmbios(table)) {
        for (std::size_t offset = 0; offset < 260; ++offset) {
            const auto text = record.text(offset);
            AGREED(!text || !text->empty());
            AGREED(!record.doubleWord(offset) || record.byte(offset + 3));
            AGREED(!text || text->find('\x1b') == std::string::npos);
        }
    }
    return 0;
}
