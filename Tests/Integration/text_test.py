#!/usr/bin/env python3
"""Text that the bus's library refuses, from wherever it comes: it costs whoever brings it, and nobody else.

The bus itself carries the characters that Unicode has set apart as none; the library that the daemon reads and writes messages with
does not.
"""

import contextlib
import json
import pathlib
import random
import shutil
import sqlite3
import struct
import subprocess
import sys
import unittest

import trial
from accounts import (FACEBOOK, GRANTED, MANAGER, NAME, OBJECT, PENDING, REFUSED, REQUEST, WITHDRAWN, Caller,
                      facebook_options)
from bus_wire import (CALL, DESTINATION, ERROR, ERROR_NAME, INTERFACE, MEMBER, PATH, REPLY, REPLY_SERIAL, SIGNAL, SIGNATURE, BusError,
                      marshalled)
from hostile_test import methods
from trial import wait_until

trial.use_build_of_command_line()

# No characters, says Unicode, yet valid UTF-8: two of the block in the middle, and the last two of the first and the last plane.
NONE = ("\ufdd0", "\ufdef", "\ufffe", "\uffff", "\U0010ffff")
# The errors with which what cannot be read is refused: the daemon's own, and the library's.
REFUSALS = ("InvalidArguments", "InvalidArgs", "InconsistentMessage")
REPLACEMENT = "\ufffd"
HERE = pathlib.Path(__file__).resolve().parent

# What a program of its own does: it finds the folder of these modules and the bus in its arguments.
AS_A_PROGRAM = """
import json, sys
folder, bus = sys.argv[1:]
del sys.argv[1:]
sys.path.insert(0, folder)
import text_test
from accounts import Caller
with Caller(bus) as caller:
"""
CALL_EVERY_METHOD = AS_A_PROGRAM + "    print(json.dumps(text_test.heard_from_every_method(caller)))"
ASK_FOR_ACCESS = AS_A_PROGRAM + "    print(json.dumps(caller.start_request().outcome()[0]))"


def plain_arguments(method: str, signature: str) -> list:
    """Arguments that the method takes, its options last."""
    if method == "RequestAccess":
        return [FACEBOOK, facebook_options(), {}]
    texts = signature.removesuffix("a{sv}").replace("h", "")
    first = "com.example.domain" if method.endswith("Preference") else FACEBOOK
    return [first, "org.example.photos"][:len(texts)] + [0] * signature.count("h") + [{}]


def heard_from_every_method(caller: Caller) -> dict:
    """The error of each method that needs no descriptor, or "answered"."""
    heard = {}
    for method, signature in methods().items():
        if "h" not in signature:
            try:
                caller.manage(method, signature, plain_arguments(method, signature))
                heard[method] = "answered"
            except BusError as error:
                heard[method] = error.name
    return heard


class Texts(unittest.TestCase):
    answer = "allow"

    def setUp(self):
        self.session = self.enterContext(trial.trial_with_account(answer=self.answer, log="error"))
        self.caller = self.enterContext(self.session.caller())

    def tearDown(self):
        self.assertIsNone(self.session.accountd.poll(), self.session.daemon_log())
        with self.session.caller() as other:
            other.grants()

    def restart(self):
        self.caller.close()
        self.session.accountd.terminate()
        self.session.accountd.wait()
        self.session.start_accountd()
        self.caller = self.enterContext(self.session.caller())

    def change_store(self, statement: str, *values):
        with contextlib.closing(sqlite3.connect(self.session.state / "accounts.sqlite")) as store:
            store.execute(statement, values)
            store.commit()

    def refusal_of(self, method: str, signature: str, values) -> BusError:
        serial = self.caller.start(method, signature, values)
        with self.assertRaises(BusError, msg=method) as refused:
            self.caller.reply_to(serial, 5).answer()
        return refused.exception


