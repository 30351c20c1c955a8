#!/usr/bin/env python3
"""People type at a real window while an alert stands: nothing is granted by it, and nothing is refused without keys that choose.

Run on a display of its own, which Tools/Desktop/screen makes.
"""

import random
import time
import unittest

# It looks for what it needs, and takes the helper's path off the command line.
import window_test
from window_test import ALLOWED, ARMED_AFTER, REFUSED, TO_ALLOW, UNMOVED_FOR, xdotool

TYPINGS = 100
TEXTS = {
    "prose": ["the", "report", "is", "not", "done", "yet,", "Ada", "says:", "please", "allow", "a", "day", "more.\n", "No\n", "yes", "I"],
    "shell": ["ls\n", "cd", "src\n", "git", "commit", "-m", "'Allow it'\n", "make\n", "y\n", "sudo", "apt", "|", "grep", "a\n", "q", "\n"],
    "code": ["int", "main()", "{\n", "return", "a;", "}\n", "if", "(allowed)", "else\n", "def", "ask(self):\n", "# a", "x", "=", "1\n"],
}
MOVES = ["Tab", "Tab", "Tab", "shift+Tab", "Left", "Right", "Up", "Down", "alt+a", "alt+d", "alt+b", "alt+f"]


class TypingAtAWindow(unittest.TestCase):
    ask = window_test.AWindow.ask
    assert_unanswered = window_test.AWindow.assert_unanswered
    choose = window_test.AWindow.choose

    def type_words(self, chance, with_moves):
        """Some words of one kind at one speed, with a pause now and then in which a button could become ready."""
        words = TEXTS[chance.choice(list(TEXTS))]
        delay = chance.choice([2, 8, 25])
        for _ in range(chance.randint(2, 5)):
            text = " ".join(chance.choice(words) for _ in range(chance.randint(1, 4)))
            xdotool("type", "--delay", delay, "--", text + chance.choice(["", " "]))
            if with_moves and chance.random() < 0.7:
                xdotool("key", "--delay", delay, *chance.choices(MOVES, k=chance.randint(1, 4)))
            if chance.random() < 0.2:
                time.sleep(chance.uniform(0, 2 * ARMED_AFTER))
                xdotool("key", chance.choice(["Return", "space"]))

    def test_answers_nothing(self):
        alert = self.ask()
        chance = random.Random(20261122)
        for _ in range(TYPINGS):
            self.type_words(chance, with_moves=False)
            self.assertIsNone(alert.process.poll())
        self.assert_unanswered(alert, UNMOVED_FOR + 0.2)
        self.choose(TO_ALLOW)
        xdotool("key", "Return")
        self.assertEqual(alert.wait(), ALLOWED, "the window stood there all the time")

    def test_with_tabs_arrows_and_alt_allows_nothing(self):
        chance = random.Random(20261123)
        alert = self.ask()
        for _ in range(TYPINGS):
            self.type_words(chance, with_moves=True)
            if alert.process.poll() is not None:
                self.assertEqual(alert.wait(), REFUSED)
                alert = self.ask()


if __name__ == "__main__":
    unittest.main(verbosity=2)
