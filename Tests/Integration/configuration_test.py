#!/usr/bin/env python3
"""Configuration that others may write decides nothing, and whoever asks hears how to mend it."""

import unittest

import trial
from bus_wire import PATIENCE
from trial import wait_until

trial.use_build_of_command_line()


class Configuration(unittest.TestCase):
    def setUp(self):
        self.session = self.enterContext(trial.Trial())
        self.session.start_accountd()
        self.session.add_account()
        self.session.accountd.terminate()
        self.session.accountd.wait()

    def expect_refusal(self, exposed, remedy: str):
        self.session.start_accountd()
        for command in (["account", "list"], ["grants"], ["request", "--app", "1", "--permission", "email"]):
            answer = self.session.run("palisade", *command)
            self.assertNotEqual(answer.returncode, 0)
            self.assertIn("is not read, because others could have written it", answer.stdout)
            self.assertIn(f"{exposed} is writable by other users", answer.stdout)
        doctor = self.session.run("palisade", "doctor")
        self.assertNotEqual(doctor.returncode, 0)
        self.assertRegex(doctor.stdout, "fail +configuration")
        self.assertIn(remedy.split("'")[0], doctor.stdout)
        self.assertEqual(self.session.person.alerts, 0)

    def expect_to_serve_when_mended(self):
        self.assertIn("has been mended", self.session.run("palisade", "account", "list").stdout)
        self.assertEqual(self.session.accountd.wait(PATIENCE), 0)
        self.session.start_accountd()
        self.assertIn("ada", self.session.run("palisade", "account", "list").stdout)

    def test_that_others_may_write_is_refused_until_it_is_mended(self):
        for name in ("accountd.toml", "server.toml"):
            for mode in (0o666, 0o620, 0o602):
                with self.subTest(name=name, mode=oct(mode)):
                    file = self.session.configuration / name
                    file.chmod(mode)
                    self.expect_refusal(file, f"chmod go-w '{file}'")
                    file.chmod(0o644)
                    self.expect_to_serve_when_mended()
                    self.session.accountd.terminate()
                    self.session.accountd.wait()

    def test_in_a_folder_that_others_may_write_is_refused_until_it_is_mended(self):
        for mode in (0o777, 0o770, 0o1777):
            with self.subTest(mode=oct(mode)):
                self.session.configuration.chmod(mode)
                self.expect_refusal(self.session.configuration, "chmod go-w '")
                self.session.configuration.chmod(0o700)
                self.expect_to_serve_when_mended()
                self.session.accountd.terminate()
                self.session.accountd.wait()

    def test_behind_a_link_is_judged_where_it_lies(self):
        elsewhere = self.session.root / "elsewhere"
        elsewhere.mkdir(mode=0o700)
        file = self.session.configuration / "server.toml"
        file.rename(elsewhere / "server.toml")
        file.symlink_to(elsewhere / "server.toml")
        self.session.start_accountd()
        self.assertIn("ada", self.session.run("palisade", "account", "list").stdout)
        self.session.accountd.terminate()
        self.session.accountd.wait()
        elsewhere.chmod(0o777)
        self.expect_refusal(elsewhere, "chmod go-w '")

    def test_that_others_may_write_is_not_used_by_vantad(self):
        (self.session.configuration / "server.toml").chmod(0o666)
        self.session.start_vantad()
        log = self.session.root / "vantad.log"
        wait_until(lambda: "because others could have written it" in log.read_text(encoding="utf-8"), "vantad tells of the file")
        self.assertIn("No server is asked until that is mended", log.read_text(encoding="utf-8"))


if __name__ == "__main__":
    unittest.main(verbosity=2)
