#!/usr/bin/env python3
"""What the daemon does when its surroundings fail: nothing is granted that was not, nothing is lost, and it says what is wrong."""

import collections
import contextlib
import os
import pathlib
import re
import resource
import shutil
import subprocess
import time
import unittest

import trial
from accounts import FACEBOOK, GRANTED, PENDING, REFUSED
from bus_wire import IS_SANITIZED, PATIENCE, BusError
from trial import wait_until

trial.use_build_of_command_line()

PHOTOS = "org.example.photos"


class AServerThatFails(unittest.TestCase):
    FAULTS = ("close", "reset", "redirect", "unavailable", "status", "huge", "bomb", "transfer-bomb", "head", "deep", "types",
              "duplicate", "text", "page", "garbage", "silent", "stall", "slow")

    def test_in_any_way_grants_nothing_and_stands_in_nobodys_way(self):
        with trial.trial_with_account(log="error") as session, session.caller() as caller:
            session.kill_accountd()
            with open(session.configuration / "server.toml", "a", encoding="utf-8") as server:
                server.write("\n[limits]\ntotal_seconds = 2\nstall_seconds = 1\n")
            session.start_accountd()
            for fault in self.FAULTS:
                with self.subTest(fault=fault):
                    session.sandbox("fault", fault, "--path", "/oauth/authorization")
                    word, results = caller.start_request().outcome()
                    self.assertEqual(word, REFUSED)
                    self.assertTrue(results.get("error_message"), results)
                    self.assertEqual(caller.grants(), {})
            session.sandbox("calm")
            self.assertEqual(caller.start_request().outcome()[0], GRANTED)

    def test_when_the_daemon_dies_has_the_token_taken_back_that_it_had_issued_already(self):
        with trial.trial_with_account(log="error") as session, session.caller() as caller:
            session.sandbox("fault", "silent", "--path", "/oauth/authorization")
            asked = caller.start_request()
            self.assertEqual(asked.reply()[0], PENDING)
            wait_until(lambda: '"valid":true' in session.sandbox("tokens"), "the server has issued a token")
            session.kill_accountd()
            session.start_vantad()
            session.start_accountd()
            self.assertEqual(caller.grants(), {})
            wait_until(lambda: [entry["state"] for entry in caller.revocations()] == ["confirmed"], "the server confirms")
            self.assertNotIn('"valid":true', session.sandbox("tokens"))

    def test_while_access_is_taken_back_is_asked_again_when_both_daemons_have_been_killed(self):
        with trial.trial_with_account(log="error") as session, session.caller() as caller:
            self.assertEqual(caller.start_request().outcome()[0], GRANTED)
            session.sandbox("fault", "unavailable", "--times", "0")
            vantad = session.start_vantad()
            caller.manage("Revoke", "ss", [FACEBOOK, PHOTOS])
            wait_until(lambda: caller.revocations()[0]["attempts"] > 0, "the server is asked")
            vantad.kill()
            vantad.wait()
            session.kill_accountd()
            session.start_accountd()
            self.assertEqual([entry["state"] for entry in caller.revocations()], ["pending"])
            session.sandbox("calm")
            session.start_vantad()
            wait_until(lambda: caller.revocations()[0]["state"] == "confirmed", "the server confirms")
            self.assertNotIn('"valid":true', session.sandbox("tokens"))

    def test_while_an_account_is_removed_is_asked_again_with_the_accounts_own_token(self):
        with trial.trial_with_account(log="error") as session, session.caller() as caller:
            self.assertEqual(caller.start_request().outcome()[0], GRANTED)
            session.sandbox("fault", "unavailable", "--times", "0")
            session.start_vantad()
            caller.manage("RemoveAccount", "s", [caller.manage("ListAccounts", "s", [""])[0][0]["id"]])
            self.assertEqual(caller.manage("ListAccounts", "s", [""]), [[]])
            wait_until(lambda: caller.revocations()[0]["attempts"] > 0, "the server is asked")
            session.sandbox("calm")
            wait_until(lambda: caller.revocations()[0]["state"] == "confirmed", "the server confirms")
            self.assertNotIn('"valid":true', session.sandbox("tokens"))
            wait_until(lambda: session.stored_tokens() == 0, "the account's token is removed")


