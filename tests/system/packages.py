"""Fetches 32-bit Debian packages into a cache of its own, without a word to the machine's package state."""

import os
import shlex
import subprocess
import sys

# What the guest runs, apart from the kernel and our own programs; their dependencies come with them.
TOOLS = ["bridge-utils", "busybox-static", "dash", "dbus-daemon", "dmidecode", "dmsetup", "ethtool", "hostname", "iproute2",
         "libsensors5", "libsqlite3-0", "libstdc++6", "smartmontools", "tzdata", "util-linux"]
ALONE = ["lm-sensors", "mdadm"]  # what they depend on besides the above is for what the guest does not run of them
KERNEL = "linux-image-686-pae"


def release_codename():
    with open("/etc/os-release", encoding="utf-8") as lines:
        entries = dict(line.rstrip("\n").split("=", 1) for line in lines if "=" in line)
    return shlex.split(entries["VERSION_CODENAME"])[0]


def machine_sources():
    """The archives this machine itself installs from, as one-line sources for i386.

    Only the release's own suites: what else a machine has configured is no business of the guest.
    """
    listing = subprocess.run(
        ["apt-get", "indextargets", "--format", "$(REPO_URI) $(RELEASE) $(COMPONENT)", "Created-By: Packages"],
        check=True, capture_output=True, text=True).stdout
    codename = release_codename()
    lines = dict.fromkeys(tuple(line.split()) for line in listing.splitlines())
    return [source for source in lines if source[1].startswith(codename) and source[2] == "main"]


class Apt:
    """An apt that knows i386 only and keeps its lists, state and downloads below one directory."""

    def __init__(self, directory):
        self.directory = directory
        self.archives = os.path.join(directory, "archives")
        for name in ("lists/partial", "archives/partial", "none/partial"):
            os.makedirs(os.path.join(directory, name), exist_ok=True)
        self._write("status", "")
        self.options = []
        for name, value in {
                "Dir::State": directory,
                "Dir::State::status": os.path.join(directory, "status"),
                "Dir::Cache": directory,
                "Dir::Etc::SourceList": os.path.join(directory, "sources.list"),
                "Dir::Etc::SourceParts": "/dev/null",
                "APT::Architecture": "i386",
                "APT::Architectures": "i386",
                "APT::Install-Recommends": "false",
                "APT::Sandbox::User": "",
                "Acquire::Languages": "none",
                "Acquire::Retries": "3",
                "Debug::NoLocking": "true",
        }.items():
            self.options += ["-o", f"{name}={value}"]

    def _write(self, name, text):
        with open(os.path.join(self.directory, name), "w", encoding="utf-8") as file:
            file.write(text)

    def _run(self, tool, *words, **more):
        return subprocess.run([tool, *self.options, "-q", *words], check=True, text=True, **more)

    def update(self):
        """Reads the indexes: all suites of the release when they can be had, the main one at the least."""
        sources = machine_sources()
        lines = [f"deb {uri} {suite} {component}\n" for uri, suite, component in sources]
        for attempt in (lines, lines[:1]):
            self._write("sources.list", "".join(attempt))
            result = subprocess.run(["apt-get", *self.options, "-q", "update"], text=True, capture_output=True)
            if result.returncode == 0 and "Err:" not in result.stdout:
                return
        sys.stderr.write(result.stdout + result.stderr)
        raise SystemExit("the package index of the machine's own archive cannot be read for i386")

    def kernel_package(self):
        """The package behind the kernel's stable name."""
        lines = self._run("apt-cache", "depends", KERNEL, capture_output=True).stdout.splitlines()
        return next(line.split()[-1] for line in lines if "Depends: linux-image-" in line)

    def uris(self, *words):
        """(address, file name, size) of what these words of apt-get would download."""
        # Packages that are here already would be left out.
        nowhere = ["-o", "Dir::Cache::archives=" + os.path.join(self.directory, "none", "")]
        lines = self._run("apt-get", *nowhere, "--print-uris", "-y", *words,
                          capture_output=True).stdout.splitlines()
        rows = [line.split() for line in lines if line.startswith("'")]
        return [(row[0].strip("'"), row[1], int(row[2])) for row in rows]


def fetch(directory):
    """Downloads what is not in the cache yet and returns the package files, the kernel's first."""
    apt = Apt(directory)
    apt.update()
    kernel = apt.kernel_package()
    wanted = apt.uris("download", kernel) + apt.uris("download", *ALONE) + apt.uris("install", *TOOLS)
    here = os.path.join(apt.archives, "")
    missing = [row for row in wanted if not os.path.exists(here + row[1])]
    if missing:
        megabytes = sum(size for _, _, size in missing) / 1e6
        print(f"# downloading {len(missing)} packages, {megabytes:.0f} MB, into {apt.archives}:", flush=True)
        for _, name, _ in missing:
            print(f"#   {name}", flush=True)
        subprocess.run(["apt-get", *apt.options, "-q", "-y", "--download-only", "install", *TOOLS],
                       check=True, stdout=subprocess.DEVNULL)
        subprocess.run(["apt-get", *apt.options, "-q", "download", kernel, *ALONE],
                       check=True, stdout=subprocess.DEVNULL, cwd=apt.archives)
    return [here + name for _, name, _ in wanted]
