#!/usr/bin/env python3
"""What is left of tokens in the memory of the daemons after they have been handed out, used, refused and removed: nothing.

The daemons keep every other process of their user out of their memory. Root of the user namespace that they run in may look.
"""

import contextlib
import os
import subprocess
import sys
import time
import unittest

import trial
from accounts import FACEBOOK, GRANTED, REFUSED
from bus_wire import IS_SANITIZED, PATIENCE, BusError

trial.use_build_of_command_line()

PHOTOS = "org.example.photos"
# A sanitizer's shadow is larger than this, and no memory of the daemon's own.
LARGEST_REGION = 1 << 30


def become_root() -> None:
    """Goes on in a user namespace in which this user is root. Root has no need of it."""
    if os.geteuid() == 0:
        return
    command = ["unshare", "--user", "--map-root-user"]
    tried = subprocess.run([*command, "true"], capture_output=True, text=True, check=False)
    if tried.returncode != 0:
        print(f"Skipped: the daemons' memory takes root or a user namespace: {tried.stderr.strip()}")
        sys.exit(77)
    sys.stdout.flush()
    os.execvp(command[0], [*command, sys.executable, *sys.argv])


def memory_of(process: subprocess.Popen):
    """The regions that the process has written to, and what they hold."""
    with open(f"/proc/{process.pid}/maps", encoding="utf-8") as maps, open(f"/proc/{process.pid}/mem", "rb", 0) as memory:
        for region in maps:
            begin, end = (int(number, 16) for number in region.split()[0].split("-"))
            if not region.split()[1].startswith("rw") or end - begin > LARGEST_REGION:
                continue
            # A region may have gone meanwhile.
            with contextlib.suppress(OSError):
                memory.seek(begin)
                yield region.strip(), memory.read(end - begin)


class Memory(unittest.TestCase):
    SETTINGS = {"keychain": "vault"}

    def setUp(self):
        self.session = trial.Trial()
        self.addCleanup(self.session.close)
        self.session.configure(**self.SETTINGS)
        self.prepare()
        self.session.start_accountd()
        self.session.add_account()
        self.tokens = {self.session.master_token.strip()}
        self.caller = self.session.caller()
        self.addCleanup(self.caller.close)

    def prepare(self) -> None:
        """Starts what else the daemon needs."""

    def fetch(self) -> None:
        self.tokens.add(self.caller.credential().encode())

    def what_is_left(self) -> "str | None":
        """Where a piece of twelve bytes of a token is."""
        for process in filter(None, (self.session.accountd, self.session.vantad)):
            size = 0
            for region, content in memory_of(process):
                size += len(content)
                for token in self.tokens:
                    for place in range(token.rindex(b"-") + 1, len(token) - 11):
                        if (found := content.find(token[place:place + 12])) >= 0:
                            return f"{process.args[0]}, {region}: {content[max(0, found - 64):found + 64]}"
            self.assertGreater(size, 1 << 20, "the memory was looked at")
        return None

    def expect_nothing(self) -> None:
        # A thread that has sent an answer has yet to put away what it needed for it.
        deadline = time.monotonic() + PATIENCE
        while (left := self.what_is_left()) is not None:
            self.assertLess(time.monotonic(), deadline, left)


class TheMemoryOfTheDaemons(Memory):
    def test_holds_no_token_that_was_granted_extended_and_fetched(self):
        self.expect_nothing()
        for permissions in (["email"], ["email", "user_photos"]):
            self.assertEqual(self.caller.start_request(permissions=permissions).outcome()[0], GRANTED)
            self.fetch()
        self.session.run("palisade", "doctor")
        self.expect_nothing()

    def test_holds_no_token_that_many_have_asked_for_at_once(self):
        with contextlib.ExitStack() as crowd:
            callers = [crowd.enter_context(self.session.caller()) for _ in range(8)]
            for asked in [caller.start_request() for caller in callers]:
                self.assertEqual(asked.outcome()[0], GRANTED)
            for caller in callers:
                self.assertEqual(caller.credential(), self.caller.credential())
        self.fetch()
        self.expect_nothing()

    def test_holds_no_token_after_a_server_that_failed(self):
        for fault in ("close", "garbage", "huge", "types", "duplicate", "deep", "text", "page"):
            self.session.sandbox("fault", fault, "--path", "/oauth/authorization")
            self.assertEqual(self.caller.start_request().outcome()[0], REFUSED)
        self.expect_nothing()

    def test_holds_no_token_that_was_taken_back_and_issued_anew(self):
        self.assertEqual(self.caller.start_request().outcome()[0], GRANTED)
        self.fetch()
        self.session.start_vantad()
        self.caller.manage("Revoke", "ss", [FACEBOOK, PHOTOS])
        trial.wait_until(lambda: self.caller.revocations()[0]["state"] == "confirmed", "the server confirms")
        self.assertEqual(self.caller.start_authorize(PHOTOS).outcome()[0], GRANTED)
        self.fetch()
        self.expect_nothing()

    def test_holds_no_token_after_it_has_opened_the_vault_of_another_day(self):
        self.assertEqual(self.caller.start_request().outcome()[0], GRANTED)
        self.session.kill_accountd()
        self.session.start_accountd()
        self.fetch()
        with self.assertRaises(BusError):
            self.session.add_account()
        self.expect_nothing()
        for account in self.caller.manage("ListAccounts", "s", [""])[0]:
            self.caller.manage("RemoveAccount", "s", [account["id"]])
        self.expect_nothing()


class TheMemoryOfADaemonWithHalfOfItsKeyInTheSecretService(Memory):
    SETTINGS = {"keychain": "secret-service"}

    def prepare(self) -> None:
        self.session.start_keyring()

    def test_holds_no_token(self):
        self.assertEqual(self.caller.start_request().outcome()[0], GRANTED)
        self.fetch()
        self.session.kill_accountd()
        self.session.start_accountd()
        self.fetch()
        self.expect_nothing()


if __name__ == "__main__":
    if IS_SANITIZED:
        print("Skipped: a sanitizer's memory is too large to search, and keeps what lay on the stack.")
        sys.exit(77)
    become_root()
    unittest.main(verbosity=2)
