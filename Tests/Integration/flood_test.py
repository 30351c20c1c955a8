#!/usr/bin/env python3
"""Applications that ask without end: the user sees few questions of them, and everything else goes on as before."""

import collections
import subprocess
import unittest

import trial
from accounts import GRANTED, PENDING, REFUSED, WITHDRAWN
from bus_wire import BusError
from trial import wait_until

trial.use_build_of_command_line()

FLOOD = 10_000
MOST_REFUSALS = 3
MOST_UNANSWERED = 10
MOST_WAITING = 8
# Beyond what is granted, so it takes a question.
MORE = {"permissions": ("email", "user_photos")}


class AnApplication(unittest.TestCase):
    """Was granted access, so that a refusal of something more is not the last word."""

    settings = {}

    def setUp(self):
        self.session = self.enterContext(trial.Trial(answer="allow"))
        self.session.add_client("album")
        self.session.configure(**self.settings)
        self.session.start_accountd()
        self.session.add_account()
        self.caller = self.enterContext(self.session.caller())
        self.assertEqual(self.caller.start_request().outcome()[0], GRANTED)
        self.alerts_before = self.session.person.alerts

    def alerts(self) -> int:
        return self.session.person.alerts - self.alerts_before

    def ask(self) -> str | int:
        """What one more request comes to."""
        try:
            return self.caller.start_request(**MORE).outcome()[0]
        except BusError as error:
            self.refusal = error
            return error.name

    def ask_often(self, times: int) -> dict:
        return dict(collections.Counter(self.ask() for _ in range(times)))


class AnApplicationThatIsRefused(AnApplication):
    def test_ten_thousand_times_is_shown_three_times_and_keeps_what_it_was_granted(self):
        self.session.person.answer = "refuse"
        self.assertEqual(self.ask_often(FLOOD), {REFUSED: MOST_REFUSALS, "NotAsked": FLOOD - MOST_REFUSALS})
        self.assertEqual(self.alerts(), MOST_REFUSALS)
        history = self.caller.manage("History")[0]
        self.assertEqual([(row["granted"], row["prompted"], row["count"]) for row in history],
                         [(False, False, FLOOD - MOST_REFUSALS), (False, True, MOST_REFUSALS), (True, True, 1)])
        self.assertRegex(self.refusal.message, r"turned this application's requests down .* Ask again in (60|59) minutes\.")

        self.assertEqual(self.caller.start_request().outcome()[0], GRANTED)
        self.assertEqual(self.caller.grants()["org.example.photos"]["permissions"], ["email"])
        history, = self.caller.manage("History", "a{sv}", [{"limit": ("u", 2 * FLOOD)}])
        self.assertEqual(sum(row["count"] for row in history if row["prompted"]), 1 + MOST_REFUSALS)
        self.assertEqual(self.session.daemon_log().count("turned down too often"), 1)

    def test_many_times_at_once_is_shown_three_times(self):
        self.session.person.answer = "refuse"
        requests = [self.caller.start_request(**MORE) for _ in range(500)]
        endings = collections.Counter()
        for request in requests:
            try:
                word, results = request.outcome()
                endings[word, results["error_domain"].rpartition(".")[2]] += 1
            except BusError as error:
                endings[error.name] += 1
        self.assertEqual(self.alerts(), MOST_REFUSALS)
        refused = [number for ending, number in endings.items() if ending[0] == REFUSED]
        self.assertEqual(refused, [MOST_REFUSALS])
        # Those that waited for their turn hear by signal what the others hear by the reply.
        self.assertGreater(endings[WITHDRAWN, "NotAsked"], 0)
        self.assertEqual(sum(endings.values()) - endings[WITHDRAWN, "NotAsked"] - endings["NotAsked"] - endings["TooManyRequests"],
                         MOST_REFUSALS)

    def test_too_often_is_asked_about_again_when_its_access_is_authorized(self):
        self.session.person.answer = "refuse"
        self.assertEqual(self.ask_often(5), {REFUSED: MOST_REFUSALS, "NotAsked": 5 - MOST_REFUSALS})
        self.assertEqual(self.caller.start_authorize("org.example.photos").outcome()[0], GRANTED)
        self.session.person.answer = "allow"
        self.assertEqual(self.ask(), GRANTED)

    def test_too_often_delays_no_other_application(self):
        self.session.person.answer = "refuse"
        self.assertEqual(self.ask(), REFUSED)
        self.ask_often(5)
        self.session.person.answer = "allow"
        self.assertIn("Access is granted.", self.session.run("album", "request", "--app", "1", "--permission", "email").stdout)


    def test_while_some_of_its_requests_wait_has_them_end_with_a_reason(self):
        ask = ("album", "request", "--app", "1", "--permission")
        self.assertIn("Access is granted.", self.session.run(*ask, "email").stdout)
        self.session.person.answer = "nothing"
        waiting = [self.session.start(*ask, "user_photos", stdout=subprocess.PIPE, stderr=subprocess.STDOUT) for _ in range(6)]
        for process in waiting:
            self.assertIn("The user is being asked", process.stdout.readline().decode())
        self.session.person.answer = "refuse"
        endings = collections.Counter(process.communicate(timeout=20)[0].decode().partition(".")[0] for process in waiting)
        self.assertEqual(endings, {"Access is refused": MOST_REFUSALS, "Nobody was asked": 6 - MOST_REFUSALS})