class Clock:
    """The wall clock of a daemon, put forward and back while it runs. Time that passes is not altered."""

    LIBRARIES = ("/usr/lib/x86_64-linux-gnu/faketime/libfaketimeMT.so.1", "/usr/lib/aarch64-linux-gnu/faketime/libfaketimeMT.so.1")

    def __init__(self, session: trial.Trial):
        library = next((library for library in self.LIBRARIES if os.path.exists(library)), None)
        if library is None:
            raise unittest.SkipTest("libfaketime is not installed, so no clock can be put forward.")
        self._file = session.root / "clock"
        self.environment = {"LD_PRELOAD": library, "FAKETIME_TIMESTAMP_FILE": str(self._file), "FAKETIME_NO_CACHE": "1",
                            "FAKETIME_DONT_FAKE_MONOTONIC": "1", "FAKETIME_DONT_RESET": "1"}
        self.put("+0")

    def put(self, offset: str) -> None:
        draft = self._file.with_suffix(".new")
        draft.write_text(f"{offset}\n", encoding="utf-8")
        draft.rename(self._file)


class AClockThatJumps(unittest.TestCase):
    JUMPS = ("-30y", "+30y", "-3d", "+1d", "+0")

    def test_changes_nothing_that_was_granted(self):
        with trial.trial_with_account(log="error") as session, session.caller() as caller:
            clock = Clock(session)
            session.kill_accountd()
            session.start_accountd(environment=clock.environment)
            self.assertEqual(caller.start_request().outcome()[0], GRANTED)
            for jump in self.JUMPS:
                clock.put(jump)
                with self.subTest(jump=jump):
                    self.assertEqual(caller.start_request().outcome()[0], GRANTED)
                    self.assertTrue(caller.credential())
            self.assertEqual(session.person.alerts, 1, "nobody was asked again")

    def test_leaves_the_history_in_the_order_in_which_it_happened(self):
        every_question = {"cool_down_after_refusals": 0}
        with trial.trial_with_account(every_question, answer="refuse", log="error") as session, session.caller() as caller:
            clock = Clock(session)
            session.kill_accountd()
            session.start_accountd(environment=clock.environment)
            times = []
            for count, jump in enumerate(self.JUMPS, 1):
                clock.put(jump)
                self.assertEqual(caller.start_request().outcome()[0], REFUSED)
                row = wait_until(lambda wanted=count: (rows := self._history(caller)) and rows[0]["count"] == wanted and rows[0],
                                 "it is written")
                times.append(row["last"])
                self.assertEqual(row["first"], times[0])
                caller.manage("RevokeAll", "s", [FACEBOOK])
            self.assertNotEqual(times, sorted(times))

    def test_neither_ends_nor_lengthens_a_cool_down(self):
        with trial.trial_with_account(answer="refuse", log="error") as session, session.caller() as caller:
            clock = Clock(session)
            session.kill_accountd()
            session.start_accountd(environment=clock.environment)
            for _ in range(3):
                self.assertEqual(caller.start_request().outcome()[0], REFUSED)
                caller.manage("RevokeAll", "s", [FACEBOOK])
            for jump in self.JUMPS:
                clock.put(jump)
                with self.subTest(jump=jump), self.assertRaisesRegex(BusError, "NotAsked: .* Ask again in (60|59) minutes"):
                    caller.start_request().outcome()
            self.assertEqual(session.person.alerts, 3)

    def test_while_access_is_taken_back_leaves_no_token_valid(self):
        for jump in self.JUMPS:
            with self.subTest(jump=jump), trial.trial_with_account(log="error") as session, session.caller() as caller:
                clock = Clock(session)
                session.kill_accountd()
                session.start_accountd(environment=clock.environment)
                self.assertEqual(caller.start_request().outcome()[0], GRANTED)
                clock.put(jump)
                caller.manage("Revoke", "ss", [FACEBOOK, PHOTOS])
                self.assertFalse(caller.grants()[PHOTOS]["granted"])
                session.start_vantad()
                wait_until(lambda: caller.revocations()[0]["state"] == "confirmed", "the server confirms")
                self.assertNotIn('"valid":true', session.sandbox("tokens"))

    @staticmethod
    def _history(caller) -> list[dict]:
        return caller.manage("History")[0]


