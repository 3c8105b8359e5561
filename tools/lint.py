#!/usr/bin/env python3
"""Runs clang-tidy over the sources of a build folder.

usage: lint.py BUILD-FOLDER [FILE...]    ends with 1 where there is a finding; default: all files
       lint.py --self-test               plants findings and sees that each is found

From the environment: MARROWDALE_LINT_JOBS, how many run at a time (all cores);
MARROWDALE_LINT_TIMES=1 says how long each unit took.

Nearly all of clang-tidy's time goes into the headers of the libraries, which it reads and matches
again for every source. So the sources of one folder that are compiled alike are put behind each
other in one file, and it reads their headers once. Text, not #include: the analyzer follows paths
only in the main file.

Sources that can't stand in one file (two have a helper of one name) are kept apart. What is found
is told with the file and line where it was written.
"""

import concurrent.futures
import contextlib
import dataclasses
import io
import json
import os
import re
import shlex
import subprocess
import sys
import tempfile
import time
from pathlib import Path

TIDY = "clang-tidy-19"
COMPILER = "clang++-19"
NOT_LINTED = ("fuzz/",)
# One unit must not take as long as all others together.
MOST_IN_A_UNIT = 20
# The analyzer follows every path through every assertion of a test: ten times the time of all other
# checks together. What it looks for the sanitizers find there, since tests are what they run.
NOT_IN_TESTS = "-clang-analyzer-*"

INCLUDE = re.compile(r"\s*#\s*include\s")


@dataclasses.dataclass
class Unit:
    name: str
    tests: bool
    flags: list
    files: list

    def part(self, files):
        return dataclasses.replace(self, files=files)

    def tidy(self, path, *more):
        checks = [f"--checks={NOT_IN_TESTS}"] if self.tests else []
        return run([TIDY, "--quiet", *checks, str(path), "--", *self.flags, *more])


def flags_of(entry):
    """How a source is compiled, without its name and the name of what is made of it."""
    words = shlex.split(entry["command"])[1:] if "command" in entry else entry["arguments"][1:]
    flags = []
    skip = False
    for word in words:
        if skip or word in ("-o", "-c"):
            skip = not skip
        else:
            flags.append(word)
    return flags


def units_of(build, top, wanted):
    units = {}
    seen = set()
    for entry in json.loads((build / "compile_commands.json").read_text()):
        file = os.path.relpath(os.path.join(entry["directory"], entry["file"]), top)
        if file in seen or file.startswith(("..", "build/") + NOT_LINTED):
            continue
        if wanted and file not in wanted:
            continue
        seen.add(file)
        folder = os.path.dirname(file)
        flags = flags_of(entry)
        key = (folder, file.endswith("Test.cpp"), tuple(flags))
        units.setdefault(key, []).append(file)
    missing = sorted(wanted - seen)
    result = []
    for (folder, tests, flags), files in units.items():
        files.sort()
        name = folder.replace("/", "-") + ("-tests" if tests else "")
        for first in range(0, len(files), MOST_IN_A_UNIT):
            result.append(Unit(name, tests, list(flags), files[first:first + MOST_IN_A_UNIT]))
    # The longest first, so that no core is idle at the end.
    result.sort(key=lambda unit: -len(unit.files))
    return result, missing


def joined(files):
    """The text of all, and for each of its lines where it was written."""
    lines = []
    origins = []
    included = set()
    for file in files:
        here = set()
        for number, line in enumerate(Path(file).read_text().splitlines(), 1):
            if INCLUDE.match(line):
                # Twice in one source is a finding, once in each of two is not.
                blank = line in included
                here.add(line)
                line = "" if blank else line
            lines.append(line)
            origins.append((file, number))
        included |= here
    return "\n".join(lines) + "\n", origins


def run(command):
    return subprocess.run(command, capture_output=True, text=True, check=False)


def errors_in(path, origins, text):
    """The files in which the compiler found errors."""
    lines = re.findall(rf"^{re.escape(str(path))}:(\d+):\d+: (?:fatal )?error: ", text, re.M)
    return {origins[int(line) - 1][0] for line in lines}


def told_by_origin(path, origins, text):
    def origin(found):
        file, line = origins[int(found.group(1)) - 1]
        return f"{file}:{line}:"

    return re.sub(rf"{re.escape(str(path))}:(\d+):", origin, text)


