"""What becomes of the packages: a plug-in written with one, an upgrade, a removal, a purge."""

import os
import re
import subprocess
import tempfile

from checks_service import CONF, UNIT, main_pid, wait_up
from tap import check, expect, expect_equal

HERE = os.path.dirname(os.path.abspath(__file__))
TRIPLETS = {"amd64": "x86_64-linux-gnu", "i386": "i386-linux-gnu"}
DATA = "/opt/vantrel/corvista/data"


def newer(package, directory):
    """The same package with a higher version."""
    tree = os.path.join(directory, "tree")
    subprocess.run(["dpkg-deb", "-R", package, tree], check=True)
    control = os.path.join(tree, "DEBIAN", "control")
    with open(control, encoding="utf-8") as file:
        text = file.read()
    with open(control, "w", encoding="utf-8") as file:
        file.write(text.replace("Version: 1.0.0\n", "Version: 1.0.1\n"))
    result = os.path.join(directory, "newer.deb")
    subprocess.run(["dpkg-deb", "--root-owner-group", "-Znone", "-b", tree, result], check=True,
                   stdout=subprocess.DEVNULL)
    return result


@check("dev: the plug-in of the documentation is built with the packages' files alone, and read")
def plugin(context):
    with open(os.path.join(HERE, "../../docs/plug-ins.md"), encoding="utf-8") as file:
        source = re.search(r"```cpp\n(// Tells for how long.*?)```", file.read(), re.DOTALL).group(1)
    host = context.host
    triplet = TRIPLETS[context.options.arch]
    with tempfile.TemporaryDirectory() as directory:
        for name in ("corvista-agent", "corvista-dev"):
            subprocess.run(["dpkg-deb", "-x", context.package(name), directory], check=True)
        source_file, library = (os.path.join(directory, name) for name in ("uptime.cpp", "libuptime.so.1"))
        with open(source_file, "w", encoding="utf-8") as file:
            file.write(source)
        flags = subprocess.run(["pkg-config", "--cflags", "--libs", "corvista"], check=True, capture_output=True,
                               text=True, env={**os.environ, "PKG_CONFIG_SYSROOT_DIR": directory,
                                               "PKG_CONFIG_LIBDIR": f"{directory}/usr/lib/{triplet}/pkgconfig"})
        bits = ["-m32"] if context.options.arch == "i386" else []
        subprocess.run(["g++", *bits, "-std=c++20", "-shared", "-fPIC", source_file, "-o", library,
                        *flags.stdout.split()], check=True)
        host.put(library, f"/usr/lib/{triplet}/corvista/plug-ins/libuptime.so.1")
    host.sh(f"chmod 644 /usr/lib/{triplet}/corvista/plug-ins/libuptime.so.1; systemctl restart {UNIT}")
    wait_up(context)
    tree = host.sh("busctl tree --list com.vantrel.Corvista1")
    expect("type_2d900" in tree or "uptime" in tree, tree)
    host.sh(f"rm /usr/lib/{triplet}/corvista/plug-ins/libuptime.so.1; systemctl restart {UNIT}")
    wait_up(context)


@check("upgrade: the new version runs, and settings, history and data are kept")
def upgrade(context):
    host = context.host
    before = main_pid(context)
    host.sh(f"echo '# of the administrator' >> {CONF}; touch /var/lib/corvista/mark {DATA}/mark")
    with tempfile.TemporaryDirectory() as directory:
        host.put(newer(context.package("corvista-agent"), directory), "/tmp/newer.deb")
    host.sh("apt-get install -y --no-install-recommends /tmp/newer.deb")
    wait_up(context)
    expect(main_pid(context) != before, "the old version still runs")
    expect_equal("the administrator's line", host.sh(f"tail -n 1 {CONF}"), "# of the administrator\n")
    host.sh(f"ls /var/lib/corvista/mark {DATA}/mark")


@check("upgrade: one that was stopped and switched off stays so")
def upgrade_stopped(context):
    host = context.host
    host.sh(f"systemctl disable --now {UNIT} && dpkg -i /tmp/newer.deb")
    expect_equal("enabled", host.run(f"systemctl is-enabled {UNIT}").stdout.strip(), "disabled")
    host.sh(f"systemctl enable --now {UNIT}")
    wait_up(context)


@check("remove: the service ends, what the administrator and the agent have written stays")
def remove(context):
    host = context.host
    host.sh("apt-get remove -y corvista-agent")
    expect_equal("processes", host.sh("pgrep -l cvagent || true"), "")
    expect_equal("failed units", host.sh("systemctl --failed --plain --no-legend"), "")
    host.sh(f"ls {CONF} /var/lib/corvista/mark {DATA}/mark")


@check("purge: nothing is left")
def purge(context):
    host = context.host
    host.sh("apt-get purge -y corvista-agent")
    left = host.sh("find / -xdev \\( -path /proc -o -path /sys -o -path /tmp -o -path /root -o -path /run "
                   "-o -path /var/log -o -path /var/lib/dpkg -o -path /var/lib/apt -o -path /var/cache \\) -prune "
                   "-o \\( -iname '*corvista*' -o -iname '*cvagent*' -o -iname '*vantrel*' \\) -print")
    expect_equal("files", left, "")
    expect_equal("group", host.run("getent group corvista").stdout, "")
    expect_equal("in dpkg", host.run("dpkg -l | grep corvista").stdout, "")
    expect_equal("units", host.sh("systemctl list-units --all --plain --no-legend | grep corvista || true"), "")
