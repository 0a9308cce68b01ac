"""A host of its own in namespaces, with the real systemd as its first process."""

import contextlib
import os
import shutil
import signal
import subprocess
import tempfile
import time

HERE = os.path.dirname(os.path.abspath(__file__))
LONGEST_WAIT = 30  # seconds for what takes less than one


class HostFailure(AssertionError):
    """After this no other check is worth running."""


class Host:
    """Boots the system in `root`, which is not changed: what the host writes is in memory and gone with it."""

    def __init__(self, root):
        self.name = f"corvista-test-{os.getpid()}"
        self.work = tempfile.mkdtemp(prefix="corvista-package-test.")
        self._boot = [os.path.join(HERE, "boot"), root, self.work, self.name]
        self._outer = subprocess.Popen(["setpriv", "--pdeathsig=KILL", *self._boot])
        try:
            self._wait_up()
        except BaseException:
            self.stop()
            raise

    def _wait_up(self):
        self.init = self._first_process()
        self.wait_for("systemctl is-system-running | grep -q -e running -e degraded")

    def cut_power(self):
        """All its processes are gone at once; then it boots again, with its files as they were."""
        with open(f"/proc/{self._outer.pid}/ns/mnt", "rb") as disk:  # it lasts as long as somebody has it open
            os.kill(self.init, signal.SIGKILL)
            self._outer.wait()  # which waits for the first process, and that for all others
            enter = ["nsenter", f"--mount=/proc/self/fd/{disk.fileno()}"]
            self._outer = subprocess.Popen(["setpriv", "--pdeathsig=KILL", *enter, *self._boot, "again"],
                                           pass_fds=[disk.fileno()])
            self._wait_up()

    def _first_process(self):
        """Its number as it is seen from outside."""
        children = f"/proc/{self._outer.pid}/task/{self._outer.pid}/children"
        end = time.monotonic() + LONGEST_WAIT
        while self._outer.poll() is None and time.monotonic() < end:
            with contextlib.suppress(OSError):
                with open(children, encoding="ascii") as file:
                    for pid in file.read().split():
                        with open(f"/proc/{pid}/comm", encoding="ascii") as comm:
                            if comm.read().strip() == "systemd":
                                return int(pid)
            time.sleep(0.02)
        raise HostFailure("no systemd comes up:\n" + self.console())

    def run(self, script, user="root"):
        """A finished shell in the host; its output is text."""
        enter = ["nsenter", "--target", str(self.init), "--mount", "--uts", "--ipc", "--net", "--pid", "--cgroup",
                 "--wdns=/"]
        become = [] if user == "root" else ["runuser", "-u", user, "--"]
        environment = {"PATH": "/usr/sbin:/usr/bin:/sbin:/bin", "HOME": "/root", "LC_ALL": "C.UTF-8",
                       "DEBIAN_FRONTEND": "noninteractive"}
        return subprocess.run([*enter, *become, "sh", "-c", script], capture_output=True, text=True, env=environment,
                              stdin=subprocess.DEVNULL, timeout=120, start_new_session=True)

    def sh(self, script, user="root"):
        """What the script printed; a script that fails is a failure of the check."""
        result = self.run(script, user)
        if result.returncode != 0:
            raise AssertionError(f"{script}\nended with status {result.returncode}:\n{result.stdout}{result.stderr}")
        return result.stdout

    def wait_for(self, script, seconds=LONGEST_WAIT):
        """Until the script ends with status 0."""
        end = time.monotonic() + seconds
        while True:
            result = self.run(script)
            if result.returncode == 0:
                return result.stdout
            if time.monotonic() > end:
                raise AssertionError(f"not within {seconds} s: {script}\n{result.stdout}{result.stderr}")
            time.sleep(0.05)

    def put(self, file, path):
        """Copies a file of the machine to that path in the host."""
        shutil.copy(file, f"/proc/{self.init}/root{path}")

    def console(self):
        with contextlib.suppress(OSError):
            with open(self.work + ".console", encoding="utf-8", errors="replace") as file:
                return file.read()
        return ""

    def stop(self):
        self._outer.kill()  # its first process dies with it, and with that all others
        self._outer.wait()
        self._remove_group()
        os.rmdir(self.work)
        with contextlib.suppress(OSError):
            os.remove(self.work + ".console")

    def _remove_group(self):
        with tempfile.TemporaryDirectory() as mount:
            subprocess.run(["mount", "-t", "cgroup2", "none", mount], check=True)
            try:
                end = time.monotonic() + LONGEST_WAIT
                while not self._is_group_gone(os.path.join(mount, self.name)) and time.monotonic() < end:
                    time.sleep(0.02)
            finally:
                subprocess.run(["umount", mount], check=True)

    @staticmethod
    def _is_group_gone(group):
        with contextlib.suppress(OSError):
            for directory, _, _ in os.walk(group, topdown=False):
                os.rmdir(directory)
        return not os.path.exists(group)