def lint(unit, folder, serial):
    """What clang-tidy says of a unit, and how often it was run."""
    if len(unit.files) == 1:
        done = unit.tidy(unit.files[0])
        return done.returncode != 0, done.stdout, 1
    path = folder / f"{unit.name}-{serial}.cpp"
    text, origins = joined(unit.files)
    path.write_text(text)
    compiled = run([COMPILER, *unit.flags, "-w", "-ferror-limit=0", "-fsyntax-only", str(path)])
    if compiled.returncode != 0:
        clashing = errors_in(path, origins, compiled.stderr)
        rest = [file for file in unit.files if file not in clashing]
        apart = [file for file in unit.files if file in clashing]
        if not rest or not apart:
            half = len(unit.files) // 2
            rest, apart = unit.files[:half], unit.files[half:]
        failed, said, runs = lint(unit.part(rest), folder, serial + "a")
        more_failed, more, more_runs = lint(unit.part(apart), folder, serial + "b")
        return failed or more_failed, said + more, runs + more_runs
    # The compiler's warnings are for the files alone: helpers of one shadow variables of another.
    done = unit.tidy(path, "-w")
    return done.returncode != 0, told_by_origin(path, origins, done.stdout), 1


def lint_all(top, build, wanted):
    """Prints what is found and answers whether anything was."""
    os.chdir(top)
    units, missing = units_of(build, top, wanted)
    for file in missing:
        print(f"{file}: no target of {build} compiles it", file=sys.stderr)
    # Within the tree, where clang-tidy looks for its configuration.
    folder = (build / "lint").resolve()
    folder.mkdir(exist_ok=True)
    failed = bool(missing)
    runs = 0

    def timed(unit, serial):
        started = time.monotonic()
        return unit, lint(unit, folder, serial), time.monotonic() - started

    jobs = int(os.environ.get("MARROWDALE_LINT_JOBS", len(os.sched_getaffinity(0))))
    with concurrent.futures.ThreadPoolExecutor(jobs) as pool:
        answers = [pool.submit(timed, unit, str(i)) for i, unit in enumerate(units)]
        for answer in concurrent.futures.as_completed(answers):
            unit, (bad, said, times), seconds = answer.result()
            if "MARROWDALE_LINT_TIMES" in os.environ:
                print(f"{seconds:6.1f} s, {len(unit.files):2} files in {times}: {unit.name}",
                      file=sys.stderr)
            if bad:
                print(said, flush=True)
            failed = failed or bad
            runs += times
    files = sum(len(unit.files) for unit in units)
    print(f"{files} files in {runs} runs", file=sys.stderr)
    return failed


PLANTED = {
    "a/one.cpp": "#include <cstddef>\nnamespace { int help() { return 1; } }\nint* one = NULL;\n"
                 "int two() { return help(); }\n",
    "a/three.cpp": "\n#include <cstddef>\nint* three = NULL;\n",
    # Clashes with the first, and is found nevertheless.
    "a/four.cpp": "#include <cstddef>\nnamespace { int help() { return 4; } }\n\n"
                  "int* four = NULL;\nint five() { return help(); }\n",
    "a/clean.cpp": "int six() { return 6; }\n",
    ".clang-tidy": "Checks: '-*,modernize-use-nullptr'\nWarningsAsErrors: '*'\n",
}


def self_test():
    with tempfile.TemporaryDirectory() as name:
        top = Path(name).resolve()
        for file, text in PLANTED.items():
            (top / file).parent.mkdir(parents=True, exist_ok=True)
            (top / file).write_text(text)
        build = top / "build"
        build.mkdir()
        (build / "compile_commands.json").write_text(json.dumps(
            [{"directory": str(top), "file": file, "command": f"{COMPILER} -o x -c {file}"}
             for file in PLANTED if file.endswith(".cpp")]))
        said = io.StringIO()
        with contextlib.redirect_stdout(said), contextlib.redirect_stderr(io.StringIO()):
            failed = lint_all(top, build, set())
            clean = not lint_all(top, build, {"a/clean.cpp"})
        os.chdir("/")
    found = set(re.findall(r"(\w+\.cpp:\d+):\d+: error", said.getvalue()))
    expected = {"one.cpp:3", "three.cpp:3", "four.cpp:4"}
    if not failed or not clean or found != expected:
        sys.exit(f"lint.py found {sorted(found)} instead of {sorted(expected)}")


def main(arguments):
    if arguments == ["--self-test"]:
        self_test()
        return 0
    if not arguments or arguments[0].startswith("-"):
        sys.exit(__doc__)
    wanted = {os.path.normpath(file) for file in arguments[1:]}
    linted = {file for file in wanted if not file.startswith(NOT_LINTED)}
    if wanted and not linted:
        return 0
    top = Path(__file__).resolve().parent.parent
    return 1 if lint_all(top, Path(arguments[0]), linted) else 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
