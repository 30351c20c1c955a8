#!/usr/bin/env python3
"""Callers that mean no good, or no sense: what they send is refused with a sentence, and harms nobody else."""

import concurrent.futures
import os
import time
import unittest
import xml.etree.ElementTree

import trial
from accounts import FACEBOOK, GRANTED, MANAGER, NAME, OBJECT, PENDING, REFUSED, REQUEST, WITHDRAWN, facebook_options
from bus_wire import BusError, marshalled
from trial import wait_until

trial.use_build_of_command_line()

INTERFACE = trial.PROJECT / "DBus/com.veltran.Accounts1.xml"
LONGEST_LANE = 8


def methods() -> dict[str, str]:
    """The manager's methods and the signatures of their arguments."""
    interface = xml.etree.ElementTree.parse(INTERFACE).getroot().find("interface")
    return {method.get("name"): "".join(argument.get("type") for argument in method.findall("arg")
                                        if argument.get("direction") == "in") for method in interface.findall("method")}


def nested_variant(depth: int):
    value = ("s", "the innermost")
    for _ in range(depth):
        value = ("v", value)
    return value


class HostileCallers(unittest.TestCase):
    answer = "nothing"
    settings = {}

    def setUp(self):
        self.session = self.enterContext(trial.trial_with_account(self.settings, answer=self.answer, log="error"))
        self.daemon = self.session.accountd.pid
        self.caller = self.enterContext(self.session.caller())

    def tearDown(self):
        self.assertIsNone(self.session.accountd.poll(), self.session.daemon_log())
        with self.session.caller() as other:
            self.assertEqual(other.grants(), {}, "nothing was granted")

    def refusal_of(self, method: str, signature: str, values, **more) -> BusError:
        with self.assertRaises(BusError, msg=f"{method}({signature})") as refused:
            self.caller.manage(method, signature, values, **more)
        self.assertNotEqual(refused.exception.message, "")
        return refused.exception

    def threads(self) -> int:
        return len(os.listdir(f"/proc/{self.session.accountd.pid}/task"))


