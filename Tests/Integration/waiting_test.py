#!/usr/bin/env python3
"""Applications whose requests stand at a server or a keychain that has stopped: nobody else waits for these."""

import json
import os
import pathlib
import signal
import subprocess
import sys
import unittest

import trial
from accounts import FACEBOOK, GRANTED, PENDING, REFUSED, WITHDRAWN
from bus_wire import PATIENCE, BusError
from trial import THIS_PROGRAM, wait_until

trial.use_build_of_command_line()

PHOTOS, ALBUM, DIARY = "org.example.photos", "org.example.album", "org.example.diary"
DESCRIBE = "/oauth/permission-description"
# The server has to be asked for words for it.
UNKNOWN = {"permissions": ("email", "user_playlists")}
REQUESTS = 300
LONGEST_LANE = 8
MOST_UNANSWERED = 10

# Another application, told line by line what to do; what it found it prints as JSON.
APPLICATION = f"""
import collections, json, sys
from accounts import FACEBOOK, PENDING, Caller
from bus_wire import ERROR, ERROR_NAME, REPLY, REPLY_SERIAL

caller, asked = Caller(sys.argv[1]), []

def grant():
    return caller.start_request().outcome()[0], caller.credential()

def flood(count):
    for number in range(count):
        if number % 3 == 2:
            asked.append(caller.start("GetCredentialDescriptor", "sa{{sv}}", [FACEBOOK, {{}}]))
        else:
            caller.start_request(**{UNKNOWN!r})

def answers():
    # What came before this answer has come.
    caller.call("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "GetId")
    return collections.Counter(kind_of(message) for message in caller.inbox)

def kind_of(message):
    if message.kind == ERROR:
        return message.fields[ERROR_NAME].rpartition(".")[2]
    if message.kind != REPLY:
        return message.fields[3]
    return "token" if message.fields[REPLY_SERIAL] in asked else f"word {{message.values[1]}}"

for line in sys.stdin:
    print(json.dumps(eval(line)), flush=True)
"""


class Application:
    """This interpreter under a name of its own, so that the daemon takes it for another application."""

    def __init__(self, session: trial.Trial, name: str):
        program = session.root / "bin" / name
        program.write_bytes(pathlib.Path(THIS_PROGRAM).read_bytes())
        program.chmod(0o755)
        session.add_client(name, str(program))
        self._program, self._session, self._process = program, session, None

    def start(self) -> None:
        self._process = self._session.start(
            self._program, "-c", APPLICATION, self._session.bus, stdout=subprocess.PIPE, input_pipe=True,
            environment={"PYTHONHOME": sys.base_prefix, "PYTHONPATH": str(pathlib.Path(__file__).parent),
                         "PYTHONDONTWRITEBYTECODE": "1"})

    def tell(self, expression: str):
        self._process.stdin.write(f"{expression}\n".encode())
        self._process.stdin.flush()
        return json.loads(self._process.stdout.readline())


class Keyring:
    """A Secret Service of the session's own."""

    def __init__(self, session: trial.Trial):
        self._process = session.start("gnome-keyring-daemon", "--foreground", "--components=secrets", "--unlock",
                                      stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, input_pipe=True)
        self._process.stdin.write(b"password")
        self._process.stdin.close()
        wait_until(lambda: "boolean false" in session.run(
            "dbus-send", "--session", "--print-reply", "--dest=org.freedesktop.secrets",
            "/org/freedesktop/secrets/collection/login", "org.freedesktop.DBus.Properties.Get",
            "string:org.freedesktop.Secret.Collection", "string:Locked").stdout, "the keyring is open")

    def stop(self) -> None:
        self._process.send_signal(signal.SIGSTOP)

    def go_on(self) -> None:
        self._process.send_signal(signal.SIGCONT)


