#!/usr/bin/env python3
"""Checks what a plug-in module shows to the process that loads it: the listed symbols, all of them and no others.

It also checks that the module asks never to be unloaded, because what it registers outlives its objects.
"""

import argparse
import pathlib
import subprocess

import project


def output_of(*command):
    return subprocess.run(command, check=True, capture_output=True, text=True).stdout


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("module", type=pathlib.Path, help="the shared object")
    parser.add_argument("expected", type=pathlib.Path, help="a file with one symbol a line; lines with # are comments")
    options = parser.parse_args()

    lines = options.expected.read_text(encoding="utf-8").splitlines()
    expected = {line for line in lines if line and not line.startswith("#")}
    defined = {line.split()[-1] for line in output_of("nm", "-D", "--defined-only", options.module).splitlines()}
    problems = [f"{symbol} is exported but not listed in {options.expected.name}" for symbol in sorted(defined - expected)]
    problems += [f"{symbol} is not exported" for symbol in sorted(expected - defined)]
    if "NODELETE" not in output_of("readelf", "--dynamic", "--wide", options.module):
        problems.append("the module can be unloaded; link it with -z nodelete")
    project.finish([f"{options.module.name}: {problem}" for problem in problems], f"{len(defined)} symbols, as listed")


if __name__ == "__main__":
    main()
