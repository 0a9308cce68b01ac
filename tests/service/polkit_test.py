#!/usr/bin/python3
"""The service with polkit itself and with one that asks the user: polkit_test.py polkitd|dbusmock CVAGENTD PLUGIN.

Both are on a bus of this test's own, in a mount namespace whose policies and rules are the test's. Exit status 77: skipped.
"""
import os
import pwd
import shutil
import subprocess
import sys
import tempfile
import time

SKIPPED = 77
ACTION = '<action id="com.vantrel.corvista1.{0}"><description>{0}</description><message>{0}</message>' \
    "<defaults><allow_any>no</allow_any><allow_inactive>no</allow_inactive><allow_active>no</allow_active></defaults></action>"
RULE = """polkit.addRule(function(action, subject) {
  if (/^com.vantrel.corvista1.(write|plan)$/.test(action.id) && subject.user == "games") { return polkit.Result.YES; }
});
"""
BUS = """<busconfig><type>system</type><listen>unix:path={0}/bus</listen><auth>EXTERNAL</auth>
<policy context="default"><allow user="*"/><allow own="*"/><allow send_type="method_call"/><allow send_type="signal"/>
<allow send_requested_reply="true" send_type="method_return"/><allow send_requested_reply="true" send_type="error"/>
<allow receive_type="method_call"/><allow receive_type="method_return"/><allow receive_type="error"/><allow receive_type="signal"/>
</policy></busconfig>"""
COMPUTER = "/com/vantrel/Corvista1/oshw/root/computer"
CONTACT, POWER_STATE = "115", "123"


def write(text, file):
    os.makedirs(os.path.dirname(file), exist_ok=True)
    with open(file, "w") as out:
        out.write(text)


class Run:
    def __init__(self, folder):
        self.folder, self.processes = folder, []
        self.address = f"unix:path={folder}/bus"
        self.environment = dict(os.environ, DBUS_SYSTEM_BUS_ADDRESS=self.address, CORVISTA_DATA_DIR=f"{folder}/data",
                                CORVISTA_FAKE_PLUGIN_DIARY=f"{folder}/diary")

    def start(self, *words):
        self.processes.append(subprocess.Popen(words, env=self.environment, stderr=subprocess.DEVNULL, stdout=subprocess.DEVNULL))

    def busctl(self, user, *words):
        who = pwd.getpwnam(user)
        done = subprocess.run(["setpriv", f"--reuid={who.pw_uid}", f"--regid={who.pw_gid}", "--clear-groups", "busctl", f"--address={self.address}", *words],
                              capture_output=True, text=True, timeout=60)
        return done.stdout + done.stderr

    def wait_for(self, name):
        end = time.monotonic() + 20
        while "true" not in self.busctl("root", "call", "org.freedesktop.DBus", "/", "org.freedesktop.DBus", "NameHasOwner", "s", name):
            if time.monotonic() > end:
                sys.exit(f"{name} does not come")
            time.sleep(0.05)

    def change(self, user, text):
        return self.busctl(user, "call", "com.vantrel.Corvista1", COMPUTER, "com.vantrel.Corvista1.Node", "Write", "uv", CONTACT, "s", text)

    def plan(self, user):
        return self.busctl(user, "--timeout=60", "call", "com.vantrel.Corvista1", "/com/vantrel/Corvista1", "com.vantrel.Corvista1.Agent", "Plan", "a(ssv)",
                           "1", "computer", "OwnerContact", "s", "planned")

    def apply(self, user, text):
        return self.busctl(user, "--timeout=60", "call", "com.vantrel.Corvista1", "/com/vantrel/Corvista1", "com.vantrel.Corvista1.Agent", "Apply",
                           "a(ssv)a{sv}", "1", "computer", "OwnerContact", "s", text, "1", "plain", "b", "true")

    def diary(self):
        with open(f"{self.folder}/diary") as file:
            return file.read()

    def end(self):
        for process in reversed(self.processes):
            process.kill()
            process.wait()