class Arguments(Texts):
    def test_cost_their_sender_an_error_in_every_place_of_every_method(self):
        for method, signature in methods().items():
            for place, right in enumerate(plain_arguments(method, signature)):
                for text in NONE if isinstance(right, str) else ():
                    values = plain_arguments(method, signature)
                    values[place] = text + right
                    descriptors = [0] if "h" in signature else ()
                    with self.subTest(method=method, place=place, text=ascii(text)):
                        serial = self.caller.start(method, signature, values, descriptors=descriptors)
                        with self.assertRaises(BusError) as refused:
                            self.caller.reply_to(serial, 5).answer()
                        self.assertIn(refused.exception.name, REFUSALS)
                        self.assertNotEqual(refused.exception.message, "")

    def test_cost_their_sender_an_error_as_keys_and_values_of_options_at_any_depth(self):
        for bad in ({NONE[0]: ("s", "x")}, {"limit": ("s", NONE[1])}, {"limit": ("as", ["x", NONE[2]])},
                    {"limit": ("v", ("v", ("a{sv}", {NONE[3]: ("s", "x")})))}, {"limit": ("a{sv}", {"x": ("s", NONE[0])})}):
            for method, signature, values in (("RequestAccess", "sa{sv}a{sv}", [FACEBOOK, bad, {}]),
                                              ("RequestAccess", "sa{sv}a{sv}", [FACEBOOK, facebook_options(), bad]),
                                              ("History", "a{sv}", [bad]), ("ListClients", "a{sv}", [bad]),
                                              ("SetPreference", "ssa{sv}", ["com.example", "key", bad])):
                with self.subTest(method=method, bad=ascii(bad)):
                    self.assertIn(self.refusal_of(method, signature, values).name, REFUSALS)

    def test_cost_their_sender_an_error_at_other_objects_and_interfaces_too(self):
        self.session.person.answer = "nothing"
        request = self.caller.start_request()
        self.assertEqual(request.reply()[0], PENDING)
        properties = "org.freedesktop.DBus.Properties"
        for path, interface, member, signature, values in (
                (request.path, REQUEST, "Close", "a{sv}", [{NONE[0]: ("s", NONE[0])}]),
                (OBJECT, properties, "Get", "ss", [MANAGER, NONE[0]]), (OBJECT, properties, "Get", "ss", [NONE[0], "version"]),
                (OBJECT, properties, "GetAll", "s", [NONE[0]]),
                (OBJECT, properties, "Set", "ssv", [MANAGER, "version", ("s", NONE[0])])):
            with self.subTest(member=member, values=ascii(values)), self.assertRaises(BusError):
                self.caller.call(NAME, path, interface, member, signature, values, timeout=5)
        request.close()
        self.assertEqual(request.response()[0], WITHDRAWN)


class Signals(Texts):
    def test_that_cannot_be_read_are_passed_over(self):
        bus = "org.freedesktop.DBus"
        for sender in range(2):
            for text in NONE:
                for path, interface, member, signature, values in (
                        ("/com/veltran/Notify1", "com.veltran.Notify1", "Posted", "s", [text]),
                        ("/com/veltran/Notify1", "com.veltran.Notify1", "Posted", "a{sv}", [{text: ("s", text)}]),
                        ("/org/freedesktop/DBus", bus, "NameOwnerChanged", "sss", [text, "", ""]),
                        ("/org/freedesktop/DBus", bus, "NameOwnerChanged", "u", [7])):
                    self.caller.emit(NAME if sender else None, path, interface, member, signature, values)
        self.assertEqual(self.caller.start_request().outcome()[0], GRANTED)


