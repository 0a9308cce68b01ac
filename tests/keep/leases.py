"""Changes an interface whose address comes from a real DHCP server, on a host with the real systemd. Reports as TAP."""

import json
import sys

import daemons
from daemons import AGENT, MANAGER, NODE, PACKAGES, PROFILE_PATH, main
from tap import check, expect, expect_equal

WITH_CLIENTS = [*PACKAGES, "busybox", "isc-dhcp-client", "udhcpc"]
# It has one address for eth0 alone, so that it need not ask around whether somebody has it.
SERVER = ("interface cable\nstart 192.0.2.100\nend 192.0.2.100\nstatic_lease 02:00:00:00:00:10 192.0.2.100\nlease_file /run/leases\n"
          "pidfile /run/udhcpd.pid\noption subnet 255.255.255.0\noption router 192.0.2.1\noption dns 192.0.2.53\n"
          "option domain lan.example\noption lease 3600\n")
# Everything of IPv4, without what tells one daemon from another.
NETWORK = ("ip -4 -o address show dev {0} scope global | awk '{{print $4, /dynamic/ ? \"leased\" : \"fixed\"}}'; "
           "ip -4 route show dev {0} | sed -E 's/ (proto|src|metric|scope) [^ ]+//g; s/ onlink//; s/ *$//' | sort")
FIXED = "192.0.2.77/24 fixed\n192.0.2.0/24\ndefault via 192.0.2.1\n"
OWN_NETWORK = "/etc/systemd/network/0-cvagent-eth0.network"
STANZA = "# the wire\nauto eth0\niface eth0 inet dhcp\n"
NETPLAN = "network:\n  version: 2\n  ethernets:\n    eth0:\n      dhcp4: true  # the lan's\n"
PROFILE = ("[connection]\nid=the lan\nuuid=7b3f0c2e-1111-4222-8333-000000000001\ntype=ethernet\ninterface-name=eth0\n\n"
           "[ipv4]\nmethod=auto\n\n[ipv6]\nmethod=disabled\n")


def serve(context):
    """The other end of the cable is another host's, which has the server and the gateway."""
    context.write("/run/udhcpd.conf", SERVER)
    context.host.sh("ip link set eth0 address 02:00:00:00:00:10; ip netns add lan; ip link set cable netns lan; "
                    "ip -n lan address add 192.0.2.1/24 dev cable; ip -n lan link set cable up; touch /run/leases")
    start_server(context)


def start_server(context):
    context.host.sh("systemd-run --quiet --unit=dhcp-server -p NetworkNamespacePath=/run/netns/lan busybox udhcpd -f /run/udhcpd.conf")


def own_resolver_file(context):
    context.host.sh("systemctl mask --runtime --now systemd-resolved; rm -f /etc/resolv.conf; echo nameserver 198.51.100.1 >/etc/resolv.conf")


def network_of(context, link="eth0"):
    return context.host.sh(NETWORK.format(link))


def wait_for_network(context, wanted, link="eth0"):
    context.write("/run/wanted", wanted)
    context.host.wait_for(f"({NETWORK.format(link)}) | diff - /run/wanted")


def wait_for_lease(context):
    context.host.wait_for(f"({NETWORK.format('eth0')}) >/run/now; grep -q 192.0.2.100/24 /run/now && grep -q default /run/now")
    return network_of(context)


def expect_file(context, path, wanted):
    expect_equal(f"the file {path}", context.host.run(f"cat '{path}'").stdout, wanted)


def change(context, words):
    result = context.host.run(f"{AGENT} {words}")
    expect_equal(f"the status of {words} ({result.stdout}{result.stderr})", result.returncode, 0)
    return result.stdout + result.stderr


def apply(context, changes, verdict="applied"):
    """What it waits for has come by then."""
    context.write("/run/changes", json.dumps(changes))
    told = change(context, "apply --verify-within 1 /run/changes")
    expect(told.startswith(f"{verdict} "), f"the verdict: {told}")
    return told


def apply_one(context, name, value):
    return apply(context, [{"node": NODE, "property": name, "value": value}])


