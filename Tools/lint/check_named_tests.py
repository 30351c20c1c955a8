#!/usr/bin/env python3
"""Checks that the tests which the documentation names in square brackets exist, as in [`Integration.Kill`, `ArmingTest`].

A name is that of a test in CTest, of a test suite, or of a test's source file.
"""

import re

import project

_BRACKETS = re.compile(r"\[(`[^\]]*)\](?!\()")
_NAME = re.compile(r"`([\w.]+)`")
_SUITE = re.compile(r"^(?:TYPED_)?TEST(?:_[FP])?\((\w+),", re.MULTILINE)
_IN_CMAKE = re.compile(r"add_test\(\s*NAME ([\w.]+)|palisade_add_(session|desktop|alert)_test\((\w+)")


def known_tests(root, names):
    known = set()
    for name in names:
        if name.parts[0] != "Tests":
            continue
        text = (root / name).read_text(encoding="utf-8", errors="replace")
        if name.name == "CMakeLists.txt":
            for whole, kind, short in _IN_CMAKE.findall(text):
                known.add(whole or f"{'Integration' if kind == 'session' else 'Desktop'}.{short}")
        elif name.suffix == ".cpp":
            known.add(name.stem)
            known.update(_SUITE.findall(text))
    return known


def main():
    options = project.arguments(__doc__)
    names = project.files(options.root)
    known = known_tests(options.root, names)
    problems = []
    count = 0
    for name in names:
        if name.suffix != ".md":
            continue
        text = (options.root / name).read_text(encoding="utf-8")
        for bracket in _BRACKETS.finditer(text):
            line = text.count("\n", 0, bracket.start()) + 1
            for test in _NAME.findall(bracket[1]):
                count += 1
                if test not in known:
                    problems.append(f"{name}:{line}: names the test {test}, which there is not")
    project.finish(problems, f"{count} names of tests, all of them right")


if __name__ == "__main__":
    main()
