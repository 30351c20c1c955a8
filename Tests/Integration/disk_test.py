#!/usr/bin/env python3
"""What the daemon does when its disk is full or read-only: it grants nothing, takes nothing back in appearance only, and says why."""

import os
import subprocess
import sys
import unittest

import trial
from accounts import FACEBOOK, GRANTED, REFUSED
from bus_wire import BusError

PHOTOS = "org.example.photos"


def become_root() -> None:
    """Goes on in user and mount namespaces in which this user is root and may mount a disk. Root has no need of it."""
    if os.geteuid() == 0:
        return
    command = ["unshare", "--user", "--map-root-user", "--mount"]
    tried = subprocess.run([*command, "true"], capture_output=True, text=True, check=False)
    if tried.returncode != 0:
        print(f"Skipped: a small disk takes root or a user namespace: {tried.stderr.strip()}")
        sys.exit(77)
    sys.stdout.flush()
    os.execvp(command[0], [*command, sys.executable, *sys.argv])


class Volume:
    """A small disk of its own under the stores' folder."""

    def __init__(self, session: trial.Trial):
        self._session = session
        self._folder = session.state
        subprocess.run(["mount", "-t", "tmpfs", "-o", "size=4m,mode=700", "tmpfs", str(self._folder)], check=True)

    def __enter__(self):
        return self

    def __exit__(self, *_):
        if self._session.accountd is not None and self._session.accountd.poll() is None:
            self._session.kill_accountd()
        subprocess.run(["umount", str(self._folder)], check=True)

    def fill(self) -> None:
        with open(self._folder / "ballast", "ab", buffering=0) as ballast:
            try:
                while True:
                    ballast.write(bytes(4096))
            except OSError:
                pass

    def free(self) -> None:
        (self._folder / "ballast").unlink()

    def remount(self, mode: str) -> None:
        # Of the mount alone: in a user namespace, the disk's own options may name users that it does not have.
        subprocess.run(["mount", "-o", f"remount,bind,{mode}", str(self._folder)], check=True)


class ADiskThat(unittest.TestCase):
    def setUp(self):
        self.session = self.enterContext(trial.Trial(log="error"))
        self.volume = self.enterContext(Volume(self.session))
        self.session.start_accountd()
        self.session.add_account()
        self.caller = self.enterContext(self.session.caller())

    def granted(self) -> set[str]:
        return {client for client, row in self.caller.grants().items() if row["granted"]}

    def expect_a_grant_that_survives(self):
        self.assertEqual(self.caller.start_request().outcome()[0], GRANTED)
        self.session.kill_accountd()
        self.session.start_accountd()
        self.assertEqual(self.granted(), {PHOTOS})
        self.assertTrue(self.caller.credential().startswith("sandbox-"))

    def test_is_full_grants_nothing_and_says_so(self):
        self.volume.fill()
        word, results = self.caller.start_request().outcome()
        self.assertEqual(word, REFUSED)
        self.assertIn("full", results["error_message"])
        self.assertEqual(self.granted(), set())
        with self.assertRaises(BusError) as refused:
            self.caller.credential()
        self.assertEqual(refused.exception.name, "NotGranted")
        self.volume.free()
        self.expect_a_grant_that_survives()

    def test_is_full_revokes_nothing_in_appearance_only(self):
        self.assertEqual(self.caller.start_request().outcome()[0], GRANTED)
        self.volume.fill()
        for method, signature, values in (("Revoke", "ss", [FACEBOOK, PHOTOS]), ("RevokeAll", "s", [FACEBOOK])):
            with self.subTest(method=method), self.assertRaises(BusError) as refused:
                self.caller.manage(method, signature, values)
            self.assertEqual(refused.exception.name, "StoreUnavailable")
            self.assertIn("full", refused.exception.message)
        self.volume.free()
        self.caller.manage("Revoke", "ss", [FACEBOOK, PHOTOS])
        self.assertEqual(self.granted(), set())

    def test_is_full_takes_no_account(self):
        self.volume.fill()
        with self.assertRaises(BusError) as refused:
            self.caller.add_account("grace", self.session.master_token)
        self.assertIn(refused.exception.name, ("StoreUnavailable", "KeychainUnavailable"))
        self.assertIn("full", refused.exception.message)
        self.assertEqual([row["username"] for row in self.caller.manage("ListAccounts", "s", [""])[0]], ["ada"])

    def test_is_read_only_stops_the_daemon_from_starting_with_a_sentence(self):
        self.session.kill_accountd()
        self.volume.remount("ro")
        with self.assertRaises(RuntimeError) as failed:
            self.session.start_accountd()
        self.assertRegex(str(failed.exception), r"(?s)ended with 1: .*accountd: .*cannot be written")
        self.volume.remount("rw")
        self.session.start_accountd()
        self.expect_a_grant_that_survives()


if __name__ == "__main__":
    become_root()
    trial.use_build_of_command_line()
    unittest.main(verbosity=2)