class AKeychainThat(unittest.TestCase):
    def test_cannot_be_written_lets_no_grant_stand_without_its_token(self):
        with trial.trial_with_account(log="error") as session, session.caller() as caller:
            blocker = subprocess.Popen(["python3", "-c", LOCK_A_STORE, session.state / "vault.sqlite"], stdin=subprocess.PIPE,
                                       stdout=subprocess.PIPE)
            try:
                blocker.stdout.readline()
                word, results = caller.start_request().outcome(timeout=40)
                self.assertEqual(word, REFUSED)
                self.assertIn("KeychainUnavailable", results["error_domain"])
                self.assertIn("another process is using it", results["error_message"])
                self.assertEqual([row["granted"] for row in caller.grants().values()], [])
            finally:
                blocker.communicate()
            self.assertEqual(caller.start_request().outcome()[0], GRANTED)

    def test_has_lost_its_key_grants_nothing_and_gives_back_all_when_the_key_is_put_back(self):
        with trial.trial_with_account(log="error") as session, session.caller() as caller:
            self.assertEqual(caller.start_request().outcome()[0], GRANTED)
            token = caller.credential()
            session.kill_accountd()
            key = session.state / "vault.key"
            key.rename(key.with_suffix(".away"))
            session.start_accountd()
            with self.assertRaises(BusError) as refused:
                caller.credential()
            self.assertIn("vault.key is missing; put back what was there, or sign in again", refused.exception.message)
            self.assertFalse(key.exists())
            key.with_suffix(".away").rename(key)
            self.assertEqual(caller.credential(), token)


# Holds a store's write lock until its standard input ends.
LOCK_A_STORE = """
import sqlite3, sys
store = sqlite3.connect(sys.argv[1], isolation_level=None)
store.execute("BEGIN IMMEDIATE")
print("locked", flush=True)
sys.stdin.read()
"""


class SeveralDaemons(unittest.TestCase):
    def test_started_at_once_leave_one_that_serves(self):
        with trial.trial_with_account(log="error") as session:
            session.kill_accountd()
            daemons = [session.start("accountd", stderr=subprocess.PIPE) for _ in range(6)]
            wait_until(lambda: sum(daemon.poll() is not None for daemon in daemons) == 5, "all daemons but one have ended")
            ended = [daemon for daemon in daemons if daemon.poll() is not None]
            self.assertEqual([daemon.returncode for daemon in ended], [1] * 5)
            for daemon in ended:
                self.assertIn(b"Another account daemon serves this session already.", daemon.stderr.read())
            with session.caller() as caller:
                self.assertEqual(caller.start_request().outcome()[0], GRANTED)


class ASessionThatEnds(unittest.TestCase):
    def test_takes_the_daemon_along_whether_the_bus_or_the_signal_comes_first(self):
        for moment in range(8):
            with self.subTest(moment=moment), trial.trial_with_account(log="error") as session:
                session.bus_process.kill()
                time.sleep(moment / 400)
                session.accountd.terminate()
                self.assertIn(session.accountd.wait(PATIENCE), (0, 1), session.daemon_log())


class ADaemonWithFewDescriptors(unittest.TestCase):
    def test_refuses_what_it_has_none_for_and_serves_the_others(self):
        with trial.Trial(log="error") as session, contextlib.ExitStack() as crowd:
            session.start_accountd(preexec_fn=lambda: resource.setrlimit(resource.RLIMIT_NOFILE, (256, 256)))
            session.add_account()
            caller = crowd.enter_context(session.caller())
            self.assertEqual(caller.start_request().outcome()[0], GRANTED)
            token = caller.credential()

            reading, writing = os.pipe()
            held = [(greedy, greedy.start("AddAccount", "ssha{sv}", [FACEBOOK, str(number), 0, {}], descriptors=[reading]))
                    for greedy in [crowd.enter_context(session.caller()) for _ in range(40)] for number in range(10)]
            os.close(reading)
            self.assertEqual(caller.credential(), token)
            self.assertEqual(caller.start_request(permissions=["email", "user_photos"]).outcome()[0], GRANTED)
            os.close(writing)
            names = collections.Counter(self.refusal_of(greedy, serial) for greedy, serial in held)
            self.assertEqual(set(names), {"TooManyRequests", "InvalidArguments"})
            self.assertEqual(len(caller.manage("ListAccounts", "s", [""])[0]), 1)

    def refusal_of(self, caller, serial) -> str:
        with self.assertRaises(BusError) as refused:
            caller.reply_to(serial).answer()
        return refused.exception.name


