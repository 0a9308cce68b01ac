#include <algorithm>
#include <iterator>

#include "hosttools/partition_table.h"

namespace hosttools {
namespace {

struct TypeName {
    std::uint8_t type;
    std::string_view name;
};

constexpr TypeName typeNames[] = {
    {0x00, "Empty"},
    {0x01, "FAT12"},
    {0x04, "FAT16 <32M"},
    {0x05, "Extended"},
    {0x06, "FAT16"},
    {0x07, "HPFS/NTFS"},
    {0x0b, "W95 FAT32"},
    {0x0c, "W95 FAT32 (LBA)"},
    {0x0e, "W95 FAT16 (LBA)"},
    {0x0f, "W95 Ext'd (LBA)"},
    {0x11, "Hidden FAT12"},
    {0x14, "Hidden FAT16 <32M"},
    {0x16, "Hidden FAT16"},
    {0x17, "Hidden HPFS/NTFS"},
    {0x1b, "Hidden W95 FAT32"},
    {0x1c, "Hidden W95 FAT32 (LBA)"},
    {0x1e, "Hidden W95 FAT16 (LBA)"},
    {0x27, "Hidden NTFS WinRE"},
    {0x41, "PPC PReP Boot"},
    {0x63, "GNU HURD or SysV"},
    {0x80, "Old Minix"},
    {0x81, "Minix / old Linux"},
    {0x82, "Linux swap / Solaris"},
    {0x83, "Linux"},
    {0x85, "Linux extended"},
    {0x86, "NTFS volume set"},
    {0x87, "NTFS volume set"},
    {0x88, "Linux plaintext"},
    {0x8e, "Linux LVM"},
    {0xa5, "FreeBSD"},
    {0xa6, "OpenBSD"},
    {0xa8, "Darwin UFS"},
    {0xa9, "NetBSD"},
    {0xab, "Darwin boot"},
    {0xaf, "HFS / HFS+"},
    {0xbe, "Solaris boot"},
    {0xbf, "Solaris"},
    {0xda, "Non-FS data"},
    {0xee, "GPT"},
    {0xef, "EFI (FAT-12/16/32)"},
    {0xfb, "VMware VMFS"},
    {0xfc, "VMware VMKCORE"},
    {0xfd, "Linux raid autodetect"},
};
static_assert(std::ranges::is_sorted(typeNames, {}, &TypeName::type));

}  // namespace

std::string_view partitionTypeName(std::uint8_t type) {
    const auto* found = std::ranges::lower_bound(typeNames, type, {}, &TypeName::type);
    return found != std::end(typeNames) && found->type == type ? found->name : "Unknown";
}

}  // namespace hosttools