class Messages(HostileCallers):
    # Arguments that no method takes, none of them with options at its end.
    WRONG = {"": (), "s": ("x",), "i": (-1,), "ay": (bytes(1 << 20),), "v": (nested_variant(30),), "as": (["x"] * 1_000,),
             "(sa(iv))": (("x", [(1, ("d", 0.5))] * 100),), "a{sa{sv}}": ({"a": {"b": ("b", True)}},), "o": ("/",),
             "g": ("a" * 20 + "i",), "a{ss}": ({str(key): "x" for key in range(1_000)},), "sssss": ("x",) * 5}

    def test_with_wrong_arguments_are_refused_by_every_method(self):
        for method, right in methods().items():
            for signature, values in self.WRONG.items():
                self.assertNotEqual(signature, right)
                serial = self.caller.start(method, signature, values)
                with self.subTest(method=method, signature=signature):
                    with self.assertRaises(BusError) as refused:
                        self.caller.reply_to(serial).answer()
                    self.assertIn(refused.exception.name, ("InvalidArgs", "UnknownMethod"))

    def test_with_unknown_or_deep_options_are_refused_by_every_method(self):
        plain = {"s": "x", "u": 1}
        for method, signature in methods().items():
            if "h" in signature:
                continue
            for options in ({"colour": ("s", "red")}, {"": ("s", "")}, {f"k{n}": ("i", n) for n in range(1_000)},
                            {"deep": ("v", nested_variant(25))}, {"x" * 10_000: ("ay", bytes(1_000))}):
                values = [{} if kind == "{" else plain[kind] for kind in signature.replace("a{sv}", "{")[:-1]]
                with self.subTest(method=method):
                    error = self.refusal_of(method, signature, [*values, options])
                    self.assertEqual(error.name, "InvalidArguments")
                    self.assertIn("There is no option", error.message)

    def test_with_options_of_wrong_types_are_refused(self):
        for method, signature, values, sentence in (
                ("History", "a{sv}", [{"limit": ("s", "1")}], "'limit' must be a whole number"),
                ("History", "a{sv}", [{"limit": ("i", -1)}], "'limit' must be a whole number"),
                ("History", "a{sv}", [{"limit": ("t", 1 << 63)}], "'limit' must be a whole number"),
                ("History", "a{sv}", [{"client": ("ay", b"x")}], "'client' must be a string"),
                ("History", "a{sv}", [{"client": ("(s)", ("x",))}], "'client' holds a value of the type '(s)'"),
                ("SetPreference", "ssa{sv}", ["com.example", "key", {"value": ("h", 0)}], ""),
                ("SetPreference", "ssa{sv}", ["../escape", "key", {"value": ("s", "x")}], ""),
                ("RequestAccess", "sa{sv}a{sv}", [FACEBOOK, facebook_options(), {"handle_token": ("i", 1)}],
                 "'handle_token' must be a string"),
                ("RequestAccess", "sa{sv}a{sv}", [FACEBOOK, {"FacebookAppIdKey": ("a{us}", {1: "x"})}, {}],
                 "'FacebookAppIdKey' holds a value of the type 'a{us}'")):
            with self.subTest(method=method, values=values):
                descriptors = [0] if ("h", 0) in values[-1].values() else ()
                error = self.refusal_of(method, signature, values, descriptors=descriptors)
                self.assertEqual(error.name, "InvalidArguments")
                self.assertIn(sentence, error.message)

    def test_that_ask_for_access_with_nonsense_are_refused_without_a_question(self):
        app = {"FacebookAppIdKey": ("s", "1")}
        for options in ({}, {"FacebookAppIdKey": ("i", 1)}, {"FacebookAppIdKey": ("as", ["1"])},
                        app | {"FacebookPermissionsKey": ("s", "email")}, app | {"FacebookPermissionsKey": ("a{sv}", {})},
                        app | {"FacebookPermissionsKey": ("as", ["publish_actions"])},
                        app | {"FacebookPermissionsKey": ("as", ["publish_actions"]), "FacebookAudienceKey": ("d", 1.5)}):
            with self.subTest(options=options):
                word, results = self.caller.start_request_with(options).outcome()
                self.assertEqual(word, REFUSED)
                self.assertEqual(results["error_code"], 8)
        self.assertEqual(self.session.person.alerts, 0)

    def test_that_are_malformed_cost_their_sender_the_connection_and_nobody_else(self):
        for body in (b"", b"\xff" * 64, marshalled("s", ["x"])[:-1], marshalled("s", [b"a\0b"]), marshalled("s", [b"\xff"]),
                     b"\xff\xff\xff\x7f"):
            with self.subTest(body=body), self.session.caller() as liar:
                serial = liar.start("ListAccounts", "sa{sv}", body=body + marshalled("a{sv}", [{}]) * bool(body))
                with self.assertRaises(ConnectionError):
                    liar.reply_to(serial)
        self.assertEqual(self.caller.grants(), {})

    def test_to_objects_interfaces_and_methods_that_do_not_exist_are_answered(self):
        for path, interface, member in ((OBJECT + "/nobody", MANAGER, "ListGrants"), (OBJECT, NAME + ".Nobody", "ListGrants"),
                                        (OBJECT, MANAGER, "Nobody"), (OBJECT + "/request/1_1/x", REQUEST, "Close"),
                                        ("/", MANAGER, "ListGrants")):
            with self.subTest(path=path, interface=interface, member=member), self.assertRaises(BusError) as refused:
                self.caller.call(NAME, path, interface, member, "sa{sv}", ["", {}])
            self.assertIn("Unknown", refused.exception.name)

    def test_with_names_of_a_megabyte_are_refused(self):
        long = "x" * 1_000_000
        for method, signature, values, name in (
                ("RequestAccess", "sa{sv}a{sv}", [long, {}, {}], "InvalidArguments"),
                ("Revoke", "ssa{sv}", [FACEBOOK, long, {}], "InvalidArguments"),
                ("Authorize", "ssa{sv}", [FACEBOOK, long, {}], "InvalidArguments"),
                ("RemoveAccount", "sa{sv}", [long, {}], "InvalidArguments"),
                ("SetPreference", "ssa{sv}", [long, "key", {"value": ("b", True)}], "InvalidArguments")):
            with self.subTest(method=method):
                self.assertEqual(self.refusal_of(method, signature, values).name, name)


class Handles(HostileCallers):
    def test_that_are_no_path_elements_are_refused(self):
        for token in ("", "a/b", "a.b", "x" * 65, "ä", "a b", "a-b", "../x", "\n"):
            with self.subTest(token=token):
                error = self.refusal_of("RequestAccess", "sa{sv}a{sv}",
                                        [FACEBOOK, facebook_options(), {"handle_token": ("s", token)}])
                self.assertEqual(error.name, "InvalidArguments")
                self.assertIn("'handle_token' may hold", error.message)

    def test_serve_one_request_at_a_time(self):
        first = self.caller.start_request()
        self.assertEqual(first.reply()[0], PENDING)
        token = first.path.rpartition("/")[2]
        again = [FACEBOOK, facebook_options(), {"handle_token": ("s", token)}]
        self.assertIn("still waits", self.refusal_of("RequestAccess", "sa{sv}a{sv}", again).message)
        first.close()
        self.assertEqual(first.response()[0], WITHDRAWN)
        path, word, _ = wait_until(lambda: self.accepted(again), "the handle is free again")
        self.assertEqual((path, word), (first.path, PENDING))

    def accepted(self, values):
        try:
            return self.caller.manage("RequestAccess", "sa{sv}a{sv}", values)
        except BusError:
            return None

    def test_of_somebody_else_cannot_be_closed_nor_heard(self):
        request = self.caller.start_request()
        self.assertEqual(request.reply()[0], PENDING)
        self.session.person.wait_for_alert(1)
        with self.session.caller() as stranger:
            stranger.listen()
            with self.assertRaises(BusError) as refused:
                stranger.call(NAME, request.path, REQUEST, "Close", "a{sv}", [{}])
            self.assertEqual(refused.exception.name, "NotPermitted")
            self.assertEqual(self.session.person.alerts, 1)
            request.close()
            self.assertEqual(request.response()[0], WITHDRAWN)
            stranger.grants()
            self.assertEqual([message for message in stranger.inbox if message.fields.get(3) == "Response"], [])

    def test_stand_when_somebody_else_claims_that_their_caller_has_left(self):
        request = self.caller.start_request()
        self.assertEqual(request.reply()[0], PENDING)
        self.session.person.wait_for_alert(1)
        bus = "org.freedesktop.DBus"
        with self.session.caller() as stranger:
            for destination in (NAME, None):
                stranger.emit(destination, "/org/freedesktop/DBus", bus, "NameOwnerChanged", "sss",
                              [self.caller.name, self.caller.name, ""])
            stranger.grants()
        self.caller.grants()
        self.assertEqual([message for message in self.caller.inbox if message.fields.get(3) == "Response"], [])
        request.close()
        self.assertEqual(request.response()[0], WITHDRAWN)
        self.assertEqual(self.session.person.alerts, 1)


