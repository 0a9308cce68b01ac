"""Changes that wait for a confirmation, where systemd looks after their guard."""

import json
import time

from checks_service import NAME, UNIT, wait_up
from tap import check, expect, expect_equal

# Everything that the changes of these checks touch.
STATE = ("head -n 99 /etc/resolv.conf /etc/hosts /etc/HOSTNAME /etc/sysconfig/network/* 2>&1; hostname; "
         "ip -o address show dev cable0; ip route show dev cable0")
CHANGES = [{"node": "ip-config:cable0", "property": "IPv4Address", "value": "192.0.2.44"},
           {"node": "ip-config:cable0", "property": "HostName", "value": "other"},
           {"node": "ip-config:cable0", "property": "DNSServers", "value": ["192.0.2.99"]}]
HURT = ("stop", "kill --signal=KILL", "kill --kill-who=main --signal=KILL")
# As the programs of a network do: after network-pre.target, before network.target.
READER = """[Unit]
DefaultDependencies=no
After=local-fs.target network-pre.target
Before=network.target
Wants=network.target
[Service]
Type=oneshot
ExecStart=sh -c 'cat /etc/resolv.conf /etc/hosts /etc/sysconfig/network/ifcfg-* >/run/read-by-network'
[Install]
WantedBy=multi-user.target
"""


def stages(context):
    """{number of a change: what became of it}."""
    lines = context.host.sh("cvagent history --changes --json").splitlines()
    return {entry["change"]: entry["stage"] for entry in map(json.loads, lines)}


def newest(context):
    return max(stages(context), default=0)


def make(context, within):
    """The number of a change of an address, a name and a name server that waits for its confirmation."""
    context.host.sh(f"cvagent apply /root/changes.json --verify-within 0 --confirm-within {within}")
    return newest(context)


def make_by_unit(context, mode):
    """The same, of one property, made by a unit whose processes are ended in that way."""
    last = newest(context)
    context.host.sh(f"systemd-run --quiet --collect --unit=typist --property=KillMode={mode} sh -c 'cvagent set "
                    "ip-config:cable0 DNSServers 192.0.2.99 --confirm-within 300; exec sleep 300'")
    context.host.wait_for("cvagent history --changes | grep 'waits for its confirmation'")
    number = newest(context)
    expect(number > last, "no change was made")
    return number


def guard_of(context, number):
    """The process of the unit, which is at work."""
    pid = int(context.host.sh(f"systemctl show corvista-guard-{number} -p MainPID --value"))
    expect(pid > 0, f"no guard of change {number}")
    return pid


def wait_taken_back(context, number, before):
    context.host.wait_for(f"cvagent history --changes | grep -q '^{number} .*is taken back'")
    context.host.wait_for(f"! systemctl list-units --all --no-legend | grep corvista-guard-{number}")
    expect_equal("the host", context.host.sh(STATE), before)


@check("guard: it outlives who made the change and the service, however they end")
def outlives(context):
    host = context.host
    host.sh("mkdir -p /etc/sysconfig/network; printf 'BOOTPROTO=static\\nIPADDR=192.0.2.10\\nNETMASK=255.255.255.0\\n' "
            "> /etc/sysconfig/network/ifcfg-eth-id-$(cat /sys/class/net/cable0/address)")
    with open(f"/proc/{host.init}/root/root/changes.json", "w", encoding="utf-8") as file:
        json.dump(CHANGES, file)
    before = host.sh(STATE)
    for mode in ("control-group", "process", "mixed"):
        host.sh(f"mkdir -p /run/systemd/system/{UNIT}.d; printf '[Service]\\nKillMode={mode}\\n' "
                f"> /run/systemd/system/{UNIT}.d/test.conf; systemctl daemon-reload")
        for hurt in HURT:
            number = make_by_unit(context, mode)
            guard = guard_of(context, number)
            host.sh(f"systemctl {hurt} typist.service {UNIT}")
            host.wait_for("! systemctl is-active typist.service")
            host.sh(f"systemctl restart {UNIT}")
            expect_equal(f"the guard after {mode}, {hurt}", guard_of(context, number), guard)
            expect("192.0.2.99" in host.sh(STATE), "it was taken back too early")
            host.sh(f"cvagent confirm {number} --lengthen 0")
            wait_taken_back(context, number, before)
    host.sh(f"rm -r /run/systemd/system/{UNIT}.d; systemctl daemon-reload; systemctl restart {UNIT}")
    wait_up(context)


@check("guard: what nobody confirms is taken back in time, without the service")
def in_time(context):
    host = context.host
    before = host.sh(STATE)
    host.sh(f"systemctl stop {UNIT}")
    number = make(context, 300)
    begin = time.monotonic()
    host.sh(f"cvagent confirm {number} --lengthen 3")
    wait_taken_back(context, number, before)
    expect(time.monotonic() - begin >= 3, "it was taken back too early")
    host.sh(f"systemctl start {UNIT}")
    wait_up(context)


