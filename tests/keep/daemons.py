"""Changes an interface that a real daemon keeps, on a host with the real systemd, and restarts that. Reports as TAP."""

import argparse
import json
import os
import re
import shutil
import sys

HERE = os.path.dirname(os.path.abspath(__file__))
sys.path.insert(1, os.path.join(HERE, "..", "package"))
sys.path.insert(1, os.path.join(HERE, "..", "system"))

import root  # noqa: E402
from host import Host  # noqa: E402
from tap import CHECKS, Report, check, expect, expect_equal  # noqa: E402

PACKAGES = ["dbus", "ifupdown", "iproute2", "libblkid1", "libpam-systemd", "libsqlite3-0", "libstdc++6", "libsystemd0", "netplan.io",
            "network-manager", "systemd", "systemd-resolved", "systemd-sysv"]
CLOCK = 25  # CAP_SYS_TIME
AGENT = "/opt/cv/agent/cvagent"
NODE = "ip-config:eth0"
STANZA = "# the wire\nauto eth0\niface eth0 inet static\n\taddress 192.0.2.10/24\n\tgateway 192.0.2.1\n"
NETWORK = "[Match]\nName=eth*\n[Network]\nAddress=192.0.2.10/24\nGateway=192.0.2.1\n"
ADDED = "[Route]\nDestination=203.0.113.0/24\nGateway=192.0.2.9\n"
NETPLAN = ("network:\n  version: 2\n  ethernets:\n    eth0:\n      addresses: [192.0.2.10/24]  # ours\n"
           "      routes:\n        - to: default\n          via: 192.0.2.1\n")
PROFILE_PATH = "/etc/NetworkManager/system-connections/the lan.nmconnection"
PROFILE = ("# by hand\n[connection]\nid=the lan\nuuid=7b3f0c2e-1111-4222-8333-000000000001\ntype=ethernet\ninterface-name=eth0\n\n"
           "[ipv4]\nmethod=manual\naddress1=192.0.2.10/24,192.0.2.1\naddress2=198.51.100.5/24\ndns=192.0.2.53;\n"
           "route1=203.0.113.0/24,192.0.2.9\n\n[ipv6]\nmethod=disabled\n")
MANAGER = "[main]\nplugins=keyfile\nno-auto-default=*\n[keyfile]\nunmanaged-devices=interface-name:cable\n"


class Context:
    """A host of each check's own: a cable whose end eth0 some daemon keeps, and the programs of a build."""

    def __init__(self, system, build):
        self.host = Host(system)
        place = f"/proc/{self.host.init}/root/opt/cv"
        os.makedirs(f"{place}/agent")
        for program in ("cvagent", "corvista-guard", "corvista-rehearsal"):
            folder = "libexec" if program == "cvagent" else "agent"  # the program that is whole without the other one
            shutil.copy(f"{build}/{folder}/{program}", f"{place}/agent")
        shutil.copytree(f"{build}/lib", f"{place}/lib", symlinks=True, ignore=shutil.ignore_patterns("*.a"))
        shutil.copytree(f"{build}/hosttools", f"{place}/hosttools", symlinks=True, ignore=shutil.ignore_patterns("*.a", "CMake*"))
        self.host.sh("systemctl stop systemd-networkd networking NetworkManager 2>/dev/null; "
                     "ip link add eth0 type veth peer name cable; ip link set cable up")

    def write(self, path, text, mode=0o644):
        self.host.sh(f"mkdir -p {os.path.dirname(path)}")
        with open(f"/proc/{self.host.init}/root{path}", "w", encoding="utf-8") as file:
            file.write(text)
        os.chmod(f"/proc/{self.host.init}/root{path}", mode)

    def read(self, path):
        with open(f"/proc/{self.host.init}/root{path}", encoding="utf-8") as file:
            return file.read()

    def keeper(self):
        keepers = json.loads(self.host.sh(f"{AGENT} doctor --json"))["keepers"]
        return next(each for each in keepers if each["interface"] == "eth0")

    def set(self, name, value, kept_in):
        result = self.host.run(f"{AGENT} set {NODE} {name} {value}")
        expect_equal(f"the status of {name} {value} ({result.stdout}{result.stderr})", result.returncode, 0)
        expect(f"kept over a restart by {kept_in}" in result.stderr, f"not told where it is kept: {result.stderr}")

    def wait_for_address(self, address):
        """The one and no other, with the default route."""
        self.host.wait_for("ip -4 -o address show dev eth0 scope global | awk '{print $4}' | xargs | "
                           f"grep -qx '{address}' && ip route | grep -q 'default via 192.0.2.1 dev eth0'")


