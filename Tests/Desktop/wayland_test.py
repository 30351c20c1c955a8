#!/usr/bin/env python3
"""The alert's window on Wayland, in the layer above all others: assistive technology presses its buttons.

Run by Tools/Desktop/wayland_screen in a compositor without a screen.
"""

import subprocess
import sys
import unittest

# It looks for what it needs, and takes the helper's path off the command line.
import window_test
from window_test import ALLOWED, EXAMPLE, REFUSED, Alert, Atspi

PROGRAM = sys.argv.pop(1)


class AWindowOnWayland(unittest.TestCase):
    def ask(self):
        alert = Alert(window_test.HELPER)
        self.addCleanup(alert.end)
        self.allow = window_test.until(lambda: window_test.widget(alert.process.pid, EXAMPLE["allow"]), "the window")
        return alert

    def test_is_allowed_by_assistive_technology_once_it_is_armed(self):
        alert = self.ask()
        Atspi.Action.do_action(self.allow, 0)
        with self.assertRaises(subprocess.TimeoutExpired):
            alert.process.wait(0.2)
        self.assertEqual(window_test.AWindow.press_until_answered(self, alert, lambda: Atspi.Action.do_action(self.allow, 0)), ALLOWED)

    def test_is_refused_by_assistive_technology_at_once(self):
        alert = self.ask()
        Atspi.Action.do_action(window_test.widget(alert.process.pid, EXAMPLE["refuse"]), 0)
        self.assertEqual(alert.wait(), REFUSED)

    def test_goes_away_with_the_daemon(self):
        alert = self.ask()
        alert.host.close()
        self.assertNotEqual(alert.process.wait(window_test.PATIENCE), 0)


class ACompositorWithLayers(unittest.TestCase):
    def test_has_the_helper_show_alerts_and_not_the_portal(self):
        with subprocess.Popen([PROGRAM, "whatever", "title", window_test.HELPER], stdin=subprocess.PIPE, stdout=subprocess.PIPE,
                              text=True) as alert:
            self.assertEqual(alert.communicate("enough\n", window_test.PATIENCE)[0], "shown by desktop\nnobody\n")


if __name__ == "__main__":
    unittest.main(verbosity=2)
