"""What the checks share: which files are the project's, what a C++ file includes, and how problems are told."""

import argparse
import pathlib
import re
import subprocess
import sys

CXX_SUFFIXES = {".cpp", ".h"}

_INCLUDE = re.compile(r"^\s*#\s*include\b\s*(?P<rest>.*?)\s*$")
_NAMED = re.compile(r'[<"](?P<header>[^>"]+)[>"]')


def arguments(description, configure=None):
    """Parses the command line that all checks have: --root, and whatever `configure` adds."""
    parser = argparse.ArgumentParser(description=description, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--root", type=pathlib.Path, default=pathlib.Path(__file__).resolve().parents[2],
                        help="the project's folder (default: the one that holds this script)")
    if configure:
        configure(parser)
    options = parser.parse_args()
    options.root = options.root.resolve()
    return options


def git(root, *words):
    """What git prints about the checkout `root`, or None where `root` is no checkout or git is not there."""
    if not (root / ".git").exists():
        return None
    try:
        run = subprocess.run(["git", "-c", f"safe.directory={root}", "-C", root, *words], capture_output=True, check=False)
    except FileNotFoundError:
        return None
    return run.stdout.decode(errors="replace") if run.returncode == 0 else None


def files(root):
    """The project's files, by path from `root`: in a checkout all that git does not ignore, elsewhere all but build/."""
    listed = git(root, "ls-files", "-z", "--cached", "--others", "--exclude-standard")
    if listed is not None:
        names = {pathlib.Path(name) for name in listed.split("\0") if name}
    else:
        names = {path.relative_to(root) for path in root.rglob("*")}
        names = {name for name in names if name.parts[0] not in ("build", ".git")}
    return sorted(name for name in names if (root / name).is_file())


def cxx_files(root):
    return [name for name in files(root) if name.suffix in CXX_SUFFIXES]


def lines(root, name):
    return (root / name).read_text(encoding="utf-8", errors="replace").splitlines()


def includes(root, name):
    """Yields (line number, header, whether it is quoted) for each include of a file; the header is None if it is a macro."""
    for number, line in enumerate(lines(root, name), start=1):
        directive = _INCLUDE.match(line)
        if directive:
            named = _NAMED.match(directive["rest"])
            yield number, named and named["header"], directive["rest"].startswith('"')


def finish(problems, summary):
    """Ends the check: tells each problem on a line and fails, or tells what was found in order."""
    for problem in problems:
        print(problem)
    if problems:
        sys.exit(f"{len(problems)} problem(s)")
    print(summary)
