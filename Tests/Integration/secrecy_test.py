#!/usr/bin/env python3
"""Where a token can be met on its way from the server to its application: on the bus, in the daemon's log."""

import contextlib
import os
import unittest

import trial
from accounts import FACEBOOK, GRANTED, Caller
from bus_wire import MEMBER, BusError

trial.use_build_of_command_line()

APPLICATION = ["request", "--app", "1234567890", "--permission", "email"]


class Monitor(Caller):
    """Hears every message of the bus, as `dbus-monitor` does."""

    def __init__(self, bus: str):
        super().__init__(bus)
        self.call("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus.Monitoring", "BecomeMonitor", "asu",
                  [[], 0])

    def heard_until(self, member: str) -> "list[bytes]":
        """The bodies of all messages until one with this member has come, and closes what came with them."""
        self.wait_for(lambda message: message.fields.get(MEMBER) == member)
        for message in self.inbox:
            for descriptor in message.descriptors:
                os.close(descriptor)
        return [message.body for message in self.inbox]


class ATokenOnTheBus(unittest.TestCase):
    def test_is_in_no_message_while_its_application_fetches_it(self):
        with trial.trial_with_account() as session, session.caller() as manager:
            session.add_client("album")
            session.kill_accountd()
            session.start_accountd()
            self.assertEqual(session.run("album", *APPLICATION).returncode, 0)
            with Monitor(session.bus) as monitor:
                fetched = session.run("album", "token")
                with contextlib.suppress(BusError):
                    manager.manage("TheEndOfTheRecording")
                heard = monitor.heard_until("TheEndOfTheRecording")
            token = fetched.stdout.strip().encode()
            self.assertRegex(token, b"^sandbox-", fetched)
            self.assertTrue(any(FACEBOOK.encode() in body for body in heard), "the recording is of this conversation")
            self.assertEqual([body for body in heard if token in body], [])

    def test_comes_in_a_pipe_and_in_no_other_way(self):
        with trial.trial_with_account() as session, session.caller() as caller:
            self.assertEqual(caller.start_request().outcome()[0], GRANTED)
            with open(caller.manage_for_descriptor("GetCredentialDescriptor", "s", [FACEBOOK]), "rb") as pipe:
                self.assertRegex(pipe.read(), b"^sandbox-")
            with self.assertRaises(BusError) as refused:
                caller.manage("GetCredential", "s", [FACEBOOK])
            self.assertEqual(refused.exception.name, "UnknownMethod")


if __name__ == "__main__":
    unittest.main(verbosity=2)