def expect(condition, *shown):
    if not condition:
        sys.exit("not as expected: " + " | ".join(map(str, shown)))


def with_polkitd(run):
    """A rule says yes for one user, the action's default no for everybody else."""
    run.start("/usr/lib/polkit-1/polkitd", "--no-debug")
    run.wait_for("org.freedesktop.PolicyKit1")
    denied = run.change("nobody", "mine")
    expect("Access denied" in denied or "may not write" in denied, denied)
    expect("=" not in run.diary(), run.diary())
    allowed = run.change("games", "ours")
    expect('"applied"' in allowed, allowed)
    expect("=" in run.diary(), run.diary())
    expect('"applied"' in run.change("root", "roots"))
    for refused in (run.plan("nobody"), run.apply("nobody", "mine")):
        expect("you may not" in refused or "Access denied" in refused, refused)
    # Whether namespaces can be had here or not: polkit has let it pass.
    planned = run.plan("games")
    expect("planned" in planned or "there is no plan" in planned, planned)
    expect('"applied"' in run.apply("games", "all at once"))
    expect("mine" not in run.diary(), run.diary())


def with_dbusmock(run):
    """One that says no, then is told to say yes."""
    run.start("/usr/bin/python3", "-m", "dbusmock", "--template", "polkitd")
    run.wait_for("org.freedesktop.PolicyKit1")
    denied = run.change("nobody", "mine")
    expect("Access denied" in denied or "may not write" in denied, denied)
    run.busctl("root", "call", "org.freedesktop.PolicyKit1", "/org/freedesktop/PolicyKit1/Authority", "org.freedesktop.DBus.Mock",
               "SetAllowed", "as", "1", "com.vantrel.corvista1.write")
    allowed = run.change("nobody", "asked for")
    expect('"applied"' in allowed, allowed)


def main():
    kind, program, plugin = sys.argv[1:4]
    needed = {"polkitd": "/usr/lib/polkit-1/polkitd", "dbusmock": "/usr/lib/python3/dist-packages/dbusmock"}[kind]
    if os.geteuid() != 0 or not os.path.exists(needed) or not shutil.which("busctl") or not shutil.which("dbus-daemon"):
        sys.exit(SKIPPED)
    if "--inside" not in sys.argv:
        os.execvp("unshare", ["unshare", "-mn", "--propagation", "private", "capsh", "--drop=cap_sys_time", "--", "-c",
                              'exec "$@"', "-", *sys.argv, "--inside"])
    os.umask(0o022)  # polkitd reads as a user of its own
    for place in ("/usr/share/polkit-1/actions", "/usr/share/polkit-1/rules.d", "/etc/polkit-1", "/opt", "/run", "/tmp", "/var/lib"):
        if os.path.isdir(place) and not program.startswith(place + "/"):
            subprocess.run(["mount", "-t", "tmpfs", "-o", "mode=755", "none", place], check=True)
    write(f"<policyconfig>{''.join(map(ACTION.format, ('write', 'power', 'plan')))}</policyconfig>",
          "/usr/share/polkit-1/actions/com.vantrel.corvista1.policy")
    write(RULE, "/etc/polkit-1/rules.d/50-test.rules")
    folder = tempfile.mkdtemp(dir="/run")
    os.chmod(folder, 0o755)
    write(BUS.format(folder), f"{folder}/bus.conf")
    run = Run(folder)
    try:
        run.start("dbus-daemon", "--nofork", "--nopidfile", f"--config-file={folder}/bus.conf")
        run.wait_for("org.freedesktop.DBus")
        run.start(program, "--bus", "system", "--plugin", plugin)
        run.wait_for("com.vantrel.Corvista1")
        (with_polkitd if kind == "polkitd" else with_dbusmock)(run)
    finally:
        run.end()


if __name__ == "__main__":
    main()