@unittest.skipIf(IS_SANITIZED, "A sanitizer needs all the addresses there are.")
class ADaemonWithoutAThreadToSpare(unittest.TestCase):
    TOO_SMALL_FOR_A_STACK = 1 << 20

    def test_refuses_what_needs_one_and_serves_everybody_when_there_is_one_again(self):
        with trial.Trial(log="error") as session, session.caller() as greedy, session.caller() as newcomer:
            session.start_accountd()
            session.add_account()
            self.assertTrue(greedy.manage("GetStatus"))
            unlimited = self.leave_no_thread(session.accountd.pid)
            reading, writing = os.pipe()
            held = [greedy.start("AddAccount", "ssha{sv}", [FACEBOOK, str(number), 0, {}], descriptors=[reading])
                    for number in range(8)]
            os.close(reading)
            for ask in (lambda: greedy.reply_to(held[-1]).answer(), lambda: newcomer.manage("GetStatus"),
                        lambda: newcomer.start_request().outcome()):
                with self.assertRaisesRegex(BusError, "no thread left"):
                    ask()
            self.assertEqual(greedy.start_request().outcome()[0], REFUSED)
            resource.prlimit(session.accountd.pid, resource.RLIMIT_AS, unlimited)
            os.close(writing)
            self.assertTrue(newcomer.manage("GetStatus"))
            self.assertEqual(newcomer.start_request().outcome()[0], GRANTED)
            with session.caller() as another:
                self.assertTrue(another.manage("GetStatus"))

    def leave_no_thread(self, process: int) -> tuple[int, int]:
        status = pathlib.Path(f"/proc/{process}/status").read_text(encoding="utf-8")
        addresses = int(re.search(r"VmSize:\s*(\d+) kB", status)[1]) * 1024
        unlimited = resource.prlimit(process, resource.RLIMIT_AS)
        resource.prlimit(process, resource.RLIMIT_AS, (addresses + self.TOO_SMALL_FOR_A_STACK, unlimited[1]))
        return unlimited


class Changes(unittest.TestCase):
    def test_are_told_to_whoever_listens(self):
        with trial.Trial(log="error") as session, session.caller() as caller, session.caller() as listener:
            session.start_accountd()
            listener.listen()
            account = caller.add_account("ada", session.master_token)
            self.expect(listener, "AccountsChanged", [FACEBOOK])
            self.assertEqual(caller.start_request().outcome()[0], GRANTED)
            self.expect(listener, "GrantsChanged", [FACEBOOK, PHOTOS])
            caller.manage("Revoke", "ss", [FACEBOOK, PHOTOS])
            self.expect(listener, "GrantsChanged", [FACEBOOK, PHOTOS])
            caller.manage("RevokeAll", "s", [FACEBOOK])
            self.expect(listener, "GrantsChanged", [FACEBOOK, ""])
            caller.manage("RemoveAccount", "s", [account])
            self.expect(listener, "AccountsChanged", [FACEBOOK])

    def expect(self, listener, member, values):
        self.assertEqual(listener.signal(member).values, values)

    def test_show_in_the_list_of_grants(self):
        with trial.trial_with_account(log="error") as session, session.caller() as caller:
            self.assertEqual(caller.grants(), {})
            caller.start_request(permissions=["publish_actions", "email"], audience="FacebookAudienceFriends").outcome()
            row = caller.grants()[PHOTOS]
            self.assertEqual({key: row[key] for key in ("granted", "app_id", "audience", "permissions", "account_type", "name")},
                             {"granted": True, "app_id": "1234567890", "audience": "FacebookAudienceFriends",
                              "permissions": ["email", "publish_actions"], "account_type": FACEBOOK, "name": "Photos"})
            caller.manage("Revoke", "ss", [FACEBOOK, PHOTOS])
            row = caller.grants()[PHOTOS]
            self.assertEqual((row["granted"], row["permissions"]), (False, []))
            caller.manage("RevokeAll", "s", [FACEBOOK])
            self.assertEqual(caller.grants(), {})


class ASandboxedApplication(unittest.TestCase):
    BOX = ("bwrap", "--die-with-parent", "--unshare-user", "--unshare-pid", "--ro-bind", "/usr", "/usr", "--symlink", "usr/bin",
           "/bin", "--symlink", "usr/lib", "/lib", "--symlink", "usr/lib64", "/lib64", "--proc", "/proc", "--dev", "/dev")

    def test_may_ask_for_itself_and_manage_nothing(self):
        with trial.trial_with_account(log="error", answer="nothing") as session:
            tried = session.run(*self.BOX, "true")
            if tried.returncode != 0:
                self.skipTest(f"No sandbox can be made here: {tried.stdout}")
            info = session.root / "flatpak-info"
            info.write_text("[Application]\nname=org.example.Boxed\n", encoding="utf-8")
            boxed = (*self.BOX, "--bind", session.root, session.root, "--ro-bind", info, "/.flatpak-info")
            manager = (*boxed, "gdbus", "call", "--session", "-d", "com.veltran.Accounts1", "-o", "/com/veltran/Accounts1", "-m")
            for method, arguments in (("ListGrants", ["", "{}"]), ("ListAccounts", ["", "{}"]), ("History", ["{}"]),
                                      ("Revoke", [FACEBOOK, PHOTOS, "{}"]), ("RevokeAll", [FACEBOOK, "{}"]),
                                      ("Authorize", [FACEBOOK, "org.example.Boxed", "{}"]), ("ListClients", ["{}"]),
                                      ("RemoveAccount", ["x", "{}"]), ("ListRevocations", ["{}"]), ("GetStatus", ["{}"]),
                                      ("GetPreference", ["com.example", "x", "{}"]),
                                      ("SetPreference", ["com.example", "x", "{}"])):
                with self.subTest(method=method):
                    output = session.run(*manager, f"com.veltran.Accounts1.Manager.{method}", *arguments).stdout
                    self.assertIn("NotPermitted", output)
            output = session.run(*manager, "com.veltran.Accounts1.Manager.RequestAccess", FACEBOOK,
                                 "{'FacebookAppIdKey': <'1'>, 'FacebookPermissionsKey': <['email']>}", "{}").stdout
            self.assertIn(f"uint32 {PENDING}", output)


