#!/usr/bin/env python3
"""Taking access back, whatever the application waits for at that moment: access ends with the call."""

import unittest

import trial
from accounts import FACEBOOK, GRANTED, PENDING, REFUSED, WITHDRAWN
from bus_wire import BusError
from trial import wait_until

trial.use_build_of_command_line()

PHOTOS = "org.example.photos"
ISSUE = "/oauth/authorization"
DESCRIBE = "/oauth/permission-description"
MORE = {"permissions": ("email", "user_photos")}
# The server has to be asked for words for it.
UNKNOWN = {"permissions": ("email", "user_playlists")}


class Revocations(unittest.TestCase):
    """The server never answers what it is asked at some path. So whatever ends in one of these tests did not wait for it."""

    def setUp(self):
        self.session = self.enterContext(trial.trial_with_account(log="error"))
        self.caller = self.enterContext(self.session.caller())
        self.manager = self.enterContext(self.session.caller())

    def grant(self) -> None:
        self.assertEqual(self.caller.start_request().outcome()[0], GRANTED)

    def stop_server(self, path: str) -> None:
        self.session.sandbox("fault", "silent", "--times", "0", "--path", path)

    def requests_at(self, path: str) -> int:
        return self.session.sandbox("requests").count(path)

    def stand_at_server(self, path: str, **options):
        """A request whose exchange with the server has begun."""
        before = self.requests_at(path)
        request = self.caller.start_request(**options)
        self.assertEqual(request.reply()[0], PENDING)
        wait_until(lambda: self.requests_at(path) > before, "the server is asked")
        return request

    def revoke(self) -> None:
        self.manager.manage("Revoke", "ss", [FACEBOOK, PHOTOS])

    def expect_revoked(self, request) -> None:
        word, results = request.response()
        self.assertEqual(word, WITHDRAWN)
        self.assertEqual(results["error_domain"], "com.veltran.Accounts1.Error.AccessRevoked")
        self.assertIn("Ask again", results["error_message"])

    def expect_no_token(self) -> None:
        with self.assertRaises(BusError) as refused:
            self.caller.credential()
        self.assertEqual(refused.exception.name, "NotGranted")

    def expect_every_token_invalidated(self) -> None:
        self.session.start_vantad()
        wait_until(lambda: (rows := self.manager.revocations()) and {row["state"] for row in rows} == {"confirmed"},
                   "the server confirms")
        self.assertNotIn('"valid":true', self.session.sandbox("tokens"))

    def record(self) -> dict | None:
        return self.manager.grants().get(PHOTOS)


class OfOneClient(Revocations):
    def test_does_not_wait_for_an_extension_that_stands_at_the_server(self):
        self.grant()
        self.stop_server(ISSUE)
        extension = self.stand_at_server(ISSUE, **MORE)
        self.assertTrue(self.caller.credential().startswith("sandbox-"))
        self.revoke()
        self.expect_no_token()
        self.expect_revoked(extension)
        self.assertFalse(self.record()["granted"])
        self.expect_every_token_invalidated()
        self.expect_no_token()
        # Asked after the revocation, so judged by it: nobody is asked again.
        alerts = self.session.person.alerts
        self.assertEqual(self.caller.start_request().outcome()[0], REFUSED)
        self.assertEqual(self.session.person.alerts, alerts)

    def test_takes_back_what_the_server_issues_to_a_first_request_that_nobody_has_recorded(self):
        self.stop_server(ISSUE)
        request = self.stand_at_server(ISSUE)
        wait_until(lambda: '"valid":true' in self.session.sandbox("tokens"), "the server has issued a token")
        self.revoke()
        self.expect_revoked(request)
        self.assertIsNone(self.record())
        self.expect_every_token_invalidated()
        self.session.sandbox("calm")
        self.grant()
        self.assertEqual(self.session.person.alerts, 2, "what asks afterwards is judged anew")

    def test_survives_the_daemons_death(self):
        self.grant()
        self.stop_server(ISSUE)
        self.stand_at_server(ISSUE, **MORE)
        self.revoke()
        self.session.kill_accountd()
        self.session.start_accountd()
        self.assertFalse(self.record()["granted"])
        self.expect_every_token_invalidated()

    def test_takes_the_clients_alert_down_and_nobody_has_answered(self):
        self.session.person.answer = "nothing"
        request = self.caller.start_request()
        self.session.person.wait_for_alert(1)
        self.revoke()
        self.assertEqual(request.reply()[0], PENDING)
        self.expect_revoked(request)
        self.assertIsNone(self.record())
        self.session.person.answer = "allow"
        self.grant()
        self.assertEqual(self.session.person.alerts, 2)

    def test_withdraws_an_authorization_that_stands_at_the_server(self):
        self.grant()
        self.revoke()
        self.stop_server(ISSUE)
        before = self.requests_at(ISSUE)
        authorization = self.manager.start_authorize(PHOTOS)
        self.assertEqual(authorization.reply()[0], PENDING)
        wait_until(lambda: self.requests_at(ISSUE) > before, "the server is asked")
        self.revoke()
        self.expect_revoked(authorization)
        self.assertFalse(self.record()["granted"])
        self.expect_no_token()
        self.expect_every_token_invalidated()

    def test_withdraws_what_waits_for_its_turn(self):
        self.stop_server(ISSUE)
        standing = self.stand_at_server(ISSUE)
        waiting = [self.caller.start_request(**MORE), self.manager.start_authorize(PHOTOS)]
        for request in waiting:
            self.assertEqual(request.reply()[0], PENDING)
        self.revoke()
        for request in (standing, *waiting):
            self.expect_revoked(request)
        self.assertIsNone(self.record())
        self.expect_every_token_invalidated()

    def test_ends_the_wait_for_a_description(self):
        self.stop_server(DESCRIBE)
        request = self.stand_at_server(DESCRIBE, **UNKNOWN)
        self.revoke()
        self.expect_revoked(request)
        self.assertIsNone(self.record())


class OfEverybody(Revocations):
    def expect_withdrawn_by(self, take_back) -> None:
        self.grant()
        self.stop_server(ISSUE)
        extension = self.stand_at_server(ISSUE, **MORE)
        take_back()
        self.expect_revoked(extension)
        self.assertEqual(self.manager.grants(), {})
        self.expect_no_token()
        self.expect_every_token_invalidated()

    def test_does_not_wait_for_an_extension_that_stands_at_the_server(self):
        self.expect_withdrawn_by(lambda: self.manager.manage("RevokeAll", "s", [FACEBOOK]))

    def test_by_the_removal_of_the_account_does_not_wait_either(self):
        account = self.manager.manage("ListAccounts", "s", [""])[0][0]["id"]
        self.expect_withdrawn_by(lambda: self.manager.manage("RemoveAccount", "s", [account]))


class ACallerThatLosesInterest(Revocations):
    def test_ends_its_wait_for_a_description(self):
        self.stop_server(DESCRIBE)
        request = self.stand_at_server(DESCRIBE, **UNKNOWN)
        request.close()
        self.assertEqual(request.response()[0], WITHDRAWN)
        self.assertIsNone(self.record())


if __name__ == "__main__":
    unittest.main(verbosity=2)
