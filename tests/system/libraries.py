"""libraries.py DIRECTORY: puts 32-bit libraries of Debian there, for a build on this machine that is linked with them.

The machine's own package state is left alone: an archive's two halves are not always in step, and then the 32-bit package of a
library that is installed here cannot be had.
"""

import hashlib
import os
import shutil
import subprocess
import sys

from image import extract
from packages import Apt

# What the service links, with all that these load.
PACKAGES = ["libsystemd-dev", "libsystemd0", "libsqlite3-dev", "libsqlite3-0", "libudev-dev", "libudev1", "libcap2", "libgcrypt20",
            "libgpg-error0", "liblz4-1", "liblzma5", "libzstd1"]
PLACES = ["lib/i386-linux-gnu", "usr/lib/i386-linux-gnu"]


def cache():
    base = os.environ.get("XDG_CACHE_HOME") or os.path.expanduser("~/.cache")
    return os.path.join(base, "corvista-system-test")


def make(directory):
    apt = Apt(cache())
    apt.update()
    packages = apt.uris("download", *PACKAGES)
    subprocess.run(["apt-get", *apt.options, "-q", "download", *PACKAGES], check=True, stdout=subprocess.DEVNULL, cwd=apt.archives)
    part = directory + ".part"
    shutil.rmtree(part, ignore_errors=True)
    root = os.path.join(part, "root")
    for _, name, _ in packages:
        extract(os.path.join(apt.archives, name), root)
    for place in PLACES:
        found = os.path.join(root, place)
        for name in sorted(os.listdir(found)) if os.path.isdir(found) else []:
            target = os.path.join(part, name)
            if ".so" in name and not os.path.lexists(target):
                move(os.path.join(found, name), target)
    shutil.rmtree(root)
    os.rename(part, directory)


def move(source, target):
    """All lie in one directory in the end, and the links between them with them."""
    if os.path.islink(source):
        os.symlink(os.path.basename(os.readlink(source)), target)
    else:
        shutil.move(source, target)


def main():
    key = hashlib.sha256(" ".join(PACKAGES).encode()).hexdigest()[:8]
    directory = os.path.join(cache(), f"libraries-{key}")
    os.makedirs(cache(), exist_ok=True)
    if not os.path.exists(directory):
        make(directory)
    os.makedirs(sys.argv[1], exist_ok=True)
    for name in sorted(os.listdir(directory)):
        target = os.path.join(sys.argv[1], name)
        if not os.path.lexists(target):  # an earlier build's serves again
            shutil.copy2(os.path.join(directory, name), target, follow_symlinks=False)


if __name__ == "__main__":
    main()