class AHostileEnvironment(unittest.TestCase):
    def test_diverts_no_request_and_writes_no_secrets(self):
        with trial.Trial(log="error") as session, session.caller() as caller:
            keys = session.root / "keys"
            session.start_accountd(environment={"https_proxy": "http://127.0.0.1:9", "HTTPS_PROXY": "http://127.0.0.1:9",
                                                "ALL_PROXY": "socks5://127.0.0.1:9", "SSLKEYLOGFILE": str(keys),
                                                "OPENSSL_CONF": "/nonexistent", "CURL_CA_BUNDLE": "/nonexistent"})
            session.add_account()
            self.assertEqual(caller.start_request().outcome()[0], GRANTED)
            self.assertFalse(keys.exists())
            token = caller.credential().encode()
            process = pathlib.Path(f"/proc/{session.accountd.pid}")
            self.assertNotIn(token, (process / "cmdline").read_bytes())
            if os.geteuid() == 0:
                self.assertNotIn(token, (process / "environ").read_bytes())
            else:
                self.assertRaises(PermissionError, (process / "environ").read_bytes)

    # What could load code, divert a connection or name another file.
    STEERING = ("LD_AUDIT", "LD_DEBUG_OUTPUT", "LD_LIBRARY_PATH", "GCONV_PATH", "LOCPATH", "NLSPATH", "GTK_MODULES", "GTK3_MODULES",
                "GTK_PATH", "GTK_EXE_PREFIX", "GIO_EXTRA_MODULES", "GIO_MODULE_DIR", "GIO_USE_VFS", "GDK_PIXBUF_MODULE_FILE",
                "GTK_IM_MODULE", "GTK_IM_MODULE_FILE", "https_proxy", "ALL_PROXY", "SSLKEYLOGFILE", "SSL_CERT_FILE", "OPENSSL_CONF",
                "OPENSSL_MODULES", "CURL_HOME", "HOSTALIASES", "RES_OPTIONS", "MALLOC_TRACE", "TMPDIR", "SQLITE_TMPDIR", "BASH_ENV",
                "PYTHONPATH", "SYSTEMD_LOG_TARGET", "SECRET_BACKEND", "XDG_DATA_HOMES", "LC")

    def test_leaves_the_daemon_what_it_needs_and_nothing_else(self):
        with trial.Trial(log="error") as session:
            module = session.root / "plugins/Spoken/Spoken.so"
            module.parent.mkdir(parents=True)
            shutil.copy(trial.BUILD / "Tests/Integration/libpalisade-spoken-environment.so", module)
            session.configure(plugins=str(session.root / "plugins"))
            harmless = {"LC_TIME": "C", "TZ": "UTC", "WAYLAND_DISPLAY": "none", "CREDENTIALS_DIRECTORY": str(session.root / "none")}
            # Where a library is to audit the others, the loader leaves a sanitizer's run-time too little room unless it is told.
            room = {"GLIBC_TUNABLES": "glibc.rtld.optional_static_tls=1000000"}
            session.start_accountd(environment=harmless | room | {name: "/nonexistent" for name in self.STEERING})
            wait_until(lambda: "environment: PATH" in session.daemon_log(), "the module has said what there is")
            seen = dict(re.findall(r"(?m)^environment: ([^=]*)=(.*)$", session.daemon_log()))
            self.assertEqual(set(seen) & set(self.STEERING), set())
            self.assertEqual(seen.pop("PATH"), "/usr/local/bin:/usr/bin:/bin")
            expected = {name: value for name, value in (session.environment | harmless).items()
                        if name not in ("PATH", "NO_COLOR") and not name.endswith("SAN_OPTIONS")}
            self.assertEqual(seen, expected)


if __name__ == "__main__":
    unittest.main(verbosity=2)
