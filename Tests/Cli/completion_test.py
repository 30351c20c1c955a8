#!/usr/bin/env python3
"""Completion as the shells carry it out: everything that the help texts name is offered, and nobody waits for a daemon."""

import json
import os
import pathlib
import shutil
import subprocess
import sys
import tempfile
import unittest

from command_help import commands, commands_in, help_of, options_in

PROJECT = pathlib.Path(__file__).resolve().parents[2]
COMPLETION = PROJECT / "Cli/Completion"
PALISADE = pathlib.Path(sys.argv.pop(1)).resolve() / "bin/palisade"

# A program in palisade's place that answers like one with a daemon.
LISTINGS = """#!/bin/sh
case "$*" in
  *grants*) echo '[{"client":"org.example.photos","granted":true},{"client":"org.example.planner","granted":false}]' ;;
  *clients*) echo '[{"bundle_id":"org.example.album"}]' ;;
  *account*) echo '[{"id":"7"},{"id":"8"}]' ;;
esac
"""

BASH = """
. "$1"
[ "$(complete -p palisade)" = "complete -F _palisade palisade" ] || exit 3
shift
COMP_WORDS=("$@") COMP_CWORD=$(($# - 1))
_palisade
[ ${#COMPREPLY[@]} = 0 ] || printf '%s\\n' "${COMPREPLY[@]}"
"""


class Shell:
    """Completes a line whose last word is being typed; `program` is what the line's `palisade` is."""

    def __init__(self, folder: pathlib.Path, program: pathlib.Path):
        bin_folder = folder / program.name
        bin_folder.mkdir()
        shutil.copy(program, bin_folder / "palisade")
        self.environment = dict(os.environ, PATH=f"{bin_folder}:{os.environ['PATH']}", HOME=str(folder), LC_ALL="C.UTF-8",
                                XDG_CONFIG_HOME=str(folder), DBUS_SESSION_BUS_ADDRESS="unix:path=/nonexistent")

    def run(self, *command: str) -> "list[str]":
        done = subprocess.run(command, env=self.environment, stdin=subprocess.DEVNULL, capture_output=True, encoding="utf-8",
                              timeout=60, check=False)
        if done.returncode != 0 or done.stderr:
            raise AssertionError(f"{command} ended with {done.returncode}: {done.stderr}")
        return done.stdout.splitlines()

    def bash(self, *words: str) -> "list[str]":
        return self.run("bash", "--norc", "-c", BASH, "bash", str(COMPLETION / "palisade.bash"), "palisade", *words)

    def fish(self, *words: str) -> "list[str]":
        line = " ".join(["palisade", *words])
        offered = self.run("fish", "--no-config", "--command", f"source {COMPLETION}/palisade.fish; complete --do-complete '{line}'")
        return [choice.partition("\t")[0] for choice in offered]


class ACompletion(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls._folder = tempfile.TemporaryDirectory(prefix="palisade-completion-")
        folder = pathlib.Path(cls._folder.name)
        answering = folder / "answering"
        answering.write_text(LISTINGS, encoding="utf-8")
        answering.chmod(0o755)
        (folder / "shells").mkdir()
        cls.with_daemon = Shell(folder / "shells", answering)
        cls.without_daemon = Shell(folder / "shells", PALISADE)

    @classmethod
    def tearDownClass(cls):
        cls._folder.cleanup()

    def completions(self, shell: Shell):
        found = [("bash", shell.bash)]
        if shutil.which("fish"):
            found.append(("fish", shell.fish))
        return found

    def test_offers_every_command_and_option_of_the_help_texts(self):
        for name, complete in self.completions(self.without_daemon):
            for command in commands(PALISADE):
                text = help_of(PALISADE, *command)
                with self.subTest(shell=name, command=" ".join(command)):
                    self.assertLessEqual(options_in(text) | {"--json", "--color", "--type"}, set(complete(*command, "--")))
                    if commands_in(text):
                        self.assertEqual(sorted(complete(*command, "''" if name == "fish" else "")), sorted(commands_in(text)))

    def test_offers_what_the_daemon_knows(self):
        table = [(["revoke"], ["org.example.photos", "org.example.planner"]), (["authorize"], ["org.example.album"]),
                 (["history", "--client"], ["org.example.album"]), (["account", "remove"], ["7", "8"])]
        for name, complete in self.completions(self.with_daemon):
            for words, expected in table:
                with self.subTest(shell=name, words=" ".join(words)):
                    self.assertEqual(sorted(complete(*words, "''" if name == "fish" else "")), expected)

    def test_is_silent_without_a_daemon(self):
        for name, complete in self.completions(self.without_daemon):
            for words in (["revoke"], ["authorize"], ["history", "--client"], ["account", "remove"]):
                with self.subTest(shell=name, words=" ".join(words)):
                    self.assertEqual(complete(*words, "''" if name == "fish" else ""), [])

    def test_narrows_down_to_what_has_been_typed(self):
        for name, complete in self.completions(self.with_daemon):
            with self.subTest(shell=name):
                self.assertEqual(sorted(complete("re")), ["request", "revocations", "revoke"])
                self.assertEqual(complete("revoke", "org.example.ph"), ["org.example.photos"])
                self.assertEqual(complete("request", "--audience", "f"), ["friends"])
                self.assertEqual(complete("--color", "never", "--json", "gr"), ["grants"])

    @unittest.skipUnless(shutil.which("zsh"), "no zsh")
    def test_is_understood_by_zsh_and_names_every_command_and_option(self):
        self.with_daemon.run("zsh", "-f", "-n", str(COMPLETION / "_palisade"))
        text = (COMPLETION / "_palisade").read_text(encoding="utf-8")
        for command in commands(PALISADE):
            for option in options_in(help_of(PALISADE, *command)):
                self.assertIn(option, text)
            if command:
                self.assertRegex(text, rf"\b{command[-1]}\b")


if __name__ == "__main__":
    unittest.main(verbosity=2)