def change_and_restart(context, kept_in, restart):
    context.wait_for_address("192.0.2.10/24")
    plan = context.host.sh(f"{AGENT} plan {NODE} IPv4Address 192.0.2.77")
    expect("192.0.2.77/24" in plan, f"the plan does not show it: {plan}")
    context.set("IPv4Address", "192.0.2.77", kept_in)
    context.wait_for_address("192.0.2.77/24")
    context.host.sh(restart)
    context.wait_for_address("192.0.2.77/24")
    context.set("SubnetMask", "255.255.255.128", kept_in)
    context.host.sh(restart)
    context.wait_for_address("192.0.2.77/25")


def change_and_take_back(context, path):
    """As many files and settings as before; the daemon, asked once more, has it so, too."""
    before = context.host.run(f"cat {path}").stdout
    result = context.host.run(f"{AGENT} set {NODE} IPv4Address 192.0.2.99 --confirm-within 600")
    expect_equal(f"the status of the change ({result.stdout}{result.stderr})", result.returncode, 0)
    context.host.wait_for("ip -4 -o address show dev eth0 | grep -q 192.0.2.99/")
    result = context.host.run(f"{AGENT} rollback")
    expect_equal("what the taking back tells", (result.stdout, result.stderr), ("change 1 is taken back\n", ""))
    context.wait_for_address("192.0.2.10/24")
    expect_equal(f"the file {path}", context.host.run(f"cat {path}").stdout, before)


def take_gateway_back(context):
    """The daemon takes all addresses and routes away and makes them anew, before and after; nothing is told before it has."""
    context.host.sh("ip address add 198.51.100.5/24 dev eth0; ip route add 198.18.0.0/15 via 192.0.2.9 dev eth0")  # which it does not know
    before = network_of(context)
    result = context.host.run(f"{AGENT} set {NODE} IPv4Gateway 192.0.2.254 --confirm-within 600")
    expect_equal(f"the status of the change ({result.stdout}{result.stderr})", result.returncode, 0)
    expect_equal("the network", network_of(context), before.replace("via 192.0.2.1 ", "via 192.0.2.254 "))
    result = context.host.run(f"{AGENT} rollback")
    expect_equal("what the taking back tells", (result.stdout, result.stderr), ("change 2 is taken back\n", ""))
    expect_equal("the network when it is taken back", network_of(context), before)
    take_back_in_time(context, before)
    context.host.sh("ip address delete 198.51.100.5/24 dev eth0; ip route delete 198.18.0.0/15")


def take_back_in_time(context, before):
    """The time is over while the host still asks whether another one has the address: the guard and who makes the change both put it back."""
    context.host.run(f"{AGENT} set {NODE} IPv6Address 2001:db8::77 --confirm-within 1")
    context.host.wait_for(f"{AGENT} history --changes | grep '^3 ' | grep -q 'is taken back  ' && ! pidof corvista-guard")
    expect_equal("the network when its time is over", network_of(context), before)
    addresses = context.host.sh("ip -6 -o address show dev eth0 scope global")
    expect("2001:db8::10/64" in addresses and "2001:db8::77" not in addresses, f"the addresses: {addresses}")
    expect("20-lan.network" in context.host.sh("networkctl status eth0"), "systemd-networkd goes on with the file of the change")


def network_of(context):
    return context.host.sh("ip -4 -o address show dev eth0; ip route")