class Messages(Texts):
    def test_of_every_shape_cost_their_sender_at_most_the_connection(self):
        """Calls, replies, errors and signals of no sense, some with bytes changed: whatever of it the bus passes on."""
        chance = random.Random(5)
        sender = self.session.caller()
        for number in range(1_500):
            try:
                sender.send_raw(self.nonsense(chance, sender))
                if number % 10 == 0:
                    sender.call("org.freedesktop.DBus", "/", "org.freedesktop.DBus.Peer", "Ping")
            except (OSError, ValueError, LookupError, struct.error):
                sender.close()
                sender = self.session.caller()
        sender.close()
        self.assertEqual(self.caller.start_request().outcome()[0], GRANTED)

    @staticmethod
    def nonsense(chance: random.Random, sender: Caller) -> bytes:
        kind = chance.choice((CALL, CALL, REPLY, ERROR, SIGNAL, SIGNAL, 5))
        signature, values = chance.choice((("sa{sv}", ["\ufdd0", {}]), ("s", ["\uffff"]), ("sss", ["a", "b", ""]), ("v", [("s", "\ufdd0")]),
                                           ("a{sv}", [{"\ufdd0": ("s", "a")}]), ("av", [[("s", "\ufdd0"), ("v", ("a{sv}", {}))]])))
        fields = {PATH: OBJECT, INTERFACE: chance.choice((MANAGER, "com.veltran.Notify1", "org.freedesktop.DBus")),
                  MEMBER: chance.choice(("ListGrants", "Posted", "NameOwnerChanged", "RequestAccess", "History")), DESTINATION: NAME,
                  SIGNATURE: signature, 200: "\ufdd0" if chance.random() < 0.3 else None}
        if kind in (REPLY, ERROR):
            fields |= {REPLY_SERIAL: chance.randrange(1, 50), ERROR_NAME: "org.example.Error"}
        message = bytearray(sender.marshalled_message(kind, fields, marshalled(signature, values)))
        for _ in range(chance.choice((0, 0, 1, 2))):
            # Not the lengths: the bus would wait for the rest.
            place = chance.choice((*range(4), *range(8, 12), *range(16, len(message))))
            message[place] = chance.choice((0, 1, 2, 255, chance.randrange(256)))
        return bytes(message)


class Names(Texts):
    def test_of_programs_refuse_the_program_and_nobody_else(self):
        for text in NONE:
            program = self.session.root / "bin" / f"program{text}"
            shutil.copy(trial.THIS_PROGRAM, program)
            with self.subTest(text=ascii(text)):
                finished = subprocess.run([program, "-c", CALL_EVERY_METHOD, HERE, self.session.bus], timeout=60, check=True,
                                          stdout=subprocess.PIPE, env=self.session.environment | {"PYTHONHOME": sys.base_prefix})
                heard = json.loads(finished.stdout)
                self.assertEqual(set(heard.values()), {"UnknownCaller"}, heard)

    def test_of_records_and_of_desktop_files_are_shown_without_them(self):
        record = self.session.clients / "org.example.photos.toml"
        desktop_files = self.session.root / "data/applications"
        desktop_files.mkdir()
        for text in NONE:
            written = record.read_text(encoding="utf-8")
            record.write_text(written.replace('name = "', f'name = "{text}'), encoding="utf-8")
            (desktop_files / "org.example.Sandboxed.desktop").write_text(f"[Desktop Entry]\nName={text}Sand{text}boxed{text}\n",
                                                                         encoding="utf-8")
            with self.subTest(text=ascii(text)):
                self.restart()
                self.assertEqual([row["name"] for row in self.caller.manage("ListClients")[0]], ["Photos"])
                self.assertEqual(self.caller.start_request().outcome()[0], GRANTED)
                self.assertEqual(self.ask_in_sandbox(), GRANTED)
                self.assertEqual({row["name"] for row in self.caller.grants().values()}, {"Photos", "Sandboxed"})
            record.write_text(written, encoding="utf-8")

    def ask_in_sandbox(self) -> int:
        finished = self.session.run_sandboxed("org.example.Sandboxed", trial.THIS_PROGRAM, "-c", ASK_FOR_ACCESS, HERE, self.session.bus)
        self.assertEqual(finished.returncode, 0, finished.stdout)
        return json.loads(finished.stdout)


