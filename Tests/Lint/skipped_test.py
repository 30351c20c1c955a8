#!/usr/bin/env python3
"""The closing table of a test run names every skipped test with its reason, whichever framework skipped it."""

import pathlib
import subprocess
import sys
import tempfile
import unittest

PROGRAM = pathlib.Path(__file__).resolve().parents[2] / "Tools/skipped.py"
REPORT = """<?xml version="1.0" encoding="UTF-8"?>
<testsuite name="all">
  <testcase name="ADisk.IsFull" status="notrun"><skipped message=""/><system-out>[ RUN      ] ADisk.IsFull
Tests/DiskTest.cpp:41: Skipped
no disk can be
mounted here
[  SKIPPED ] ADisk.IsFull (0 ms)
</system-out></testcase>
  <testcase name="Integration.Faults"><system-out>test_of_a_clock (__main__.AClock.test_of_a_clock) ... skipped 'there is no\\nclock\\n'
test_of_a_keychain (__main__.AKeychain.test_of_a_keychain) ... ok
</system-out></testcase>
  <testcase name="Desktop.Window" status="notrun"><skipped message=""/><system-out>Skipped: there is no display
</system-out></testcase>
  <testcase name="Desktop.Silent" status="notrun"><skipped message=""/></testcase>
  <testcase name="Lint.Passes"><system-out>all is well</system-out></testcase>
</testsuite>
"""


def table(report: str) -> str:
    with tempfile.NamedTemporaryFile("w", suffix=".xml") as file:
        file.write(report)
        file.flush()
        return subprocess.run([sys.executable, PROGRAM, file.name], capture_output=True, text=True, check=True).stdout


class TheClosingTable(unittest.TestCase):
    def test_names_every_skipped_test_and_why(self):
        self.assertEqual(table(REPORT).splitlines(), [
            "Skipped: 4",
            "  ADisk.IsFull", "      no disk can be mounted here",
            "  Integration.Faults: test_of_a_clock", "      there is no clock",
            "  Desktop.Window", "      there is no display",
            "  Desktop.Silent", "      it does not say why",
        ])

    def test_says_so_when_nothing_was_skipped(self):
        self.assertEqual(table('<testsuite><testcase name="a"/></testsuite>'), "No test was skipped.\n")


if __name__ == "__main__":
    unittest.main(verbosity=2)
