#!/usr/bin/env python3
"""Checks that every C++ file is formatted as .clang-format says. With --fix, formats those that are not.

The formatter's version matters, since each lays out some code differently: this is clang-format 14.
"""

import shutil
import subprocess
import sys

import project

FORMATTER = "clang-format-14"


def main():
    def configure(parser):
        parser.add_argument("--fix", action="store_true", help="format the files in place")

    options = project.arguments(__doc__, configure)
    if not shutil.which(FORMATTER):
        sys.exit(f"{FORMATTER} is not installed; ./test installs it")
    names = project.cxx_files(options.root)
    if not names:
        project.finish([], "no C++ file here")
        return
    mode = ["-i"] if options.fix else ["--dry-run", "-Werror"]
    run = subprocess.run([FORMATTER, "--style=file", *mode, *names], cwd=options.root, check=False)
    if run.returncode != 0:
        sys.exit(f"Format them with: {sys.argv[0]} --fix")
    project.finish([], f"{len(names)} files are formatted")


if __name__ == "__main__":
    main()
