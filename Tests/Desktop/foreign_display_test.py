#!/usr/bin/env python3
"""An X server of another user waits where DISPLAY points: the alert's window does not show itself to it."""

import os
import pathlib
import subprocess
import sys
import time
import unittest

PROJECT = pathlib.Path(__file__).resolve().parents[2]
sys.path.insert(0, str(PROJECT / "Tools/Desktop"))
from alert import Alert  # noqa: E402

HELPER = sys.argv.pop(1)
PATIENCE = 20
SOMEBODY_ELSE = ("setpriv", "--reuid", "1", "--regid", "1", "--clear-groups")
OTHER_USERS = ("unshare", "--user", "--map-root-user", "--map-auto")


def other_user():
    """How this user starts a program as another one, or why that cannot be done."""
    command = SOMEBODY_ELSE if os.geteuid() == 0 else (*OTHER_USERS, *SOMEBODY_ELSE)
    trial = subprocess.run([*command, "true"], capture_output=True, text=True, check=False)
    return command, trial.stderr.strip()


class AnXServer:
    def __init__(self, *user):
        ready, told = os.pipe()
        self.process = subprocess.Popen([*user, "Xvfb", "-displayfd", str(told), "-ac", "-nolisten", "tcp"], pass_fds=[told],
                                        stderr=subprocess.DEVNULL)
        os.close(told)
        with open(ready, encoding="ascii") as numbers:
            self.display = f":{numbers.readline().strip()}"

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.process.terminate()
        self.process.wait()

    def windows(self):
        found = subprocess.run(["xdotool", "search", "--onlyvisible", "--class", "palisade-alert"], capture_output=True, text=True,
                               check=False, env=os.environ | {"DISPLAY": self.display})
        return found.stdout.split()


class AnAlert(unittest.TestCase):
    def ask(self, server):
        environment = {"DISPLAY": server.display, "GDK_BACKEND": "x11", "NO_AT_BRIDGE": "1", "GTK_THEME": "Adwaita",
                       "XAUTHORITY": "/dev/null"}
        alert = Alert(HELPER, environment=environment)
        self.addCleanup(alert.end)
        return alert

    def test_does_not_show_itself_to_another_users_server(self):
        command, trouble = other_user()
        if trouble:
            self.skipTest(f"This takes another user: {trouble}")
        with AnXServer(*command) as server:
            alert = self.ask(server)
            deadline = time.monotonic() + PATIENCE
            while alert.process.poll() is None and time.monotonic() < deadline:
                self.assertEqual(server.windows(), [], "the alert stands on another user's screen")
                time.sleep(0.05)
            self.assertIsNone(alert.wait())
            self.assertNotEqual(alert.process.returncode, 0)

    def test_shows_itself_to_this_users_server(self):
        with AnXServer() as server:
            self.ask(server)
            deadline = time.monotonic() + PATIENCE
            while not server.windows():
                self.assertLess(time.monotonic(), deadline, "no window appeared")
                time.sleep(0.05)


if __name__ == "__main__":
    missing = [program for program in ("Xvfb", "xdotool", "setpriv") if not any(
        os.access(os.path.join(folder, program), os.X_OK) for folder in os.environ["PATH"].split(":"))]
    if missing:
        print(f"Skipped: there is no {', '.join(missing)} here.")
        sys.exit(77)
    unittest.main(verbosity=2)
