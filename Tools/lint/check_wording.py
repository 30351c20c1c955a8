#!/usr/bin/env python3
"""Checks that the project's texts stand on their own.

Code, documents, file names and commit messages say what a thing does and why. They never lean on a document that the reader
does not have, nor on a numbered section of one, and they name no path of the machine on which they were written.
In a checkout the messages of all its commits are read too, as far as its history goes.
"""

import re

import project

# Written so that the patterns do not match themselves.
ELSEWHERE = re.compile(r"[Ss]pecificatio[n]|\bthe spe[c]\b|spe[c]\.md|\bPar[t] [1-4](\.[1-4])?\b")
MACHINE = re.compile(r"(?<![\w.])/wor[k]/|\.\./share[d]\b")


def machine_patterns(root):
    """Paths of the machine: known ones, and where this checkout lies unless that is a name like /src that says nothing."""
    own = [rf"(?<![\w.]){re.escape(str(root))}\b"] if len(root.parts) > 2 else []
    return re.compile("|".join([MACHINE.pattern, *own]))


def problem_with(text, machine):
    """What is wrong with one line of text, or None."""
    found = ELSEWHERE.search(text)
    if found:
        return f"leans on a document that the reader does not have: '{found[0]}'"
    found = machine.search(text)
    if found:
        return f"names a path of the machine on which it was written: '{found[0]}'"
    return None


def text_lines(root, name):
    """The lines of a file, none of a file that is no text."""
    content = (root / name).read_bytes()
    return [] if b"\0" in content else content.decode(errors="replace").splitlines()


def commits(root):
    """Yields (abbreviated name, message line) of all commits that are here."""
    for entry in (project.git(root, "log", "--format=%h%n%B%x00") or "").split("\0"):
        name, *message = entry.strip().splitlines() or [""]
        for line in message:
            yield name, line


def main():
    options = project.arguments(__doc__)
    machine = machine_patterns(options.root)
    problems = []
    names = project.files(options.root)
    for name in names:
        problem = problem_with(str(name), machine)
        if problem:
            problems.append(f"{name}: its name {problem}")
        for number, line in enumerate(text_lines(options.root, name), start=1):
            problem = problem_with(line, machine)
            if problem:
                problems.append(f"{name}:{number}: {problem}")
    for name, line in commits(options.root):
        problem = problem_with(line, machine)
        if problem:
            problems.append(f"commit {name}: {problem}")

    count = (project.git(options.root, "rev-list", "--count", "HEAD") or "").strip()
    if not count:
        history = "no history here, so no commit message was read"
    elif (project.git(options.root, "rev-parse", "--is-shallow-repository") or "").strip() == "true":
        history = f"a shallow history, of which the messages of {count} commits were read"
    else:
        history = f"the messages of {count} commits"
    project.finish(problems, f"{len(names)} files; {history}")


if __name__ == "__main__":
    main()