class AnApplicationThatIsNotAnswered(AnApplication):
    def test_is_shown_ten_times(self):
        self.session.person.answer = "close"
        self.assertEqual(self.ask_often(200), {WITHDRAWN: MOST_UNANSWERED, "NotAsked": 200 - MOST_UNANSWERED})
        self.assertEqual(self.alerts(), MOST_UNANSWERED)

    def test_because_it_withdraws_its_requests_is_shown_ten_times(self):
        self.session.person.answer = "nothing"
        for number in range(1, MOST_UNANSWERED + 1):
            request = self.caller.start_request(**MORE)
            self.assertEqual(request.reply()[0], PENDING)
            self.session.person.wait_for_alert(self.alerts_before + number)
            request.close()
            self.assertEqual(request.response()[0], WITHDRAWN)
        self.assertEqual(self.ask_often(10), {"NotAsked": 10})
        self.assertEqual(self.alerts(), MOST_UNANSWERED)


class WithoutACoolDown(AnApplication):
    settings = {"cool_down_after_refusals": 0}

    def test_an_application_is_shown_whenever_it_asks(self):
        self.session.person.answer = "refuse"
        self.assertEqual(self.ask_often(20), {REFUSED: 20})
        self.assertEqual(self.alerts(), 20)


class ManyApplications(unittest.TestCase):
    def test_at_once_wait_in_a_bounded_queue(self):
        count = 12
        session = self.enterContext(trial.Trial(answer="nothing"))
        for number in range(count):
            session.add_client(f"app{number}")
        session.start_accountd()
        session.add_account()
        asking = [session.start(f"app{number}", "request", "--app", "1", "--permission", "email", stdout=subprocess.PIPE,
                                stderr=subprocess.STDOUT) for number in range(count)]

        def ended():
            return [process for process in asking if process.poll() is not None]

        too_many = count - MOST_WAITING - 1
        wait_until(lambda: len(ended()) == too_many, "some are told that too many wait")
        for process in ended():
            self.assertIn("8 questions wait for the user already. Ask again when some are answered.",
                          process.stdout.read().decode())
        session.person.wait_for_alert(1)
        self.assertEqual(session.person.alerts, 1)

        for number in range(1, MOST_WAITING + 2):
            session.person.wait_for_alert(number)
            session.person.press(b"\x1b")
            wait_until(lambda count=too_many + number: len(ended()) == count, "one more has its answer")
        self.assertEqual(session.person.alerts, MOST_WAITING + 1)


if __name__ == "__main__":
    unittest.main(verbosity=2)
