#!/usr/bin/env python3
"""Notifications reach the daemon from the user's own programs, and not from sandboxed applications."""

import os
import unittest

import trial
from accounts import GRANTED, NAME
from trial import wait_until

trial.use_build_of_command_line()

DOMAIN = "com.veltran.social.facebook"
KEY = "FacebookIgnoreAccessRequests"
NOTIFICATION = "FacebookEnvironmentDidChangeNotification"
# To everybody, and straight to the daemon.
DESTINATIONS = (None, NAME)
POST = """
import sys
folder, bus, destination = sys.argv[1:]
sys.path.insert(0, folder)
from accounts import Caller
from bus_wire import BusError
with Caller(bus) as caller:
    caller.emit(destination or None, "/com/veltran/Notify1", "com.veltran.Notify1", "Posted", "s",
                ["FacebookEnvironmentDidChangeNotification"])
    try:
        caller.manage("ListGrants", "s", [""])
    except BusError as error:
        print(error.name)
"""


class ANotification(unittest.TestCase):
    def setUp(self):
        self.session = self.enterContext(trial.trial_with_account(log="error"))
        self.caller = self.enterContext(self.session.caller())
        self.caller.manage("SetPreference", "ssa{sv}", [DOMAIN, KEY, {"value": ("b", False)}])
        # The plug-in listens from the first answer of a user on.
        self.assertEqual(self.caller.start_request().outcome()[0], GRANTED)
        self.assertIs(self.preference(), False)
        # What is written without an end is no change that the daemon notices by itself.
        self.file = os.open(self.session.configuration / "preferences" / f"{DOMAIN}.toml", os.O_WRONLY)
        self.addCleanup(os.close, self.file)
        os.pwrite(self.file, f"{KEY} = true \n".encode(), 0)
        self.assertIs(self.preference(), False)

    def preference(self):
        return self.caller.manage("GetPreference", "ss", [DOMAIN, KEY])[0]["value"]

    def test_of_a_program_has_the_daemon_read_its_preferences_again(self):
        for destination in DESTINATIONS:
            with self.subTest(destination=destination), self.session.caller() as poster:
                poster.emit(destination, "/com/veltran/Notify1", "com.veltran.Notify1", "Posted", "s", [NOTIFICATION])
                wait_until(lambda: self.preference() is True, "the preference is read again")

    def test_of_the_command_line_does_too(self):
        self.session.run("palisade", "notify", NOTIFICATION)
        wait_until(lambda: self.preference() is True, "the preference is read again")

    def test_of_a_sandboxed_application_is_passed_over(self):
        for destination in DESTINATIONS:
            with self.subTest(destination=destination):
                posted = self.session.run_sandboxed("org.example.Sandboxed", trial.THIS_PROGRAM, "-c", POST,
                                                    trial.PROJECT / "Tests/Integration", self.session.bus, destination or "")
                self.assertEqual(posted.stdout.split(), ["NotPermitted"], "the daemon has read what was posted before")
                self.assertIs(self.preference(), False)


if __name__ == "__main__":
    unittest.main(verbosity=2)