@check("guard: killed itself, again and again, it is started again; what an upgrade starts anew leaves the change to it")
def killed(context):
    host = context.host
    before = host.sh(STATE)
    number = make(context, 300)
    for _ in range(8):  # more often than systemd usually starts anything anew
        guard = guard_of(context, number)
        host.sh(f"kill -KILL {guard}")
        host.wait_for(f"systemctl show corvista-guard-{number} -p MainPID --value | grep -v -x -e 0 -e {guard}")
    host.sh("systemctl restart corvista-restore")
    changed = host.sh(STATE)
    expect(all(value in changed for value in ("192.0.2.44/24", "192.0.2.99", "\nother\n")), changed)
    expect_equal("what becomes of it", stages(context)[number], "waits for its confirmation")
    host.sh(f"cvagent confirm {number} --lengthen 1")
    wait_taken_back(context, number, before)


@check("guard: stopped by a signal beyond the change's time, it takes it back when it goes on")
def stopped(context):
    host = context.host
    before = host.sh(STATE)
    number = make(context, 300)
    guard = guard_of(context, number)
    # Stopped in the middle of a look it has the journal in its hands.
    host.wait_for(f"kill -STOP {guard}; cvagent confirm {number} --lengthen 0 || {{ kill -CONT {guard}; false; }}")
    late = host.run(f"cvagent confirm {number}")
    expect(late.returncode == 1 and "its time is over" in late.stderr, late.stderr)
    expect("192.0.2.99" in host.sh(STATE), "somebody else has taken it back")
    host.sh(f"kill -CONT {guard}")
    wait_taken_back(context, number, before)


@check("guard: the service keeps and takes back a change in its sandbox")
def by_service(context):
    host = context.host
    ask = f"busctl --timeout=60 call {NAME} /com/vantrel/Corvista1 {NAME}.Agent"
    before = host.sh(STATE)
    number = make(context, 300)
    changed = host.sh(STATE)
    host.sh(f"{ask} Lengthen ud {number} 200; {ask} Confirm u {number}")
    expect_equal("what becomes of it", stages(context)[number], "is kept")
    expect_equal("the host", host.sh(STATE), changed)
    expect_equal("the answer", host.sh(f"{ask} Rollback u 0").strip(), f'usas {number} "is taken back" 0')
    wait_taken_back(context, number, before)
    host.sh("cvagent apply /root/changes.json --verify-within 0")  # which nobody has to confirm
    expect_equal("what becomes of it", stages(context)[number + 1], "is kept")
    host.sh("cvagent rollback")
    wait_taken_back(context, number + 1, before)


@check("guard: what somebody confirms stays, and can be taken back later")
def confirmed(context):
    host = context.host
    before = host.sh(STATE)
    number = make(context, 300)
    changed = host.sh(STATE)
    host.sh(f"cvagent confirm {number}")
    host.wait_for(f"! systemctl list-units --all --no-legend | grep corvista-guard-{number}")
    expect_equal("the host", host.sh(STATE), changed)
    host.sh(f"cvagent rollback {number}")
    wait_taken_back(context, number, before)


@check("restore: after a power cut what nobody had confirmed is taken back before the network reads its settings")
def power_cut(context):
    host = context.host
    expect_equal("enabled", host.sh("systemctl is-enabled corvista-restore").strip(), "enabled")
    host.sh(f"cat > /etc/systemd/system/reader.service <<'END'\n{READER}END\nsystemctl enable reader.service")
    host.sh("cvagent set ip-config:cable0 DNSServers 192.0.2.98 --confirm-within 300")
    kept = newest(context)
    host.sh(f"cvagent confirm {kept}")
    files = "cat /etc/resolv.conf /etc/hosts /etc/sysconfig/network/ifcfg-*"
    before = host.sh(files)
    number = make(context, 300)
    expect(host.sh(files) != before, "nothing was changed")
    host.cut_power()
    wait_up(context)
    expect_equal("what the network has read", host.sh("cat /run/read-by-network"), before)
    expect_equal("the files", host.sh(files), before)
    after = stages(context)
    expect_equal("the changes", (after[kept], after[number]), ("is kept", "is taken back"))
    host.wait_for(f"journalctl --no-pager -b -o cat -u corvista-restore | grep -q -x 'change {number}: is taken back'")
    expect_equal("failed units", host.sh("systemctl --failed --plain --no-legend"), "")


@check("plan: after the start of the host it is made in its sandbox again")
def plan_after_start(context):
    host = context.host
    plan = json.loads(host.sh("cvagent plan computer OwnerName planned --json"))["plan"]
    expect("planned" in plan["files"][0]["after"]["content"], plan)
    host.wait_for("journalctl --no-pager -b -o cat _PID=1 | grep 'plan@.*A change tried out'")
