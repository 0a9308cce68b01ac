"""Every settable property, by what it changes in the running guest and in its files."""

import re

from guest import LOG
from machine import mac
from tap import check, expect, expect_equal

CONFIG = "ip-config:eth0"
NETWORK = "/etc/sysconfig/network/"
INTERFACE_FILE = NETWORK + "ifcfg-eth-id-" + mac(0)


def settings(context, path):
    """{key: value} of a file of KEY=value lines, quotes removed."""
    rows = (line.split("=", 1) for line in context.guest.read(path).splitlines() if "=" in line)
    return {key: value.strip("'\"") for key, value in rows}


def expect_line(context, path, line):
    lines = context.guest.read(path).splitlines()
    expect(line in lines, f"{path} has no line {line!r}:\n" + "\n".join(lines))


def one_interface(context):
    """Leaves the guest with eth0 alone: an agent asks for every interface there is, and these checks start many."""
    if context.alone:
        return
    context.guest.sh(
        "ip link delete eth1.10; ip link delete bond0; ip link set br0 down; ip link delete br0; "
        "for nic in 1 2 3 4; do d=$(readlink -f /sys/class/net/eth$nic/device); "
        "echo ${d##*/} > /sys/bus/pci/drivers/e1000/unbind; done; ! ls -d /sys/class/net/eth1")
    context.alone = True


@check("set: the host name reaches the kernel, /etc/hosts and /etc/HOSTNAME")
def host_name(context):
    one_interface(context)
    context.guest.set(CONFIG, "HostName", "lathe")
    expect_equal("hostname", context.guest.sh("hostname").strip(), "lathe.example.test")
    expect_line(context, "/etc/hosts", "192.0.2.10\tlathe.example.test\tlathe")
    expect_equal("/etc/HOSTNAME", context.guest.read("/etc/HOSTNAME"), "lathe.example.test")


@check("set: the domain name reaches the kernel, /etc/hosts and /etc/HOSTNAME")
def domain_name(context):
    one_interface(context)
    old, new = context.guest.set(CONFIG, "DomainName", "works.example.net")
    expect_equal("domain before and after", (old, new), ("example.test", "works.example.net"))
    expect_equal("hostname", context.guest.sh("hostname").strip(), "lathe.works.example.net")
    expect_line(context, "/etc/hosts", "192.0.2.10\tlathe.works.example.net\tlathe")
    expect_equal("/etc/HOSTNAME", context.guest.read("/etc/HOSTNAME"), "lathe.works.example.net")


@check("set: name servers replace those of the resolver file")
def dns_servers(context):
    one_interface(context)
    change = context.guest.set(CONFIG, "DNSServers", "198.51.100.53", "2001:db8::53")
    expect_equal("before and after", change, (["192.0.2.53"], ["198.51.100.53", "2001:db8::53"]))
    expect_equal("/etc/resolv.conf", context.guest.read("/etc/resolv.conf"),
                 "# made for the test\nsearch example.test\nnameserver 198.51.100.53\nnameserver 2001:db8::53\n")


@check("set: search suffixes replace those of the resolver file")
def dns_suffixes(context):
    one_interface(context)
    context.guest.set(CONFIG, "DNSSuffixes", "works.example.net", "example.net")
    expect_line(context, "/etc/resolv.conf", "search works.example.net example.net")


@check("set: the origin DHCP reaches the interface file and hands the resolver file back")
def origin_dhcp(context):
    one_interface(context)
    change = context.guest.set(CONFIG, "IPOrigin", "1")
    expect_equal("before and after", change, (3, 1))
    file = settings(context, INTERFACE_FILE)
    expect_equal("BOOTPROTO, STARTMODE", (file["BOOTPROTO"], file["STARTMODE"]), ("dhcp", "auto"))
    expect_line(context, NETWORK + "config", 'NETCONFIG_DNS_POLICY="auto"')


@check("set: while the origin is DHCP an address changes no file, and is told so")
def refused_while_dhcp(context):
    one_interface(context)
    before = context.guest.read(INTERFACE_FILE)
    context.guest.set(CONFIG, "IPv4Address", "192.0.2.99", status=1)
    expect_equal("interface file", context.guest.read(INTERFACE_FILE), before)


@check("set: the origin static reaches the interface file and takes the resolver file over")
def origin_static(context):
    one_interface(context)
    expect_equal("before and after", context.guest.set(CONFIG, "IPOrigin", "3"), (1, 3))
    expect_equal("BOOTPROTO", settings(context, INTERFACE_FILE)["BOOTPROTO"], "static")
    expect_line(context, NETWORK + "config", 'NETCONFIG_DNS_POLICY=""')


def expect_running(context, address):
    expect(f" {address} " in context.guest.sh("ip address show dev eth0"), f"{address} is not in force")


@check("set: the IPv4 address reaches the interface file and the running interface")
def ipv4_address(context):
    one_interface(context)
    context.guest.set(CONFIG, "IPv4Address", "192.0.2.20")
    expect_equal("IPADDR", settings(context, INTERFACE_FILE)["IPADDR"], "192.0.2.20")
    expect_running(context, "192.0.2.20/24")
    expect("192.0.2.10/" not in context.guest.sh("ip address show dev eth0"), "the old address is still there")


@check("set: the subnet mask reaches the interface file and the running interface")
def subnet_mask(context):
    one_interface(context)
    context.guest.set(CONFIG, "SubnetMask", "255.255.0.0")
    expect_equal("NETMASK", settings(context, INTERFACE_FILE)["NETMASK"], "255.255.0.0")
    expect_running(context, "192.0.2.20/16")


