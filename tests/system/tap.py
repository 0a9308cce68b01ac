"""The list of checks and their report in TAP."""

import collections
import threading
import time
import traceback

CHECKS = collections.defaultdict(list)  # those of each machine


def check(name, machine="main"):
    """Marks a function as the check of that name. Those of one machine run in the order in which they are defined;
    the machines run side by side."""
    def mark(function):
        CHECKS[machine].append((name, function))
        return function
    return mark


def expect(condition, message):
    if not condition:
        raise AssertionError(message)


def expect_equal(what, actual, expected):
    expect(actual == expected, f"{what}:\n  is       {actual!r}\n  expected {expected!r}")


def block(title, lines):
    return [f"# --- {title}"] + [f"#   {line}" for line in lines]


class Report:
    """What came out so far; the machines' threads share it."""

    def __init__(self):
        self.number, self.failed = 0, 0
        self._guard = threading.Lock()

    def _print(self, name, seconds, diagnosis):
        with self._guard:
            self.number += 1
            self.failed += bool(diagnosis)
            verdict = "not ok" if diagnosis else "ok"
            print("\n".join([f"{verdict} {self.number} - {name} # {seconds:.1f} s"] + diagnosis), flush=True)

    def run(self, name, function, context, evidence):
        """Runs a check; when it fails, prints why and the evidence: (title, lines) of this moment.

        Returns what the check failed with, or None.
        """
        start = time.monotonic()
        raised, diagnosis = None, []
        try:
            function(context)
        except Exception as failure:  # whatever goes wrong, the other checks are still worth running
            raised = failure
            text = str(failure) if isinstance(failure, AssertionError) else traceback.format_exc()
            diagnosis += block("what is wrong", text.splitlines())
            for title, lines in evidence():
                diagnosis += block(title, lines)
        self._print(name, time.monotonic() - start, diagnosis)
        return raised

    def finish(self, wanted):
        print(f"1..{wanted}")
        missing = wanted - self.number
        passed = self.number - self.failed
        if missing:
            print(f"# {missing} checks were not run")
        print(f"{passed} passed, {self.failed + missing} failed", flush=True)
        return 0 if passed == wanted else 1
