#!/usr/bin/env python3
"""Only one well-formed word of the backend that was asked, in answer to the very question, is consent; everything else that a
backend, a bus or another program may do is nobody's answer, and ends at once when the alert is taken down.

The backends are programs of the tests' own on a bus of the tests' own; a real one is asked in Tests/Desktop.
"""

import json
import os
import pathlib
import select
import subprocess
import sys
import tempfile
import time
import unittest

try:
    import dbus  # noqa: F401
    import gi  # noqa: F401
except ImportError:
    print("Skipped: there is no python3-dbus or no python3-gi here, so no backend can be played.")
    sys.exit(77)

PROGRAM = sys.argv[1]
del sys.argv[1:3]
HERE = pathlib.Path(__file__).resolve().parent
BACKEND = "org.example.Backend"
PATIENCE = 20
AT_ONCE = 1

BUS = """<busconfig><type>session</type><listen>unix:tmpdir={folder}</listen><servicedir>{folder}/services</servicedir>
<policy context="default"><allow send_destination="*" eavesdrop="true"/><allow eavesdrop="true"/><allow own="*"/></policy>
</busconfig>"""


class Program:
    """A running program, and what it says line by line."""

    def __init__(self, *command, environment):
        self.process = subprocess.Popen(command, stdin=subprocess.PIPE, stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True,
                                        env=environment)

    def line(self):
        if not select.select([self.process.stdout], [], [], PATIENCE)[0]:
            raise AssertionError(f"{self.process.args[0]} said nothing for {PATIENCE} s")
        return self.process.stdout.readline().strip()

    def tell(self, text):
        self.process.stdin.write(text + "\n")
        self.process.stdin.flush()

    def end(self):
        self.process.kill()
        self.process.wait()
        self.process.stdin.close()
        self.process.stdout.close()


class Session:
    """A bus, the folders of a session in which one backend is installed, and what runs there. The bus starts `service` for it."""

    def __init__(self, case, service=None):
        folder = tempfile.TemporaryDirectory(prefix="palisade-portal-")
        case.addCleanup(folder.cleanup)
        self.case, self.folder = case, pathlib.Path(folder.name)
        for name in ("services", "data/xdg-desktop-portal/portals", "config"):
            (self.folder / name).mkdir(parents=True)
        (self.folder / "data/xdg-desktop-portal/portals/test.portal").write_text(
            f"[portal]\nDBusName={BACKEND}\nInterfaces=org.freedesktop.impl.portal.Access;\n")
        if service is not None:
            (self.folder / f"services/{BACKEND}.service").write_text(f"[D-BUS Service]\nName={BACKEND}\nExec={service}\n")
        (self.folder / "bus.conf").write_text(BUS.format(folder=self.folder))
        self.environment = {name: value for name, value in os.environ.items() if not name.startswith("XDG_")}
        self.bus = self.run("dbus-daemon", f"--config-file={self.folder}/bus.conf", "--nofork", "--print-address")
        self.environment.update(DBUS_SESSION_BUS_ADDRESS=self.bus.line(), DBUS_SYSTEM_BUS_ADDRESS="unix:path=/nonexistent",
                                XDG_DATA_HOME=f"{self.folder}/data", XDG_DATA_DIRS=f"{self.folder}/none",
                                XDG_CONFIG_HOME=f"{self.folder}/config", XDG_CONFIG_DIRS=f"{self.folder}/none", LC_ALL="C.UTF-8")

    def run(self, *command):
        program = Program(*command, environment=self.environment)
        self.case.addCleanup(program.end)
        return program

    def start_backend(self):
        backend = self.run("/usr/bin/python3", "-B", HERE / "portal_backend.py", BACKEND)
        self.case.assertEqual(json.loads(backend.line()), {"serves": BACKEND})
        return backend

    def ask(self, orders):
        alert = self.run(PROGRAM, "portal", orders)
        self.case.assertEqual(alert.line(), f"shown by portal ({BACKEND})")
        return alert


