"""Installs the packages on a host with the real systemd, and checks what the service does there. Reports as TAP."""

import argparse
import os
import re
import resource
import sys
import time

HERE = os.path.dirname(os.path.abspath(__file__))
sys.path.insert(1, os.path.join(HERE, "..", "system"))

import root  # noqa: E402
from host import Host, HostFailure  # noqa: E402
from tap import CHECKS, Report  # noqa: E402

import checks_build  # noqa: F401,E402  each registers its checks, in this order
import checks_service  # noqa: F401,E402
import checks_guard  # noqa: F401,E402
import checks_packages  # noqa: F401,E402

# What the packages need, and what the checks ask with. Without these the host could not install them without a network.
PACKAGES = ["dbus", "init", "iproute2", "libblkid1", "libpam-systemd", "libsqlite3-0", "libstdc++6", "libsystemd0",
            "libudev1", "polkitd", "procps", "systemd", "systemd-sysv"]
CLOCK = 25  # CAP_SYS_TIME


class Context:
    """What the checks share."""

    def __init__(self, host, options):
        self.host = host
        self.options = options

    def package(self, name):
        return os.path.join(self.options.packages, f"{name}_1.0.0_{self.options.arch}.deb")


def arguments():
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument("--packages", required=True, help="directory of the packages")
    parser.add_argument("--again", default="", help="directory of a second build of the same sources")
    parser.add_argument("--arch", default="amd64")
    parser.add_argument("--only", default="", help="run only the checks whose name matches; the first install is one")
    return parser.parse_args()


def bounding_set():
    with open("/proc/self/status", encoding="ascii") as status:
        return int(re.search(r"^CapBnd:\s*(\w+)", status.read(), re.MULTILINE).group(1), 16)


def evidence_of(host):
    def collect():
        journal = host.run("journalctl --no-pager -n 12 -o short-monotonic -u 'corvista-*' -u dbus -u polkit")
        yield "the journal", journal.stdout.splitlines()
    return collect


def main():
    options = arguments()
    if bounding_set() >> CLOCK & 1:
        raise SystemExit("with CAP_SYS_TIME this could set the machine's clock: start it as scripts/package-test does")
    start = time.monotonic()
    system = root.make("test", options.arch, PACKAGES)
    checks = [row for row in CHECKS["main"] if re.search(options.only, row[0])]
    report = Report()
    booting = time.monotonic()
    host = Host(system)
    print(f"# systemd is up after {time.monotonic() - booting:.1f} s", flush=True)
    try:
        context = Context(host, options)
        for name, function in checks:
            if isinstance(report.run(name, function, context, evidence_of(host)), HostFailure):
                break
    finally:
        host.stop()
    used = resource.getrusage(resource.RUSAGE_CHILDREN)
    print(f"# took {time.monotonic() - start:.0f} s, {used.ru_utime + used.ru_stime:.0f} s of processor time")
    return report.finish(len(checks))


if __name__ == "__main__":
    raise SystemExit(main())