@check("ifupdown: a change is in the stanza and in force; set back, the file is as it was, byte for byte")
def ifupdown(context):
    context.write("/etc/network/interfaces", STANZA)
    context.host.sh("ifup eth0")
    expect_equal("who keeps it", context.keeper()["keeper"], "ifupdown")
    change_and_take_back(context, "/etc/network/interfaces")
    change_and_restart(context, "ifupdown, in /etc/network/interfaces", "ifdown eth0; ifup eth0")
    context.set("SubnetMask", "255.255.255.0", "ifupdown")
    context.set("IPv4Address", "192.0.2.10", "ifupdown")
    context.wait_for_address("192.0.2.10/24")
    expect_equal("the file", context.read("/etc/network/interfaces"), STANZA)


@check("systemd-networkd: a change is in a file of ours, in front of the other one; without it, the host is as it was")
def networkd(context):
    network = NETWORK + "Address=2001:db8::10/64\n"
    context.write("/etc/systemd/network/20-lan.network", network)
    context.write("/etc/systemd/network/20-lan.network.d/more.conf", ADDED)
    context.host.sh("systemctl start systemd-networkd")
    context.host.wait_for("networkctl status eth0 | grep -q configured && ip route | grep -q 203.0.113.0/24")
    expect_equal("who keeps it", context.keeper()["keeper"], "systemd-networkd")
    change_and_take_back(context, "/etc/systemd/network/0-cvagent-eth0.network")
    expect("20-lan.network" in context.host.sh("networkctl status eth0"), "it does not have its own file back")
    take_gateway_back(context)
    change_and_restart(context, "systemd-networkd, in /etc/systemd/network/0-cvagent-eth0.network", "systemctl restart systemd-networkd")
    context.host.wait_for("ip route | grep -q 203.0.113.0/24")
    expect_equal("the file", context.read("/etc/systemd/network/20-lan.network"), network)
    context.host.sh("rm /etc/systemd/network/0-cvagent-eth0.network; networkctl reload")
    context.wait_for_address("192.0.2.10/24")


@check("netplan: a change is in its file, and what it makes for networkd is made anew; set back, the file is as it was")
def netplan(context):
    context.write("/etc/netplan/50-host.yaml", NETPLAN)
    context.host.sh("netplan generate; systemctl start systemd-networkd")
    context.host.wait_for("networkctl status eth0 | grep -q configured")
    expect_equal("who keeps it", context.keeper()["keeper"], "netplan")
    change_and_take_back(context, "/etc/netplan/50-host.yaml")
    context.host.wait_for("grep -q 192.0.2.10/24 /run/systemd/network/10-netplan-eth0.network")
    change_and_restart(context, "netplan, in /etc/netplan/50-host.yaml", "netplan generate; systemctl restart systemd-networkd")
    context.set("SubnetMask", "255.255.255.0", "netplan")
    context.set("IPv4Address", "192.0.2.10", "netplan")
    context.wait_for_address("192.0.2.10/24")
    expect_equal("the file", context.read("/etc/netplan/50-host.yaml"), NETPLAN)


