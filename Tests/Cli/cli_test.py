#!/usr/bin/env python3
"""The command line as people and scripts meet it, in a session of its own (Tools/Trial/session) that all tests here share."""

import json
import os
import pathlib
import pty
import re
import select
import signal
import subprocess
import sys
import termios
import time
import unicodedata
import unittest

PROJECT = pathlib.Path(__file__).resolve().parents[2]
INSIDE = "PALISADE_CLI_TEST"
COMMANDS = [[], ["account"], ["account", "list"], ["account", "add"], ["account", "remove"], ["request"], ["token"], ["grants"],
            ["revoke"], ["authorize"], ["history"], ["revocations"], ["clients"], ["preferences"], ["preferences", "get"],
            ["preferences", "set"], ["notify"], ["doctor"]]
YES, NO, ERROR = 0, 1, 2
REQUEST = ["request", "--app", "1", "--permission", "email"]


def trial() -> pathlib.Path:
    return pathlib.Path(os.environ["PALISADE_TRIAL"])


def run(*command: str, text: str = "", **environment: str) -> subprocess.CompletedProcess:
    return subprocess.run(command, input=text, capture_output=True, encoding="utf-8", timeout=60, check=False,
                          env=dict(os.environ, **environment))


def palisade(*words: str, **more: str) -> subprocess.CompletedProcess:
    return run("palisade", *words, **more)


def wait_until(is_true, what: str) -> None:
    deadline = time.monotonic() + 20
    while not is_true():
        if time.monotonic() > deadline:
            raise TimeoutError(f"Gave up waiting until {what}.")
        time.sleep(0.02)


class Daemon:
    """The account daemon, which reads some files only when it starts."""

    process = None

    @classmethod
    def restart(cls) -> None:
        cls.end()
        cls.start()

    @classmethod
    def start(cls) -> None:
        with open(trial() / "accountd.log", "ab") as log:
            cls.process = subprocess.Popen(["accountd"], stdin=subprocess.DEVNULL, stderr=log)
        wait_until(lambda: palisade("clients").returncode == YES, "the daemon serves")

    @classmethod
    def end(cls) -> None:
        if cls.process is None:
            os.kill(int((trial() / "accountd.pid").read_text(encoding="utf-8")), signal.SIGTERM)
        else:
            cls.process.terminate()
            cls.process.wait()
            cls.process = None
        wait_until(lambda: palisade("clients").returncode == ERROR, "the daemon has ended")


def write_record(name: str, content: str) -> pathlib.Path:
    record = pathlib.Path(os.environ["XDG_DATA_HOME"]) / "palisade/clients" / f"{name}.toml"
    record.write_text(content, encoding="utf-8")
    return record


def install_application(name: str, title: str) -> None:
    program = trial() / "bin" / name
    program.write_bytes((trial() / "bin/photos").read_bytes())
    program.chmod(0o755)
    write_record(f"org.example.{name}", f'bundle_id = "org.example.{name}"\nname = "{title}"\n[match]\nexecutable = "{program}"\n')


def setUpModule():
    install_application("album", "写真アルバム")
    install_application("rennes", "Château de Rennes")
    Daemon.restart()
    token = (pathlib.Path(os.environ["XDG_RUNTIME_DIR"]) / "palisade-sandbox/master-token").read_text(encoding="utf-8")
    assert palisade("account", "add", "ada", text=token).returncode == YES
    for application in ("photos", "album", "rennes"):
        assert run(application, *REQUEST).returncode == YES


def tearDownModule():
    Daemon.end()


def width(text: str) -> int:
    return sum(2 if unicodedata.east_asian_width(character) in "WF" else 0 if unicodedata.combining(character) else 1
               for character in text)


