#!/usr/bin/env python3
"""Where a token can be met on its way from the server to its application: on the bus, in the Secret Service, in a log."""

import contextlib
import os
import unittest

import trial
from accounts import FACEBOOK, GRANTED, REFUSED, Caller
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


class AnApplicationThatUsesTheSecretService(unittest.TestCase):
    def setUp(self):
        self.session = trial.Trial(log="error")
        self.addCleanup(self.session.close)
        self.session.start_keyring()
        self.session.configure(keychain="automatic")
        self.session.start_accountd()
        self.account = self.session.add_account()
        self.caller = self.session.caller()
        self.addCleanup(self.caller.close)
        self.assertEqual(self.caller.start_request().outcome()[0], GRANTED)
        self.token = self.caller.credential()

    def restart(self) -> None:
        self.session.kill_accountd()
        self.session.start_accountd()

    def expect_no_use(self, advice: str) -> None:
        with self.assertRaises(BusError) as refused:
            self.caller.credential()
        self.assertEqual(refused.exception.name, "KeychainUnavailable")
        self.assertIn(advice, refused.exception.message)
        word, results = self.caller.start_request(app_id="222").outcome()
        self.assertEqual(word, REFUSED)
        self.assertIn(advice, results["error_message"])

    def test_finds_no_token_there_and_nothing_that_opens_the_store(self):
        stolen = [bytes.fromhex(secret) for secret in self.session.run_thief("read").values()]
        for token in (self.session.master_token.strip(), self.token.encode()):
            self.assertEqual([secret for secret in stolen if token in secret], [])
        self.assertEqual([len(secret) for secret in stolen], [64], "half of a key, as hexadecimal digits")
        self.assertIn("may use the service and read your files", self.session.run("palisade", "doctor").stdout)

    def test_that_replaces_what_lies_there_changes_no_answer(self):
        stolen = self.session.run_thief("read")
        self.session.run_thief("replace", {item: "61" * (len(secret) // 2) for item, secret in stolen.items()})
        self.restart()
        self.expect_no_use("sign in again")
        self.assertRegex(self.session.run("palisade", "doctor").stdout, r"fail +keychain(.*\n)+.*was replaced")
        self.session.run_thief("replace", stolen)
        self.assertEqual(self.caller.credential(), self.token)

    def test_that_deletes_what_lies_there_leaves_the_way_to_sign_in_again(self):
        self.session.run_thief("delete")
        self.restart()
        self.expect_no_use("sign in again")
        self.assertEqual(self.session.add_account(), self.account)
        self.assertEqual(self.caller.start_request(app_id="222").outcome()[0], GRANTED)
        self.assertNotEqual(self.caller.credential(), self.token)

    def test_that_deletes_what_lies_there_keeps_nobody_from_taking_access_back(self):
        self.session.start_vantad()
        self.session.run_thief("delete")
        self.caller.manage("Revoke", "ss", [FACEBOOK, "org.example.photos"])
        self.restart()
        with self.assertRaises(BusError) as refused:
            self.caller.credential()
        self.assertEqual(refused.exception.name, "NotGranted")

    def test_does_not_see_what_the_social_daemon_needs_to_have_a_token_made_invalid(self):
        self.session.start_vantad()
        self.caller.manage("Revoke", "ss", [FACEBOOK, "org.example.photos"])
        trial.wait_until(lambda: self.caller.revocations()[0]["state"] == "confirmed", "the server confirms")


def pieces_of(token: bytes) -> "list[bytes]":
    """The shortest pieces of a token that tell something."""
    return [token[place:place + 12] for place in range(token.rindex(b"-") + 1, len(token) - 11)]


class ATokenInALog(unittest.TestCase):
    def test_is_masked_at_every_level(self):
        with trial.trial_with_account(log="debug") as session, session.caller() as caller:
            tokens = [session.master_token.strip()]
            for permissions in (["email"], ["email", "user_photos"]):
                self.assertEqual(caller.start_request(permissions=permissions).outcome()[0], GRANTED)
                tokens.append(caller.credential().encode())
            session.start_vantad()
            caller.manage("Revoke", "ss", [FACEBOOK, "org.example.photos"])
            trial.wait_until(lambda: caller.revocations()[0]["state"] == "confirmed", "the server confirms")
            log = (session.root / "accountd.log").read_bytes() + (session.root / "vantad.log").read_bytes()
            self.assertIn(b"Access request response", log)
            self.assertIn(b"[masked]", log)
            self.assertEqual([token for token in tokens if any(piece in log for piece in pieces_of(token))], [])


if __name__ == "__main__":
    unittest.main(verbosity=2)
