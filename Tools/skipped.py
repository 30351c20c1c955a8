#!/usr/bin/env python3
"""The closing table of a test run: every test that was skipped, and why.

    skipped.py JUNIT-FILE
"""

import re
import sys
import xml.etree.ElementTree

# How each framework says it: GoogleTest after the place, Python's unittest behind the test's name, our own scripts in a line.
REASONS = (
    re.compile(r"^\S+:\d+: Skipped\n(?P<reason>.+?)\n(?:$|\[)", re.MULTILINE | re.DOTALL),
    re.compile(r"^(?P<part>test_\w+).*?\.\.\. skipped ['\"](?P<reason>.*)['\"]$", re.MULTILINE),
    re.compile(r"^Skipped: (?P<reason>.*)$", re.MULTILINE),
)


def skipped(case: xml.etree.ElementTree.Element) -> "list[tuple[str, str]]":
    """What was skipped in one test, which may consist of several, and the reason of each."""
    name, output = case.get("name"), case.findtext("system-out") or ""
    found = []
    for pattern in REASONS:
        for match in pattern.finditer(output):
            part = match.groupdict().get("part")
            found.append((f"{name}: {part}" if part else name, " ".join(match["reason"].replace(r"\n", " ").split())))
    if not found and case.find("skipped") is not None:
        found.append((name, "it does not say why"))
    return found


def main() -> None:
    rows = [row for case in xml.etree.ElementTree.parse(sys.argv[1]).iter("testcase") for row in skipped(case)]
    if not rows:
        print("No test was skipped.")
        return
    print(f"Skipped: {len(rows)}")
    for name, reason in rows:
        print(f"  {name}\n      {reason}")


if __name__ == "__main__":
    main()