class EveryCommand(unittest.TestCase):
    def test_prints_valid_json_whatever_becomes_of_it(self):
        table = [
            (["account", "list"], YES, list), (["grants"], YES, list), (["history", "--limit", "2"], YES, list),
            (["history", "--client", "org.example.photos"], YES, list), (["revocations"], YES, list), (["clients"], YES, list),
            (["preferences", "set", "Colour", "blue"], YES, dict), (["preferences", "get", "Colour"], YES, dict),
            (["preferences", "set", "Colour"], YES, dict), (["preferences", "get", "Colour"], NO, dict),
            (["notify", "SomethingHappened"], YES, dict), (["doctor"], YES, dict), (["token"], NO, dict),
            (["account", "add", "bob"], ERROR, dict), (["account", "remove", "77"], ERROR, dict),
            (["revoke", "org.example.nobody"], ERROR, dict), (["authorize", "org.example.nobody"], ERROR, dict),
            (["grants", "--type", "nonsense"], YES, list), (["revoke", "--all", "--type", "nonsense"], ERROR, dict),
        ]
        for words, status, kind in table:
            with self.subTest(" ".join(words)):
                done = palisade(*words, "--json")
                self.assertEqual(done.returncode, status, done)
                self.assertIsInstance(json.loads(done.stdout), kind)
                self.assertEqual(done.stderr, "")

    def test_of_an_application_prints_valid_json(self):
        for words, status in [(["token"], YES), (REQUEST, YES), (["request", "--app", "1", "--permission", "publish_stream"], NO)]:
            with self.subTest(" ".join(words)):
                done = run("photos", *words, "--json")
                self.assertEqual(done.returncode, status, done)
                self.assertIsInstance(json.loads(done.stdout), dict)

    def test_helps_without_a_daemon(self):
        for command in COMMANDS:
            with self.subTest(" ".join(command)):
                done = palisade(*command, "--help", DBUS_SESSION_BUS_ADDRESS="unix:path=/nonexistent")
                self.assertEqual((done.returncode, done.stderr), (YES, ""))
                self.assertIn(f"Usage: palisade {' '.join(command)}".rstrip(), done.stdout)
                self.assertGreater(len(done.stdout.split("Options:")[1].splitlines()), 3, "options alone are no help")

    def test_refuses_a_line_that_it_does_not_understand(self):
        for words in [["nonsense"], [], ["account"], ["revoke"], ["revoke", "--all", "org.example.photos"], ["request"],
                      ["request", "--app", "1", "--audience", "nobody"], ["grants", "--nonsense"], ["authorize"],
                      ["preferences", "get"], ["history", "--limit", "many"], ["account", "add", "ada", "a-token"]]:
            with self.subTest(" ".join(words)):
                done = palisade(*words)
                self.assertEqual((done.returncode, done.stdout), (ERROR, ""))
                self.assertIn("--help", done.stderr)

    def test_that_fails_names_the_next_step(self):
        no_bus = {"DBUS_SESSION_BUS_ADDRESS": "unix:path=/nonexistent"}
        table = [(["grants"], no_bus, "dbus-run-session"), (["account", "remove", "77"], {}, "palisade account list"),
                 (["revoke", "org.example.nobody"], {}, "palisade clients"), (["account", "add", "bob"], {}, "< token-file"),
                 (["authorize", "org.example.nobody"], {}, "palisade clients")]
        for words, environment, step in table:
            with self.subTest(" ".join(words)):
                done = palisade(*words, **environment)
                self.assertEqual((done.returncode, done.stdout), (ERROR, ""))
                self.assertRegex(done.stderr, r"^palisade: [A-Z]")
                self.assertIn(step, done.stderr)


class AListing(unittest.TestCase):
    def test_lines_its_columns_up_whatever_script_they_are_in(self):
        for locale in ("C.UTF-8", "C"):
            with self.subTest(locale):
                lines = palisade("grants", LC_ALL=locale).stdout.splitlines()
                self.assertEqual(len(lines), 4)
                self.assertIn("写真アルバム", "\n".join(lines))
                for first, column in [("GRANTED", "yes"), ("PERMISSIONS", "email")]:
                    position = width(lines[0][:lines[0].index(first)])
                    for line in lines[1:]:
                        self.assertEqual(width(line[:re.search(rf"(?<=  ){column}\b", line).start()]), position, line)

    def test_shows_no_character_that_moves_the_cursor_or_turns_the_line(self):
        added = palisade("account", "add", "a\x1b[2Jb\u202ec\x85d", "--json", text="a-token\n")
        identifier = json.loads(added.stdout)["id"]
        self.assertRegex(palisade("account", "list").stdout, "(?m) a\ufffd\\[2Jb\ufffdc\ufffdd ")
        self.assertEqual(palisade("account", "remove", identifier).returncode, YES)


class AColour(unittest.TestCase):
    def on_terminal(self, *words: str, **environment: str) -> str:
        screen, terminal = pty.openpty()
        process = subprocess.Popen(["palisade", *words], stdin=subprocess.DEVNULL, stdout=terminal, close_fds=True,
                                   env={k: v for k, v in os.environ.items() if k != "NO_COLOR"} | {"TERM": "xterm"} | environment)
        os.close(terminal)
        shown = b""
        try:
            while part := os.read(screen, 65536):
                shown += part
        except OSError:
            pass
        process.wait()
        os.close(screen)
        return shown.decode()

    def test_is_for_terminals_that_know_it_and_people_who_want_it(self):
        self.assertIn("\x1b[", self.on_terminal("clients"))
        self.assertNotIn("\x1b[", self.on_terminal("clients", NO_COLOR="1"))
        self.assertNotIn("\x1b[", self.on_terminal("clients", TERM="dumb"))
        self.assertNotIn("\x1b[", self.on_terminal("clients", "--color", "never"))
        self.assertNotIn("\x1b[", palisade("clients", NO_COLOR="", TERM="xterm").stdout)
        self.assertIn("\x1b[", palisade("clients", "--color", "always").stdout)


