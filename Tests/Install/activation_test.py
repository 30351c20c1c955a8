#!/usr/bin/env python3
"""The daemons as the session bus starts them: from the installed files, when somebody calls, once."""

import os
import pathlib
import re
import sqlite3
import subprocess
import sys
import tempfile
import time
import unittest

PROJECT = pathlib.Path(__file__).resolve().parents[2]
BUILD = pathlib.Path(sys.argv.pop(1)).resolve()
CMAKE = sys.argv.pop(1)

BUS_CONFIGURATION = """<!DOCTYPE busconfig PUBLIC "-//freedesktop//DTD D-Bus Bus Configuration 1.0//EN"
 "http://www.freedesktop.org/standards/dbus/1.0/busconfig.dtd">
<busconfig>
  <type>session</type>
  <listen>unix:path={root}/bus</listen>
  <auth>EXTERNAL</auth>
  <standard_session_servicedirs/>
  <policy context="default"><allow send_destination="*" eavesdrop="true"/><allow eavesdrop="true"/><allow own="*"/></policy>
</busconfig>
"""
FACEBOOK = "com.veltran.accounttype.facebook"


def wait_until(is_true, what: str):
    deadline = time.monotonic() + 20
    while not (result := is_true()):
        if time.monotonic() > deadline:
            raise TimeoutError(f"Gave up waiting until {what}.")
        time.sleep(0.02)
    return result


def command_of(process: int) -> "str | None":
    """What a process was started as; the daemons show nobody which file they run. None when it has ended."""
    try:
        return pathlib.Path(f"/proc/{process}/cmdline").read_text(encoding="utf-8").split("\0")[0] or None
    except (FileNotFoundError, ProcessLookupError):
        return None


class Session:
    """A bus that knows the installed services and nothing else, and a home that nobody has used yet."""

    def __init__(self, prefix: pathlib.Path):
        self._folder = tempfile.TemporaryDirectory(prefix="palisade-activation-")
        self.root = pathlib.Path(self._folder.name)
        self.prefix = prefix
        self.environment = {
            "PATH": f"{prefix}/bin:{prefix}/libexec:/usr/bin:/bin", "LC_ALL": "C.UTF-8", "HOME": f"{self.root}/home",
            "XDG_RUNTIME_DIR": f"{self.root}/runtime", "XDG_DATA_DIRS": f"{prefix}/share", "XDG_CONFIG_DIRS": f"{prefix}/etc/xdg",
            "DBUS_SESSION_BUS_ADDRESS": f"unix:path={self.root}/bus",
        } | {name: value for name, value in os.environ.items() if name.endswith("SAN_OPTIONS")}
        for folder in ("home", "runtime"):
            (self.root / folder).mkdir(mode=0o700)
        configuration = self.root / "bus.conf"
        configuration.write_text(BUS_CONFIGURATION.format(root=self.root), encoding="utf-8")
        self._helpers: "list[subprocess.Popen]" = []
        self._log = open(self.root / "bus.log", "ab")
        self._bus = subprocess.Popen(["dbus-daemon", "--nofork", "--print-address", f"--config-file={configuration}"],
                                     env=self.environment, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=self._log)
        self._bus.stdout.readline()

    def __enter__(self):
        return self

    def __exit__(self, *_):
        for helper in self._helpers:
            helper.terminate()
            helper.wait()
            helper.stdout.close()
        # The daemons end with their bus.
        daemons = [self.process_of(name) for name in ("com.veltran.Accounts1", "com.veltran.Vantad1")]
        self._bus.terminate()
        self._bus.wait()
        self._bus.stdout.close()
        self._log.close()
        for daemon in filter(None, daemons):
            wait_until(lambda: command_of(daemon) is None, "the daemons have ended with their bus")
        self._folder.cleanup()

    def run(self, *command: str, text: str = "") -> subprocess.CompletedProcess:
        return subprocess.run(command, input=text, capture_output=True, encoding="utf-8", timeout=60, check=False,
                              env=self.environment)

    def start(self, *command) -> str:
        """Starts a program that says in its first line when it is ready, and answers the line."""
        self._helpers.append(subprocess.Popen(command, env=self.environment, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                                              stderr=self._log, encoding="utf-8"))
        return self._helpers[-1].stdout.readline().strip()

    def write(self, name: str, content: str) -> None:
        """Writes a file below the home."""
        path = self.root / "home" / name
        path.parent.mkdir(parents=True, exist_ok=True)
        path.write_text(content, encoding="utf-8")

    def call_bus(self, method: str, *arguments: str) -> str:
        return self.run("gdbus", "call", "--session", "--dest", "org.freedesktop.DBus", "--object-path", "/org/freedesktop/DBus",
                        "--method", f"org.freedesktop.DBus.{method}", *arguments).stdout

    def leave_revocation(self) -> None:
        """Writes down that a token is to be made invalid, as if the account daemon had done so and ended."""
        database = sqlite3.connect(self.root / "home/.local/state/palisade/outbox.sqlite")
        with database:
            database.execute("INSERT INTO invalidations (account_id, app_id, requested_at, requested_boot, requested_uptime)"
                             " VALUES ('1', '42', 1700000000, '', 0)")
        database.close()

    def revocations_wait(self) -> bool:
        database = sqlite3.connect(self.root / "home/.local/state/palisade/outbox.sqlite")
        waiting = database.execute("SELECT count(*) FROM invalidations WHERE state = 'pending'").fetchone()[0]
        database.close()
        return waiting > 0

    def process_of(self, name: str) -> "int | None":
        """Who owns a name on the bus; asking starts nobody."""
        found = re.search(r"uint32 (\d+)", self.call_bus("GetConnectionUnixProcessID", name))
        return int(found[1]) if found else None

    def program_of(self, name: str) -> "str | None":
        process = self.process_of(name)
        return command_of(process) if process else None


