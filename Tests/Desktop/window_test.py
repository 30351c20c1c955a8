#!/usr/bin/env python3
"""The alert's window on a real display: assistive technology, keys and clicks press its buttons, and only when that is meant.

Run on a display of its own, which Tools/Desktop/screen makes.
"""

import pathlib
import signal
import subprocess
import sys
import time
import unittest

try:
    import gi
    gi.require_version("Atspi", "2.0")
    from gi.repository import Atspi
except (ImportError, ValueError):
    print("Skipped: there is no python3-gi with AT-SPI here, so the windows cannot be read.")
    sys.exit(77)

PROJECT = pathlib.Path(__file__).resolve().parents[2]
sys.path.insert(0, str(PROJECT / "Tools/Desktop"))
from alert import ALLOWED, CLOSED, EXAMPLE, REFUSED, Alert  # noqa: E402

HELPER = sys.argv.pop(1)
PATIENCE = 20
ARMED_AFTER = 0.5
# Nothing moves the keyboard for that long after typing.
UNMOVED_FOR = 3
# How many steps lead from the text to a button.
TO_REFUSE, TO_ALLOW = 2, 3


def until(condition, what):
    """The first truth that `condition` answers."""
    deadline = time.monotonic() + PATIENCE
    while time.monotonic() < deadline:
        found = condition()
        if found:
            return found
        time.sleep(0.02)
    raise AssertionError(f"waited {PATIENCE} s for {what}")


def descendants(node):
    yield node
    for index in range(node.get_child_count()):
        child = node.get_child_at_index(index)
        if child is not None:
            yield from descendants(child)


def widget(process, name):
    """What the helper with this process number shows under that accessible name, or None."""
    try:
        for application in descendants_of_desktop():
            if application.get_process_id() != process:
                continue
            for node in descendants(application):
                if node.get_name() == name and node.get_role_name() == "push button":
                    return node
    except gi.repository.GLib.Error:
        pass
    return None


def focused(process):
    """The accessible name of what has the keyboard's focus in the helper with this process number, or None."""
    try:
        for application in descendants_of_desktop():
            if application.get_process_id() != process:
                continue
            for node in descendants(application):
                if node.get_state_set().contains(Atspi.StateType.FOCUSED):
                    return node.get_name()
    except gi.repository.GLib.Error:
        pass
    return None


def descendants_of_desktop():
    desktop = Atspi.get_desktop(0)
    children = (desktop.get_child_at_index(index) for index in range(desktop.get_child_count()))
    return [child for child in children if child is not None]


def xdotool(*arguments, check=True):
    return subprocess.run(["xdotool", *map(str, arguments)], check=check, capture_output=True, text=True).stdout


