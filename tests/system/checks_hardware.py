"""The second plug-in's drives, arrays and mappings, against lsblk in the same guest. A machine of its own: drives whose
commands have a time limit want a clock that waits for them."""

import json

from guest import by_id
from machine import HARDWARE_DRIVES
from tap import check, expect, expect_equal

DRIVE, PARTITION, FILE_SYSTEM, ARRAY, MAPPING = 305, 306, 307, 308, 309
MACHINE = "hardware"
OWN_VERSION = {"nvme0n1": "firmware_rev", "mmcblk0": "fwrev"}  # drives whose firmware is as old as QEMU says
SETUP = r"""
set -e
while read -r module; do insmod /lib/modules/$module.ko || exit 1; done < /lib/modules/order-hardware
i=0; until [ -e /dev/nvme0n1 ] && [ -e /dev/sdc ] && [ -e /dev/mmcblk0 ] && [ -e /dev/vdc ]; do
  sleep 1; i=$((i + 1)); [ $i -lt 60 ] || { ls /dev; dmesg | tail -40; exit 1; }
done
printf 'n\np\n1\n2048\n65535\nn\np\n2\n65536\n\nw\n' | fdisk -u /dev/sdc > /dev/null 2>&1 || true
mkswap -L 'swap area' /dev/nvme0n1 > /dev/null
echo md5 > /sys/module/md_mod/parameters/new_array
cd /sys/block/md5/md
echo raid1 > level; echo 2 > raid_disks; echo 16384 > component_size
for disk in vda vdb; do cat /sys/block/$disk/dev > new_dev; done
slot=0
for member in dev-vda dev-vdb; do
  echo 16384 > $member/size; echo $slot > $member/slot; slot=$((slot + 1))
done
echo active > array_state || { dmesg | tail -20; exit 1; } >&2
dmsetup create --noudevsync an-example --table '0 16384 linear /dev/vdc 0'
"""


def load(context):
    """The plug-in's nodes by class and name, and lsblk's rows by name."""
    if context.tree is None:
        expect(not context.alone, "the drives could not be made ready")
        context.alone = True
        context.guest.sh(SETUP)
        context.tree = look(context)
    return context.tree


def look(context):
    nodes = context.guest.cvagent("--plugin", plugin(context), "tree")["nodes"]
    listing = json.loads(context.guest.sh("lsblk --json --bytes --output-all --list"))["blockdevices"]
    return ({(node["type"], by_id(node)[node["type"] * 100]): by_id(node) for node in nodes
             if DRIVE <= node["type"] <= MAPPING}, {row["kname"]: row for row in listing})


def plugin(context):
    return context.guest.sh("find /usr/lib -name libcorvistahardware.so.1").strip()


def names(nodes, kind):
    return sorted(name for type_, name in nodes if type_ == kind)


def rows(listing, *types):
    return sorted(name for name, row in listing.items() if row["type"] in types)


@check("hardware: the drives of every kind are those of lsblk", MACHINE)
def drives(context):
    nodes, listing = load(context)
    expect_equal("drives", names(nodes, DRIVE), rows(listing, "disk"))
    for name in names(nodes, DRIVE):
        values, row = nodes[DRIVE, name], listing[name]
        expect_equal(f"{name}: size, blocks, turning, removable, read-only",
                     tuple(values[30500 + number] for number in (7, 8, 9, 10, 11, 12)),
                     (row["size"], row["log-sec"], row["phy-sec"], row["rota"], row["rm"], row["ro"]))
        if row["tran"]:
            expect_equal(f"{name}: transport", values[30501], row["tran"])


@check("hardware: models, serial numbers and versions are those the machine was given", MACHINE)
def identity(context):
    nodes, _ = load(context)
    for name, (model, serial, firmware, _) in HARDWARE_DRIVES.items():
        values = nodes[DRIVE, name]
        if name in OWN_VERSION:
            firmware = context.guest.read(f"/sys/block/{name}/device/{OWN_VERSION[name]}").strip()
        expect_equal(f"{name}: model, serial number, firmware",
                     (values.get(30503), values.get(30504), values.get(30505)), (model, serial, firmware))


@check("hardware: partitions and what lies on drives are those of lsblk", MACHINE)
def contents(context):
    nodes, listing = load(context)
    expect_equal("partitions", names(nodes, PARTITION), rows(listing, "part"))
    expect({"sda1", "sdc1", "sdc2"} <= set(names(nodes, PARTITION)), f"partitions {names(nodes, PARTITION)}")
    for name in names(nodes, PARTITION):
        values, row = nodes[PARTITION, name], listing[name]
        expect_equal(f"{name}: size, start", (values[30603], values[30602]),
                     (row["size"], int(context.guest.read(f"/sys/class/block/{name}/start")) * 512))
    expect_equal("file systems", names(nodes, FILE_SYSTEM), ["nvme0n1"])
    values = nodes[FILE_SYSTEM, "nvme0n1"]
    told = dict(line.split("=", 1) for line in context.guest.sh("blkid -p -o export /dev/nvme0n1").splitlines())
    expect_equal("type, label, UUID", (values.get(30701), values.get(30702), values.get(30703)),
                 ("swap", "swap area", told["UUID"]))