class Standing(unittest.TestCase):
    """Album's requests stand; photos and a manager do what they always do."""

    keychain = "vault"

    def setUp(self):
        self.session = self.enterContext(trial.Trial(log="error"))
        self.album = Application(self.session, "album")
        self.other = Application(self.session, "diary")
        self.before_daemon()
        self.session.configure(keychain=self.keychain)
        self.session.start_accountd()
        self.session.add_account()
        self.photos = self.enterContext(self.session.caller())
        self.manager = self.enterContext(self.session.caller())
        self.assertEqual(self.photos.start_request().outcome()[0], GRANTED)
        for application in (self.album, self.other):
            application.start()
            self.assertEqual(application.tell("grant()")[0], GRANTED)

    def before_daemon(self) -> None:
        pass

    def threads(self) -> int:
        status = pathlib.Path(f"/proc/{self.session.accountd.pid}/status").read_text(encoding="utf-8")
        return int(status.split("Threads:")[1].split()[0])

    def revoke(self, client: str) -> None:
        self.manager.manage("Revoke", "ss", [FACEBOOK, client])

    def expect_everybody_else_is_served(self) -> None:
        self.assertEqual(self.photos.start_request().reply()[0], GRANTED)
        self.assertEqual(set(self.manager.grants()), {PHOTOS, ALBUM, DIARY})
        self.assertEqual(len(self.manager.manage("ListAccounts", "s", [""])[0]), 1)
        self.assertTrue(self.manager.manage("History")[0])
        # Also a caller of whom the daemon has not heard before.
        with self.session.caller() as newcomer:
            self.assertEqual(newcomer.start_request().reply()[0], GRANTED)

    def expect_that_access_can_be_taken_back(self) -> None:
        self.revoke(DIARY)
        self.assertFalse(self.manager.grants()[DIARY]["granted"])
        self.revoke(ALBUM)
        self.assertFalse(self.manager.grants()[ALBUM]["granted"])
        wait_until(lambda: self.album.tell("answers()").get("Response") == LONGEST_LANE, "what stands has its answer")
        self.assertEqual(self.album.tell("caller.start_request().outcome()")[0], REFUSED)


class RequestsAtAStoppedServer(Standing):
    def test_delay_nobody(self):
        self.session.sandbox_process.send_signal(signal.SIGSTOP)
        self.album.tell(f"flood({REQUESTS})")
        self.expect_everybody_else_is_served()
        self.assertLess(self.threads(), 40)
        answers = self.album.tell("answers()")
        tokens = REQUESTS // 3
        self.assertEqual(answers, {"NameAcquired": 1, f"word {PENDING}": LONGEST_LANE, "token": tokens,
                                   "TooManyRequests": REQUESTS - tokens - LONGEST_LANE})
        self.expect_that_access_can_be_taken_back()


class RequestsAtAStoppedServerAndKeyring(Standing):
    keychain = "secret-service"

    def before_daemon(self) -> None:
        self.keyring = Keyring(self.session)
        self.addCleanup(self.keyring.go_on)

    def test_delay_nobody(self):
        # The daemon keeps the key that it needs. A fresh one has none yet.
        self.session.kill_accountd()
        self.session.sandbox_process.send_signal(signal.SIGSTOP)
        self.keyring.stop()
        self.session.start_accountd()
        self.album.tell(f"flood({REQUESTS})")
        self.expect_everybody_else_is_served()
        self.assertLess(self.threads(), 40)
        # The daemon gives the keyring up after seconds, two calls at a time. Nobody has waited for all of them.
        self.assertLess(self.album.tell("answers()").get("KeychainUnavailable", 0), REQUESTS // 3)
        self.expect_that_access_can_be_taken_back()


class RequestsForWordsThatNeverCome(Standing):
    def test_cost_their_application_the_users_attention(self):
        self.session.sandbox("fault", "unavailable", "--times", "0", "--path", DESCRIBE)
        alerts = self.session.person.alerts
        for _ in range(MOST_UNANSWERED):
            self.assertEqual(self.photos.start_request(**UNKNOWN).outcome()[0], REFUSED)
        self.session.sandbox("calm")
        asked = self.session.sandbox("requests").count(DESCRIBE)
        self.assertEqual(asked, MOST_UNANSWERED)
        for _ in range(3):
            with self.assertRaisesRegex(BusError, "NotAsked: .* Ask again in (60|59) minutes"):
                self.photos.start_request(**UNKNOWN).outcome()
        self.assertEqual(self.session.sandbox("requests").count(DESCRIBE), asked, "the server is left alone")
        self.assertEqual(self.session.person.alerts, alerts)
        self.assertEqual(self.photos.start_request().reply()[0], GRANTED, "what was granted stands")

    def test_do_so_when_their_application_gives_them_up(self):
        self.session.sandbox("fault", "silent", "--times", "0", "--path", DESCRIBE)
        for _ in range(MOST_UNANSWERED):
            request = self.photos.start_request(**UNKNOWN)
            self.assertEqual(request.reply()[0], PENDING)
            request.close()
            self.assertEqual(request.response()[0], WITHDRAWN)
        with self.assertRaisesRegex(BusError, "NotAsked"):
            self.photos.start_request(**UNKNOWN).outcome()


if __name__ == "__main__":
    unittest.main(verbosity=2)
