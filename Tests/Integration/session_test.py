#!/usr/bin/env python3
"""The account daemon as its users meet it: applications ask over D-Bus, a person answers, tokens come over TLS.

Each test is one session of its own (Tools/Trial/session) in which a small shell script plays the applications. The script's output
is what the test looks at.
"""

import os
import pathlib
import re
import subprocess
import sys
import unittest

PROJECT = pathlib.Path(__file__).resolve().parents[2]
BUILD = pathlib.Path(sys.argv.pop(1)) if len(sys.argv) > 1 else PROJECT / "build/debug"

ASK = "photos request --app 1234567890 --permission email --permission user_photos"
ADD_ACCOUNT = 'palisade account add ada <"$XDG_RUNTIME_DIR/palisade-sandbox/master-token" >/dev/null\n'
# Waits until the bus has noticed that the account daemon is gone: a new one could not take its name before.
WHEN_GONE = ("while gdbus call --session -d org.freedesktop.DBus -o /org/freedesktop/DBus -m org.freedesktop.DBus.NameHasOwner "
             "com.veltran.Accounts1 | grep -q true; do sleep 0.05; done\n")
# Waits until the alert stands on the screen.
WHEN_ASKED = 'until [ -e "$PALISADE_TRIAL/asked" ]; do sleep 0.05; done\n'


def session(script: str, answer: str = "allow", log: str = "notice") -> str:
    """What the script prints, its errors among it."""
    environment = dict(os.environ, PALISADE_ANSWER=answer, PALISADE_LOG=log, NO_COLOR="1", LC_ALL="C.UTF-8")
    finished = subprocess.run([PROJECT / "Tools/Trial/session", BUILD, "bash", "-c", script], env=environment, text=True,
                              stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.STDOUT, timeout=120, check=False)
    return finished.stdout


class AnApplicationThatAsks(unittest.TestCase):
    def test_is_granted_access_that_works_at_the_server_until_it_is_taken_back(self):
        environment = dict(os.environ, PALISADE_ANSWER="allow", NO_COLOR="1", LC_ALL="C.UTF-8")
        story = subprocess.run([PROJECT / "Tools/Trial/session", BUILD], env=environment, text=True, stdin=subprocess.DEVNULL,
                               stdout=subprocess.PIPE, stderr=subprocess.STDOUT, timeout=120, check=True).stdout
        self.assertIn("“Photos” would like to use your Facebook account to see your basic profile", story)
        for line in ("Application  Photos", "org.example.photos", "Identity     Only claimed (not sandboxed)", "Account      ada"):
            self.assertIn(line, story)
        self.assertIn('"audience":"ALL_FRIENDS"', story)
        self.assertEqual(story.count("No terminal here"), 1, "the second request is answered from the grant")
        self.assertRegex(story, r"1234567890 +confirmed")
        self.assertIn("was not granted access", story)

    def test_and_is_refused_stays_refused_without_a_second_question(self):
        output = session(ADD_ACCOUNT + f'{ASK}; echo "first $?"; {ASK}; echo "second $?"; palisade history --json', answer="refuse")
        self.assertIn("first 1", output)
        self.assertIn("second 1", output)
        self.assertEqual(output.count('"prompted":true'), 1)

    def test_and_gets_nobodys_answer_leaves_nothing_behind(self):
        output = session(ADD_ACCOUNT + f"{ASK}; echo \"first $?\"; palisade grants", answer="close")
        self.assertIn("Nobody answered.", output)
        self.assertIn("first 1", output)
        self.assertIn("No application has asked yet.", output)

    def test_without_an_account_learns_that_there_is_none(self):
        output = session(f"{ASK} --json; echo \"status $?\"")
        self.assertIn('"error_code":6', output)
        self.assertIn("status 1", output)

    def test_to_publish_without_an_audience_learns_that_its_options_are_invalid(self):
        output = session(ADD_ACCOUNT + "photos request --app 1 --permission publish_stream --json")
        self.assertIn('"error_code":8', output)

    def test_learns_that_the_server_is_down_and_is_granted_nothing(self):
        output = session(ADD_ACCOUNT + f"palisade-sandbox fault reset --times 0 >/dev/null; {ASK}; echo \"status $?\"; palisade grants")
        self.assertIn("status 1", output)
        self.assertIn("No application has asked yet.", output)