@check("hardware: the array and the mapping are the kernel's", MACHINE)
def built_of_others(context):
    nodes, listing = load(context)
    expect_equal("arrays", names(nodes, ARRAY), ["md5"])
    values = nodes[ARRAY, "md5"]
    expect_equal("level, size, disks, missing", (values[30801], values[30803], values[30804], values[30805]),
                 ("raid1", listing["md5"]["size"], 2, 0))
    expect_equal("members", [member.split(":")[0] for member in values[30806]], ["vda", "vdb"])
    expect_equal("mappings", names(nodes, MAPPING), ["dm-0"])
    values = nodes[MAPPING, "dm-0"]
    told = context.guest.sh("dmsetup info --columns --noheadings -o name; cat /sys/block/dm-0/size").split()
    expect_equal("name, members", (values[30901], values[30905]), (told[0], ["vdc"]))
    expect_equal("size", values[30903], int(told[-1]) * 512)


@check("hardware: NVMe and SATA drives tell their health", MACHINE)
def health(context):
    nodes, _ = load(context)
    nvme, sata = nodes[DRIVE, "nvme0n1"], nodes[DRIVE, "sdc"]
    expect_equal("SATA: power state", sata.get(30518), "active")
    expect(0 < sata.get(30519, 0) < 100, f"SATA: temperature {sata.get(30519)}")
    expect(0 < nvme.get(30519, 0) < 100, f"NVMe: temperature {nvme.get(30519)}")
    for what, number in (("worn", 30520), ("spare", 30521), ("hours", 30522)):
        expect(number in nvme, f"NVMe: {what} is not told")
    expect_equal("SATA: hours told", 30522 in sata, True)


@check("hardware: a drive that hangs costs what only it knows, and holds nothing up", MACHINE)
def hanging(context):
    before, _ = load(context)
    context.machine.slow_down("sdc", 100)
    try:
        # The first piece is read at once, the second one when the first is paid for. Its commands follow one another.
        context.guest.sh("dd if=/dev/sdc of=/dev/null bs=4096 count=2 iflag=direct > /dev/null 2>&1 & sleep 0.5")
        start = float(context.guest.read("/proc/uptime").split()[0])
        node = context.guest.cvagent("--plugin", plugin(context), "get", "drive:sdc", status=1)
        took = float(context.guest.read("/proc/uptime").split()[0]) - start
        expect("dd" in context.guest.sh("ps -e -o comm"), "the drive did not hang for long enough")
    finally:
        context.machine.slow_down("sdc", 0)
    rows = {int(number): row for number, row in node["properties"].items()}
    expect(took < 8, f"it took {took:.1f} s")
    for number in (30507, 30503, 30504):
        expect_equal(f"what the kernel knows: {number}", rows[number].get("value"), before[DRIVE, "sdc"][number])
    for number in (30518, 30519, 30522):
        expect("value" not in rows[number] and "did not answer in time" in json.dumps(rows[number]),
               f"what only the drive knows: {number} {rows[number]}")
    context.guest.sh("while pidof dd > /dev/null; do sleep 0.1; done")
    nodes, _ = look(context)
    expect_equal("it answers again", nodes[DRIVE, "sdc"].get(30518), "active")


@check("hardware: a drive whose reads all fail is shown as it is", MACHINE)
def failing(context):
    load(context)
    context.machine.add_disk("sdd", 16, broken=True)
    context.guest.sh("i=0; until [ -e /dev/sdd ]; do sleep 0.2; i=$((i + 1)); [ $i -lt 100 ]; done")
    context.guest.sh("! dd if=/dev/sdd of=/dev/null bs=4096 count=1 iflag=direct 2> /dev/null")
    nodes, listing = look(context)
    values = nodes[DRIVE, "sdd"]
    expect_equal("size", values[30507], listing["sdd"]["size"])
    counted = int(context.guest.read("/sys/block/sdd/device/ioerr_cnt"), 16)
    expect(counted > 0, "the kernel counts no errors")
    expect_equal("errors", values[30517], counted)
    expect_equal("the others", sorted(set(names(nodes, DRIVE)) - {"sdd"}), names(context.tree[0], DRIVE))