@check("set: the IPv6 address reaches the interface file and /etc/hosts")
def ipv6_address(context):
    one_interface(context)
    context.guest.set(CONFIG, "IPv6Address", "2001:db8::20")
    file = settings(context, INTERFACE_FILE)
    expect_equal("IPADDR_1, LABEL_1", (file["IPADDR_1"], file["LABEL_1"]), ("2001:db8::20", "1"))
    expect_line(context, "/etc/hosts", "2001:db8::20\tlathe.works.example.net\tlathe")
    expect("2001:db8::20/" in context.guest.sh("ip address show dev eth0"), "the address is not in force")


@check("set: the IPv6 prefix length reaches the interface file")
def ipv6_prefix(context):
    one_interface(context)
    context.guest.set(CONFIG, "IPv6PrefixLength", "56")
    expect_equal("PREFIXLEN_1", settings(context, INTERFACE_FILE)["PREFIXLEN_1"], "56")
    expect_running(context, "2001:db8::20/56")


@check("set: the IPv4 gateway reaches the interface's and the host's route files")
def ipv4_gateway(context):
    one_interface(context)
    context.guest.set(CONFIG, "IPv4Gateway", "192.0.2.254")
    expect_equal("ifroute-eth0", context.guest.read(NETWORK + "ifroute-eth0"), "192.0.2.20\t192.0.2.254\t-\n")
    expect_equal("routes", context.guest.read(NETWORK + "routes"),
                 "default\t192.0.2.254\t-\n# Static routes\ndefault\tfe80::1\t-\t-\n")
    running = re.findall(r"default via (\S+) dev eth0", context.guest.sh("ip route show"))
    expect_equal("running default routes", running, ["192.0.2.254"])


@check("set: the IPv6 gateway reaches the running routes and the route file")
def ipv6_gateway(context):
    one_interface(context)
    change = context.guest.set(CONFIG, "IPv6Gateway", "fe80::2")
    expect_equal("before and after", change, ("fe80::1", "fe80::2"))
    running = re.findall(r"default via (\S+) dev eth0", context.guest.sh("ip -6 route show"))
    expect_equal("running default routes", running, ["fe80::2"])
    expect_equal("routes", context.guest.read(NETWORK + "routes"),
                 "default\t192.0.2.254\t-\n# Static routes\ndefault\tfe80::2\t-\n")


@check("set: an interface is taken down and brought up")
def interface_state(context):
    one_interface(context)
    expect_equal("down", context.guest.set(CONFIG, "InterfaceState", "12"), (1, 12))
    expect(",UP" not in context.guest.sh("ip link show dev eth0"), "the interface is up")
    context.guest.set(CONFIG, "InterfaceState", "1")
    expect(",UP" in context.guest.sh("sleep 5; ip link show dev eth0"), "the interface is down")


@check("set: looking for interfaces finds a network port that was plugged in meanwhile")
def enumerate_ports(context):
    """The agent is held while it builds its nodes: the port comes after its list of interfaces is made."""
    one_interface(context)
    context.guest.sh(
        f": > {LOG}; cvagent --log {LOG} --log-level 3000 set {CONFIG} EnumeratePorts 1 > /run/set.out 2>&1 & "
        f"echo $! > /run/set.pid; until grep -q 'Creating an IPConfigNode for eth0' {LOG}; do sleep 0.01; done; "
        "kill -STOP $(cat /run/set.pid)")
    context.machine.add_nic(5)
    context.guest.sh("i=0; until [ -e /sys/class/net/eth1 ]; do sleep 1; i=$((i + 1)); [ $i -lt 60 ]; done; "
                     "ip link set eth1 up; p=$(cat /run/set.pid); kill -CONT $p; while [ -d /proc/$p ]; do sleep 1; done")
    inserted = re.findall(r"Inserting the interface in the Map (\S+)", context.guest.read(LOG))
    expect_equal("interfaces found, in order", inserted, ["eth0", "eth1"])


@check("set: owner data is kept in the asset file")
def owner(context):
    one_interface(context)
    context.guest.set("computer", "OwnerName", "Gerda Möbius")
    context.guest.set("computer", "OwnerContact", "gerda@example.test, room 12")
    asset = context.guest.read("/opt/vantrel/corvista/data/asset.dat").splitlines()
    expect_equal("asset.dat", sorted(asset), ["Computer.OwnerContact=gerda@example.test, room 12",
                                              "Computer.OwnerName=Gerda Möbius"])


@check("set: the clock")
def clock(context):
    one_interface(context)
    now = context.guest.set("computer", "CurrentTime", "2026-11-20T21:03:00Z")[1]
    set_to = 1795208580
    expect(set_to <= now <= set_to + 60, f"just after it was set to {set_to} the clock showed {now}")
    seconds = int(context.guest.sh("date +%s"))
    expect(now <= seconds < now + 86400, f"then the clock went on to {seconds}")


@check("set: the time zone reaches /etc/localtime and the clock file")
def time_zone(context):
    one_interface(context)
    change = context.guest.set("computer", "TimeZoneOffset", "330")
    expect_equal("before and after", change[1], 330)
    expect_equal("/etc/localtime", context.guest.sh("readlink /etc/localtime").strip(), "/usr/share/zoneinfo/Asia/Kolkata")
    expect_equal("TIMEZONE", settings(context, "/etc/sysconfig/clock")["TIMEZONE"], "Asia/Kolkata")
    expect_equal("zone", context.guest.sh("date +%z").strip(), "+0530")


@check("set: the power action restarts the machine, which comes up again")
def restart(context):
    context.machine.qmp("set-action", reboot="reset")
    context.machine.start("cvagent set computer PowerAction 9 --yes")
    event = context.machine.wait_event("RESET", 240)
    expect_equal("reset by the guest", event["data"]["guest"], True)
    context.machine.wait_ready()
    expect_equal("host name after the restart", context.guest.sh("hostname").strip(), "guest.example.test")
