"""The guest as the checks see it: its files, its sysfs, and cvagent running in it."""

import json
import shlex

from tap import expect

EVENTS = "/run/events"
LOG = "/run/plugin.log"
LONGEST_WAIT = 300  # seconds of the guest's time; the slowest monitor looks once a minute


def by_id(node):
    """A node's properties as {number: value}."""
    return {int(number): row.get("value") for number, row in node["properties"].items()}


class Guest:
    def __init__(self, machine):
        self.machine = machine

    def sh(self, script):
        """What the script printed; a script that fails is a failure of the check."""
        result = self.machine.run(script)
        expect(result.status == 0, f"{script}\nended with status {result.status}:\n{result.out}{result.err}")
        return result.out

    def read(self, path):
        return self.sh(f"cat {shlex.quote(path)}")

    def sleep(self, seconds):
        self.sh(f"sleep {seconds}")

    def wait_for_text(self, file, text):
        """Until the file has it, which may be so already."""
        result = self.machine.run(f"i=0; until grep -q -F {shlex.quote(text)} {file}; do sleep 1; i=$((i + 1)); "
                                  f"[ $i -lt {LONGEST_WAIT} ] || exit 1; done")
        expect(result.status == 0, f"not within {LONGEST_WAIT} s in {file}: {text}")

    def names(self, pattern):
        """Base names of the paths that match."""
        return [path.rsplit("/", 1)[1] for path in self.sh(f"for p in {pattern}; do echo $p; done").split()
                if "*" not in path]

    def cvagent(self, *words, status=0):
        """One run of cvagent, its JSON read. It gets files of its own: an agent may be running."""
        line = shlex.join(["cvagent", *words, "--json"])
        own = "mount -t tmpfs -o mode=700 none /opt/vantrel/corvista/data"
        result = self.machine.run(f"unshare -m sh -c {shlex.quote(own + ' && exec ' + line)}")
        expect(result.status == status, f"{line}\nended with status {result.status}:\n{result.out}{result.err}")
        return json.loads(result.out)

    def set(self, node, name, *values, status=0):
        """Sets a property on the host's own files and returns the values before and after."""
        line = shlex.join(["cvagent", "--log", LOG, "--log-level", "3000", "set", node, name, *values, "--json"])
        result = self.machine.run(line)
        expect(result.status == status, f"{line}\nended with status {result.status}:\n{result.out}{result.err}")
        change = json.loads(result.out)["property"]
        return change["old"].get("value"), change["new"].get("value")


class Watch:
    """cvagent watching in the background, with its events and the plug-in's log in files."""

    def __init__(self, guest):
        self.guest = guest
        self.pid = None

    def start(self):
        line = f"cvagent watch --json --log {LOG} --log-level 3000 >> {EVENTS} 2> /run/watch.err"
        self.guest.sh(f": > {EVENTS}; : > {LOG}; {line} & echo $! > /run/watch.pid")
        self.pid = int(self.guest.read("/run/watch.pid"))
        self.wait_log("returning from createCurNetNodeMap", 1)

    def stop(self):
        script = f"kill {self.pid}; i=0; while [ -d /proc/{self.pid} ]; do sleep 1; i=$((i + 1)); [ $i -lt 60 ]; done"
        self.guest.sh(script)
        self.pid = None

    def wait(self, file, text, count):
        """Until the file has that many lines with the text, which may be past already."""
        script = (f"i=0; until [ $(grep -c -F {shlex.quote(text)} {file}) -ge {count} ]; do "
                  f"sleep 1; i=$((i + 1)); [ $i -lt {LONGEST_WAIT} ] || exit 1; done")
        result = self.guest.machine.run(script)
        expect(result.status == 0, f"not {count} times within {LONGEST_WAIT} s in {file}: {text}")

    def wait_log(self, text, count=1):
        self.wait(LOG, text, count)

    def events(self):
        return [json.loads(line) for line in self.guest.read(EVENTS).splitlines()]

    def forget_events(self):
        self.guest.sh(f": > {EVENTS}")

    def alerts(self):
        """(last part of the node's path, message) of every alert."""
        return [(event["path"].rsplit("/", 1)[1], event["message"]) for event in self.events()
                if event["event"] == "alert"]

    def wait_alert(self, message, count=1):
        self.wait(EVENTS, json.dumps(message), count)

    def passes(self, count):
        """Waits for whole passes of the network monitor from now on."""
        done = int(self.guest.sh(f"grep -c -F 'writePrevNetNodeMap: exit' {LOG} || true"))
        self.wait_log("writePrevNetNodeMap: exit", done + count)

    def disk_passes(self, count):
        done = int(self.guest.sh(f"grep -c -F 'Hard Drive ThreadProcess :: Exit' {LOG} || true"))
        self.wait_log("Hard Drive ThreadProcess :: Exit", done + count)

    def usage(self):
        """Resident memory in KiB, open descriptors and threads."""
        # The kernel's own sum of the process is behind by up to 64 pages a thread.
        memory = self.guest.read(f"/proc/{self.pid}/smaps_rollup").split("Rss:")[1]
        status = dict(line.split(":", 1) for line in self.guest.read(f"/proc/{self.pid}/status").splitlines())
        descriptors = len(self.guest.names(f"/proc/{self.pid}/fd/*"))
        return int(memory.split()[0]), descriptors, int(status["Threads"])
