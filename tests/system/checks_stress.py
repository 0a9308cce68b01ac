"""The monitors over a long time, on a machine of their own: this takes as long as all the other checks together."""

from guest import EVENTS, LOG
from tap import check, expect, expect_equal

ONLINE, OFFLINE = "NIC is Online ", "NIC is Offline "

FLAPS, DISK_CHANGES, WARM_UP = 200, 50, 24
FLAT_MEMORY = 256  # KiB


def flap(context, number):
    """Pulls or plugs eth1's cable and waits until that has been reported."""
    context.machine.cable(1, number % 2 == 1)
    script = (f"i=0; until [ $(grep -c '\"alert\".*:eth1\"' {EVENTS}) -gt {number} ]; do "
              f"sleep 5; i=$((i + 1)); [ $i -lt 60 ] || exit 1; done; : > {LOG}")
    expect(context.machine.run(script).status == 0, f"link change {number + 1} was not reported")
    if number % 50 == 49:
        print(f"# {number + 1} of {FLAPS} link changes", flush=True)


def change_disks(context, number):
    """Adds a disk or removes it, often enough apart for the monitor to see each change."""
    step = FLAPS // DISK_CHANGES
    if number % (2 * step) == 0:
        context.machine.add_disk("sdc", 16)
    elif number % (2 * step) == step:
        context.machine.remove_disk("sdc")


def expect_flat(before, after):
    memory = after[0] - before[0]
    expect(memory <= FLAT_MEMORY, f"resident memory grew by {memory} KiB, from {before[0]}")
    expect_equal("descriptors, threads", after[1:], before[1:])


@check(f"stress: {FLAPS} link changes and {DISK_CHANGES} disk changes are each reported once, with flat memory, "
       "descriptors and threads", machine="stress")
def stress(context):
    watch = context.watch
    watch.start()
    watch.disk_passes(2)
    watch.forget_events()
    for number in range(FLAPS):
        change_disks(context, number)
        flap(context, number)
        if number == WARM_UP:
            before = watch.usage()
    watch.disk_passes(2)
    expect_flat(before, watch.usage())
    events = watch.events()
    links = [event["message"] for event in events if event["path"].endswith(":eth1")]
    expect_equal("alerts of eth1", links, [OFFLINE, ONLINE] * (FLAPS // 2))
    drives = [event for event in events if event["event"] == "published" and event["class"] == "hard-drive"]
    expect_equal("drives published", len(drives), DISK_CHANGES // 2 * (3 + 2))
