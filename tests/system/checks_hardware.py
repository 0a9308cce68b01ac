"""The second plug-in's values against those of lsblk, dmidecode, smartctl and others in the same guest. A machine of its own:
drives whose commands have a time limit want a clock that waits for them."""

import json

from guest import by_id
from machine import HARDWARE_DRIVES
from tap import check, expect, expect_equal

SYSTEM, MEMORY, MODULE, PROCESSOR, DRIVE, PARTITION, FILE_SYSTEM, ARRAY, MAPPING, LINK, SENSOR = range(301, 312)
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
dmsetup create --noudevsync an-example --uuid CRYPT-PLAIN-example --table '0 16384 linear /dev/vdc 0'
mke2fs -L 'a label' /dev/sdb > /dev/null
mkdir -p '/mnt/a place'; mount -t ext4 /dev/sdb '/mnt/a place'
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
    return ({(node["type"], by_id(node).get(node["type"] * 100, "")): by_id(node) for node in nodes},
            {row["kname"]: row for row in listing})


def told(values, *numbers):
    """The values of some properties; None for those that are not told."""
    return tuple(values.get(number) for number in numbers)


def rows_of(text, separator=":"):
    """{key: value} of the lines that have both."""
    pairs = (line.split(separator, 1) for line in text.splitlines() if separator in line)
    return {key.strip(): value.strip() for key, value in pairs}


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
                     told(values, 30507, 30508, 30509, 30510, 30511, 30512),
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
        kernel = rows_of(context.guest.sh(f"blkid -p -o export /dev/{name}"), "=")
        expect_equal(f"{name}: number, start, size, by libblkid", told(values, 30601, 30602, 30603),
                     (int(kernel["PART_ENTRY_NUMBER"]), int(kernel["PART_ENTRY_OFFSET"]) * 512,
                      int(kernel["PART_ENTRY_SIZE"]) * 512))
    expect_equal("file systems", names(nodes, FILE_SYSTEM), ["nvme0n1", "sdb"])
    for name in names(nodes, FILE_SYSTEM):
        values = nodes[FILE_SYSTEM, name]
        blkid = rows_of(context.guest.sh(f"blkid -p -o export /dev/{name} | tr -d '\\\\'"), "=")
        expect_equal(f"{name}: label, UUID", told(values, 30702, 30703), (blkid["LABEL"], blkid["UUID"]))
        driver = {"ext2": "ext4"}  # that mounts it
        expect_equal(f"{name}: type", values[30701], driver.get(blkid["TYPE"], blkid["TYPE"]))
    values, row = nodes[FILE_SYSTEM, "sdb"], listing["sdb"]
    expect_equal("mount points, size, free", told(values, 30704, 30705, 30706),
                 (row["mountpoints"], int(row["fssize"]), int(row["fsavail"])))


@check("hardware: the array and the mapping are the kernel's", MACHINE)
def built_of_others(context):
    nodes, listing = load(context)
    expect_equal("arrays", names(nodes, ARRAY), ["md5"])
    values = nodes[ARRAY, "md5"]
    expect_equal("level, size, disks, missing", (values[30801], values[30803], values[30804], values[30805]),
                 ("raid1", listing["md5"]["size"], 2, 0))
    expect_equal("members", [member.split(":")[0] for member in values[30806]], ["vda", "vdb"])
    detail = rows_of(context.guest.sh("mdadm --detail /dev/md5"), " : ")
    expect_equal("level, disks, missing, by mdadm", told(values, 30801, 30804, 30805),
                 (detail["Raid Level"], int(detail["Raid Devices"]),
                  int(detail["Raid Devices"]) - int(detail["Active Devices"])))
    expect_equal("size, by mdadm", values[30803], int(detail["Array Size"].split()[0]) * 1024)
    expect_equal("no resynchronisation, by mdadm", told(values, 30807, 30808) == ("idle", None),
                 "Resync Status" not in detail)
    expect_equal("state, by mdadm", values[30802].split("-")[0], detail["State"].split(",")[0])
    expect_equal("mappings", names(nodes, MAPPING), ["dm-0"])
    values = nodes[MAPPING, "dm-0"]
    kernel = context.guest.sh("dmsetup info --columns --noheadings -o name,blkdevs_used --separator ' '").split()
    expect_equal("name, members", (values[30901], values[30905]), (kernel[0], kernel[1].split(",")))
    expect_equal("size, by dmsetup", values[30903], int(context.guest.sh("dmsetup table an-example").split()[1]) * 512)
    expect_equal("kind, by the UUID that it was made with", values[30902], "encrypted")
    for command, suspended in (("suspend --noflush --nolockfs", True), ("resume", False)):
        context.guest.sh(f"dmsetup {command} --noudevsync an-example")
        state = context.guest.sh("dmsetup info --columns --noheadings -o suspended an-example").strip()
        node = by_id(context.guest.cvagent("--plugin", plugin(context), "get", "mapping:dm-0"))
        expect_equal("suspended", (node[30904], state == "Suspended"), (suspended, suspended))


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
    told_by_smartctl(context, nodes)


