"""The service as an administrator meets it: installed, asked, hurt, reloaded, stopped."""

import json
import os
import re

from host import HostFailure
from tap import check, expect, expect_equal

UNIT = "corvista-agent.service"
PLAN_UNIT, PLAN_SOCKET = "corvista-plan@.service", "corvista-plan.socket"
NAME = "com.vantrel.Corvista1"
OWNER_NAME = 116  # of a computer
HOST_NAME, DNS_SERVERS = 97, 94  # of an IP configuration
HERE = os.path.dirname(os.path.abspath(__file__))
CONF = "/etc/corvista/agent.conf"
CHANGES_ITSELF = re.compile("Time|Available|Free|Used|Uptime|Load|Frequency|Temperature|Bytes|Packets|Reads|Writes")
ASK = f"busctl --auto-start=no get-property {NAME} /com/vantrel/Corvista1 {NAME}.Agent"


def show(context, *properties):
    """{name: value} of the unit."""
    text = context.host.sh(f"systemctl show {UNIT} -p {','.join(properties)}")
    return dict(line.split("=", 1) for line in text.splitlines())


def main_pid(context):
    pid = int(show(context, "MainPID")["MainPID"])
    expect(pid > 0, f"{UNIT} has no process")
    return pid


def wait_up(context):
    context.host.wait_for(f"systemctl is-active {UNIT} && {ASK} Version")


def restarted(context, before):
    """Waits until another process serves; how often the unit was restarted by then."""
    context.host.wait_for(f"[ $(systemctl show {UNIT} -p MainPID --value) -gt 0 ] && "
                          f"[ $(systemctl show {UNIT} -p MainPID --value) != {before} ]")
    wait_up(context)
    return int(show(context, "NRestarts")["NRestarts"])


def messages(context):
    return context.host.sh(f"journalctl --no-pager -o cat -u {UNIT}")


def wait_told(context, text):
    """Until the journal has it, which takes what it is sent in its own time."""
    context.host.wait_for(f"journalctl --no-pager -o cat -u {UNIT} | grep -q '{text}'")


@check("install: apt installs the package, and the service is up")
def install(context):
    host = context.host
    host.sh("ip link add cable0 type veth peer name cable1; ip address add 192.0.2.10/24 dev cable0; ip link set cable0 up")
    for name in ("corvista-agent", "corvista-dev"):
        host.put(context.package(name), f"/tmp/{name}.deb")
    try:
        host.sh("apt-get install -y --no-install-recommends /tmp/corvista-agent.deb 2>&1")
        wait_up(context)
    except AssertionError as failure:
        raise HostFailure(str(failure)) from failure
    state = show(context, "Type", "NotifyAccess", "UnitFileState", "SubState")
    expect_equal("the unit", (state["Type"], state["UnitFileState"], state["SubState"]), ("notify", "enabled", "running"))
    expect_equal("failed units", host.sh("systemctl --failed --plain --no-legend"), "")


@check("install: the group, the directory of the history, the bus and polkit know of it")
def around(context):
    host = context.host
    expect(host.sh("getent group corvista").startswith("corvista:"), "no group")
    expect_equal("directory", host.sh("stat -c '%a %U %G' /var/lib/corvista").strip(), "750 root corvista")
    actions = host.sh("pkaction | grep corvista").split()
    expect_equal("actions", actions, [f"com.vantrel.corvista1.{name}" for name in ("confirm", "plan", "power", "write")])
    for action in actions:
        details = host.sh(f"pkaction --verbose --action-id {action}")
        asked = 2 if action.endswith("plan") else 3  # a plan is for who sits at the host
        expect_equal(f"who is asked: {action}", details.count("auth_admin\n"), asked)


@check("sandbox: systemd rates it 5.0 or better")
def rated(context):
    for unit, most in ((UNIT, 5.0), (PLAN_UNIT, 4.6)):
        text = context.host.sh(f"systemd-analyze security --offline=true --no-pager /lib/systemd/system/{unit} 2>&1 | "
                               "tail -n 1")
        print(f"# {text.strip()}", flush=True)
        level = float(text.split(": ")[1].split()[0])
        expect(level <= most, text)


@check("plan: the units are sound, and the socket is root's alone")
def plan_units(context):
    host = context.host
    host.sh(f"systemd-analyze verify --man=no /lib/systemd/system/{PLAN_UNIT} /lib/systemd/system/{PLAN_SOCKET} "
            f"/lib/systemd/system/{UNIT}")
    host.sh(f"systemctl is-active {PLAN_SOCKET}")
    expect_equal("the socket", host.sh("stat -c '%a %U' /run/corvista/plan").strip(), "600 root")


