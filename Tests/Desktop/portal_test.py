#!/usr/bin/env python3
"""The portal's own dialog on a real display: GTK's backend shows it, assistive technology and keys answer it.

Run on a display of its own, which Tools/Desktop/screen makes.
"""

import contextlib
import os
import pathlib
import subprocess
import sys
import unittest

# It looks for what it needs, and takes the program's path off the command line.
import window_test
from gi.repository import Gio, GLib
from window_test import Atspi, until, widget, xdotool

PROGRAM, HELPER = window_test.HELPER, sys.argv.pop(1)
BACKEND = "org.freedesktop.impl.portal.desktop.gtk"
TITLE = "Allow <u>100 %s</u> of Access?"
# Within half a second nothing is consent.
READ_AFTER = 0.7

if not any(pathlib.Path(folder, "xdg-desktop-portal/portals/gtk.portal").exists() for folder in ("/usr/local/share", "/usr/share")):
    print("Skipped: there is no xdg-desktop-portal-gtk here, so no portal can show anything.")
    sys.exit(77)


def bus(method, *arguments):
    """What the bus answers, without the parentheses around it."""
    called = subprocess.run(["gdbus", "call", "--session", "--dest", "org.freedesktop.DBus", "--object-path", "/org/freedesktop/DBus",
                             "--method", f"org.freedesktop.DBus.{method}", *arguments], capture_output=True, text=True, check=True)
    return called.stdout.strip().strip("(),")


class ADialog(unittest.TestCase):
    def setUp(self):
        # It is started here, so that its number is known before it shows anything.
        bus("StartServiceByName", BACKEND, "0")
        self.backend = int(bus("GetConnectionUnixProcessID", BACKEND).split()[-1])
        self.alert = self.start("portal")
        self.assertEqual(self.alert.stdout.readline(), f"shown by portal ({BACKEND})\n")
        self.allow = until(lambda: widget(self.backend, "Allow"), "the dialog")
        self.window = until(self.windows, "its number")[-1]
        until(lambda: xdotool("getactivewindow", check=False).strip() == self.window, "the focus")

    def start(self, front_end, **environment):
        alert = subprocess.Popen([PROGRAM, front_end, TITLE, HELPER], stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True,
                                 env={**os.environ, "XDG_CURRENT_DESKTOP": "", **environment})
        self.addCleanup(self.end, alert)
        return alert

    def end(self, alert):
        if alert.stdout.closed:
            return
        # A dialog outlives a program that is killed, and would stand in the next test's way.
        with contextlib.suppress(BrokenPipeError):
            alert.communicate("enough\n", window_test.PATIENCE)

    def windows(self):
        found = subprocess.run(["xdotool", "search", "--onlyvisible", "--pid", str(self.backend)], capture_output=True, text=True,
                               check=False)
        return found.stdout.split()

    def assert_unanswered(self, seconds):
        with self.assertRaises(subprocess.TimeoutExpired):
            self.alert.wait(seconds)

    def assert_ends(self, word):
        self.assertEqual(self.alert.stdout.readline(), f"{word}\n")
        until(lambda: not self.windows(), "the dialog's end")

    # What presses a button.

    def test_is_allowed_by_assistive_technology(self):
        self.assert_unanswered(READ_AFTER)
        Atspi.Action.do_action(self.allow, 0)
        self.assert_ends("allowed")

    def test_has_no_answer_when_assistive_technology_refuses(self):
        Atspi.Action.do_action(widget(self.backend, "Don’t Allow"), 0)
        self.assert_ends("nobody")

    def test_has_no_answer_when_return_refuses(self):
        xdotool("key", "Return")
        self.assert_ends("nobody")

    def test_is_allowed_by_return_after_tab(self):
        self.assert_unanswered(READ_AFTER)
        xdotool("key", "Tab", "Return")
        self.assert_ends("allowed")

    # What closes it.

    def test_is_closed_by_escape(self):
        xdotool("key", "Escape")
        self.assert_ends("nobody")

    def test_is_closed_by_the_window_manager(self):
        xdotool("key", "alt+F4")
        self.assert_ends("nobody")

    def test_goes_away_when_it_is_taken_down(self):
        self.alert.stdin.write("enough\n")
        self.alert.stdin.flush()
        self.assert_ends("nobody")

    def test_goes_away_when_it_is_taken_down_before_it_stands(self):
        for _ in range(10):
            other = self.start("portal")
            self.end(other)
        until(lambda: len(self.windows()) == 1, "the end of all others")

    def test_goes_away_when_the_session_locks(self):
        # Only whoever has the screen saver's name is believed.
        saver = Gio.bus_get_sync(Gio.BusType.SESSION)
        saver.call_sync("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "RequestName",
                        GLib.Variant("(su)", ("org.freedesktop.ScreenSaver", 0)), None, Gio.DBusCallFlags.NONE, -1)
        self.addCleanup(saver.call_sync, "org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "ReleaseName",
                        GLib.Variant("(s)", ("org.freedesktop.ScreenSaver",)), None, Gio.DBusCallFlags.NONE, -1)
        saver.emit_signal(None, "/org/freedesktop/ScreenSaver", "org.freedesktop.ScreenSaver", "ActiveChanged",
                          GLib.Variant("(b)", (True,)))
        saver.flush_sync()
        self.assert_ends("nobody")

    def test_is_nobodys_answer_when_the_backend_is_killed(self):
        os.kill(self.backend, 9)
        self.assert_ends("nobody")

    # How it stands there.

    def test_is_modal(self):
        state = subprocess.run(["xprop", "-id", self.window, "_NET_WM_STATE"], check=True, capture_output=True, text=True).stdout
        self.assertIn("_NET_WM_STATE_MODAL", state)

    def test_reads_texts_as_texts(self):
        names = [node.get_name() for application in window_test.descendants_of_desktop()
                 if application.get_process_id() == self.backend for node in window_test.descendants(application)]
        self.assertIn("Allow ‹u›100 ٪s‹/u› of Access?", names)
        self.assertIn("“\u2068Photos\u2069” asks for ‹b›100 %‹/b› &\u2060amp; more.", names)
        self.assertIn("Application: \u2068Photos\u2069\n\u2068org.example.photos\u2069\nIdentity: Only claimed (not sandboxed)\n"
                      "Account: \u2068ada@example.org\u2069", names)

    def test_is_not_chosen_where_windows_can_be_kept_on_top(self):
        for desktop in ("ubuntu:GNOME", "Openbox"):
            self.assertEqual(self.start("whatever", XDG_CURRENT_DESKTOP=desktop).stdout.readline(), "shown by desktop\n")


if __name__ == "__main__":
    unittest.main(verbosity=2)