def told_by_smartctl(context, nodes):
    """What drives are and how they are, by another reader of the same pages and logs."""
    for name, device in (("nvme0n1", "nvme0"), ("sdc", "sdc"), ("sda", "sda")):
        values = nodes[DRIVE, name]
        other = json.loads(context.guest.machine.run(f"smartctl -j -a -n never /dev/{device}").out)
        expect_equal(f"{name}: serial number", values.get(30504), other.get("serial_number"))
        if name == "sda":
            expect_equal("SCSI: maker, model, firmware", told(values, 30502, 30503, 30505),
                         (other["scsi_vendor"], other["scsi_product"], other["scsi_revision"]))
            continue
        expect_equal(f"{name}: model, firmware", told(values, 30503, 30505),
                     (other["model_name"], other["firmware_version"]))
        expect_equal(f"{name}: temperature, hours", told(values, 30519, 30522),
                     (other["temperature"]["current"], other["power_on_time"]["hours"]))
        expect_equal(f"{name}: warnings", bool(values.get(30523)), not other["smart_status"]["passed"])
        if name == "nvme0n1":
            log = other["nvme_smart_health_information_log"]
            expect_equal("NVMe: worn, spare, media errors", told(values, 30520, 30521, 30524),
                         (log["percentage_used"], log["available_spare"], log["media_errors"]))
        else:
            wwn = other["wwn"]
            expect_equal("SATA: WWN", values.get(30506), f"naa.{wwn['naa']:x}{wwn['oui']:06x}{wwn['id']:09x}")
            expect_equal("SATA: power state", values.get(30518) in ("active", "idle"),
                         "ACTIVE or IDLE" in context.guest.machine.run("smartctl -i -n standby /dev/sdc").out)


@check("hardware: the system and its memory modules are those that dmidecode reads", MACHINE)
def firmware(context):
    nodes, _ = load(context)
    values = nodes[SYSTEM, ""]
    for number, word in ((30101, "system-manufacturer"), (30102, "system-product-name"), (30103, "system-serial-number"),
                         (30104, "system-uuid"), (30105, "bios-version"), (30106, "bios-release-date")):
        expect_equal(word, values.get(number), context.guest.sh(f"dmidecode -s {word}").strip())
    expect_equal("modules", names(nodes, MODULE), ["0"])
    rows = rows_of(context.guest.sh("dmidecode -q -t 17"))
    expect_equal("slot, bank, maker, part, serial number", told(nodes[MODULE, "0"], 30301, 30302, 30306, 30307, 30308),
                 (rows["Locator"], rows["Bank Locator"], rows["Manufacturer"], rows["Part Number"], rows["Serial Number"]))
    expect_equal("size, kind, speed", told(nodes[MODULE, "0"], 30303, 30304, 30305),
                 (int(rows["Size"].split()[0]) << 20, rows["Type"], int(rows["Configured Memory Speed"].split()[0])))


@check("hardware: processors, memory and system are those of lscpu, free and uname", MACHINE)
def system(context):
    nodes, _ = load(context)
    rows = {row["field"]: row["data"] for row in json.loads(context.guest.sh("lscpu -J -B"))["lscpu"]}
    (name,) = names(nodes, PROCESSOR)
    expect_equal("maker, model, cores, threads", told(nodes[PROCESSOR, name], 30401, 30402, 30403, 30404),
                 (rows["Vendor ID:"], rows["Model name:"], int(rows["Core(s) per socket:"]), int(rows["CPU(s):"])))
    values = nodes[SYSTEM, ""]
    expect_equal("virtual", values[30107], "Hypervisor vendor:" in rows or "hypervisor" in rows["Flags:"].split())
    expect_equal("kernel, architecture", told(values, 30110, 30111), tuple(context.guest.sh("uname -rm").split()))
    started = float(context.guest.sh("date +%s")) - float(context.guest.read("/proc/uptime").split()[0])
    expect(abs(values[30109] - started) < 5, f"started at {values[30109]}, by the clock at {started}")
    total = int(context.guest.sh("busybox free -b").splitlines()[1].split()[1])
    expect_equal("memory", nodes[MEMORY, ""][30201], total)


@check("hardware: links are those of ip and ethtool", MACHINE)
def links(context):
    nodes, _ = load(context)
    rows = json.loads(context.guest.sh("ip -j -d link"))
    expect_equal("links", names(nodes, LINK), sorted(row["ifname"] for row in rows))
    for row in rows:
        name = row["ifname"]
        values = nodes[LINK, name]
        expect_equal(f"{name}: index, address, MTU", told(values, 31002, 31003, 31005),
                     (row["ifindex"], row["address"], row["mtu"]))
        if row.get("parentbus") == "pci":
            driver = rows_of(context.guest.sh(f"ethtool -i {name}"), ": ")
            expect_equal(f"{name}: driver, bus address", told(values, 31011, 31013), (driver["driver"], driver["bus-info"]))
            expect_equal(f"{name}: permanent address", values.get(31004),
                         context.guest.sh(f"ethtool -P {name}").split()[-1])
            settings = rows_of(context.guest.sh(f"ethtool {name}"))
            if "Mb/s" in settings["Speed"]:
                expect_equal(f"{name}: speed, duplex", told(values, 31008, 31009),
                             (int(settings["Speed"].removesuffix("Mb/s")), settings["Duplex"].lower()))


@check("hardware: sensors are those of lm-sensors", MACHINE)
def sensors(context):
    nodes, _ = load(context)
    chips = json.loads(context.guest.sh("sensors -j -c /dev/null"))
    theirs = {}
    for chip, features in chips.items():
        for label, rows in features.items():
            if isinstance(rows, dict):
                name = next(iter(rows)).split("_")[0]
                theirs[f"{chip}:{name}"] = (label, *(rows.get(f"{name}_{limit}") for limit in ("input", "min", "max", "crit")))
    expect("nvme-pci" in " ".join(theirs), f"the NVMe drive has no sensor: {theirs}")
    own = {name: told(nodes[SENSOR, name], 31102, 31103, 31110, 31111, 31112) for name in names(nodes, SENSOR) if ":" in name}
    expect_equal("label, temperature, limits", {name: values[:1] + tuple(value and round(value, 3) for value in values[1:])
                                                for name, values in own.items()}, theirs)


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
