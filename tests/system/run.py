"""Builds the guest, boots it, runs the checks and reports them as TAP."""

import argparse
import os
import re
import resource
import shutil
import tempfile
import threading
import time

import image
import packages
from guest import LOG, Guest, Watch
from machine import Machine, MachineFailure
from tap import CHECKS, Report, block

import checks_tree  # noqa: F401  each registers its checks, in this order
import checks_events  # noqa: F401
import checks_settings  # noqa: F401
import checks_stress  # noqa: F401
import checks_hardware  # noqa: F401
import checks_service  # noqa: F401


class Context:
    """What the checks share."""

    def __init__(self, machine):
        self.machine = machine
        self.guest = Guest(machine)
        self.watch = Watch(self.guest)
        self.tree = None
        self.alone = False


def arguments():
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument("--build", required=True, help="build directory of the 32-bit programs")
    parser.add_argument("--cache", required=True, help="where downloaded packages are kept")
    parser.add_argument("--only", default="", help="run only the checks whose name matches this pattern")
    return parser.parse_args()


def evidence_of(context):
    """The plug-in's log and the console as they are now."""
    def collect():
        yield "the guest's console", context.machine.console_tail()
        try:
            yield "the plug-in's log", context.machine.run(f"tail -n 60 {LOG}", 60).lines()
            yield "standard error of the agent", context.machine.run("tail -n 20 /run/watch.err", 60).lines()
        except (MachineFailure, OSError) as failure:
            yield "the plug-in's log", [f"cannot be read: {failure}"]
    return collect


class Runner(threading.Thread):
    """Boots one machine and runs its checks there."""

    def __init__(self, name, checks, report, guest_files, directory):
        super().__init__(name=name, daemon=True)
        self.checks, self.report, self.guest_files, self.directory = checks, report, guest_files, directory

    def run(self):
        os.makedirs(self.directory)
        start = time.monotonic()
        machine = Machine(self.directory, *self.guest_files, hardware=self.name == checks_hardware.MACHINE)
        try:
            machine.wait_ready()
            print(f"# the guest for {self.name} is up after {time.monotonic() - start:.0f} s", flush=True)
            context = Context(machine)
            for name, function in self.checks:
                if isinstance(self.report.run(name, function, context, evidence_of(context)), MachineFailure):
                    break
        except MachineFailure as failure:
            print("\n".join(block(f"the guest for {self.name} does not start: {failure}", machine.console_tail())))
        finally:
            machine.stop()


def build_guest(options, directory):
    """The kernel and the initramfs that all machines start from."""
    files = packages.fetch(options.cache)
    kernel = image.Kernel(files[0], options.cache)
    initramfs = os.path.join(directory, "initramfs")
    image.build_initramfs(files[1:], kernel, options.build, os.path.join(directory, "root"), initramfs)
    shutil.rmtree(os.path.join(directory, "root"))
    return kernel.image, initramfs


def main():
    options = arguments()
    os.makedirs(options.cache, exist_ok=True)
    chosen = {machine: [row for row in rows if re.search(options.only, row[0])] for machine, rows in CHECKS.items()}
    report = Report()
    start = time.monotonic()
    with tempfile.TemporaryDirectory(prefix="corvista-system-test.") as directory:
        guest_files = build_guest(options, directory)
        runners = [Runner(machine, checks, report, guest_files, os.path.join(directory, machine))
                   for machine, checks in chosen.items() if checks]
        for runner in runners:
            runner.start()
        for runner in runners:
            runner.join()
    used = resource.getrusage(resource.RUSAGE_CHILDREN)
    print(f"# took {time.monotonic() - start:.0f} s, {used.ru_utime + used.ru_stime:.0f} s of processor time")
    return report.finish(sum(len(checks) for checks in chosen.values()))


if __name__ == "__main__":
    raise SystemExit(main())