class TheInstalledDaemons(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls._folder = tempfile.TemporaryDirectory(prefix="palisade-installed-")
        cls.prefix = pathlib.Path(cls._folder.name)
        subprocess.run([CMAKE, "--install", BUILD, "--prefix", cls.prefix, "--component", "runtime"], check=True,
                       stdout=subprocess.DEVNULL)
        settings = cls.prefix / "etc/xdg/palisade/accountd.toml"
        settings.write_text(settings.read_text(encoding="utf-8") + 'keychain = "vault"\n', encoding="utf-8")
        # Nobody answers there: what is taken back stays to be done.
        (cls.prefix / "etc/xdg/palisade/server.toml").write_text('address = "https://127.0.0.1:1"\n', encoding="utf-8")

    @classmethod
    def tearDownClass(cls):
        cls._folder.cleanup()

    def test_are_not_there_before_anybody_calls(self):
        with Session(self.prefix) as session:
            names = session.call_bus("ListActivatableNames")
            self.assertIn("'com.veltran.Accounts1'", names)
            self.assertIn("'com.veltran.Vantad1'", names)
            self.assertIsNone(session.process_of("com.veltran.Accounts1"))
            self.assertIsNone(session.process_of("com.veltran.Vantad1"))

    def test_are_started_when_they_are_called_and_find_their_plugins(self):
        with Session(self.prefix) as session:
            grants = session.run("palisade", "grants")
            self.assertEqual((grants.returncode, grants.stdout), (0, "No application has asked yet.\n"), grants.stderr)
            self.assertEqual(session.program_of("com.veltran.Accounts1"), f"{self.prefix}/libexec/accountd")
            doctor = session.run("palisade", "doctor").stdout
            self.assertRegex(doctor, r"(?m)^ok    plug-ins +.*VXFacebookAccountAccessPlugin")
            self.assertRegex(doctor, r"(?m)^ok    vantad +is started when there is something to do")
            self.assertRegex(doctor, r"(?m)^fail  server +https://127.0.0.1:1")
            self.assertIsNone(session.process_of("com.veltran.Vantad1"), "there is nothing to do for it")

    def test_make_a_token_invalid_that_is_revoked(self):
        with Session(self.prefix) as session:
            terminal = session.start(sys.executable, PROJECT / "Tools/Trial/answer_alerts.py", "--answer", "allow")
            session.write(".config/palisade/accountd.toml", f'keychain = "vault"\nterminal = "{terminal}"\n')
            session.write(".local/share/palisade/clients/org.example.photos.toml", 'bundle_id = "org.example.photos"\nname = "Photos"\n'
                          f'[match]\nexecutable = "{self.prefix}/bin/palisade"\n')
            session.start(BUILD / "bin/palisade-sandbox", "--configuration", session.root / "home/.config/palisade/server.toml")
            token = (session.root / "runtime/palisade-sandbox/master-token").read_text(encoding="utf-8")

            self.assertEqual(session.run("palisade", "account", "add", "ada", text=token).returncode, 0)
            self.assertEqual(session.run("palisade", "request", "--app", "1", "--permission", "email").stdout, "Access is granted.\n")
            self.assertIsNone(session.process_of("com.veltran.Vantad1"), "there is nothing to do for it yet")
            self.assertEqual(session.run("palisade", "revoke", "org.example.photos").returncode, 0)
            wait_until(lambda: "confirmed" in session.run("palisade", "revocations").stdout, "the server has confirmed it")
            self.assertEqual(session.program_of("com.veltran.Vantad1"), f"{self.prefix}/libexec/vantad")

    def test_start_the_social_daemon_when_a_token_is_left_to_be_taken_back(self):
        with Session(self.prefix) as session:
            session.call_bus("StartServiceByName", "com.veltran.Vantad1", "0")
            first = session.process_of("com.veltran.Vantad1")
            self.assertEqual(session.program_of("com.veltran.Vantad1"), f"{self.prefix}/libexec/vantad")
            os.kill(first, 15)
            wait_until(lambda: session.process_of("com.veltran.Vantad1") is None, "vantad has ended")

            # What an earlier session left behind: the account daemon looks when it starts.
            session.leave_revocation()
            session.run("palisade", "grants")
            wait_until(lambda: session.program_of("com.veltran.Vantad1") == f"{self.prefix}/libexec/vantad", "vantad is started")

            wait_until(lambda: not session.revocations_wait(), "vantad has done what was left to it")
            os.kill(session.process_of("com.veltran.Vantad1"), 9)
            wait_until(lambda: session.process_of("com.veltran.Vantad1") is None, "vantad is gone")
            session.leave_revocation()
            self.assertRegex(session.run("palisade", "doctor").stdout,
                             r"(?m)^fail  vantad .*\n +1 revocation waits at the server, and vantad does not run. Start it")

    def test_that_cannot_start_leave_the_caller_with_where_to_look(self):
        with Session(self.prefix) as session:
            session.write(".config/palisade/accountd.toml", 'keychain = "drawer"\n')
            grants = session.run("palisade", "grants")
            self.assertEqual(grants.returncode, 2)
            self.assertEqual(grants.stderr, "palisade: The account daemon ended when it was started. "
                                            "`journalctl --user -u accountd` says why.\n")
            self.assertIn("There is no keychain 'drawer'", (session.root / "bus.log").read_text(encoding="utf-8"))

    def test_say_so_when_they_are_started_twice(self):
        with Session(self.prefix) as session:
            session.run("palisade", "grants")
            session.call_bus("StartServiceByName", "com.veltran.Vantad1", "0")
            second = session.run("accountd")
            self.assertEqual((second.returncode, second.stderr),
                             (1, "accountd: Another account daemon serves this session already.\n"))
            second = session.run("vantad")
            self.assertEqual(second.returncode, 1)
            self.assertRegex(second.stderr, r"vantad: Another vantad of this user, .* works on .*\.")


if __name__ == "__main__":
    unittest.main(verbosity=2)