@check("NetworkManager: a change is in its profile and in force, and nothing else is; taken back, the file is as it was, byte for byte")
def network_manager(context):
    context.write("/etc/NetworkManager/NetworkManager.conf", MANAGER)
    context.write(PROFILE_PATH, PROFILE, 0o600)
    context.host.sh("systemctl start NetworkManager")
    context.host.wait_for("ip route | grep -q 203.0.113.0/24 && nmcli -g GENERAL.STATE device show eth0 | grep -q 100")
    expect_equal("who keeps it", context.keeper()["keeper"], "NetworkManager")
    before = network_of(context)
    plan = context.host.sh(f"{AGENT} plan {NODE} IPv4Address 192.0.2.77")
    expect("NetworkManager Update2 'the lan': ipv4.addresses '192.0.2.10/24,198.51.100.5/24' -> '192.0.2.77/24,198.51.100.5/24'" in plan,
           f"the plan does not show it: {plan}")
    expect_equal("the network after a plan", network_of(context), before)
    expect_equal("the file after a plan", context.read(PROFILE_PATH), PROFILE)
    for name, value in (("IPv4Address", "192.0.2.99"), ("IPv4Gateway", "192.0.2.3"), ("SubnetMask", "255.255.255.128")):
        result = context.host.run(f"{AGENT} set {NODE} {name} {value} --confirm-within 600")
        expect_equal(f"the status of {name} ({result.stdout}{result.stderr})", result.returncode, 0)
        result = context.host.run(f"{AGENT} rollback")
        expect_equal("what the taking back tells", (result.returncode, result.stderr), (0, ""))
        expect_equal(f"the file after {name}", context.read(PROFILE_PATH), PROFILE)
        expect_equal(f"the network after {name}", network_of(context), before)
    for name, value in (("IPv4Address", "192.0.2.77"), ("IPv4Gateway", "192.0.2.3")):
        context.set(name, value, f"NetworkManager, in {PROFILE_PATH}")
    after = network_of(context)
    expect_equal("the network after a change", after, before.replace("192.0.2.10", "192.0.2.77").replace("192.0.2.1 ", "192.0.2.3 "))
    context.host.sh("systemctl stop NetworkManager; ip address flush dev eth0; systemctl start NetworkManager")
    context.host.wait_for("ip route | grep -q 203.0.113.0/24 && nmcli -g GENERAL.STATE device show eth0 | grep -q 100")
    expect_equal("the network after a restart", network_of(context), after)
    context.set("IPv4Address", "192.0.2.10", "NetworkManager")
    context.set("IPv4Gateway", "192.0.2.1", "NetworkManager")
    expect_equal("the network when it is set back", network_of(context), before)
    for line in PROFILE.split("\n"):
        expect(line in context.read(PROFILE_PATH) or line.startswith("#"), f"the profile has no more: {line}")


@check("two at once: an interface that ifupdown and networkd both have is left alone")
def two(context):
    context.write("/etc/network/interfaces", STANZA)
    context.write("/etc/systemd/network/20-lan.network", NETWORK)
    context.host.sh("ifup eth0; systemctl start systemd-networkd")
    context.host.wait_for("networkctl status eth0 | grep -q configured")
    expect_equal("who claims it", [claim["system"] for claim in context.keeper()["claims"]], ["systemd-networkd", "ifupdown"])
    result = context.host.run(f"{AGENT} set {NODE} IPv4Address 192.0.2.77")
    expect("systemd-networkd and ifupdown both have 'eth0'" in result.stderr, result.stderr)
    expect_equal("the stanza", context.read("/etc/network/interfaces"), STANZA)


def evidence_of(host):
    def collect():
        for command in ("ip address show dev eth0; ip route", "networkctl --no-pager status eth0 | head -30",
                        "journalctl --no-pager -n 20 -o short-monotonic -u systemd-networkd -u NetworkManager"):
            yield command, (host.run(command).stdout).splitlines()
    return collect


def refuse_with_clock():
    with open("/proc/self/status", encoding="ascii") as status:
        rights = int(re.search(r"^CapBnd:\s*(\w+)", status.read(), re.MULTILINE).group(1), 16)
    if rights >> CLOCK & 1:
        raise SystemExit("with CAP_SYS_TIME this could set the machine's clock: start it as scripts/keep-test does")


def main(module, description, system_of, evidence):
    """The checks of one module. system_of(check) is the name and the packages of the system that it runs on."""
    parser = argparse.ArgumentParser(description=description)
    parser.add_argument("build", help="directory of a build of this architecture")
    parser.add_argument("--only", default="", help="run only the checks that begin so")
    options = parser.parse_args()
    refuse_with_clock()
    architecture = os.popen("dpkg --print-architecture").read().strip()
    checks = [row for row in CHECKS["main"] if row[1].__module__ == module and row[0].startswith(options.only)]
    report = Report()
    for name, function in checks:
        system, packages = system_of(function)
        context = Context(root.make(system, architecture, packages), options.build)
        try:
            report.run(name, function, context, evidence(context.host))
        finally:
            context.host.stop()
    return report.finish(len(checks))


if __name__ == "__main__":
    sys.exit(main(__name__, __doc__, lambda _: ("keep", PACKAGES), evidence_of))
