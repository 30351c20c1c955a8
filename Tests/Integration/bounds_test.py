#!/usr/bin/env python3
"""Values of any size: what is beyond its bound is refused before anybody is asked, and nothing of it is kept."""

import contextlib
import sqlite3
import subprocess
import unittest

import trial
from accounts import FACEBOOK, GRANTED, PENDING, facebook_options
from bus_wire import PATIENCE, BusError
from hostile_test import methods
from text_test import plain_arguments
from trial import wait_until

trial.use_build_of_command_line()

MEBIBYTE = 1 << 20
# The bus carries dictionaries of less than 64 MiB.
LARGE = 63 * MEBIBYTE
NAME_BOUND = 256
CLIENT_BOUND = 4096
APP = "FacebookAppIdKey"
PERMISSIONS = "FacebookPermissionsKey"
AUDIENCE = "FacebookAudienceKey"


class Bounds(unittest.TestCase):
    answer = "allow"

    def setUp(self):
        self.session = self.enterContext(trial.trial_with_account(answer=self.answer, log="error"))
        self.caller = self.enterContext(self.session.caller())

    def tearDown(self):
        self.assertIsNone(self.session.accountd.poll(), self.session.daemon_log())

    def refusal_of(self, method: str, signature: str, values, **more) -> str:
        with self.assertRaises(BusError, msg=method) as refused:
            self.caller.manage(method, signature, values, **more)
        self.assertEqual(refused.exception.name, "InvalidArguments")
        self.assertLess(len(refused.exception.message), 1000)
        return refused.exception.message

    def refusal_of_request(self, options: dict) -> str:
        return self.refusal_of("RequestAccess", "sa{sv}a{sv}", [FACEBOOK, options, {}])

    def stored_bytes(self) -> int:
        return sum(file.stat().st_size for file in self.session.state.iterdir() if file.is_file())


