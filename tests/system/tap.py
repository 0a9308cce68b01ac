"""The list of checks and their report in TAP."""

import time
import traceback

CHECKS = []


def check(name):
    """Marks a function as the check of that name; checks run in the order in which they are defined."""
    def mark(function):
        CHECKS.append((name, function))
        return function
    return mark


def expect(condition, message):
    if not condition:
        raise AssertionError(message)


def expect_equal(what, actual, expected):
    expect(actual == expected, f"{what}:\n  is       {actual!r}\n  expected {expected!r}")


class Report:
    def __init__(self):
        self.number, self.failed = 0, []

    def result(self, name, seconds, failure=None):
        self.number += 1
        if failure is not None:
            self.failed.append(name)
        print(f"{'ok' if failure is None else 'not ok'} {self.number} - {name} # {seconds:.1f} s", flush=True)

    def diagnose(self, title, lines):
        print(f"# --- {title}")
        for line in lines:
            print(f"#   {line}")

    def run(self, name, function, context, evidence):
        """Runs a check; when it fails, prints why and the evidence: (title, lines) of this moment."""
        start = time.monotonic()
        try:
            function(context)
        except Exception as failure:  # whatever goes wrong, the other checks are still worth running
            self.result(name, time.monotonic() - start, failure)
            text = str(failure) if isinstance(failure, AssertionError) else traceback.format_exc()
            self.diagnose("what is wrong", text.splitlines())
            for title, lines in evidence():
                self.diagnose(title, lines)
        else:
            self.result(name, time.monotonic() - start)

    def finish(self, wanted):
        print(f"1..{wanted}")
        missing = wanted - self.number
        passed = self.number - len(self.failed)
        if missing:
            print(f"# {missing} checks were not run")
        print(f"{passed} passed, {len(self.failed) + missing} failed", flush=True)
        return 0 if passed == wanted else 1