class ATokenOfAnAccount(unittest.TestCase):
    def ask(self) -> "tuple[int, int]":
        """A process at its prompt, and its terminal."""
        process, terminal = pty.fork()
        if process == 0:
            os.execvp("palisade", ["palisade", "account", "add", "bob", "--json"])
        self.read_until(terminal, "(not shown): ")
        return process, terminal

    def read_until(self, terminal: int, text: str) -> str:
        seen = ""
        while text not in seen:
            self.assertTrue(select.select([terminal], [], [], 20)[0], f"gave up after {seen!r}")
            seen += os.read(terminal, 4096).decode()
        return seen

    def test_is_not_shown_while_it_is_typed(self):
        process, terminal = self.ask()
        os.write(terminal, b"a-secret-token\n")
        seen = self.read_until(terminal, "}")
        self.assertEqual(os.waitstatus_to_exitcode(os.waitpid(process, 0)[1]), YES)
        os.close(terminal)
        self.assertNotIn("a-secret-token", seen)
        self.assertEqual(palisade("account", "remove", json.loads(seen[seen.index("{"):])["id"]).returncode, YES)

    def test_leaves_the_terminal_as_it_was_when_the_prompt_is_interrupted(self):
        process, terminal = self.ask()
        self.assertFalse(termios.tcgetattr(terminal)[3] & termios.ECHO)
        os.write(terminal, b"\x03")
        self.assertEqual(os.waitstatus_to_exitcode(os.waitpid(process, 0)[1]), -signal.SIGINT)
        self.assertTrue(termios.tcgetattr(terminal)[3] & termios.ECHO)
        os.close(terminal)


class TheDoctor(unittest.TestCase):
    def findings(self, **environment: str) -> "tuple[int, dict]":
        done = palisade("doctor", "--json", **environment)
        return done.returncode, {check["check"]: check for check in json.loads(done.stdout)["checks"]}

    def test_finds_that_all_is_well(self):
        status, checks = self.findings()
        self.assertEqual({name: check["level"] for name, check in checks.items() if check["level"] != "ok"}, {})
        self.assertEqual(list(checks), ["session bus", "accountd", "plug-ins", "client records", "keychain", "alert", "server",
                                        "store", "log", "vantad"])
        self.assertEqual(status, 0)
        for line in palisade("doctor").stdout.splitlines():
            self.assertRegex(line, r"^ok    \S")

    def test_names_a_client_record_that_cannot_be_read_and_what_is_wrong_with_it(self):
        record = write_record("org.example.broken", 'bundle_id = "org.example.broken"\nnmae = "Broken"\n')
        try:
            Daemon.restart()
            status, checks = self.findings()
            self.assertEqual((status, checks["client records"]["level"]), (1, "warn"))
            self.assertIn("'nmae' is unknown", checks["client records"]["advice"])
        finally:
            record.unlink()
            Daemon.restart()

    def test_finds_a_server_that_is_missing_or_cannot_prove_who_it_is(self):
        settings = pathlib.Path(os.environ["XDG_CONFIG_HOME"]) / "palisade/server.toml"
        right = settings.read_text(encoding="utf-8")
        address = re.search(r'(?m)^address = .*$', right)[0]
        try:
            for wrong, advice in [('address = "https://127.0.0.1:1"', "Check the address in server.toml"),
                                  (address, "name that as certificate_authorities"), ("", "No server is configured.")]:
                with self.subTest(wrong):
                    settings.write_text(wrong + "\n", encoding="utf-8")
                    Daemon.restart()
                    status, checks = self.findings()
                    self.assertEqual((status, checks["server"]["level"]), (2, "fail"))
                    self.assertIn(advice, checks["server"]["advice"])
        finally:
            settings.write_text(right, encoding="utf-8")
            Daemon.restart()

    def test_finds_that_there_is_no_bus_or_no_daemon(self):
        status, checks = self.findings(DBUS_SESSION_BUS_ADDRESS="unix:path=/nonexistent")
        self.assertEqual((status, checks["session bus"]["level"]), (2, "fail"))
        Daemon.end()
        try:
            status, checks = self.findings()
            self.assertEqual((status, checks["session bus"]["level"], checks["accountd"]["level"]), (2, "ok", "fail"))
        finally:
            Daemon.start()


if __name__ == "__main__":
    if INSIDE not in os.environ:
        build = pathlib.Path(sys.argv[1]) if len(sys.argv) > 1 and "/" in sys.argv[1] else PROJECT / "build/debug"
        session = [str(PROJECT / "Tools/Trial/session"), str(build), sys.executable, "-B", __file__]
        os.execve(session[0], session + sys.argv[2:],
                  dict(os.environ, PALISADE_ANSWER="allow", LC_ALL="C.UTF-8", NO_COLOR="1", **{INSIDE: "1"}))
    unittest.main(verbosity=2)
