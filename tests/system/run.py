"""Builds the guest, boots it, runs the checks and reports them as TAP."""

import argparse
import os
import re
import resource
import shutil
import tempfile
import time

import image
import packages
from guest import LOG, Guest, Watch
from machine import Machine, MachineFailure
from tap import CHECKS, Report

import checks_tree  # noqa: F401  each registers its checks, in this order
import checks_events  # noqa: F401
import checks_settings  # noqa: F401


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


def boot(options, directory):
    files = packages.fetch(options.cache)
    kernel = image.Kernel(files[0], options.cache)
    initramfs = os.path.join(directory, "initramfs")
    image.build_initramfs(files[1:], kernel, options.build, os.path.join(directory, "root"), initramfs)
    shutil.rmtree(os.path.join(directory, "root"))
    start = time.monotonic()
    machine = Machine(directory, kernel.image, initramfs)
    try:
        machine.wait_ready()
    except MachineFailure:
        print("\n".join("# " + line for line in machine.console_tail()))
        machine.stop()
        raise
    print(f"# the guest is up after {time.monotonic() - start:.1f} s", flush=True)
    return machine


def main():
    options = arguments()
    os.makedirs(options.cache, exist_ok=True)
    checks = [(name, function) for name, function in CHECKS if re.search(options.only, name)]
    report = Report()
    start = time.monotonic()
    with tempfile.TemporaryDirectory(prefix="corvista-system-test.") as directory:
        machine = boot(options, directory)
        try:
            context = Context(machine)
            for name, function in checks:
                report.run(name, function, context, evidence_of(context))
        finally:
            machine.stop()
    used = resource.getrusage(resource.RUSAGE_CHILDREN)
    print(f"# took {time.monotonic() - start:.0f} s, {used.ru_utime + used.ru_stime:.0f} s of processor time")
    return report.finish(len(checks))


if __name__ == "__main__":
    raise SystemExit(main())
