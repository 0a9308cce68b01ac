"""The virtual machine: starting it, driving its hardware through QMP, running commands inside."""

import base64
import json
import os
import socket
import subprocess
import time

NICS = 5
DISKS = {"sda": 6144, "sdb": 24}  # MiB; the first has more bytes than 32 bits count
# Of the machine that has drives of every kind, by the names they get there: model, serial number, firmware, QEMU's words.
# sda and sdb hang on virtio-scsi as in the other machines.
HARDWARE_DRIVES = {
    "nvme0n1": ("QEMU NVMe Ctrl", "NVME0001", None, "nvme,serial=NVME0001"),
    "sdc": ("EXAMPLE MODEL OF MORE THAN 16 LETTERS", "SATA0001", "1.234567",
            "ide-hd,bus=ahci.0,model=EXAMPLE MODEL OF MORE THAN 16 LETTERS,serial=SATA0001,ver=1.234567"),
    "vda": (None, "VIRTIO0001", None, "virtio-blk-pci,serial=VIRTIO0001"),
    "vdb": (None, "VIRTIO0002", None, "virtio-blk-pci,serial=VIRTIO0002"),
    "vdc": (None, None, None, "virtio-blk-pci"),
    "mmcblk0": ("QEMU!", "0xdeadbeef", None, "sd-card"),
}
# No network names of udev's, fast start, and nothing random in addresses: translated code is used again.
KERNEL_OPTIONS = ("console=ttyS0,115200 quiet loglevel=4 panic=-1 net.ifnames=0 clocksource=tsc tsc=reliable "
                  "random.trust_cpu=on mitigations=off init_on_alloc=0 apparmor=0 audit=0 nokaslr norandmaps")
LONGEST_BOOT = 240  # seconds of real time, on a machine that is busy with other things
LONGEST_COMMAND = 240


class MachineFailure(Exception):
    """The machine is gone or does not answer: nothing more can be checked."""


def mac(nic):
    return f"52:54:00:12:34:{nic:02x}"


class Lines:
    """A stream socket read line by line, with a limit on the wait."""

    def __init__(self, path, process, limit):
        end = time.monotonic() + limit
        self.socket = socket.socket(socket.AF_UNIX)
        while True:
            try:
                self.socket.connect(path)
                break
            except OSError as error:
                if time.monotonic() > end or process.poll() is not None:
                    raise MachineFailure(f"the virtual machine does not start: {error}") from error
                time.sleep(0.05)
        self.pending = b""

    def send(self, line):
        self.socket.sendall(line + b"\n")

    def read(self, limit):
        end = time.monotonic() + limit
        while b"\n" not in self.pending:
            self.socket.settimeout(max(0.01, end - time.monotonic()))
            try:
                data = self.socket.recv(65536)
            except TimeoutError:
                raise MachineFailure(f"no answer within {limit} s") from None
            if not data:
                raise MachineFailure("the virtual machine has ended")
            self.pending += data
        line, self.pending = self.pending.split(b"\n", 1)
        return line.rstrip(b"\r").decode(errors="replace")


class Result:
    """What a command in the guest gave."""

    def __init__(self, status, out, err):
        self.status, self.out, self.err = status, out, err

    def lines(self):
        return self.out.splitlines()