class ABackend(unittest.TestCase):
    def setUp(self):
        self.session = Session(self)

    def asked(self, backend, orders):
        """The alert and what the backend was asked for it."""
        alert = self.session.ask(orders)
        return alert, json.loads(backend.line())

    def assert_answers(self, rows):
        """Each of the orders leads to the answer beside it. They stand at the same time, which saves it."""
        alerts = [(orders, expected, self.session.ask(orders)) for orders, expected in rows]
        for orders, expected, alert in alerts:
            with self.subTest(orders):
                self.assertEqual(alert.line(), expected)

    def assert_taken_down_at_once(self, alert):
        before = time.monotonic()
        alert.tell("enough")
        self.assertEqual(alert.line(), "nobody")
        self.assertLess(time.monotonic() - before, AT_ONCE)

    # What is an answer.

    def test_presses_a_button_with_one_well_formed_word(self):
        self.session.start_backend()
        self.assert_answers([("after 0.7 reply 0", "allowed"), ("after 0.7 reply 1", "nobody"), ("reply 1", "nobody")])

    def test_is_asked_in_the_form_of_the_portals(self):
        backend = self.session.start_backend()
        _, question = self.asked(backend, "reply 1")
        self.assertEqual((question["path"], question["signature"]), ("/org/freedesktop/portal/desktop", "osssssa{sv}"))
        self.assertRegex(question["handle"], r"^/org/freedesktop/portal/desktop/request/\d+_\d+/palisade$")
        self.assertEqual((question["app_id"], question["parent"]), ("", ""))
        self.assertEqual(question["subtitle"], "“\u2068Photos\u2069” asks for ‹b›100 %‹/b› &\u2060amp; more.")
        self.assertEqual(question["body"], "Application: \u2068Photos\u2069\n\u2068org.example.photos\u2069\n"
                         "Identity: Only claimed (not sandboxed)\nAccount: \u2068ada@example.org\u2069")
        self.assertEqual(question["options"], {"modal": True, "deny_label": "Don’t Allow", "grant_label": "Allow",
                                               "icon": "dialog-password-symbolic"})

    def test_is_started_by_the_bus(self):
        self.session = Session(self, service=f"/usr/bin/python3 -B {HERE}/portal_backend.py {BACKEND}")
        self.assert_answers([("after 0.7 reply 0", "allowed"), ("after 0.7 reply 1", "nobody")])

    # What is none.

    def test_says_nothing_with_another_word(self):
        self.session.start_backend()
        self.assert_answers([(f"after 0.7 reply {word}", "nobody") for word in (2, 3, 256, 4294967295)])

    def test_says_nothing_before_a_person_could_have_read_the_question(self):
        self.session.start_backend()
        self.assert_answers([("reply 0", "nobody")])

    def test_says_nothing_in_another_form(self):
        self.session.start_backend()
        forms = ("u", "i", "s", "v", "b", "a{sv}", "a{sv}u", "ia{sv}", "ta{sv}", "ya{sv}", "ba{sv}", "sa{sv}", "va{sv}", "au",
                 "ua{ss}", "uu", "us", "ua{sv}u", "ua{sv}y", "ua{sv}a{sv}", "uua{sv}", "(ua{sv})")
        self.assert_answers([("after 0.7 form", "nobody")] + [(f"after 0.7 form {form}", "nobody") for form in forms])

    def test_says_nothing_with_an_error(self):
        self.session.start_backend()
        self.assert_answers([("error", "nobody"), ("after 0.7 error", "nobody"), ("after 0.7 error reply 0", "nobody")])

    def test_says_only_its_first_word(self):
        self.session.start_backend()
        self.assert_answers([("after 0.7 reply 1 reply 0", "nobody"), ("after 0.7 reply 2 reply 0", "nobody"),
                             ("after 0.7 form s reply 0", "nobody"), ("reply 0 after 0.7 reply 0", "nobody")])

    def test_is_the_only_one_whose_word_counts(self):
        self.session.start_backend()
        self.assert_answers([("after 0.7 accomplice", "nobody"), ("after 0.7 accomplice after 0.1 reply 0", "nobody")])

    # What ends the question otherwise.

    def test_answers_for_nobody_when_it_leaves_the_bus(self):
        for order in ("exit", "after 0.3 exit"):
            self.session.start_backend()
            self.assert_answers([(order, "nobody")])

    def test_answers_for_nobody_when_it_gives_its_name_up(self):
        backend = self.session.start_backend()
        alert, question = self.asked(backend, "release after 0.7 reply 0")
        self.assertEqual(alert.line(), "nobody")
        self.assertEqual(json.loads(backend.line()), {"closed": question["handle"]})

    def test_answers_for_nobody_when_another_takes_its_name(self):
        backend = self.session.start_backend()
        alert, question = self.asked(backend, "after 2 reply 0")
        self.session.start_backend()
        self.assertEqual(alert.line(), "nobody")
        self.assertEqual(json.loads(backend.line()), {"closed": question["handle"]})

    def test_answers_for_nobody_when_the_bus_goes(self):
        backend = self.session.start_backend()
        alert, _ = self.asked(backend, "after 5 reply 0")
        self.session.bus.end()
        self.assertEqual(alert.line(), "nobody")

    def test_is_told_to_close_what_is_taken_down(self):
        backend = self.session.start_backend()
        alert, question = self.asked(backend, "after 5 reply 0")
        self.assert_taken_down_at_once(alert)
        self.assertEqual(json.loads(backend.line()), {"closed": question["handle"]})

    def test_is_told_again_to_close_what_it_was_still_making(self):
        backend = self.session.start_backend()
        alert, question = self.asked(backend, "deaf")
        self.assert_taken_down_at_once(alert)
        self.assertEqual(json.loads(backend.line()), {"closed": question["handle"]})

    def test_holds_nobody_up_when_it_is_stopped(self):
        backend = self.session.start_backend()
        alert, _ = self.asked(backend, "stop")
        self.assert_taken_down_at_once(alert)

    def test_holds_nobody_up_when_it_does_not_start(self):
        self.session = Session(self, service="/bin/sleep 5")
        self.assert_taken_down_at_once(self.session.ask("reply 0"))

    def test_answers_for_nobody_when_it_cannot_be_started(self):
        self.session = Session(self, service="/bin/false")
        self.assert_answers([("reply 0", "nobody")])

    def test_is_not_asked_when_it_is_not_there(self):
        alert = self.session.run(PROGRAM, "portal", "reply 0")
        self.assertEqual(alert.line(), "not shown by nobody")
        self.assertEqual(alert.line(), "nobody")


if __name__ == "__main__":
    unittest.main(verbosity=2)
