#!/usr/bin/env python3
"""Checks that every C++ file can be read in one sitting: a warning above 400 lines, a failure above 600."""

import project

WARN_ABOVE = 400
FAIL_ABOVE = 600


def main():
    options = project.arguments(__doc__)
    problems = []
    names = project.cxx_files(options.root)
    for name in names:
        length = len(project.lines(options.root, name))
        if length > FAIL_ABOVE:
            problems.append(f"{name}: {length} lines; split it by subject, {FAIL_ABOVE} are the most")
        elif length > WARN_ABOVE:
            print(f"warning: {name}: {length} lines; is it still one subject?")
    project.finish(problems, f"{len(names)} files of at most {FAIL_ABOVE} lines")


if __name__ == "__main__":
    main()