class Machine:
    """Time in the guest is counted in instructions and does not wait: as soon as all its processes sleep, the clock
    jumps to the next timer. So a minute of sleep costs well under a second, and nothing in the guest ever times out
    because the machine underneath is busy.

    The disks hang on virtio-scsi for that reason: it is the controller whose commands have no time limit, and the
    host's files answer in real time. The machine with hardware of every kind has a clock that runs as usual.
    """

    def __init__(self, directory, kernel, initramfs, hardware=False):
        self.directory = directory
        self.hardware = HARDWARE_DRIVES if hardware else {}
        self.console = os.path.join(directory, "console.log")
        self.events = []
        for name, megabytes in DISKS.items():
            self.make_disk(name, megabytes)
        for name in self.hardware:
            self.make_disk(name, 64)
        self.process = subprocess.Popen(self._command(kernel, initramfs), stdin=subprocess.DEVNULL,
                                        stdout=open(os.path.join(directory, "qemu.log"), "wb"),
                                        stderr=subprocess.STDOUT)
        self.monitor = Lines(self._path("qmp"), self.process, 30)
        self.monitor.read(30)
        self.qmp("qmp_capabilities")
        self.channel = Lines(self._path("channel"), self.process, 30)

    def _path(self, name):
        return os.path.join(self.directory, name)

    def _command(self, kernel, initramfs):
        words = ["setpriv", "--pdeathsig", "TERM",  # whatever ends the test ends the machine, too
                 "qemu-system-i386", "-accel", "tcg", "-smp", "1", "-m", "256", "-cpu", "qemu32",
                 *([] if self.hardware else ["-icount", "shift=3,sleep=off"]),
                 "-nodefaults", "-no-user-config", "-display", "none",
                 "-action", "reboot=shutdown",  # a guest that panics ends at once
                 "-rtc", "base=2026-01-01T00:00:00,clock=vm",
                 "-kernel", kernel, "-initrd", initramfs,
                 "-append", KERNEL_OPTIONS,
                 "-serial", "file:" + self.console,
                 "-chardev", f"socket,id=channel,path={self._path('channel')},server=on,wait=off",
                 "-serial", "chardev:channel",
                 "-qmp", f"unix:{self._path('qmp')},server=on,wait=off",
                 "-device", "virtio-scsi-pci,id=scsi"]
        for nic in range(NICS):  # each on a wire of its own, with nobody at the other end
            words += ["-netdev", f"hubport,id=wire{nic},hubid={nic}",
                      "-device", f"e1000,id=nic{nic},netdev=wire{nic},mac={mac(nic)}"]
        for name in DISKS:
            words += ["-blockdev", json.dumps(self._block_device(name)),
                      "-device", f"scsi-hd,id={name},bus=scsi.0,drive=drive-{name}"]
        if self.hardware:
            words += ["-device", "ahci,id=ahci", "-device", "sdhci-pci,id=sdhci"]
        for name, row in self.hardware.items():
            words += ["-blockdev", json.dumps(self._block_device(name)),
                      "-device", f"{row[3]},id={name},drive=drive-{name}"]
        return words

    def make_disk(self, name, megabytes):
        with open(self._path(name), "wb") as file:
            file.truncate(megabytes * 1024 * 1024)

    def _block_device(self, name):
        return {"driver": "raw", "node-name": "drive-" + name,
                "file": {"driver": "file", "filename": self._path(name)}}

    def qmp(self, command, **arguments):
        self.monitor.send(json.dumps({"execute": command, "arguments": arguments}).encode())
        while True:
            answer = json.loads(self.monitor.read(60))
            if "event" in answer:
                self.events.append(answer)
            elif "error" in answer:
                raise RuntimeError(f"{command}: {answer['error']['desc']}")
            else:
                return answer["return"]

    def wait_event(self, name, limit=60):
        """The next event of that name, one that has come already included."""
        end = time.monotonic() + limit
        while True:
            for event in self.events:
                if event["event"] == name:
                    self.events.remove(event)
                    return event
            answer = json.loads(self.monitor.read(max(0.01, end - time.monotonic())))
            if "event" in answer:
                self.events.append(answer)

    def cable(self, nic, plugged):
        self.qmp("set_link", name=f"nic{nic}", up=plugged)

    def add_disk(self, name, megabytes, broken=False):
        """A broken one answers every read with an error."""
        self.make_disk(name, megabytes)
        device = self._block_device(name)
        if broken:
            device = {"driver": "blkdebug", "node-name": device.pop("node-name"), "image": device,
                      "inject-error": [{"event": "none", "iotype": "read", "errno": 5}]}
        self.qmp("blockdev-add", **device)
        self.qmp("device_add", driver="scsi-hd", id=name, bus="scsi.0", drive="drive-" + name)

    def remove_disk(self, name):
        self.qmp("device_del", id=name)
        self.wait_event("DEVICE_DELETED")
        self.qmp("blockdev-del", **{"node-name": "drive-" + name})

    def slow_down(self, name, bytes_per_second):
        """How much a drive reads from now on; 0 for as much as it can."""
        self.qmp("block_set_io_throttle", id=name, bps=0, bps_rd=bytes_per_second, bps_wr=0, iops=0, iops_rd=0, iops_wr=0)

    def add_nic(self, nic):
        self.qmp("netdev_add", type="hubport", id=f"wire{nic}", hubid=nic)
        self.qmp("device_add", driver="e1000", id=f"nic{nic}", netdev=f"wire{nic}", mac=mac(nic))

    def wait_ready(self):
        end = time.monotonic() + LONGEST_BOOT
        while self.channel.read(max(0.01, end - time.monotonic())) != "ready!":
            pass

    def run(self, script, limit=LONGEST_COMMAND):
        """Runs a shell script in the guest."""
        self.start(script)
        return self.finish(limit)

    def start(self, script):
        self.channel.send(base64.b64encode(script.encode()))

    def finish(self, limit=LONGEST_COMMAND):
        def part(end):
            text = ""
            while (line := self.channel.read(limit)) != end:
                text += line
            return base64.b64decode(text).decode(errors="replace")
        status = int(self.channel.read(limit).rstrip("!"))
        return Result(status, part("out!"), part("err!"))

    def console_tail(self, lines=60):
        with open(self.console, encoding="utf-8", errors="replace") as file:
            return file.read().splitlines()[-lines:]

    def stop(self):
        self.process.terminate()
        try:
            self.process.wait(20)
        except subprocess.TimeoutExpired:
            self.process.kill()
            self.process.wait()
