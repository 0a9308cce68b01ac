"""Changes name, zone and name servers of a host with the real systemd, and restarts that. Reports as TAP."""

import sys

from daemons import AGENT, NODE, PACKAGES, main
from tap import check, expect, expect_equal

# Each of the two makes /etc/resolv.conf, so they are never together.
WITH_RESOLVCONF = ["dbus", "ifupdown", "iproute2", "libblkid1", "libsqlite3-0", "libstdc++6", "libsystemd0", "resolvconf", "systemd",
                   "systemd-sysv"]
DROP_IN = "/etc/systemd/resolved.conf.d/zz-cvagent.conf"
HEAD = "/etc/resolvconf/resolv.conf.d/head"
STANZA = "auto eth0\niface eth0 inet static\n\taddress 192.0.2.10/24\n\tdns-nameservers 192.0.2.1\n\tdns-search lan.example\n"


def expect_kept(result, where):
    expect_equal(f"the status ({result.stdout}{result.stderr})", result.returncode, 0)
    expect(f"kept over a restart {where}" in result.stderr, f"not told where it is kept: {result.stderr}")


def set_of_host(context, node, name, value, where):
    expect_kept(context.host.run(f"{AGENT} set {node} {name} {value}"), where)


def change_and_take_back(context, words, files):
    """Every file as before, byte for byte, and none more."""
    state = f"sha256sum {files} 2>&1; ls -ld {files} 2>&1 | awk '{{print $1, $3, $4, $NF}}'; ls /etc/systemd; hostname"
    before = context.host.sh(f"{state}; true")
    result = context.host.run(f"{AGENT} set {words} --confirm-within 600")
    expect_equal(f"the status of the change ({result.stdout}{result.stderr})", result.returncode, 0)
    expect(context.host.sh(f"{state}; true") != before, "nothing has changed")
    result = context.host.run(f"{AGENT} rollback")
    expect_equal("what the taking back tells", (result.stdout, result.stderr), ("change 1 is taken back\n", ""))
    expect_equal("the files", context.host.sh(f"{state}; true"), before)


@check("systemd-hostnamed: the host's name is asked of it, and is there after the next start; taken back, it knows the old one")
def host_name(context):
    host = context.host
    old = host.sh("hostname").strip()
    change_and_take_back(context, f"{NODE} HostName moon", "/etc/hostname /etc/hosts")
    expect_equal("what it says then", host.sh("hostnamectl --static").strip(), old)
    set_of_host(context, NODE, "HostName", "moon", "by systemd-hostnamed, in /etc/hostname")
    set_of_host(context, NODE, "DomainName", "example.com", "by systemd-hostnamed, in /etc/hostname")
    expect_equal("what it says", host.sh("hostnamectl --static").strip(), "moon.example.com")
    host.cut_power()
    expect_equal("the names after the next start", host.sh("hostname; hostname -s; hostname -d").split(),
                 ["moon.example.com", "moon", "example.com"])


@check("without systemd-hostnamed: the host's name is in its file")
def host_name_alone(context):
    context.host.sh("systemctl mask --runtime --now systemd-hostnamed")
    set_of_host(context, NODE, "HostName", "moon", "in /etc/hostname")
    expect_equal("the file", context.read("/etc/hostname"), "moon\n")


@check("the zone: link and name are there after the next start; taken back, they are as they were, and no clock was set")
def zone(context):
    host = context.host
    change_and_take_back(context, "computer TimeZoneOffset 330", "/etc/localtime /etc/timezone")
    set_of_host(context, "computer", "TimeZoneOffset", "330", "in /etc/localtime and /etc/timezone")
    host.cut_power()
    expect_equal("the zone", host.sh("date +%z; cat /etc/timezone; readlink /etc/localtime").split(),
                 ["+0530", "Asia/Kolkata", "/usr/share/zoneinfo/Asia/Kolkata"])


def expect_used(context, servers, domains):
    context.host.wait_for(f"resolvectl dns | grep -qx 'Global: {servers}' && resolvectl domain | grep -qx 'Global: {domains}'")


@check("systemd-resolved: name servers and domains are in a drop-in of ours and in use, also after its restart; taken back, both are gone")
def resolved(context):
    host = context.host
    host.sh("systemctl start systemd-resolved")
    link = host.sh("readlink /etc/resolv.conf")
    change_and_take_back(context, f"{NODE} DNSServers 192.0.2.53", f"{DROP_IN} /etc/resolv.conf /run/systemd/resolve/stub-resolv.conf")
    expect("192.0.2.53" not in host.sh("resolvectl dns"), "it has them still")
    set_of_host(context, NODE, "DNSServers", "192.0.2.53 2001:DB8::53", f"by systemd-resolved, in {DROP_IN}")
    set_of_host(context, NODE, "DNSSuffixes", "example.com example.org", f"by systemd-resolved, in {DROP_IN}")
    expect_used(context, "192.0.2.53 2001:db8::53", "example.com example.org ~.")
    host.sh("systemctl reset-failed systemd-resolved; systemctl restart systemd-resolved")
    expect_used(context, "192.0.2.53 2001:db8::53", "example.com example.org ~.")
    expect_equal("the link", host.sh("readlink /etc/resolv.conf"), link)
    expect("nameserver 127.0.0.53" in context.read("/run/systemd/resolve/stub-resolv.conf"), "its own file is not its own")
    set_of_host(context, NODE, "DNSServers", "192.0.2.54", f"by systemd-resolved, in {DROP_IN}")
    expect_used(context, "192.0.2.54", "example.com example.org ~.")


@check("ifupdown with resolvconf: name servers are in its head and first, also after ifdown and ifup; taken back, the head is as it was")
def resolvconf(context):
    host = context.host
    context.write("/etc/network/interfaces", STANZA)
    host.sh("ln -sf ../run/resolvconf/resolv.conf /etc/resolv.conf; ifup eth0; grep -q 192.0.2.1 /etc/resolv.conf")
    change_and_take_back(context, f"{NODE} DNSServers 192.0.2.53", f"{HEAD} /etc/resolv.conf /run/resolvconf/resolv.conf")
    set_of_host(context, NODE, "DNSServers", "192.0.2.53", f"by resolvconf, in {HEAD}")
    set_of_host(context, NODE, "DNSSuffixes", "example.com", "by resolvconf, in /etc/resolvconf/resolv.conf.d/tail")
    host.sh("ifdown eth0; ifup eth0")
    lines = [line for line in context.read("/run/resolvconf/resolv.conf").split("\n") if line and not line.startswith("#")]
    expect_equal("what it has made", lines, ["nameserver 192.0.2.53", "nameserver 192.0.2.1", "search lan.example", "search example.com"])


def evidence_of(host):
    def collect():
        for command in ("cat /etc/resolv.conf", "resolvectl --no-pager", "hostnamectl", "journalctl --no-pager -n 30 -o short-monotonic"):
            yield command, host.run(command).stdout.splitlines()
    return collect


def system_of(function):
    return ("resolvconf", WITH_RESOLVCONF) if function is resolvconf else ("keep", PACKAGES)


if __name__ == "__main__":
    sys.exit(main(__name__, __doc__, system_of, evidence_of))