class AWindow(unittest.TestCase):
    def ask(self, **question):
        alert = Alert(HELPER, question)
        self.addCleanup(alert.end)
        self.allow = until(lambda: widget(alert.process.pid, EXAMPLE["allow"]), "the window")
        # What there is not yet, xdotool calls an error.
        search = ("search", "--onlyvisible", "--pid", alert.process.pid)
        self.window = until(lambda: xdotool(*search, check=False).split(), "its number")[-1]
        until(lambda: xdotool("getactivewindow", check=False).strip() == self.window, "the focus")
        return alert

    def assert_unanswered(self, alert, seconds):
        """The alert stands for that long."""
        with self.assertRaises(subprocess.TimeoutExpired):
            alert.process.wait(seconds)

    def press_until_answered(self, alert, press):
        """Presses with pauses in which the window can arm itself."""
        for _ in range(10):
            press()
            try:
                alert.process.wait(ARMED_AFTER + 0.7)
                return alert.wait()
            except subprocess.TimeoutExpired:
                continue
        raise AssertionError("no press was taken")

    def choose(self, steps):
        """Moves the keyboard on from the text, and waits until a key may press what it comes to."""
        xdotool("key", *["Tab"] * steps)
        time.sleep(ARMED_AFTER + 0.2)

    def middle_of(self, button):
        place = button.get_extents(Atspi.CoordType.SCREEN)
        return place.x + place.width // 2, place.y + place.height // 2

    # What presses a button.

    def test_is_allowed_by_assistive_technology(self):
        alert = self.ask()
        self.assertEqual(self.press_until_answered(alert, lambda: Atspi.Action.do_action(self.allow, 0)), ALLOWED)

    def test_is_refused_by_assistive_technology_at_once(self):
        alert = self.ask()
        Atspi.Action.do_action(widget(alert.process.pid, EXAMPLE["refuse"]), 0)
        self.assertEqual(alert.wait(), REFUSED)

    def test_is_allowed_by_return_and_by_space_on_the_button(self):
        for key in ("Return", "KP_Enter", "space"):
            alert = self.ask()
            self.choose(TO_ALLOW)
            xdotool("key", key)
            self.assertEqual(alert.wait(), ALLOWED, key)

    def test_is_refused_by_return_and_by_space_on_the_button(self):
        for key in ("Return", "KP_Enter", "space"):
            alert = self.ask()
            self.choose(TO_REFUSE)
            xdotool("key", key)
            self.assertEqual(alert.wait(), REFUSED, key)

    def test_leads_the_keyboard_to_its_buttons_by_their_letters(self):
        for letter, steps, word in (("alt+a", TO_ALLOW, ALLOWED), ("alt+d", TO_REFUSE, REFUSED)):
            alert = self.ask()
            xdotool("key", *[letter] * steps)
            self.assert_unanswered(alert, ARMED_AFTER + 0.2)
            xdotool("key", "Return")
            self.assertEqual(alert.wait(), word)

    def test_leads_the_keyboard_between_its_buttons_by_arrows(self):
        for keys, word in ((["Right"], ALLOWED), (["Right", "Left"], REFUSED), (["Tab", "shift+Tab"], REFUSED)):
            alert = self.ask()
            xdotool("key", *["Tab"] * TO_REFUSE, *keys)
            self.assert_unanswered(alert, ARMED_AFTER + 0.2)
            xdotool("key", "Return")
            self.assertEqual(alert.wait(), word)

    def test_shows_where_the_keyboard_stands(self):
        alert = self.ask()
        for place in ("would like to use", "org.example.photos", "Don’t Allow", "Allow", "would like to use"):
            until(lambda place=place: place in (focused(alert.process.pid) or ""), place)
            xdotool("key", "Tab")

    def test_is_allowed_by_a_click(self):
        alert = self.ask()
        click = lambda: xdotool("mousemove", *self.middle_of(self.allow), "click", 1)  # noqa: E731
        self.assertEqual(self.press_until_answered(alert, click), ALLOWED)

    def test_is_closed_by_escape(self):
        alert = self.ask()
        xdotool("key", "Escape")
        self.assertEqual(alert.wait(), CLOSED)

    def test_is_closed_by_the_window_manager(self):
        alert = self.ask()
        xdotool("key", "alt+F4")
        self.assertEqual(alert.wait(), CLOSED)

    # What does not.

    def test_takes_none_of_a_storm_of_clicks(self):
        alert = self.ask()
        x, y = self.middle_of(self.allow)
        xdotool("mousemove", x, y, "click", "--repeat", 50, "--delay", 40, 1)
        self.assert_unanswered(alert, 0.1)
        self.assertEqual(self.press_until_answered(alert, lambda: xdotool("click", 1)), ALLOWED)

    def test_takes_none_of_a_storm_of_keys(self):
        alert = self.ask()
        xdotool("key", "--delay", 40, *["Tab"] * TO_ALLOW, *["Return"] * 50)
        self.assert_unanswered(alert, ARMED_AFTER + 0.2)
        xdotool("key", "Return")
        self.assertEqual(alert.wait(), ALLOWED)

    def test_takes_no_key_at_its_text_and_its_details(self):
        alert = self.ask()
        for _ in range(2):
            for key in ("Return", "space", "alt+Return", "ctrl+Return"):
                self.assert_unanswered(alert, ARMED_AFTER + 0.2)
                xdotool("key", key)
            self.assert_unanswered(alert, UNMOVED_FOR + 0.2)
            xdotool("key", "Tab")

    def test_takes_every_other_key_for_typing(self):
        alert = self.ask()
        for key in ("x", "Up", "Page_Down", "alt+x", "ctrl+c", "F1"):
            self.choose(TO_ALLOW)
            xdotool("key", key, "Return")
            self.assert_unanswered(alert, ARMED_AFTER + 0.2)
            xdotool("key", *["Tab"] * TO_ALLOW)
            self.assert_unanswered(alert, ARMED_AFTER + 0.2)
            xdotool("key", "Return")
            self.assert_unanswered(alert, UNMOVED_FOR + 0.2)
        self.choose(TO_ALLOW)
        xdotool("key", "Return")
        self.assertEqual(alert.wait(), ALLOWED)

    def test_takes_no_key_that_was_down_before(self):
        xdotool("keydown", "Return")
        try:
            alert = self.ask()
            self.assert_unanswered(alert, 2)
        finally:
            xdotool("keyup", "Return")
        self.assert_unanswered(alert, UNMOVED_FOR + 0.2)
        self.choose(TO_ALLOW)
        xdotool("key", "Return")
        self.assertEqual(alert.wait(), ALLOWED)

    def test_takes_no_key_that_is_held(self):
        alert = self.ask()
        self.choose(TO_ALLOW)
        xdotool("keydown", "Return")
        try:
            self.assert_unanswered(alert, 2)
        finally:
            xdotool("keyup", "Return")
        self.assert_unanswered(alert, 0.3)

    def test_takes_no_press_while_another_window_covers_the_button(self):
        alert = self.ask()
        x, y = self.middle_of(self.allow)
        overlay = subprocess.Popen([sys.executable, str(PROJECT / "Tests/Desktop/overlay.py"), str(x), str(y)],
                                   stdout=subprocess.PIPE)
        self.addCleanup(overlay.stdout.close)
        try:
            self.assertTrue(overlay.stdout.readline())
            for _ in range(4):
                Atspi.Action.do_action(self.allow, 0)
                self.assert_unanswered(alert, ARMED_AFTER + 0.2)
        finally:
            overlay.kill()
            overlay.wait()
        self.assertEqual(self.press_until_answered(alert, lambda: Atspi.Action.do_action(self.allow, 0)), ALLOWED)

    def test_is_nobodys_answer_when_any_signal_ends_the_helper(self):
        for number in (signal.SIGTERM, signal.SIGKILL, signal.SIGSEGV, signal.SIGABRT, signal.SIGHUP, signal.SIGINT):
            alert = self.ask()
            alert.process.send_signal(number)
            self.assertIsNone(alert.wait(), number)

    def test_goes_away_with_the_daemon(self):
        alert = self.ask()
        before = time.monotonic()
        alert.host.close()
        self.assertNotEqual(alert.process.wait(PATIENCE), 0)
        self.assertLess(time.monotonic() - before, 1)

    # How it stands there.

    def test_is_modal_and_above_all_others(self):
        self.ask()
        state = subprocess.run(["xprop", "-id", self.window, "_NET_WM_STATE"], check=True, capture_output=True, text=True).stdout
        self.assertIn("_NET_WM_STATE_MODAL", state)
        self.assertIn("_NET_WM_STATE_ABOVE", state)

    def test_reads_a_name_as_text_and_not_as_markup(self):
        alert = self.ask(message="“<b>Photos</b> &amp;” asks.")
        names = [node.get_name() for application in descendants_of_desktop()
                 if application.get_process_id() == alert.process.pid for node in descendants(application)]
        self.assertIn("“<b>Photos</b> &amp;” asks.", names)


class AHelperWithoutAQuestion(unittest.TestCase):
    def test_says_who_starts_it(self):
        run = subprocess.run(["bash", "-c", f'exec 3</dev/null; exec "{HELPER}"'], capture_output=True, text=True, check=False)
        self.assertNotEqual(run.returncode, 0)
        self.assertIn("accountd", run.stderr)


class AHelperWithoutADisplay(unittest.TestCase):
    def test_is_nobodys_answer(self):
        with Alert(HELPER, environment={"DISPLAY": ":987"}) as alert:
            self.assertIsNone(alert.wait())


if __name__ == "__main__":
    unittest.main(verbosity=2)
