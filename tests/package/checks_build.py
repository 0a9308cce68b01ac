"""The packages as files."""

import os
import re
import subprocess

from tap import check, expect, expect_equal



def lines(*command):
    return subprocess.run(command, check=True, capture_output=True, text=True).stdout.splitlines()


@check("build: two builds of the same sources in two folders are the same bytes")
def same_bytes(context):
    expect(context.options.again, "no second build to compare with (--again)")
    for name in ("corvista-agent", "corvista-dev"):
        first = context.package(name)
        second = os.path.join(context.options.again, os.path.basename(first))
        with open(first, "rb") as one, open(second, "rb") as other:
            expect(one.read() == other.read(), f"{first} and {second} differ")


@check("build: lintian finds no error and no warning")
def lintian(context):
    result = subprocess.run(["lintian", "--allow-root", "--fail-on=error,warning", context.package("corvista-agent"),
                             context.package("corvista-dev")], capture_output=True, text=True)
    expect(result.returncode == 0, result.stdout + result.stderr)


@check("build: no file names the folder it was made in")
def no_traces(context):
    for name in ("corvista-agent", "corvista-dev"):
        data = subprocess.run(["dpkg-deb", "--fsys-tarfile", context.package(name)], check=True,
                              capture_output=True).stdout
        found = re.findall(rb"[\w./-]*/source/[\w./-]+", data)
        expect_equal(f"names in {name}", found, [])


@check("build: the configuration is the administrator's file, and everything else root's")
def owners(context):
    package = context.package("corvista-agent")
    conffiles = lines("dpkg-deb", "--info", package, "conffiles")
    expect_equal("files that an upgrade keeps", conffiles, ["/etc/corvista/agent.conf"])
    for line in lines("dpkg-deb", "--contents", package):
        mode, owner = line.split()[:2]
        alone = mode[0] == "l" or (mode[5] != "w" and mode[8] != "w" and "s" not in mode)
        expect(owner == "root/root" and alone, f"not root's alone: {line}")
