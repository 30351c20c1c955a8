#!/usr/bin/env python3
"""A program in a sandbox that does not say which application it is: it may ask for access, and manage nothing."""

import subprocess
import unittest

import trial

trial.use_build_of_command_line()


class AProgramInAnUnknownSandbox(unittest.TestCase):
    def setUp(self):
        self.session = self.enterContext(trial.Trial())
        self.session.add_client("album")
        self.session.start_accountd()
        self.session.add_account()
        # The sandbox shows it the whole file system, so its program has the path that it has outside.
        probe = subprocess.run([*self.sandbox(), "true"], stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True, check=False)
        if probe.returncode != 0:
            self.skipTest(f"Sandboxes need bubblewrap and user namespaces, which are not allowed here: {probe.stdout}")

    @staticmethod
    def sandbox() -> list[str]:
        return ["bwrap", "--dev-bind", "/", "/", "--unshare-user", "--unshare-pid", "--proc", "/proc", "--"]

    def test_may_not_manage_accounts_grants_and_preferences(self):
        for command in (["account", "list"], ["grants"], ["revoke", "org.example.photos"], ["history"], ["clients"], ["revocations"]):
            with self.subTest(command=command):
                outside = self.session.run("palisade", *command)
                self.assertNotIn("sandboxed", outside.stdout)
                inside = self.session.run(*self.sandbox(), "palisade", *command)
                self.assertNotEqual(inside.returncode, 0, inside.stdout)
                self.assertIn("A sandboxed application may not manage", inside.stdout)

    def test_is_not_the_application_that_its_program_is_outside(self):
        program = self.session.root / "bin/album"
        ask = [program, "request", "--app", "1", "--permission", "email"]
        self.assertIn("Access is granted.", self.session.run(*ask).stdout)
        answer = self.session.run(*self.sandbox(), *ask).stdout
        self.assertNotIn("Access is granted.", answer)
        self.assertIn(f"sandbox:{program} because it has no bundle ID", answer)
        with self.session.caller() as manager:
            self.assertEqual(set(manager.grants()), {"org.example.album"})


if __name__ == "__main__":
    unittest.main(verbosity=2)