def take_back(context):
    result = context.host.run(f"{AGENT} rollback")
    expect_equal("what the taking back tells", (result.returncode, result.stdout.endswith(" is taken back\n"), result.stderr), (0, True, ""))


def refuse_parts_of_the_lease(context, leased):
    """A mask or gateway for as long as the lease lasts would be none that is kept."""
    for name, value in (("SubnetMask", "255.255.255.128"), ("IPv4Gateway", "192.0.2.254")):
        result = context.host.run(f"{AGENT} set {NODE} {name} {value}")
        expect_equal(f"the status of {name} ({result.stderr})", result.returncode, 1)
        expect("not kept over a restart: " in result.stderr and f"{name} was not changed" in result.stderr, result.stderr)
    expect_equal("the network with parts of a lease", network_of(context), leased)


def plan(context, name, value, path, leaves):
    """Changes nothing. @return the lines that it shows as those of the file to come"""
    before = context.host.run(f"cat '{path}'").stdout
    text = change(context, f"plan {NODE} {name} {value}")
    expect_equal("the network after a plan", network_of(context), leaves)
    expect_file(context, path, before)
    expect("(not tried)" in text and "NOT TO BE FORESEEN" in text, f"the plan does not tell what it has not tried: {text}")
    if name == "IPv4Address":
        expect("+ address eth0 192.0.2.77/24\n" in text and "- address eth0 192.0.2.100/24\n" in text, text)
        expect(text.count("+ route default ") + text.count("- route default ") in (0, 2), f"the gateway in the plan: {text}")
    files = text.split("\nFILES\n")[1].split("\nCOMMANDS\n")[0].split("\n")
    return [line[1:] for line in files if line[:1] == "+" and not line.startswith("+++")]


def static_and_back(context, keeper, path, restart, tells_of_servers=True):
    """From a lease to a static address and back, each taken back once."""
    leased = wait_for_lease(context)
    context.host.wait_for(f"{AGENT} doctor --json | grep -q '\"keeper\": \"{keeper}\"'")
    expect_equal("who keeps it", context.keeper()["keeper"], keeper)
    refuse_parts_of_the_lease(context, leased)
    before = context.host.run(f"cat '{path}'").stdout
    planned = plan(context, "IPv4Address", "192.0.2.77", path, leased)
    told = apply_one(context, "IPv4Address", "192.0.2.77")
    expect(f"kept over a restart by {keeper}, in {path}" in told, f"not told where it is kept: {told}")
    expect_equal(f"whether it is told of name servers ({told})", "name servers of the lease may go with it" in told, tells_of_servers)
    expect_equal("the network when it is static", network_of(context), FIXED)
    fixed = context.host.run(f"cat '{path}'").stdout
    for line in planned:
        expect(line in fixed.split("\n"), f"the plan has {line!r}, the file not: {fixed}")
    take_back(context)
    wait_for_network(context, leased)
    expect_file(context, path, before)
    change(context, f"set {NODE} IPv4Address 192.0.2.77")
    context.host.sh(restart)
    wait_for_network(context, FIXED)

    fixed = context.host.run(f"cat '{path}'").stdout
    plan(context, "IPOrigin", "1", path, FIXED)
    told = apply_one(context, "IPOrigin", 1)
    expect("no address" not in told, f"the lease: {told}")
    expect_equal("the address when it is leased", network_of(context).split("\n")[0], leased.split("\n")[0])
    wait_for_network(context, leased)
    take_back(context)
    wait_for_network(context, FIXED)
    expect_file(context, path, fixed)
    change(context, f"set {NODE} IPOrigin 1")
    context.host.sh(restart)
    wait_for_network(context, leased)


