"""The tree as it is when the agent starts, against what the guest's kernel says."""

import ipaddress
import re

from guest import by_id
from tap import check, expect, expect_equal

# class, its parent's class, how many
UPPER_LEVELS = [("oshw", None), ("root", "oshw"), ("computer", "root"), ("chassis", "computer"),
                ("planar", "chassis"), ("network-controller", "chassis"), ("disk-controller", "planar")]


def load_tree(context):
    if context.tree is None:
        context.tree = context.guest.cvagent("tree")["nodes"]
    return context.tree


def nodes(context, kind):
    return [node for node in load_tree(context) if node["class"] == kind]


def one(context, kind, name):
    """The node of that class whose path ends in the name."""
    found = [node for node in nodes(context, kind) if node["path"].endswith(f"/{kind}:{name}")]
    expect(len(found) == 1, f"{len(found)} nodes {kind}:{name}")
    return found[0]


def parent_class(context, node):
    return next((other["class"] for other in load_tree(context) if other["id"] == node["parent"]), None)


def sysfs(context, name, *files):
    """Contents of an interface's files in sysfs."""
    script = "; ".join(f"cat /sys/class/net/{name}/{file} 2> /dev/null || echo" for file in files)
    return context.guest.sh(script).split("\n")[:len(files)]


def ethtool(context, name):
    """{label: first word} of what ethtool prints."""
    rows = re.findall(r"^\s*([^:\n]+):\s*(\S+)", context.guest.sh(f"ethtool {name} 2> /dev/null"), re.MULTILINE)
    return dict(rows)


@check("tree: one node of each upper level, each below the right one")
def upper_levels(context):
    for kind, parent in UPPER_LEVELS:
        found = nodes(context, kind)
        expect_equal(f"nodes of class {kind}", len(found), 1)
        expect_equal(f"parent of {kind}", parent_class(context, found[0]), parent)
    expect_equal("host name", by_id(nodes(context, "computer")[0])[108], context.guest.sh("hostname").strip())


@check("tree: doctor finds no fact that the kernel tells otherwise")
def verified(context):
    verdict = context.guest.cvagent("doctor", "--verify")
    expect_equal("differences", verdict["differences"], [])
    expect(verdict["compared"] > 20, f"only {verdict['compared']} facts were compared")


@check("tree: the network ports are the kernel's Ethernet devices and VLANs, without the bridge's member")
def ports(context):
    devices = set(context.guest.names("/sys/class/net/eth*"))
    members = {
        name for name in devices if context.machine.run(f"[ -d /sys/class/net/{name}/brport ]").status == 0}
    expected = sorted(devices - members)
    expect_equal("ports", sorted(by_id(node)[108] for node in nodes(context, "network-port")), expected)
    for node in nodes(context, "network-port"):
        expect_equal(f"parent of {node['path']}", parent_class(context, node), "network-controller")


@check("tree: speed, duplex and link state of every port are sysfs's")
def port_values(context):
    for node in nodes(context, "network-port"):
        values = by_id(node)
        speed, duplex, carrier = sysfs(context, values[108], "speed", "duplex", "carrier")
        expect_equal(f"{values[108]}: speed, full duplex, link state", (values[57], values[82], values[123]),
                     (int(speed) * 1000, duplex == "full", 1 if carrier == "1" else 12))


@check("tree: negotiation, link modes and Wake-on-LAN of the e1000 ports are the driver's")
def port_abilities(context):
    for name in ("eth0", "eth1", "eth2", "eth3"):
        values, driver = by_id(one(context, "network-port", name)), ethtool(context, name)
        mode = driver["Supported link modes"]
        expect_equal(f"{name}: first link mode", mode, "10baseT/Half")
        expect_equal(f"{name}: negotiation, port type, first speed", (values[67], values[185], values[38]),
                     (driver["Auto-negotiation"] == "on", 50, 10))
        wake = [3] if driver["Supports Wake-on"] else []
        expect_equal(f"{name}: Wake-on-LAN supported, configured", (values.get(182), values.get(183)), (wake, wake))


@check("tree: each interface's addresses are those the kernel lists")
def addresses(context):
    for node in nodes(context, "ip-config"):
        values = by_id(node)
        name = values[108]
        four = re.findall(r"inet (\S+)", context.guest.sh(f"ip -4 address show dev {name}"))
        six = re.findall(r"inet6 (\S+) scope global", context.guest.sh(f"ip -6 address show dev {name}"))
        inet = ipaddress.ip_interface(four[0]) if four else None
        mask = str(inet.netmask) if inet else "0.0.0.0"
        if six and not inet:
            mask = ""
        address, _, prefix = six[0].partition("/") if six else ("", "", "0")
        expect_equal(f"{name}: address, mask, IPv6 address, prefix", (values[25], values[26], values[27], values[102]),
                     (str(inet.ip) if inet else mask, mask, address, int(prefix)))


