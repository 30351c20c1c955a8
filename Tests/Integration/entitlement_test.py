#!/usr/bin/env python3
"""A user's own file system that says of every file that it is root's: its client records give no entitlements."""

import json
import subprocess
import unittest

import trial

trial.use_build_of_command_line()


class AFileSystemThatClaimsRootsFiles(unittest.TestCase):
    def setUp(self):
        self.session = self.enterContext(trial.Trial())
        source, self.shown = self.session.root / "source", self.session.root / "shown"
        records = source / "palisade/clients"
        records.mkdir(parents=True)
        self.shown.mkdir()
        (records / "org.example.thief.toml").write_text(
            'bundle_id = "org.example.thief"\nname = "Thief"\nentitlements = ["com.example.everything"]\n\n'
            '[match]\nexecutable = "/usr/bin/thief"\n',
            encoding="utf-8")
        command = ["bindfs", "--no-allow-other", "--force-user=0", "--force-group=0", "--perms=go-w", source, self.shown]
        mount = subprocess.run(command, stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True, check=False)
        if mount.returncode != 0:
            self.skipTest(f"FUSE file systems cannot be mounted here: {mount.stdout}")
        self.addCleanup(subprocess.run, ["fusermount3", "-u", "-z", self.shown], check=True)
        self.assertEqual((self.shown / "palisade/clients/org.example.thief.toml").stat().st_uid, 0)

    def test_gives_no_entitlements_and_the_doctor_says_so(self):
        self.session.start_accountd(environment={"XDG_DATA_DIRS": str(self.shown)})
        clients = json.loads(self.session.run("palisade", "--json", "clients").stdout)
        thief, = (client for client in clients if client["bundle_id"] == "org.example.thief")
        self.assertEqual(thief["entitlements"], [])
        self.assertRegex(self.session.run("palisade", "doctor").stdout,
                         r"org\.example\.thief\.toml: its entitlements do not count: its folder is none of the system's")


if __name__ == "__main__":
    unittest.main(verbosity=2)
