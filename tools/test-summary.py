#!/usr/bin/env python3
"""Says what was tested and what was left out, and why, from the logs of ctest.

usage: test-summary.py NAME=LOG...

Each LOG is a LastTest.log; NAME says who ran it. Ends with 1 when a log names no test at all.
"""

import re
import sys
from collections import defaultdict

PASSED = re.compile(r"^\[       OK \] (\S+?)(?:, where .*)? \(", re.MULTILINE)
FAILED = re.compile(r"^\[  FAILED  \] (\S+?)(?:, where .*)? \(", re.MULTILINE)
STARTED = re.compile(r"^\[ RUN      \] (\S+)", re.MULTILINE)
# GoogleTest writes the place, the reason (which may have several lines) and then the name.
SKIPPED = re.compile(
    r"^[^\n]*: Skipped\n(?P<reason>(?:(?!\[)[^\n]*\n)*?)\n*\[  SKIPPED \] (?P<name>[^\s,]+)",
    re.MULTILINE,
)


def skipped_tests(text):
    """Names of the tests that were skipped, by reason."""
    by_reason = defaultdict(set)
    for match in SKIPPED.finditer(text):
        reason = " ".join(match["reason"].split()) or "no reason given"
        by_reason[reason].add(match["name"])
    return by_reason


def summarize(name, text):
    """Lines on one run, and whether anything was run."""
    passed = set(PASSED.findall(text))
    failed = set(FAILED.findall(text))
    skipped = skipped_tests(text)
    count = sum(len(names) for names in skipped.values())
    # A process that crashed, or was ended for taking too long, says nothing of its test.
    failed |= set(STARTED.findall(text)) - passed - set().union(*skipped.values())
    lines = [f"{name}: {len(passed)} passed, {len(failed)} failed, {count} skipped"]
    lines += [f"  FAILED {test}" for test in sorted(failed)]
    for reason, names in sorted(skipped.items()):
        lines.append(f"  skipped, {reason}:")
        lines += [f"    {test}" for test in sorted(names)]
    return lines, bool(passed or failed)


def main(arguments):
    complete = True
    for argument in arguments:
        name, _, path = argument.partition("=")
        try:
            with open(path, encoding="utf-8", errors="replace") as log:
                lines, ran = summarize(name, log.read())
        except OSError as error:
            lines, ran = [f"{name}: no log ({error})"], False
        print("\n".join(lines))
        complete = complete and ran
    return 0 if complete else 1


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
