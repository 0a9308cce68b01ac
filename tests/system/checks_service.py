"""The 32-bit service on the guest's system bus, asked and used by the command line."""

import json
import shlex

from guest import EVENTS, by_id
from tap import check, expect, expect_equal

MACHINE = "service"
CHANGES_ITSELF = {"AvailableMemory", "CurrentTime", "FreeSwap", "ReadBytes", "Reads", "ReceivedBytes", "ReceivedPackets", "SentBytes",
                  "SentPackets", "WrittenBytes", "Writes"}


def client(context, *words):
    """One run of cvagent that asks the service; it has no data directory of its own, which the service holds."""
    return context.guest.sh(shlex.join(["cvagent", *words]))


def facts(nodes):
    return {(node["path"], row["name"]): row.get("value") for node in nodes for row in node["properties"].values()
            if row["name"] not in CHANGES_ITSELF}


@check("service: it starts on the system's bus", MACHINE)
def starts(context):
    context.guest.sh("mkdir -p /run/dbus; dbus-daemon --config-file=/etc/dbus-1/system.conf --nopidfile --fork")
    context.guest.sh("cvagentd 2> /run/service.err & echo $! > /run/service.pid")
    context.guest.wait_for_text("/run/service.err", "nodes on the bus")


@check("service: the tree it tells is the tree that the command line finds by itself", MACHINE)
def same_tree(context):
    served = json.loads(client(context, "tree", "--json"))["nodes"]
    alone = context.guest.cvagent("--bus", "none", "tree")["nodes"]
    expect_equal("nodes", [node["path"] for node in served], [node["path"] for node in alone])
    one, other = facts(served), facts(alone)
    expect(len(one) > 100, f"only {len(one)} facts")
    expect_equal("facts that differ", [(key, one.get(key), other[key]) for key in other if one.get(key) != other[key]], [])


def unlike(context):
    """Where what the service tells and what the command line finds by itself are not the same."""
    served = json.loads(client(context, "tree", "--json"))["nodes"]
    alone = context.guest.cvagent("--bus", "none", "tree")["nodes"]
    paths = {node["path"] for node in served} ^ {node["path"] for node in alone}
    one, other = facts(served), facts(alone)
    return sorted(paths) or [(key, one.get(key), other[key]) for key in other if one.get(key) != other[key]]


@check("service: a value that is set through it is in the guest's files, and in what it tells", MACHINE)
def set_through(context):
    client(context, "set", "ip-config:eth0", "DNSServers", "192.0.2.53", "2001:db8::53")
    lines = context.guest.read("/etc/resolv.conf").splitlines()
    expect_equal("name servers", [line for line in lines if line.startswith("nameserver")],
                 ["nameserver 192.0.2.53", "nameserver 2001:db8::53"])
    node = json.loads(client(context, "get", "ip-config:eth0", "DNSServers", "--json"))
    expect_equal("told", by_id(node)[94], ["192.0.2.53", "2001:db8::53"])
    expect("DNSServers" in client(context, "history"), "it is not in the history")


@check("service: a cable that is pulled is told to who watches", MACHINE)
def watched(context):
    context.guest.sh(f"cvagent watch --json > {EVENTS} 2> /run/watch.err & echo $! > /run/watch.pid")
    context.guest.wait_for_text("/run/watch.err", "watching")
    context.machine.cable(1, False)
    context.guest.wait_for_text(EVENTS, '"NIC is Offline "')
    context.machine.cable(1, True)
    context.guest.wait_for_text(EVENTS, '"NIC is Online "')
    context.guest.sh("kill $(cat /run/watch.pid)")


@check("service: a VLAN and a bond that come, and go, come and go in what it tells", MACHINE)
def links_come_and_go(context):
    member = context.guest.read("/sys/class/net/bond0/bonding/slaves").split()[-1]
    for change, node, comes in [
            ("ip link add link eth0 name eth0.30 type vlan id 30; ip link set eth0.30 up", "ip-config:eth0.30", True),
            ("ip link add bond7 type bond; "
             f"ip link set {member} down; ip link set {member} master bond7; ip link set bond7 up", "/team:bond7", True),
            ("ip link delete bond7", "/team:bond7", False),
            ("ip link delete eth0.30", "ip-config:eth0.30", False)]:
        context.guest.sh(change)
        different = None
        for _ in range(30):
            different = unlike(context)
            if not different:
                break
            context.guest.sleep(1)
        expect_equal(f"differences after: {change}", different, [])
        expect_equal(f"{node} is there after: {change}", node in client(context, "tree", "--json"), comes)


@check("service: it ends at SIGTERM, and the command line works by itself", MACHINE)
def ends(context):
    context.guest.sh("kill $(cat /run/service.pid); i=0; while [ -d /proc/$(cat /run/service.pid) ]; do sleep 1; "
                     "i=$((i + 1)); [ $i -lt 60 ]; done")
    expect("/oshw/root/computer" in client(context, "tree", "--json"), "no tree without the service")
