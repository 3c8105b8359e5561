#!/usr/bin/env python3
"""Holds the manual page and the completions against the program's own help.

check-texts.py PROGRAM FOLDER: PROGRAM is marrowdale, FOLDER is packaging/. What is lacking is listed, one a line, and
is a failure.
"""

import pathlib
import re
import subprocess
import sys

COMMON = {"--help", "--root", "--state", "--json", "--verbose", "--version"}


def help_of(program, *command):
    return subprocess.run([program, *command, "--help"], check=True, capture_output=True, text=True).stdout


def commands_of(text):
    section = text.split("Commands:\n", 1)[1].split("\n\n", 1)[0]
    return re.findall(r"^  (\S+)", section, re.MULTILINE)


def options_of(text):
    return set(re.findall(r"^  (?:-\w, )?(--[\w-]+)", text, re.MULTILINE))


def main():
    program, folder = sys.argv[1], pathlib.Path(sys.argv[2])
    # The manual page writes an option as "Fl Fl name", fish as "-l name".
    texts = {
        "man/marrowdale.1": lambda option: r"Fl Fl " + option[2:] + r"\b",
        "completions/marrowdale.bash": lambda option: option + r"\b",
        "completions/_marrowdale": lambda option: option + r"\b",
        "completions/marrowdale.fish": lambda option: r"-l " + option[2:] + r"\b",
    }
    commands = commands_of(help_of(program))
    options = {command: options_of(help_of(program, command)) - COMMON for command in commands}
    lacking = []
    for name, pattern in texts.items():
        text = (folder / name).read_text()
        for command in commands:
            if not re.search(r"(?<![\w-])" + command + r"(?![\w-])", text):
                lacking.append(f"{name}: the command {command}")
            lacking += [
                f"{name}: {option} of {command}"
                for option in sorted(options[command])
                if not re.search(pattern(option), text)
            ]
        lacking += [f"{name}: {option}" for option in sorted(COMMON) if not re.search(pattern(option), text)]
    print("\n".join(lacking) if lacking else f"{len(commands)} commands, nothing lacking")
    return 1 if lacking else 0


if __name__ == "__main__":
    sys.exit(main())