class AnAlert(unittest.TestCase):
    def test_goes_away_with_the_application_that_asked(self):
        output = session(ADD_ACCOUNT + f"{ASK} & asking=$!\n" + WHEN_ASKED + "kill -9 $asking; wait $asking 2>/dev/null\n"
                         f"rm \"$PALISADE_TRIAL/asked\"; {ASK} & \n" + WHEN_ASKED + "palisade grants", answer="nothing")
        self.assertEqual(output.count("No terminal here"), 2, "the second alert could stand because the first was taken down")
        self.assertIn("No application has asked yet.", output)

    def test_goes_away_with_a_revocation_and_leaves_nothing_granted(self):
        output = session(ADD_ACCOUNT + f"{ASK} & asking=$!\n" + WHEN_ASKED +
                         "palisade revoke org.example.photos; wait $asking; echo \"status $?\"; palisade grants", answer="nothing")
        self.assertIn("status 1", output)
        self.assertIn("taken back while this request waited", output)
        self.assertIn("No application has asked yet.", output)

    def test_delays_nobody_else(self):
        output = session(ADD_ACCOUNT + f"{ASK} & \n" + WHEN_ASKED + "palisade account list; palisade history", answer="nothing")
        self.assertIn("ada", output)
        self.assertIn("Nothing has been decided yet.", output)

    def test_ends_with_the_daemon_and_the_application_is_told(self):
        output = session(ADD_ACCOUNT + f"{ASK} & asking=$!\n" + WHEN_ASKED +
                         'kill -9 "$(cat "$PALISADE_TRIAL/accountd.pid")"; wait $asking; echo "status $?"', answer="nothing")
        self.assertIn("Nothing was granted.", output)
        self.assertIn("status 2", output)


class TheDaemon(unittest.TestCase):
    def test_keeps_grants_and_credentials_through_a_kill(self):
        output = session(ADD_ACCOUNT + f"{ASK}; before=$(photos token)\n"
                         'kill -9 "$(cat "$PALISADE_TRIAL/accountd.pid")"\n' + WHEN_GONE +
                         "accountd 2>/dev/null & until palisade grants >/dev/null 2>&1; do sleep 0.05; done\n"
                         '[ "$before" = "$(photos token)" ] && echo same token\n' + f"{ASK}; kill %1")
        self.assertIn("same token", output)
        self.assertEqual(output.count("Access is granted."), 2)
        self.assertEqual(output.count("No terminal here"), 1)

    def test_is_one_a_session(self):
        output = session("accountd; echo \"status $?\"; palisade account list")
        self.assertIn("accountd: Another account daemon serves this session already.", output)
        self.assertIn("status 1", output)
        self.assertIn("There are no accounts.", output)

    def test_writes_no_token_into_its_log_nor_plainly_into_its_stores(self):
        output = session(ADD_ACCOUNT + f"{ASK}; token=$(photos token); master=$(cat \"$XDG_RUNTIME_DIR/palisade-sandbox/master-token\")\n"
                         'grep -c "Access request response" "$PALISADE_TRIAL/accountd.log"\n'
                         'grep -raF -e "$token" -e "$master" "$PALISADE_TRIAL"/*.log "$XDG_STATE_HOME" && echo leaked; true', log="debug")
        self.assertRegex(output, r"(?m)^1$", "the answer is logged")
        self.assertNotIn("leaked", output)

    def test_answers_wrong_arguments_with_a_sentence(self):
        manager = ("gdbus call --session -d com.veltran.Accounts1 -o /com/veltran/Accounts1 "
                   "-m com.veltran.Accounts1.Manager.")
        cases = {
            manager + "RequestAccess nonsense '{}' '{}'": "InvalidArguments: No plug-in serves the account type 'nonsense'",
            manager + "RequestAccess com.veltran.accounttype.facebook '{}' \"{'handle_token': <'a/b'>}\"":
                "InvalidArguments: 'handle_token' may hold",
            manager + "RequestAccess com.veltran.accounttype.facebook '{}' \"{'handle_token': <1>}\"":
                "InvalidArguments: The option 'handle_token' must be a string.",
            manager + "ListAccounts '' \"{'colour': <'red'>}\"": "InvalidArguments: There is no option 'colour'",
            manager + "Revoke com.veltran.accounttype.facebook org.example.nobody '{}'": "NoSuchClient",
            manager + "RemoveAccount 7 '{}'": "NoSuchAccount",
        }
        output = session("\n".join(f"{command} 2>&1" for command in cases))
        for expected in cases.values():
            with self.subTest(expected):
                self.assertIn(expected, output)

    def test_reads_a_preference_that_the_command_line_wrote(self):
        output = session(ADD_ACCOUNT + f"palisade preferences set FacebookIgnoreAccessRequests true; {ASK}; echo \"status $?\"\n"
                         f"palisade preferences set FacebookIgnoreAccessRequests false; {ASK}; echo \"status $?\"")
        self.assertEqual(re.findall(r"status (\d)", output), ["1", "0"])


if __name__ == "__main__":
    unittest.main(verbosity=2)