class Floods(HostileCallers):
    def test_of_requests_are_cut_at_the_bound_and_delay_nobody_else(self):
        count = 2_000
        requests = [self.caller.start_request() for _ in range(count)]
        refused = 0
        for request in requests:
            try:
                self.assertEqual(request.reply()[0], PENDING)
            except BusError as error:
                self.assertEqual(error.name, "TooManyRequests")
                refused += 1
        self.assertEqual(refused, count - LONGEST_LANE)
        with self.session.caller() as other:
            self.assertEqual(other.grants(), {})
        self.caller.close()
        wait_until(self.takes_a_new_request, "the places of a caller that left are free")
        self.assertLess(self.threads(), 64)

    def takes_a_new_request(self) -> bool:
        with self.session.caller() as caller:
            try:
                return caller.start_request().reply()[0] == PENDING
            except BusError:
                return False

    def test_of_tokens_that_never_come_are_cut_at_the_bound(self):
        reading, writing = os.pipe()
        self.addCleanup(os.close, reading)
        self.addCleanup(os.close, writing)
        count = 100
        serials = [self.caller.start("AddAccount", "ssha{sv}", [FACEBOOK, f"user{number}", 0, {}], descriptors=[reading])
                   for number in range(count)]
        for serial in serials[LONGEST_LANE:]:
            with self.assertRaises(BusError) as refused:
                self.caller.reply_to(serial).answer()
            self.assertEqual(refused.exception.name, "TooManyRequests")
        for serial in serials[:LONGEST_LANE]:
            with self.assertRaises(BusError) as refused:
                self.caller.reply_to(serial).answer()
            self.assertIn("did not come to its end", refused.exception.message)
        self.assertEqual(len(self.caller.manage("ListAccounts", "s", [""])[0]), 1)

    def test_of_additions_of_one_account_add_it_once(self):
        def add(name: str) -> bool:
            with self.session.caller() as caller:
                try:
                    caller.add_account(name, self.session.master_token)
                except BusError as error:
                    self.assertIn("already", str(error))
                    return False
                return True

        with concurrent.futures.ThreadPoolExecutor(LONGEST_LANE) as pool:
            for name in (f"user {number}" for number in range(20)):
                with self.subTest(name=name):
                    self.assertEqual(sum(pool.map(add, [name] * LONGEST_LANE)), 1)


class Leaving(HostileCallers):
    # Leaving so often would cost an application the user's attention; here it is to come again and again.
    settings = {"cool_down_after_refusals": 0}

    def test_at_every_moment_leaves_nothing_behind(self):
        """The moments of a request: before its reply, before, while and after the alert stands."""
        for step in range(60):
            with self.session.caller() as caller:
                caller.start_request()
                time.sleep(step / 4000)
        wait_until(self.asks_again, "everything that left was withdrawn")

    def asks_again(self) -> bool:
        before = self.session.person.alerts
        with self.session.caller() as caller:
            try:
                request = caller.start_request()
                if request.reply()[0] != PENDING:
                    return False
                self.session.person.wait_for_alert(before + 1, 1)
                return True
            except (BusError, TimeoutError):
                return False


class LeavingAPersonWhoAllows(unittest.TestCase):
    def test_while_the_server_answers_keeps_what_the_person_has_granted_whole(self):
        with trial.trial_with_account(answer="allow", log="error") as session:
            session.sandbox("fault", "slow", "--milliseconds", "1", "--path", "/oauth/authorization")
            caller = session.caller()
            caller.start_request()
            session.person.wait_for_alert(1)
            wait_until(lambda: "/oauth/authorization" in session.sandbox("requests"), "the server is asked")
            caller.close()
            with session.caller() as manager:
                wait_until(lambda: manager.start_request().reply()[0] in (GRANTED, PENDING), "the first request has ended")
                if manager.grants():
                    self.assertTrue(manager.credential().startswith("sandbox-"))


if __name__ == "__main__":
    unittest.main(verbosity=2)
