#!/usr/bin/env python3
"""An alert shows who asks: the class and the name of the caller itself, and not what a record says about its identifier."""

import json
import pathlib
import unittest

import trial
from accounts import GRANTED
from text_test import ASK_FOR_ACCESS

trial.use_build_of_command_line()

HERE = pathlib.Path(__file__).resolve().parent


class WhoAsks(unittest.TestCase):
    def setUp(self):
        self.session = self.enterContext(trial.Trial(answer="allow"))

    def start(self):
        self.session.start_accountd()
        self.session.add_account()

    def alert_of_sandboxed(self, application):
        """What the person read when the sandboxed application asked."""
        asked = self.session.run_sandboxed(application, trial.THIS_PROGRAM, "-c", ASK_FOR_ACCESS, HERE, self.session.bus)
        self.assertEqual((asked.returncode, asked.stdout.strip()), (0, json.dumps(GRANTED)), asked.stdout)
        return self.session.person.dialog

    def test_is_a_sandboxed_application_without_a_record(self):
        desktop_files = self.session.root / "data/applications"
        desktop_files.mkdir()
        (desktop_files / "org.example.Sandboxed.desktop").write_text("[Desktop Entry]\nName=Sand Castle\n", encoding="utf-8")
        self.start()
        dialog = self.alert_of_sandboxed("org.example.Sandboxed")
        self.assertRegex(dialog, "Application +Sand Castle")
        self.assertIn("org.example.Sandboxed", dialog)
        # Whoever is outside sandboxes can build one that says the same.
        self.assertIn("Likely (sandboxed)", dialog)

    def let_sandboxed_in(self):
        """The record of a program recognises a sandboxed application, too."""
        with open(self.session.clients / "org.example.photos.toml", "a", encoding="utf-8") as record:
            record.write('flatpak = "org.example.Sandboxed"\n')
        self.start()

    def test_is_the_sandboxed_caller_of_a_record_that_lets_a_program_in_as_well(self):
        self.let_sandboxed_in()
        dialog = self.alert_of_sandboxed("org.example.Sandboxed")
        self.assertRegex(dialog, "Application +Photos")
        self.assertIn("Likely (sandboxed)", dialog)

    def test_is_the_program_of_a_record_that_lets_a_sandboxed_caller_in_as_well(self):
        self.let_sandboxed_in()
        with self.session.caller() as caller:
            self.assertEqual(caller.start_request().outcome()[0], GRANTED)
        self.assertRegex(self.session.person.dialog, "Application +Photos")
        self.assertIn("Only claimed (not sandboxed)", self.session.person.dialog)


if __name__ == "__main__":
    unittest.main(verbosity=2)
