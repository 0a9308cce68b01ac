"""Puts the guest together: packages, our programs and a SUSE-style /etc, as an initramfs."""

import glob
import os
import re
import shutil
import subprocess
import tempfile

HERE = os.path.dirname(os.path.abspath(__file__))
MODULES = ["e1000", "virtio_pci", "virtio_scsi", "sd_mod", "bonding", "8021q", "bridge"]
# Loaded by the checks that need them.
HARDWARE_MODULES = ["nvme", "ahci", "virtio_blk", "sdhci_pci", "mmc_block", "raid1", "dm_mod", "crc32c_generic", "ext4"]
# Of their other tools the guest has busybox's, or needs none.
ONLY = {"util-linux": ["bin/lsblk", "sbin/blkid", "usr/bin/lscpu"], "util-linux-extra": [], "lm-sensors": ["usr/bin/sensors"],
        "mdadm": ["sbin/mdadm"], "smartmontools": ["usr/sbin/smartctl"]}
# Of the packages only what runs: no documentation, and of the time zones the files, not the variants.
UNWANTED = ["usr/share/doc", "usr/share/man", "usr/share/locale", "usr/share/lintian", "usr/share/bash-completion",
            "usr/share/zoneinfo/posix", "usr/share/zoneinfo/right", "usr/share/perl5", "usr/share/debconf",
            "usr/lib/i386-linux-gnu/gconv", "usr/lib/locale"]


def extract(package, directory):
    os.makedirs(directory, exist_ok=True)
    subprocess.run(["dpkg-deb", "--fsys-tarfile", package], check=True,
                   stdout=open(os.path.join(directory, ".tar"), "wb"))
    subprocess.run(["tar", "-xf", ".tar", "--no-same-owner", "--keep-directory-symlink"], check=True, cwd=directory)
    os.remove(os.path.join(directory, ".tar"))


class Kernel:
    """An unpacked kernel package."""

    def __init__(self, package, cache):
        self.directory = os.path.join(cache, os.path.basename(package).removesuffix(".deb"))
        if not os.path.exists(self.directory):
            extract(package, self.directory + ".part")
            os.rename(self.directory + ".part", self.directory)
        self.image = glob.glob(self.directory + "/boot/vmlinuz-*")[0]
        self._files = {os.path.basename(path)[:-3].replace("-", "_"): path
                       for path in glob.glob(self.directory + "/lib/modules/**/*.ko", recursive=True)}

    def modules(self, names, order=None):
        """Files of the modules and of those they need, in the order in which they can be loaded."""
        order = {} if order is None else order
        for name in names:
            if name in self._files and name not in order:
                with open(self._files[name], "rb") as file:
                    depends = re.search(rb"\0depends=([^\0]*)\0", file.read()).group(1).decode()
                self.modules([need.replace("-", "_") for need in depends.split(",") if need], order)
                order[name] = self._files[name]
        return order


def install_packages(packages, root):
    for package in packages:
        wanted = ONLY.get(os.path.basename(package).split("_")[0])
        if wanted is None:
            extract(package, root)
            continue
        with tempfile.TemporaryDirectory() as apart:
            extract(package, apart)
            for name in wanted:
                os.makedirs(os.path.dirname(os.path.join(root, name)), exist_ok=True)
                shutil.copy(os.path.join(apart, name), os.path.join(root, name))
    for name in UNWANTED:
        shutil.rmtree(os.path.join(root, name), ignore_errors=True)


def install_modules(kernel, root):
    directory = os.path.join(root, "lib/modules")
    os.makedirs(directory, exist_ok=True)
    always = kernel.modules(MODULES)
    more = {name: path for name, path in kernel.modules(HARDWARE_MODULES).items() if name not in always}
    for file, modules in (("order", always), ("order-hardware", more)):
        with open(os.path.join(directory, file), "w", encoding="utf-8") as order:
            for name, path in modules.items():
                shutil.copy(path, os.path.join(directory, name + ".ko"))
                order.write(name + "\n")


def install_ours(build, root):
    subprocess.run(["cmake", "--install", build, "--prefix", os.path.join(root, "usr"), "--strip"],
                   check=True, stdout=subprocess.DEVNULL)


def install_guest(root):
    shutil.copytree(os.path.join(HERE, "guest"), root, dirs_exist_ok=True)
    for name in ("dev", "proc", "sys", "tmp", "run", "root", "var/lib", "opt/vantrel/corvista/data"):
        os.makedirs(os.path.join(root, name), exist_ok=True)


def build_initramfs(packages, kernel, build, root, initramfs):
    shutil.rmtree(root, ignore_errors=True)
    os.makedirs(root)
    install_packages(packages, root)
    install_modules(kernel, root)
    install_ours(build, root)
    install_guest(root)
    with open(initramfs, "wb") as out:
        names = subprocess.Popen(["find", ".", "-print0"], cwd=root, stdout=subprocess.PIPE)
        subprocess.run(["cpio", "--null", "-o", "-H", "newc", "--owner=0:0", "--quiet"], cwd=root, check=True,
                       stdin=names.stdout, stdout=out)
        names.wait()
