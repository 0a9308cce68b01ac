"""Small Debian systems, made once with debootstrap and kept."""

import hashlib
import os
import shutil
import subprocess
import sys

sys.path.insert(1, os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "system"))
from packages import machine_sources, release_codename  # noqa: E402


def cache():
    base = os.environ.get("XDG_CACHE_HOME") or os.path.expanduser("~/.cache")
    return os.path.join(base, "corvista-roots")


def make(purpose, architecture, packages, variant="minbase"):
    """The directory of a system with these packages, which nobody changes. It takes a minute the first time.

    Another list of packages makes another system, and the one before it is removed.
    """
    codename = release_codename()
    key = hashlib.sha256(" ".join([codename, variant, *packages]).encode()).hexdigest()[:8]
    prefix = f"{purpose}-{architecture}-"
    root = os.path.join(cache(), prefix + key)
    if os.path.exists(root):
        return root
    os.makedirs(cache(), exist_ok=True)
    for name in os.listdir(cache()):
        if name.startswith(prefix):
            shutil.rmtree(os.path.join(cache(), name))
    mirror = next(uri for uri, suite, _ in machine_sources() if suite == codename)
    print(f"# making {root} from {mirror}", file=sys.stderr, flush=True)
    part = root + ".part"
    with open(part + ".log", "w", encoding="utf-8") as log:
        result = subprocess.run(["debootstrap", f"--variant={variant}", f"--arch={architecture}",
                                 "--include=" + ",".join(packages), codename, part, mirror],
                                stdout=log, stderr=subprocess.STDOUT, env={**os.environ, "LC_ALL": "C"})
    if result.returncode != 0:
        raise SystemExit(f"debootstrap failed; its output is in {part}.log")
    shutil.rmtree(os.path.join(part, "var/cache/apt/archives"))
    os.makedirs(os.path.join(part, "var/cache/apt/archives/partial"))
    os.remove(part + ".log")
    os.rename(part, root)
    return root


if __name__ == "__main__":
    # root.py PURPOSE ARCHITECTURE PACKAGE...: prints the directory of one to build in
    print(make(sys.argv[1], sys.argv[2], sys.argv[3:], "buildd"))