@check("plan: made in the sandbox of its own it is the one that root makes by hand, and changes nothing")
def plan_by_service(context):
    host = context.host
    change = "plan ip-config:cable0 HostName planned --json"
    started = "$(journalctl --no-pager -o cat _PID=1 | grep -c 'Started .*plan@')"
    before = host.sh(f"echo {started}").strip()
    served = host.sh(f"cvagent {change}")
    host.wait_for(f"[ {started} -gt {before} ]")
    expect("planned" not in host.sh("hostname; cat /etc/hosts"), "it was done")
    host.sh(f"systemctl stop {UNIT}")
    host.wait_for(f"[ $(systemctl is-active {PLAN_SOCKET}) = inactive ]")
    expect_equal("by hand", host.sh(f"cvagent --bus none {change}"), served)
    host.sh(f"systemctl start {UNIT}")
    wait_up(context)


@check("plan: a user whom polkit lets has root's plan but for what only root may read; another one hears why not")
def plan_by_user(context):
    host = context.host
    change = "cvagent plan computer OwnerName planned --json"
    refused = host.run(change, user="nobody")
    expect("the service does not let you have its plan" in refused.stderr, refused.stderr)
    rule = 'polkit.addRule(function(action, subject) { if (action.id == "com.vantrel.corvista1.plan" && ' \
           'subject.user == "nobody") { return polkit.Result.YES; } });'
    host.sh(f"echo '{rule}' > /etc/polkit-1/rules.d/10-test.rules")
    host.wait_for(f"! runuser -u nobody -- {change} 2>&1 | grep -q 'does not let'")
    users = json.loads(host.sh(change, user="nobody"))["plan"]
    host.sh("rm /etc/polkit-1/rules.d/10-test.rules")
    roots = json.loads(host.sh(change))["plan"]
    expect("planned" in roots["files"][0]["after"]["content"], roots)
    expect(users["files"][0]["after"]["withheld"], users)
    expect_equal("the rest", {**users, "files": []}, {**roots, "files": []})


@check("sandbox: the page on security tells of every part of it")
def explained(context):
    with open(os.path.join(HERE, "../../docs/security.md"), encoding="utf-8") as file:
        page = file.read()
    units = "".join(context.host.sh(f"sed '1,/^# docs.security.md/d; /^.Install/,$d' /lib/systemd/system/{unit}")
                    for unit in (UNIT, PLAN_UNIT))
    for line in units.splitlines():
        key, _, words = line.partition("=")
        named = words.split() if key == "CapabilityBoundingSet" else [key] if key else []
        for word in named:
            expect(f"`{word}" in page, f"not in docs/security.md: {word}")


@check("sandbox: a walk within it finds what one without it finds")
def nothing_missed(context):
    host = context.host
    host.sh(f"systemctl stop {UNIT}")
    boxed = "/run/systemd/system/boxed.service"
    host.sh(f"sed -e 's|^ExecStart=.*|ExecStart=/usr/bin/cvagent tree --json|; s/^Type=.*/Type=oneshot/; "
            f"s|^Restart=.*|StandardOutput=file:/run/boxed|; /^WatchdogSec/d' "
            f"/lib/systemd/system/{UNIT} > {boxed}; systemctl daemon-reload; systemctl start boxed.service")
    within = host.sh(f"cat /run/boxed; rm {boxed} /run/boxed; systemctl daemon-reload")
    without = host.sh("cvagent tree --json")
    host.sh(f"systemctl start {UNIT}")
    wait_up(context)
    expect_equal("differences", differences(json.loads(within)["nodes"], json.loads(without)["nodes"]), [])


def differences(one, other):
    """(path, property, value, value) of what two trees have differently, apart from what changes all the time."""
    def facts(nodes):
        return {(node["path"], row["name"]): row.get("value") for node in nodes for row in node["properties"].values()
                if not CHANGES_ITSELF.search(row["name"])}
    left, right = facts(one), facts(other)
    expect(len(left) > 50, f"only {len(left)} facts")
    return [(*key, left.get(key), right.get(key)) for key in sorted({**left, **right}) if left.get(key) != right.get(key)]