class Sources(Texts):
    def test_a_servers_explanation_reaches_the_application_without_them(self):
        self.session.sandbox("fault", "message", "--path", "/oauth/authorization")
        word, results = self.caller.start_request().outcome()
        self.assertEqual(word, REFUSED)
        self.assertIn("could not fulfill this access request", results["error_message"])
        self.assertFalse(set(results["error_message"]) & set(NONE), ascii(results))

    def test_a_preference_that_somebody_wrote_into_its_file_is_read_without_them(self):
        folder = self.session.configuration / "preferences"
        folder.mkdir(exist_ok=True)
        (folder / "com.example.toml").write_text(f'"k{NONE[0]}" = "v"\nkey = "a{NONE[1]}"\nlist = ["{NONE[2]}", 1]\n'
                                                 f'[table]\n"{NONE[3]}" = "{NONE[4]}"\n', encoding="utf-8")
        expected = {"key": "a" + REPLACEMENT, "list": [REPLACEMENT, 1], "table": {REPLACEMENT: REPLACEMENT}}
        for key, value in expected.items():
            with self.subTest(key=key):
                self.assertEqual(self.caller.manage("GetPreference", "ss", ["com.example", key])[0], {"value": value})

    def test_a_store_that_holds_them_is_listed_all_the_same(self):
        self.assertEqual(self.caller.start_request().outcome()[0], GRANTED)
        for text in NONE:
            self.change_store("INSERT INTO accounts(account_type, username, description) VALUES (?, ?, ?)", FACEBOOK, text, text)
        self.change_store("UPDATE history SET bundle_id = ?", NONE[0])
        self.restart()
        accounts = self.caller.manage("ListAccounts", "s", [""])[0]
        self.assertEqual([row["username"] for row in accounts], ["ada"] + [REPLACEMENT] * len(NONE))
        self.assertEqual([row["client"] for row in self.caller.manage("History")[0]], [REPLACEMENT])

    def test_a_configuration_that_holds_them_is_reported_all_the_same(self):
        (self.session.clients / f"org.example.{NONE[0]}.toml").write_text("nonsense", encoding="utf-8")
        self.session.configure(plugins=f"{trial.BUILD}/plugins")
        self.restart()
        self.assertIn("clients_trouble", self.caller.manage("GetStatus")[0])


class ATerminal(unittest.TestCase):
    def setUp(self):
        self.session = self.enterContext(trial.Trial(log="error"))
        self.session.add_client("album")
        self.session.start_accountd()
        self.session.add_account()

    def test_sees_nothing_of_a_servers_explanation_that_could_steer_it(self):
        request = ("album", "request", "--app", "1", "--permission", "email")
        for words in (request, (*request, "--json")):
            self.session.sandbox("fault", "message", "--path", "/oauth/authorization")
            refused = self.session.run(*words)
            self.assertEqual(refused.returncode, 1, refused.stdout)
            line = refused.stdout.rstrip("\n").split("\n")[-1]
            self.assertIn("Access is granted.", line, "what the server said is on one line")
            with self.subTest(words=words):
                self.assertTrue(line.isprintable(), ascii(line))
                if "--json" in words:
                    self.assertIn("\x1b[31m", json.loads(line)["error_message"])
            self.session.run("palisade", "revoke", "org.example.album")

    def test_is_told_which_argument_is_no_text(self):
        for words in (("revoke", "x\uffff"), ("preferences", "set", "key", b"\xff"), ("notify", "\ufdd0")):
            done = subprocess.run(["palisade", *words], env=self.session.environment, capture_output=True, timeout=60, check=False)
            with self.subTest(words=words):
                self.assertEqual(done.returncode, 2)
                self.assertIn(f"Argument {len(words)}, ", done.stderr.decode())


class TheSocialDaemon(Texts):
    def test_lives_on_when_it_is_sent_what_it_cannot_read(self):
        vantad = self.session.start_vantad()
        wait_until(lambda: self.has_owner("com.veltran.Vantad1"), "vantad owns its name")
        for text in NONE:
            for interface, member in (("org.freedesktop.DBus.Properties", "GetAll"), ("com.veltran.Vantad1", "Anything")):
                with self.assertRaises(BusError):
                    self.caller.call("com.veltran.Vantad1", "/", interface, member, "s", [text])
            self.caller.emit("com.veltran.Vantad1", "/org/freedesktop/DBus", "org.freedesktop.DBus", "NameOwnerChanged", "s", [text])
        self.assertTrue(self.has_owner("com.veltran.Vantad1"))
        self.assertIsNone(vantad.poll())

    def has_owner(self, name: str) -> bool:
        bus = "org.freedesktop.DBus"
        return self.caller.call(bus, "/org/freedesktop/DBus", bus, "NameHasOwner", "s", [name])[0]


if __name__ == "__main__":
    unittest.main(verbosity=2)
