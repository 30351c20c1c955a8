#!/usr/bin/env python3
"""The account daemon asks in a window: real daemons, a sample application, keys on a real display.

Run on a display of its own, which Tools/Desktop/screen makes.
"""

import os
import pathlib
import subprocess
import sys
import unittest

PROJECT = pathlib.Path(__file__).resolve().parents[2]
BUILD = pathlib.Path(sys.argv.pop(1))

ASK_IN_A_WINDOW = """
palisade account add ada <"$XDG_RUNTIME_DIR/palisade-sandbox/master-token" >/dev/null
daemon=$(cat "$PALISADE_TRIAL/accountd.pid")
window() { xdotool search --onlyvisible --class "$WINDOW" >/dev/null 2>&1; }
until_window() { local try; for try in $(seq 400); do window && return; sleep 0.05; done; echo "no window"; }
# A second is twenty looks.
gone() { local try; for try in $(seq 20); do window || { echo "gone"; return; }; sleep 0.05; done; echo "still there"; }
request() { photos request --app 1234567890 --permission email; }
# Leads the keyboard that many steps on, and presses there when it has stood there for long enough.
press_after() {
  xdotool key $(for step in $(seq "$1"); do echo Tab; done)
  local try; for try in $(seq 20); do sleep 0.8; window || return 0; xdotool key Return; done
}
"""


def session(script, alert="desktop", window="palisade-alert"):
    """What the script prints, its errors among it."""
    environment = dict(os.environ, PALISADE_ALERT=alert, WINDOW=window, PALISADE_ANSWER="nothing", NO_COLOR="1")
    finished = subprocess.run([PROJECT / "Tools/Trial/session", BUILD, "bash", "-c", ASK_IN_A_WINDOW + script], env=environment,
                              text=True, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.STDOUT, timeout=120,
                              check=False)
    if "no window" in finished.stdout:
        raise AssertionError(finished.stdout)
    return finished.stdout


class AnApplicationThatAsks(unittest.TestCase):
    def test_is_granted_access_by_the_allow_button(self):
        output = session('palisade doctor; request & asking=$!; until_window; press_after 3; wait $asking; echo "status $?"; '
                         "palisade grants; kill $daemon")
        self.assertRegex(output, r"(?i)alert.*desktop")
        self.assertIn("status 0", output)
        self.assertIn("org.example.photos", output)

    def test_is_refused_by_the_other_button_and_not_asked_about_again(self):
        output = session('request & asking=$!; until_window; press_after 2; wait $asking; echo "first $?"; '
                         'request; echo "second $?"; kill $daemon')
        self.assertIn("first 1", output)
        self.assertIn("second 1", output)

    def test_and_whose_window_is_closed_leaves_nothing_behind(self):
        output = session('request & asking=$!; until_window; xdotool key Escape; wait $asking; echo "status $?"; '
                         "palisade grants; kill $daemon")
        self.assertIn("status 1", output)
        self.assertIn("No application has asked yet.", output)


@unittest.skipUnless(os.path.exists("/usr/share/xdg-desktop-portal/portals/gtk.portal"), "there is no xdg-desktop-portal-gtk here")
class AnApplicationThatAsksThroughThePortal(unittest.TestCase):
    def session(self, script):
        return session(script, alert="portal", window="xdg-desktop-portal-gtk")

    def test_is_granted_access_by_the_allow_button(self):
        output = self.session('palisade doctor; request & asking=$!; until_window; sleep 0.7; xdotool key Tab Return; wait $asking; '
                              'echo "status $?"; palisade grants; kill $daemon')
        self.assertRegex(output, r"(?i)alert.*portal \(org\.freedesktop\.impl\.portal\.desktop\.gtk\)")
        self.assertIn("status 0", output)
        self.assertIn("org.example.photos", output)

    def test_and_is_refused_by_the_other_button_leaves_nothing_behind(self):
        output = self.session('request & asking=$!; until_window; xdotool key Return; wait $asking; echo "status $?"; '
                              "palisade grants; kill $daemon")
        self.assertIn("status 1", output)
        self.assertIn("No application has asked yet.", output)

    def test_and_whose_dialog_is_closed_leaves_nothing_behind(self):
        output = self.session('request & asking=$!; until_window; xdotool key Escape; wait $asking; echo "status $?"; '
                              "palisade grants; kill $daemon")
        self.assertIn("status 1", output)
        self.assertIn("No application has asked yet.", output)

    def test_has_its_dialog_closed_when_it_leaves(self):
        output = self.session("exec 2>/dev/null; photos request --app 1234567890 --permission email & asking=$!; until_window; "
                              "kill -9 $asking; pkill -9 -P $asking; gone; kill $daemon")
        self.assertIn("gone", output)

    def test_has_its_dialog_closed_when_the_daemon_stops(self):
        output = self.session("exec 2>/dev/null; request & asking=$!; until_window; kill $daemon; gone; kill $asking")
        self.assertIn("gone", output)


class AWindow(unittest.TestCase):
    def test_goes_away_with_the_application_that_asked(self):
        output = session("exec 2>/dev/null; photos request --app 1234567890 --permission email & asking=$!; until_window; "
                         "kill -9 $asking; pkill -9 -P $asking; gone; kill $daemon")
        self.assertIn("gone", output)

    def test_goes_away_with_the_daemon(self):
        for signal in ("TERM", "KILL"):
            output = session(f"exec 2>/dev/null; request & asking=$!; until_window; kill -{signal} $daemon; gone; kill $asking")
            self.assertIn("gone", output, signal)


if __name__ == "__main__":
    unittest.main(verbosity=2)
