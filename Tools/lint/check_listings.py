#!/usr/bin/env python3
"""Compares the code listings of documents with the files that they were taken from.

A listing is a fenced block whose first line names its language and its file: three backticks, then cpp file=Examples/X/X.cpp. A
file may be shown in several listings, with text in between; together and in their order they have to be the whole file. So
nothing in a document can go stale, and whoever copies all listings has what the tests compile. Code without a file is refused;
commands and their output (sh, text) need none.

Prints one line a finding, DOCUMENT:LINE: SENTENCE, and exits with 1 if there are any.
"""

import argparse
import pathlib
import re
import sys

FREE_LANGUAGES = {"sh", "text"}

_FENCE = re.compile(r"```(\S*)(?:\s+file=(\S+))?\s*$")


def listings(document):
    """(line number, language, file or none, lines) of each fenced block."""
    opening = None
    for number, line in enumerate(pathlib.Path(document).read_text(encoding="utf-8").splitlines(), start=1):
        if opening is not None and line.rstrip() == "```":
            yield opening
            opening = None
        elif opening is not None:
            opening[3].append(line)
        elif line.startswith("```"):
            match = _FENCE.match(line)
            opening = (number, match[1] if match else "", match[2] if match else None, [])
    if opening is not None:
        yield opening


def numbered_lines(lines, first=1):
    return [(number, line) for number, line in enumerate(lines, start=first) if line.strip()]


def check(document, root):
    problems = []
    shown = {}
    for number, language, file, lines in listings(document):
        if file is not None:
            shown.setdefault(file, []).extend(numbered_lines(lines, first=number + 1))
        elif language not in FREE_LANGUAGES:
            problems.append(f"{document}:{number}: a listing in '{language}' names no file; nobody notices when it goes stale.")
    for file, listed in shown.items():
        path = pathlib.Path(root) / file
        if not path.is_file():
            problems.append(f"{document}:{listed[0][0] - 1}: there is no {file}.")
            continue
        wanted = numbered_lines(path.read_text(encoding="utf-8").splitlines())
        for (here, line), (there, original) in zip(listed, wanted):
            if line != original:
                problems.append(f"{document}:{here}: '{line}' is '{original}' in {file}:{there}.")
                break
        else:
            if len(listed) < len(wanted):
                there, original = wanted[len(listed)]
                problems.append(f"{document}:{listed[-1][0]}: {file} goes on with '{original}' (line {there}).")
            elif len(listed) > len(wanted):
                here, line = listed[len(wanted)]
                problems.append(f"{document}:{here}: {file} has ended before '{line}'.")
    return problems, shown


def main(argv=None):
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--root", required=True, help="folder that the files' names start from")
    parser.add_argument("documents", nargs="+", help="Markdown documents")
    arguments = parser.parse_args(argv)
    found = []
    for document in arguments.documents:
        problems, shown = check(document, arguments.root)
        found += problems
        if not shown:
            found.append(f"{document}:1: there is no listing to compare.")
        elif not problems:
            print(f"{document}: shows {len(shown)} files as they are.")
    if found:
        sys.exit("\n".join(found))


if __name__ == "__main__":
    main()