@check("bus: everybody may ask, nobody but root may take the name")
def bus_policy(context):
    host = context.host
    expect(host.sh(f"{ASK} Version", user="nobody").startswith("s "), "no version for a user")
    tree = host.sh(f"busctl tree --list {NAME}", user="nobody")
    expect("/com/vantrel/Corvista1/oshw" in tree, tree)
    taken = host.run(f"busctl call org.freedesktop.DBus / org.freedesktop.DBus RequestName su {NAME} 4", user="nobody")
    expect("Access denied" in taken.stderr or "not allowed" in taken.stderr, taken.stdout + taken.stderr)


@check("bus: a user without polkit's consent changes nothing")
def write_denied(context):
    host = context.host
    node = host.sh(f"busctl call {NAME} /com/vantrel/Corvista1 {NAME}.Agent Find s computer").split()[1]
    owner = f"busctl call {NAME} /com/vantrel/Corvista1 {NAME}.Agent Write uuv {node} {OWNER_NAME} s"
    denied = host.run(f"{owner} mallory", user="nobody")
    expect(denied.returncode != 0 and "denied" in denied.stderr.lower(), denied.stdout + denied.stderr)
    expect("mallory" not in host.sh("cat /opt/vantrel/corvista/data/* 2>/dev/null || true"), "it was written")
    wait_told(context, "may not write")
    expect('"applied"' in host.sh(f"{owner} alice"), "root cannot write")
    expect("alice" in host.sh("cat /opt/vantrel/corvista/data/asset.dat"), "nothing was written")


def entries_of_writes(context):
    """What the journal keeps of each write: {field: value}."""
    fields = ("PRIORITY", "SYSLOG_IDENTIFIER", "CORVISTA_NODE", "CORVISTA_PROPERTY", "CORVISTA_CALLER_UID",
              "CORVISTA_VERDICT")
    text = context.host.sh(f"journalctl --no-pager -o json -u {UNIT} SYSLOG_IDENTIFIER=cvagentd")
    entries = [json.loads(line) for line in text.splitlines()]
    return [{name: entry.get(name) for name in fields} for entry in entries if "CORVISTA_VERDICT" in entry]


@check("journal: a write that was denied and one that was made are entries with fields of their own")
def fields(context):
    nobody = context.host.sh("id -u nobody").strip()
    common = {"SYSLOG_IDENTIFIER": "cvagentd", "CORVISTA_NODE": "/oshw/root/computer", "CORVISTA_PROPERTY": "OwnerName"}
    expected = [{**common, "PRIORITY": "4", "CORVISTA_CALLER_UID": nobody, "CORVISTA_VERDICT": "denied"},
                {**common, "PRIORITY": "5", "CORVISTA_CALLER_UID": "0", "CORVISTA_VERDICT": "applied"}]
    context.host.wait_for("journalctl --no-pager -o cat CORVISTA_VERDICT=applied | grep -q .")
    expect_equal("entries of the two writes before", entries_of_writes(context), expected)
    found = context.host.sh("journalctl --no-pager -o cat CORVISTA_VERDICT=denied").splitlines()
    expect_equal("what is found by a field", len(found), 1)


@check("cvagent: asks the service, shows what it shows by itself, and keeps one history with it")
def client(context):
    host = context.host
    served = host.sh("cvagent tree")
    service = main_pid(context)
    wrote = messages(context).count(" wrote ")
    host.sh("cvagent set computer OwnerName bob")
    expect("bob" in host.sh("cvagent history --json"), "the write is not in the history")
    host.wait_for(f"[ $(journalctl --no-pager -o cat -u {UNIT} | grep -c ' wrote ') -gt {wrote} ]")
    host.sh(f"systemctl stop {UNIT}")
    alone = host.sh("cvagent tree")
    host.sh("cvagent set computer OwnerName carol")
    kept = host.sh("cvagent history --json")
    expect("bob" in kept and "carol" in kept, kept)
    host.sh(f"systemctl start {UNIT}")
    wait_up(context)
    expect(main_pid(context) != service, "the service was not stopped")
    expect_equal("lines that differ", [line for line in served.splitlines() if line not in alone], [])
    expect("carol" in host.sh("cvagent history --json"), "what happened without the service")