class Requests(Bounds):
    def test_beyond_a_bound_are_refused_with_its_name_and_leave_nothing(self):
        options = facebook_options(audience="FacebookAudienceFriends")
        before = self.stored_bytes()
        # Three bytes each in UTF-8.
        wide = "\u20ac"
        for changed, expected in (
                ({APP: ("s", "1" * (NAME_BOUND + 1))}, f"'{APP}' is longer than 256 bytes."),
                ({APP: ("s", wide * 86)}, f"'{APP}' is longer than 256 bytes."),
                ({AUDIENCE: ("s", "x" * (NAME_BOUND + 1))}, f"'{AUDIENCE}' is longer than 256 bytes."),
                ({PERMISSIONS: ("as", [f"p{number}" for number in range(201)])}, f"'{PERMISSIONS}' holds more than 200 permissions."),
                ({PERMISSIONS: ("av", [("i", 1)] * 201)}, f"'{PERMISSIONS}' holds more than 200 permissions."),
                ({PERMISSIONS: ("as", ["x" * 129])}, f"'{PERMISSIONS}' holds a permission of more than 128 bytes."),
                ({PERMISSIONS: ("av", [("i", 1), ("s", "x" * 129)])}, f"'{PERMISSIONS}' holds a permission of more than 128 bytes."),
                ({"other": ("s", "x" * 65_536)}, "A dictionary holds more than 64 KiB."),
                ({"x" * 65_536: ("b", True)}, "A dictionary holds more than 64 KiB."),
                ({"list": ("as", [""] * 8_192)}, "A dictionary holds more than 64 KiB."),
                ({"deep": ("v", ("a{sv}", {"x": ("av", [("i", 1)] * 8_192)}))}, "A dictionary holds more than 64 KiB.")):
            with self.subTest(expected=expected, key=list(changed)[0][:20]):
                self.assertEqual(self.refusal_of_request(options | changed), expected)
        self.assertEqual(self.session.person.alerts, 0)
        self.assertEqual(self.caller.grants(), {})
        self.assertEqual(self.caller.manage("History")[0], [])
        self.assertEqual(self.stored_bytes(), before)

    def test_of_many_mebibytes_in_any_field_delay_and_cost_nobody_else(self):
        self.session.person.answer = "refuse"
        with self.session.caller() as other:
            for options in ({APP: ("s", "1" * LARGE)}, {AUDIENCE: ("s", "x" * LARGE)}, {PERMISSIONS: ("as", ["x" * LARGE])},
                            {PERMISSIONS: ("as", ["xxxxxxx"] * (LARGE // 64))}, {"x" * LARGE: ("b", True)}):
                serial = self.caller.start("RequestAccess", "sa{sv}a{sv}", [FACEBOOK, facebook_options() | options, {}])
                self.assertEqual(other.grants(), {})
                with self.assertRaises(BusError) as refused:
                    self.caller.reply_to(serial).answer()
                self.assertEqual(refused.exception.name, "InvalidArguments")
        self.assertLess(self.stored_bytes(), MEBIBYTE)

    def test_at_every_bound_are_served(self):
        options = {APP: ("s", "1" * NAME_BOUND), AUDIENCE: ("s", "x" * NAME_BOUND),
                   PERMISSIONS: ("as", [f"p{number}".ljust(128, "x") for number in range(200)])}
        request = self.caller.start_request_with(options)
        self.assertNotEqual(request.outcome()[0], PENDING)

    def test_within_the_bounds_are_listed_as_they_are(self):
        app = "1" * NAME_BOUND
        self.assertEqual(self.caller.start_request(app_id=app).outcome()[0], GRANTED)
        self.assertEqual(self.caller.grants()["org.example.photos"]["app_id"], app)


class Arguments(Bounds):
    def test_of_every_method_have_a_bound(self):
        for method, signature in methods().items():
            arguments = plain_arguments(method, signature)
            for place, right in enumerate(arguments):
                if not isinstance(right, str):
                    continue
                is_client = method in ("Revoke", "Authorize") and place == 1
                for size in ((CLIENT_BOUND if is_client else NAME_BOUND) + 1, MEBIBYTE):
                    values = plain_arguments(method, signature)
                    values[place] = "x" * size
                    with self.subTest(method=method, place=place, size=size):
                        message = self.refusal_of(method, signature, values, descriptors=[0] if "h" in signature else ())
                        self.assertRegex(message, f"is longer than {CLIENT_BOUND if is_client else NAME_BOUND} bytes")

    def test_in_options_have_a_bound(self):
        for method, values, signature, expected in (
                ("History", [{"client": ("s", "x" * (CLIENT_BOUND + 1))}], "a{sv}", "'client' is longer than 4096 bytes."),
                ("History", [{"x" * 60_000: ("b", True)}], "a{sv}", "There is no option 'x"),
                ("SetPreference", ["com.example", "key", {"value": ("s", "x" * 65_536)}], "ssa{sv}", "more than 64 KiB"),
                ("SetPreference", ["com.example", "key", {"value": ("as", ["x" * 1_000] * 66)}], "ssa{sv}", "more than 64 KiB")):
            with self.subTest(method=method, expected=expected):
                self.assertIn(expected, self.refusal_of(method, signature, values))


class Answers(Bounds):
    def fill_store(self, mebibytes: int, count: int):
        self.caller.close()
        self.session.accountd.terminate()
        self.session.accountd.wait()
        subprocess.run([trial.BUILD / "Tests/Integration/palisade-large-records", self.session.state / "accounts.sqlite",
                        str(mebibytes), str(count)], check=True)
        with contextlib.closing(sqlite3.connect(self.session.state / "accounts.sqlite")) as store:
            store.execute("INSERT INTO accounts (account_type, username, description) VALUES (?, ?, ?)",
                          (FACEBOOK, "y" * (mebibytes * MEBIBYTE), "z"))
            store.commit()
        self.session.start_accountd()
        self.caller = self.enterContext(self.session.caller())

    def test_show_a_record_that_was_stored_without_a_bound(self):
        self.fill_store(64, 1)
        grants, = self.caller.manage("ListGrants", "s", [FACEBOOK], timeout=5 * PATIENCE)
        self.assertEqual([row["audience"] for row in grants], ["x" * (CLIENT_BOUND - 3) + "…"])
        names = [row["username"] for row in self.caller.manage("ListAccounts", "s", [""])[0]]
        self.assertEqual(names, ["ada", "y" * (CLIENT_BOUND - 3) + "…"])

    def test_show_records_that_were_stored_without_bounds_and_they_can_be_revoked(self):
        self.fill_store(1, 5)
        self.assertEqual(len(self.caller.grants()), 5)
        self.assertEqual(self.session.run("palisade", "grants").returncode, 0)
        self.caller.manage("Revoke", "ss", [FACEBOOK, "large0"], timeout=5 * PATIENCE)
        self.assertFalse(self.caller.grants()["large0"]["granted"])

    def test_that_are_too_large_are_errors(self):
        folder = self.session.configuration / "preferences"
        folder.mkdir(exist_ok=True)
        (folder / "com.example.toml").write_text('key = "' + "x" * MEBIBYTE + '"\n', encoding="utf-8")
        with self.assertRaises(BusError) as refused:
            self.caller.manage("GetPreference", "ss", ["com.example", "key"])
        self.assertEqual(refused.exception.name, "Failed")
        self.assertIn("cannot be sent", refused.exception.message)
        wait_until(lambda: "cannot be sent" in self.session.daemon_log(), "the log says so too")


if __name__ == "__main__":
    unittest.main(verbosity=2)
