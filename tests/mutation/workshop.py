"""Copies of the tree in which defects are planted, built and tested."""

import os
import re
import shutil
import signal
import subprocess
import time

from defects import TREE, ListError

UNPLANTED = 900  # seconds that a test program may take when nothing is wrong


def tree_files():
    """What git knows of the tree and what it would take up."""
    listed = subprocess.run(["git", "ls-files", "-co", "--exclude-standard", "-z"], cwd=TREE, check=True,
                            stdout=subprocess.PIPE, text=True).stdout
    return sorted(name for name in listed.split("\0") if name and os.path.lexists(TREE / name))


def copy_if_new(source, target):
    target.parent.mkdir(parents=True, exist_ok=True)
    if source.is_symlink():  # recorded hosts have links that lead nowhere here
        target.unlink(missing_ok=True)
        target.symlink_to(os.readlink(source))
    elif target.is_symlink() or not target.exists() or target.read_bytes() != source.read_bytes():
        target.unlink(missing_ok=True)
        shutil.copy(source, target)


def copy_tree(copy):
    """Makes the copy the tree's equal; what is equal already keeps its time, so that it is not built again."""
    names = set(tree_files())
    for name in names:
        copy_if_new(TREE / name, copy / name)
    for path in copy.rglob("*"):
        name = path.relative_to(copy)
        if name.parts[0] != "build" and str(name) not in names and (path.is_symlink() or path.is_file()):
            path.unlink()


class Workshop:
    def __init__(self, folder, cores):
        self.copy = folder / "tree"
        self.build = self.copy / "build/dev"
        self.cores = cores

    def prepare(self, programs):
        copy_tree(self.copy)
        # Small units: a defect has its own compiled again, not a component.
        flags = ["-DCMAKE_CXX_FLAGS=-O0 -w", "-DCMAKE_CXX_FLAGS_DEBUG=-g0", "-DCMAKE_UNITY_BUILD_BATCH_SIZE=3"]
        linker = next((name for name in ("lld", "gold") if shutil.which("ld." + name)), None)
        if linker:
            flags += [f"-DCMAKE_{kind}_LINKER_FLAGS=-fuse-ld={linker}" for kind in ("EXE", "SHARED", "MODULE")]
        if shutil.which("ccache"):
            flags += ["-DCMAKE_CXX_COMPILER_LAUNCHER=ccache"]
        subprocess.run(["cmake", "--preset", "dev", *flags], cwd=self.copy, check=True, stdout=subprocess.DEVNULL)
        if error := self.make(programs):
            raise ListError("the tree itself does not build:\n" + error)

    def make(self, programs):
        """The compiler's words when it fails; nothing when all is built."""
        command = ["ninja", "-C", str(self.build), "-j", str(self.cores), *(program + "_test" for program in programs)]
        result = subprocess.run(command, stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True, errors="replace")
        return result.stdout[-3000:] if result.returncode else ""

    def usual_seconds(self, program):
        """How long a test program takes when nothing is wrong. On a busy machine one may fail once; twice is the tree's fault."""
        for _ in range(2):
            start = time.monotonic()
            if not (failed := self.test(program, UNPLANTED)):
                return time.monotonic() - start
        raise ListError(f"without a defect {program}_test fails already: {failed}")

    def test(self, program, longest, only=""):
        """What failed first; nothing when all tests pass."""
        command = [str(self.build / "tests" / (program + "_test")), "--gtest_fail_fast", "--gtest_brief=1"]
        command += ["--gtest_filter=" + only] if only else []
        process = subprocess.Popen(command, cwd=self.build / "tests", stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                                   stderr=subprocess.STDOUT, text=True, errors="replace", start_new_session=True)
        try:
            output = process.communicate(timeout=longest)[0]
        except subprocess.TimeoutExpired:
            return f"no end after {longest:.0f} s"
        finally:
            try:
                os.killpg(process.pid, signal.SIGKILL)  # and what it has started
            except ProcessLookupError:
                pass
            process.wait()
        if process.returncode == 0:
            return ""
        failed = re.search(r"\[  FAILED  \] (\S+?),? ", output)
        return failed.group(1) if failed else f"ended with {process.returncode}"

    def check(self, planted, turns):
        """Verdict, the program that gave it and what it or the compiler says. A turn is a program, its tests and its longest."""
        path, text = self.copy / planted[0], planted[1]
        original = path.read_text()
        path.write_text(text)
        try:
            for program, only, longest in turns:
                if error := self.make([program]):
                    return "does not compile", program, error
                if failed := self.test(program, longest, only):
                    return "caught", program, failed
            return "survived", "", ""
        finally:
            path.write_text(original)