@check("systemd-networkd: a lease becomes a static address and the other way round; taken back, the lease is there again")
def networkd(context):
    serve(context)
    context.write("/etc/systemd/network/20-lan.network", "[Match]\nName=eth0\n[Network]\nDHCP=yes\n")
    context.host.sh("systemctl start systemd-resolved systemd-networkd")
    context.host.wait_for("resolvectl dns eth0 | grep -q 192.0.2.53")
    static_and_back(context, "systemd-networkd", OWN_NETWORK, "systemctl restart systemd-networkd")
    context.host.wait_for("resolvectl dns eth0 | grep -q 192.0.2.53")
    expect_equal("the other file", context.read("/etc/systemd/network/20-lan.network"), "[Match]\nName=eth0\n[Network]\nDHCP=yes\n")


@check("netplan: a lease becomes a static address and the other way round; taken back, the lease is there again")
def netplan(context):
    serve(context)
    context.write("/etc/netplan/50-host.yaml", NETPLAN, 0o600)
    context.host.sh("netplan generate; systemctl start systemd-networkd")
    static_and_back(context, "netplan", "/etc/netplan/50-host.yaml", "netplan generate; systemctl restart systemd-networkd")
    expect_equal("the file", context.read("/etc/netplan/50-host.yaml"), NETPLAN)


@check("NetworkManager: a lease becomes a static address and the other way round; taken back, the lease is there again")
def network_manager(context):
    serve(context)
    own_resolver_file(context)
    start_network_manager(context)
    static_and_back(context, "NetworkManager", PROFILE_PATH, "systemctl restart NetworkManager")
    servers_in_file(context, ["192.0.2.53"], "lan.example")


def start_network_manager(context):
    context.write("/etc/NetworkManager/NetworkManager.conf", MANAGER.replace("[keyfile]", "dns=default\nrc-manager=file\n[keyfile]"))
    context.write(PROFILE_PATH, PROFILE, 0o600)
    context.host.sh("systemctl start NetworkManager")


def clients_of(context, name):
    return context.host.sh(f"grep -lx {name} /proc/[0-9]*/comm | wc -l").strip()


def by_ifupdown(context, client, tells_of_servers):
    serve(context)
    own_resolver_file(context)
    context.write("/etc/network/interfaces", STANZA)
    context.host.sh("ifup eth0")
    expect_equal("clients", clients_of(context, client), "1")
    static_and_back(context, "ifupdown", "/etc/network/interfaces", "ifdown eth0; ifup eth0", tells_of_servers)
    expect_equal("clients in the end", clients_of(context, client), "1")
    change(context, f"set {NODE} IPv4Address 192.0.2.77")
    expect_equal("clients with a static address", clients_of(context, client), "0")


@check("ifupdown with dhclient: a lease becomes a static address, its client ends, and the other way round")
def dhclient(context):
    by_ifupdown(context, "dhclient", True)


@check("ifupdown with udhcpc: a lease becomes a static address, its client ends, and the other way round")
def udhcpc(context):
    context.host.sh("mv /sbin/dhclient /sbin/dhclient.away")
    by_ifupdown(context, "udhcpc", False)  # it sets the address for ever, as if nobody had leased it


def servers_in_file(context, servers, domain):
    wanted = "".join(f"nameserver {server}\n" for server in servers)
    context.write("/run/wanted-servers", f"# Generated by NetworkManager\nsearch {domain}\n{wanted}")
    context.host.wait_for("diff /etc/resolv.conf /run/wanted-servers")


@check("NetworkManager that makes /etc/resolv.conf: name servers and domains beside a lease are in its profile; taken back, the file is as it was")
def name_servers(context):
    serve(context)
    own_resolver_file(context)
    start_network_manager(context)
    servers_in_file(context, ["192.0.2.53"], "lan.example")
    for name, value in (("DNSServers", "192.0.2.99 192.0.2.98"), ("DNSSuffixes", "corp.example")):
        told = change(context, f"set {NODE} {name} {value} --confirm-within 600")
        expect(f"kept over a restart by NetworkManager, in {PROFILE_PATH}" in told, told)
        take_back(context)
        servers_in_file(context, ["192.0.2.53"], "lan.example")
        expect_file(context, PROFILE_PATH, PROFILE)
    both = [{"node": NODE, "property": "DNSServers", "value": ["192.0.2.99"]}, {"node": NODE, "property": "DNSSuffixes", "value": ["corp.example"]}]
    for verdict in ("applied", "unchanged"):
        told = apply(context, both, verdict)
        expect_equal(f"the verdicts ({told})", told.count(f"{verdict} "), 2)
        servers_in_file(context, ["192.0.2.99", "192.0.2.53"], "corp.example")
    context.host.sh("systemctl restart NetworkManager")
    wait_for_lease(context)
    servers_in_file(context, ["192.0.2.99", "192.0.2.53"], "corp.example")
    change(context, f"set {NODE} IPv4Address 192.0.2.77")
    servers_in_file(context, ["192.0.2.99"], "corp.example")


