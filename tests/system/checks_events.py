"""What a running agent reports when cables, links and disks change."""

from guest import by_id
from tap import check, expect, expect_equal

ONLINE, OFFLINE = "NIC is Online ", "NIC is Offline "
OVER, BACK = "NIC has Switched Over ", "NIC has Switched Back "


def device_names(events, event, kind):
    return sorted(row["path"].rsplit(":", 1)[1] for row in events if (row["event"], row["class"]) == (event, kind))


def expect_rebuilt(context, kind, before, after):
    """Every old node of the class withdrawn, every new one published, once each."""
    events = [event for event in context.watch.events() if event["event"] != "alert"]
    expect_equal(f"withdrawn {kind}", device_names(events, "withdrawn", kind), sorted(before))
    expect_equal(f"published {kind}", device_names(events, "published", kind), sorted(after))


@check("watch: an agent that starts with nothing changed reports nothing")
def quiet_start(context):
    context.watch.start()
    context.watch.passes(2)
    expect_equal("alerts", context.watch.alerts(), [])


@check('cable: pulling one gives "NIC is Offline " once, for the port and the VLAN on it')
def cable_pulled(context):
    watch = context.watch
    watch.forget_events()
    context.machine.cable(1, False)
    watch.wait_alert(OFFLINE, 2)
    watch.passes(2)
    expect_equal("alerts", sorted(watch.alerts()),
                 [("network-port:eth1", OFFLINE), ("network-port:eth1.10", OFFLINE)])


@check("cable: while it is out, the port reads as down and without speed")
def cable_out(context):
    node = by_id(context.guest.cvagent("get", "network-port:eth1", "LinkState", "LinkSpeed", "FullDuplex"))
    expect_equal("link state, speed, full duplex", (node[123], node[57], node[82]), (12, 0, False))


@check('cable: plugging it in gives "NIC is Online " once, for the port and the VLAN on it')
def cable_plugged(context):
    watch = context.watch
    watch.forget_events()
    context.machine.cable(1, True)
    watch.wait_alert(ONLINE, 2)
    watch.passes(2)
    expect_equal("alerts", sorted(watch.alerts()),
                 [("network-port:eth1", ONLINE), ("network-port:eth1.10", ONLINE)])
    codes = [event["codes"] for event in watch.events() if event["event"] == "alert"]
    expect_equal("codes", codes, [{"first": 3, "second": 0, "event": 1}] * 2)


@check('bond: pulling the active member\'s cable gives "NIC has Switched Over ", the members nothing')
def switched_over(context):
    watch = context.watch
    watch.forget_events()
    context.machine.cable(2, False)
    watch.wait_alert(OVER)
    watch.passes(2)
    active = context.guest.read("/sys/class/net/bond0/bonding/active_slave").strip()
    expect_equal("active member", active, "eth3")
    # The state "switched over" lasts one pass; the bond is found up again by the next.
    expect_equal("alerts", watch.alerts(), [("ip-config:bond0", OVER), ("ip-config:bond0", ONLINE)])


@check("bond: the team's members read as the bonding driver has them")
def member_state(context):
    node = by_id(context.guest.cvagent("get", "network-port:eth2", "IsActiveMember", "MemberLinkStatus",
                                       "MemberLinkFailures", "TeamName"))
    expect_equal("active, status, failures, team", (node[194], node[195], node[196], node[199]),
                 (False, "down", 1, "bond0"))


@check('bond: plugging it in again gives "NIC has Switched Back ", the members nothing')
def switched_back(context):
    watch = context.watch
    watch.forget_events()
    context.machine.cable(2, True)
    watch.wait_alert(BACK)
    watch.passes(2)
    active = context.guest.read("/sys/class/net/bond0/bonding/active_slave").strip()
    expect_equal("active member", active, "eth2")
    expect_equal("alerts", watch.alerts(), [("ip-config:bond0", BACK), ("ip-config:bond0", ONLINE)])


@check("disks: the first look publishes the drives and partitions anew, the next ones nothing")
def first_look(context):
    context.watch.wait_log("Partition Check Sum found Different")
    context.watch.forget_events()
    context.watch.disk_passes(2)
    expect_equal("events", context.watch.events(), [])


@check("disks: an added disk rebuilds the drives and leaves the partitions")
def disk_added(context):
    context.watch.forget_events()
    context.machine.add_disk("sdc", 32)
    context.watch.wait_log("Hard Drive Check Sum found Different", 2)
    context.watch.disk_passes(2)
    expect_rebuilt(context, "hard-drive", ["sda", "sdb"], ["sda", "sdb", "sdc"])
    expect_rebuilt(context, "partition", [], [])


@check("disks: a new partition rebuilds the partitions and leaves the drives")
def partition_added(context):
    context.watch.forget_events()
    context.guest.sh("printf 'n\\np\\n3\\n\\n\\nw\\n' | fdisk /dev/sdc > /dev/null 2>&1; grep sdc3 /proc/partitions")
    context.watch.wait_log("Partition Check Sum found Different", 2)
    context.watch.disk_passes(2)
    events = context.watch.events()
    expect_equal("withdrawn partitions", device_names(events, "withdrawn", "partition"), ["sda1", "sda2"])
    expect_equal("published partitions", device_names(events, "published", "partition"), ["sda1", "sda2", "sdc3"])


@check("disks: a removed disk takes its drive and its partitions along")
def disk_removed(context):
    context.watch.forget_events()
    context.machine.remove_disk("sdc")
    context.watch.wait_log("Partition Check Sum found Different", 3)
    context.watch.disk_passes(2)
    expect_rebuilt(context, "hard-drive", ["sda", "sdb", "sdc"], ["sda", "sdb"])
    expect_rebuilt(context, "partition", ["sda1", "sda2", "sdc3"], ["sda1", "sda2"])


@check("restart: stopping the agent ends its threads and removes its files")
def stop(context):
    context.watch.stop()
    listing = context.guest.sh("ls /tmp/fdisk_tmp /opt/vantrel/corvista/data/ifcfg-* 2> /dev/null; true")
    expect_equal("files left", listing, "")
    state = context.guest.read("/opt/vantrel/corvista/data/oshwminetind.dat").split()
    expect(set(state) >= {"eth0=1", "eth1=1", "bond0=1"}, f"states kept: {state}")


@check("restart: a change while the agent was stopped is reported once at the next start")
def change_while_stopped(context):
    context.machine.cable(1, False)
    context.watch.start()
    context.watch.wait_alert(OFFLINE, 2)
    context.watch.passes(2)
    expect_equal("alerts", sorted(context.watch.alerts()),
                 [("network-port:eth1", OFFLINE), ("network-port:eth1.10", OFFLINE)])
    context.watch.stop()


@check("restart: a restart with nothing changed reports nothing")
def nothing_changed(context):
    context.watch.start()
    context.watch.passes(2)
    expect_equal("alerts", context.watch.alerts(), [])
    context.watch.stop()
    context.machine.cable(1, True)
