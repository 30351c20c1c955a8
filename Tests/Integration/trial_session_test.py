#!/usr/bin/env python3
"""The session that ./run shows: where a step of it fails, it says which, why, and what the log says."""

import os
import pathlib
import subprocess
import tempfile
import unittest

import trial

trial.use_build_of_command_line()

SESSION = trial.PROJECT / "Tools/Trial/session"


class ASession(unittest.TestCase):
    def setUp(self):
        self.folder = pathlib.Path(self.enterContext(tempfile.TemporaryDirectory(prefix="palisade-session.")))

    def build_with(self, program: str, script: str) -> pathlib.Path:
        """A build folder like the real one, with another program in one place."""
        (self.folder / "bin").mkdir()
        (self.folder / "plugins").symlink_to(trial.BUILD / "plugins")
        for real in (trial.BUILD / "bin").iterdir():
            if real.name != program:
                (self.folder / "bin" / real.name).symlink_to(real)
        self.write(f"bin/{program}", script)
        return self.folder

    def write(self, name: str, script: str) -> pathlib.Path:
        file = self.folder / name
        file.write_text(f"#!/bin/sh\n{script}\n", encoding="utf-8")
        file.chmod(0o755)
        return file

    def run_session(self, build: pathlib.Path, *command: str, **environment) -> subprocess.CompletedProcess:
        return subprocess.run([SESSION, build, *command], env=os.environ | environment, text=True, stdin=subprocess.DEVNULL,
                              stdout=subprocess.PIPE, stderr=subprocess.STDOUT, timeout=120, check=False)

    def expect_failure(self, ended: subprocess.CompletedProcess, *sentences: str) -> None:
        self.assertEqual(ended.returncode, 1, ended.stdout)
        for sentence in sentences:
            self.assertIn(sentence, ended.stdout)
        self.assertNotIn("Gave up", ended.stdout)

    def test_runs_a_command_and_ends_with_its_status(self):
        ended = self.run_session(trial.BUILD, "sh", "-c", "palisade clients; exit 7")
        self.assertEqual(ended.returncode, 7, ended.stdout)
        self.assertIn("org.example.photos", ended.stdout)

    def test_whose_account_daemon_cannot_start_says_why(self):
        self.expect_failure(self.run_session(trial.BUILD, PALISADE_LOG="nonsense"), "The account daemon has ended with status 1.",
                            "    accountd: There is no log level 'nonsense'")

    def test_whose_server_cannot_start_says_why(self):
        build = self.build_with("palisade-sandbox", "echo 'no port is free' >&2; exit 3")
        self.expect_failure(self.run_session(build), "The Facebook server of this machine has ended with status 3.",
                            "    no port is free")

    def test_whose_account_daemon_does_not_serve_says_what_it_waited_for(self):
        build = self.build_with("accountd", "echo 'thinking' >&2; exec sleep 600")
        self.expect_failure(self.run_session(build, PALISADE_PATIENCE="1"), "The account daemon is not ready after ",
                            "    thinking")

    def test_whose_token_stays_valid_says_that_the_social_daemon_is_gone(self):
        build = self.build_with("vantad", "echo 'out of order' >&2; exit 4")
        self.expect_failure(self.run_session(build), "The social daemon, which has the token made invalid, has ended with status 4.",
                            "    out of order")

    def test_in_which_a_step_fails_names_the_step(self):
        application = self.write("photos", 'kill -9 "$(cat "$PALISADE_TRIAL/accountd.pid")"; cat "$PALISADE_TRIAL/accountd.pid"')
        self.expect_failure(self.run_session(trial.BUILD, PALISADE_APPLICATION=str(application)),
                            "This step failed: palisade grants")


if __name__ == "__main__":
    unittest.main(verbosity=2)