@check("tree: gateways, name servers, suffixes and origin are those of the files and routes")
def routes(context):
    values = by_id(one(context, "ip-config", "eth0"))
    expect_equal("IPv4 gateway, IPv6 gateway", (values[100], values[101]), ("192.0.2.1", "fe80::1"))
    expect_equal("servers, suffixes", (values[94], values[99]), (["192.0.2.53"], ["example.test"]))
    expect_equal("host, domain", (values[97].strip(), values[98].strip()), ("guest", "example.test"))
    expect_equal("origin of eth0", values[24], 3)
    expect_equal("origin of eth1", by_id(one(context, "ip-config", "eth1"))[24], 1)


@check("tree: the VLAN is a port with an IP configuration of its own")
def vlan(context):
    port = one(context, "network-port", "eth1.10")
    expect_equal("parent of the port", parent_class(context, port), "network-controller")
    expect_equal("parent of its configuration", one(context, "ip-config", "eth1.10")["parent"], port["id"])


@check("tree: the bridge is an IP configuration below the controller, its member is nowhere")
def bridge(context):
    node = one(context, "ip-config", "br0")
    expect_equal("description", node["description"], "Bridge")
    expect_equal("parent", parent_class(context, node), "network-controller")
    member = [other["path"] for other in load_tree(context) if by_id(other).get(108) == "eth4"]
    expect_equal("nodes of the member", member, [])


@check("tree: the bond is a team with the kernel's mode and members, which know their team")
def team(context):
    bonding = "/sys/class/net/bond0/bonding/"
    expect_equal("teams", len(nodes(context, "team")), 1)
    values = by_id(nodes(context, "team")[0])
    expect_equal("parent", parent_class(context, nodes(context, "team")[0]), "computer")
    members = context.guest.read(bonding + "slaves").split()
    expect_equal("name, members", (values[197], values[165]), ("bond0", members))
    mode = context.guest.read(bonding + "mode").split()[0]
    expect(f"({mode})" in values[198], f"mode: {values[198]} is not {mode}")
    active = context.guest.read(bonding + "active_slave").strip()
    for name in members:
        port = by_id(one(context, "network-port", name))
        expect_equal(f"{name}: member, team, active, status, failures",
                     (port[193], port[199], port[194], port[195], port[196]), (True, "bond0", name == active, "up", 0))


@check("tree: the drives are the kernel's disks with their sizes")
def drives(context):
    expected = {}
    for name in context.guest.names("/sys/block/sd*"):
        expected["/dev/" + name] = int(context.guest.read(f"/sys/block/{name}/size")) * 512 // 1000
    expect_equal("drives", {by_id(node)[89]: by_id(node)[37] for node in nodes(context, "hard-drive")}, expected)


@check("tree: the partitions are the kernel's with their sizes")
def partitions(context):
    expected = {}
    for name in context.guest.names("/sys/block/sd*/sd*"):
        expected["/dev/" + name] = int(context.guest.read(f"/sys/class/block/{name}/size")) // 2
    expect(len(expected) == 2, f"the guest has partitions {expected}")
    expect_equal("partitions", {by_id(node)[89]: by_id(node)[112] for node in nodes(context, "partition")}, expected)


@check("tree: the processors are those of /proc/cpuinfo")
def processors(context):
    speeds = [int(float(text)) for text in re.findall(r"cpu MHz\s*: (\S+)", context.guest.read("/proc/cpuinfo"))]
    expect_equal("clock speeds", [by_id(node)[80] for node in nodes(context, "processor")], speeds)


@check("tree: read through our host-tool adapters it is the same, the time apart")
def adapters(context):
    expect_equal("adapters", sorted(context.guest.names("/usr/lib/corvista/adapters/*")),
                 ["brctl", "egrep", "ethtool", "fdisk", "ifconfig", "route"])
    ours = context.guest.cvagent("--host-tools", "classic", "tree")["nodes"]
    first = [[node for node in tree if node["path"].startswith("/oshw")] for tree in (ours, load_tree(context))]
    for mine, native in zip(*first, strict=True):
        for node in (mine, native):
            node["properties"].pop("126", None)
        expect_equal(native["path"], mine, native)
