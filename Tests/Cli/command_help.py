"""What `palisade --help` says there is."""

import re
import subprocess


def help_of(program, *command: str) -> str:
    return subprocess.run([program, *command, "--help"], stdout=subprocess.PIPE, encoding="utf-8", check=True).stdout


def options_in(text: str) -> "set[str]":
    """The long options that stand in the first column of a help text."""
    return set(re.findall(r"(?m)^ +(?:-\w, ?)?(--[a-z-]+)", text))


def commands_in(text: str) -> "list[str]":
    listed = re.search(r"(?m)^Subcommands:\n((?:  .*\n)+)", text)
    return re.findall(r"(?m)^  ([a-z]+) ", listed[1]) if listed else []


def commands(program) -> "list[tuple[str, ...]]":
    """Every command with its words, the empty one first."""
    found = [()]
    for command in found:
        found += [(*command, name) for name in commands_in(help_of(program, *command))]
    return found
