#!/usr/bin/env python3
"""The manual pages: each command and option of a help text is in its page, and the pages are sound."""

import os
import pathlib
import re
import shlex
import shutil
import subprocess
import sys
import unittest

from command_help import commands, options_in

PROJECT = pathlib.Path(__file__).resolve().parents[2]
BUILD = pathlib.Path(sys.argv.pop(1)).resolve()
MANUAL = BUILD / "Docs/man"
# scdoc opens each paragraph in this way, and every formatter reads over it.
HABIT_OF_SCDOC = "skipping paragraph macro"
# What our pages refer to without bringing it along.
PAGES_OF_THE_SYSTEM = ("systemd.exec", "tty")

PAGES = {"palisade.1": "palisade", "plugin-replay.1": "plugin-replay", "palisade-sandbox.1": "palisade-sandbox",
         "accountd.8": "accountd", "vantad.8": "vantad"}


def words(page: str) -> str:
    """The page without its typography."""
    source = (MANUAL / page).read_text(encoding="utf-8")
    return re.sub(r"\\f[BIRP]|\\&", "", source).replace("\\-", "-")


def help_of(program: str, *command: str) -> str:
    return subprocess.run([BUILD / "bin" / program, *command, "--help"], stdout=subprocess.PIPE, encoding="utf-8", check=True).stdout


@unittest.skipUnless(shutil.which("mandoc") and MANUAL.is_dir() and list(MANUAL.glob("*.1")), "no scdoc or no mandoc")
class AManualPage(unittest.TestCase):
    def test_names_every_option_of_its_program(self):
        for page, program in PAGES.items():
            text = words(page)
            for option in sorted(options_in(help_of(program)) | set(re.findall(r"  (--[a-z-]+) N\b", help_of(program)))):
                with self.subTest(page=page, option=option):
                    self.assertRegex(text, rf"{option}\b")

    def test_names_every_command_of_palisade_and_its_options(self):
        text = words("palisade.1")
        for command in commands(BUILD / "bin/palisade"):
            with self.subTest(" ".join(command)):
                for option in options_in(help_of("palisade", *command)):
                    self.assertRegex(text, rf"{option}\b")
                self.assertIn(command[-1] if command else "palisade", text)

    def test_is_sound(self):
        pages = sorted(path for path in MANUAL.iterdir() if re.fullmatch(r".*\.[158]", path.name))
        self.assertEqual(len(pages), 7)
        found = subprocess.run(["mandoc", "-T", "lint", "-W", "warning", *pages], stdout=subprocess.PIPE, encoding="utf-8",
                               check=False).stdout
        self.assertEqual([line for line in found.splitlines() if HABIT_OF_SCDOC not in line], [])

    def test_shows_commands_that_are_understood(self):
        shown = re.findall(r"(?m)^ +(palisade [^|&<\n]*[^|&<\s])", (PROJECT / "README.md").read_text(encoding="utf-8"))
        shown += re.findall(r"(?m)^\t(palisade [^|&<\n]*[^|&<\s])", (PROJECT / "Docs/man/palisade.1.scd").read_text(encoding="utf-8"))
        shown += re.findall(r"(?m)^  (palisade [^|&<\n]*[^|&<\s])", help_of("palisade"))
        self.assertGreater(len(shown), 8)
        for line in shown:
            with self.subTest(line):
                words = shlex.split(line)[1:]
                done = subprocess.run([BUILD / "bin/palisade", *words], stdin=subprocess.DEVNULL, capture_output=True, encoding="utf-8",
                                      env=dict(os.environ, DBUS_SESSION_BUS_ADDRESS="unix:path=/nonexistent"), check=False)
                self.assertIn("There is no session bus.", done.stdout + done.stderr)

    def test_refers_to_pages_that_are_there(self):
        for path in MANUAL.glob("*.[158]"):
            for name, section in re.findall(r"\b([a-z][a-z.-]*)\((\d)\)", words(path.name)):
                if name not in PAGES_OF_THE_SYSTEM:
                    self.assertTrue((MANUAL / f"{name}.{section}").is_file(), f"{path.name} refers to {name}({section})")


if __name__ == "__main__":
    unittest.main(verbosity=2)