def late_lease(context, path, leased):
    """It comes when the change is made, and nobody else's work that would have to stay beside what comes back."""
    change(context, f"set {NODE} IPv4Address 192.0.2.77")
    wait_for_network(context, FIXED)
    fixed = context.host.run(f"cat '{path}'").stdout
    context.host.sh("systemctl stop dhcp-server")
    told = change(context, f"set {NODE} IPOrigin 1 --confirm-within 600")
    expect("no address has come by DHCP yet" in told, f"that there is no lease: {told}")
    start_server(context)
    wait_for_network(context, leased)
    take_back(context)
    wait_for_network(context, FIXED)
    expect_file(context, path, fixed)


@check("systemd-networkd: that no lease comes is told; one that comes late goes when the change is taken back")
def late_at_networkd(context):
    serve(context)
    context.write("/etc/systemd/network/20-lan.network", "[Match]\nName=eth0\n[Network]\nDHCP=ipv4\nLinkLocalAddressing=no\n")
    context.host.sh("systemctl start systemd-networkd")
    late_lease(context, OWN_NETWORK, wait_for_lease(context))


@check("NetworkManager: that no lease comes is told; one that comes late goes when the change is taken back")
def late_at_network_manager(context):
    serve(context)
    own_resolver_file(context)
    start_network_manager(context)
    late_lease(context, PROFILE_PATH, wait_for_lease(context))


@check("two interfaces: what becomes of the lease of one leaves the other as it is")
def two_interfaces(context):
    serve(context)
    context.host.sh("ip link add eth1 type veth peer name other; ip link set other netns lan; ip -n lan link set other up")
    context.write("/etc/systemd/network/20-lan.network", "[Match]\nName=eth0\n[Network]\nDHCP=yes\n")
    context.write("/etc/systemd/network/30-other.network",
                  "[Match]\nName=eth1\n[Network]\nAddress=198.51.100.7/24\n[Route]\nDestination=203.0.113.0/24\nGateway=198.51.100.1\n")
    context.host.sh("systemctl start systemd-networkd")
    leased = wait_for_lease(context)
    other = "198.51.100.7/24 fixed\n198.51.100.0/24\n203.0.113.0/24 via 198.51.100.1\n"
    wait_for_network(context, other, "eth1")
    keepers = {each["interface"]: each for each in json.loads(context.host.sh(f"{AGENT} doctor --json"))["keepers"]}
    for name, file in (("eth0", "20-lan"), ("eth1", "30-other")):
        expect_equal(f"who keeps {name}", keepers[name]["keeper"], "systemd-networkd")
        expect(f"{file}.network" in json.dumps(keepers[name]), f"the evidence: {keepers[name]}")
    apply_one(context, "IPv4Address", "192.0.2.77")
    expect_equal("the network", network_of(context), FIXED)
    expect_equal("the other one", network_of(context, "eth1"), other)
    take_back(context)
    wait_for_network(context, leased)
    expect_equal("the other one", network_of(context, "eth1"), other)


def evidence_of(host):
    def collect():
        yield from daemons.evidence_of(host)()
        for command in ("cat /etc/resolv.conf", "cat /run/wanted", "journalctl --no-pager -n 40 -o short-monotonic"):
            yield command, host.run(command).stdout.splitlines()
    return collect


if __name__ == "__main__":
    sys.exit(main(__name__, __doc__, lambda _: ("leases", WITH_CLIENTS), evidence_of))