@check("sandbox: what root writes through the service reaches the host's files and its kernel")
def writes(context):
    host = context.host
    node = host.sh(f"busctl call {NAME} /com/vantrel/Corvista1 {NAME}.Agent Find s ip-config:cable0").split()[1]
    write = f"busctl call --timeout=60 {NAME} /com/vantrel/Corvista1 {NAME}.Agent Write uuv {node}"
    host.sh(f"{write} {DNS_SERVERS} as 2 192.0.2.53 192.0.2.54")
    expect("nameserver 192.0.2.53\nnameserver 192.0.2.54\n" in host.sh("cat /etc/resolv.conf"), "no name servers")
    host.sh(f"{write} {HOST_NAME} s renamed")
    expect_equal("the kernel's name of the host", host.sh("hostname"), "renamed\n")
    expect("renamed" in host.sh("cat /etc/hosts"), "not in /etc/hosts")


@check("crash: killed, it is started again and answers")
def killed(context):
    before = main_pid(context)
    context.host.sh(f"kill -KILL {before}")
    expect(restarted(context, before) >= 1, "not restarted by systemd")


@check("watchdog: one that hangs is ended and started again")
def watchdog(context):
    host = context.host
    host.sh(f"mkdir -p /run/systemd/system/{UNIT}.d; printf '[Service]\\nWatchdogSec=4\\n' "
            f"> /run/systemd/system/{UNIT}.d/test.conf; systemctl daemon-reload; systemctl restart {UNIT}")
    wait_up(context)
    before = main_pid(context)
    host.sh("sleep 5")
    expect_equal("process after more than one watchdog's time", main_pid(context), before)
    host.sh(f"kill -STOP {before}")
    restarted(context, before)
    wait_told(context, "atchdog timeout")
    host.sh(f"rm -r /run/systemd/system/{UNIT}.d; systemctl daemon-reload; systemctl restart {UNIT}")
    wait_up(context)


@check("reload: the file is read again by the same process; a wrong line is told with its number and changes nothing")
def reload(context):
    host = context.host
    before = main_pid(context)
    host.sh(f"cp {CONF} /root/agent.conf; systemctl reload {UNIT}")
    host.sh(f"echo 'no such key' >> {CONF}")
    number = host.sh(f"wc -l < {CONF}").strip()
    refused = host.run(f"systemctl reload {UNIT}")
    expect(refused.returncode != 0, "systemctl reload took a wrong file")
    checked = host.run("cvagentd --check")
    expect(checked.returncode != 0 and number in checked.stderr + checked.stdout, checked.stdout + checked.stderr)
    host.wait_for(f"journalctl --no-pager -o cat -u {UNIT} | grep -q {CONF}.*{number}")
    wait_up(context)
    expect_equal("process", main_pid(context), before)
    host.sh(f"cp /root/agent.conf {CONF}; systemctl reload {UNIT}")
    expect_equal("process", main_pid(context), before)


@check("configuration: the file that is installed names every key, and each is taken")
def keys(context):
    host = context.host
    host.sh(f"sed 's/^#\\([a-z]\\)/\\1/' {CONF} > /root/all.conf; cvagentd --check --config /root/all.conf")
    named = host.sh("sed -n 's/^\\([a-z-]*\\) = .*/\\1/p' /root/all.conf").split()
    with open(os.path.join(HERE, "../../packaging/agent.conf.5"), encoding="utf-8") as file:
        page = file.read()
    with open(os.path.join(HERE, "../../agent/service/config.cpp"), encoding="utf-8") as file:
        known = re.findall(r'^    \{"([a-z-]+)", set', file.read(), re.MULTILINE)
    expect(len(known) > 3, f"keys in the source: {known}")
    expect_equal("keys in the file", sorted(named), sorted(known))
    for key in known:
        expect(".B " + key.replace("-", "\\-") + "\n" in page, f"not in agent.conf(5): {key}")


@check("journal: no complaint of the service or of its commands about the sandbox")
def quiet(context):
    lines = [line for line in messages(context).splitlines()
             if "Permission denied" in line or "Operation not permitted" in line or "Read-only" in line]
    expect_equal("complaints", lines, [])


@check("stop: it ends in order, nothing of it stays, and the command line works by itself")
def stop(context):
    host = context.host
    host.sh(f"systemctl stop {UNIT}")
    expect_equal("the unit", show(context, "ActiveState", "Result"), {"ActiveState": "inactive", "Result": "success"})
    expect_equal("processes", host.sh("pgrep -l cvagent || true"), "")
    expect("/oshw" in host.sh("cvagent tree --json"), "no tree without the service")
    expect_equal("the unit after that", host.run(f"systemctl is-active {UNIT}").stdout.strip(), "inactive")
    host.sh(f"systemctl start {UNIT}")
    wait_up(context)
