#!/usr/bin/env python3
"""A thousand connections of four applications ask the daemon at once."""

import json
import os
import pathlib
import subprocess
import sys
import unittest

import trial
from bus_wire import IS_SANITIZED, SLOWNESS
from trial import THIS_PROGRAM, wait_until

trial.use_build_of_command_line()

APPLICATIONS = ("album", "blog", "chess", "diary")
CONNECTIONS_EACH = 250
# What the allocator may keep of a crowd that was served before.
TOLERATED_GROWTH_KB = 2048


class Crowd:
    """The four applications. Each is this interpreter under a name of its own."""

    def __init__(self, session: trial.Trial):
        self._session = session
        self._environment = {"PYTHONHOME": sys.base_prefix, "PYTHONPATH": str(pathlib.Path(__file__).parent),
                             "PYTHONDONTWRITEBYTECODE": "1"}
        for name in APPLICATIONS:
            program = session.root / "bin" / name
            program.write_bytes(pathlib.Path(THIS_PROGRAM).read_bytes())
            program.chmod(0o755)
            session.add_client(name, str(program))

    def grant(self) -> None:
        """Has the person allow each application what it will ask for; keeps its token."""
        self._tokens = {name: self._say(name, "caller.start_request().outcome(); print(caller.credential())")
                        for name in APPLICATIONS}

    def _say(self, name: str, script: str) -> str:
        preamble = "import sys; from accounts import Caller; caller = Caller(sys.argv[1]); "
        process = self._session.start(self._session.root / "bin" / name, "-c", preamble + script, self._session.bus,
                                      environment=self._environment, stdout=subprocess.PIPE)
        return process.communicate(timeout=30 * SLOWNESS)[0].decode().strip()

    def ask(self) -> list[dict]:
        """Has all of them ask at once; what each application found."""
        program = pathlib.Path(__file__).with_name("crowd.py")
        clients = [f"org.example.{name}" for name in APPLICATIONS]
        crowd = []
        for name in APPLICATIONS:
            command = [str(self._session.root / "bin" / name), str(program), self._session.bus, str(CONNECTIONS_EACH),
                       self._tokens[name], *clients]
            crowd.append(subprocess.Popen(command, env=self._session.environment | self._environment, text=True,
                                          stdin=subprocess.PIPE, stdout=subprocess.PIPE))
        try:
            for step in ("ready", None):
                lines = [application.stdout.readline() for application in crowd]
                for application in crowd:
                    application.stdin.write("\n")
                    application.stdin.flush()
            return [json.loads(line) for line in lines]
        finally:
            for application in crowd:
                application.communicate(timeout=60 * SLOWNESS)


class AThousandConnections(unittest.TestCase):
    def setUp(self):
        self.session = self.enterContext(trial.Trial(log="error"))

    def test_are_each_answered_once_with_their_own_answers_and_leave_nothing_behind(self):
        crowd = Crowd(self.session)
        self.session.start_accountd()
        self.session.add_account()
        crowd.grant()

        # What threads and pools take is taken by the first crowds.
        for _ in range(2):
            self.expect_right_answers(crowd.ask())
        rest = self.memory()
        self.expect_right_answers(crowd.ask())
        # A sanitizer keeps what was freed, to see who still uses it.
        if not IS_SANITIZED:
            self.assertLess(self.memory(), rest + TOLERATED_GROWTH_KB, "kB that the daemon has taken for good")
        if os.geteuid() == 0:
            wait_until(lambda: self.descriptors() < 64, "the daemon lets go of its descriptors")

    def expect_right_answers(self, findings):
        self.assertEqual([finding["problems"] for finding in findings], [[]] * len(APPLICATIONS))
        answers = sum(finding["answers"] for finding in findings)
        seconds = max(finding["seconds"] for finding in findings)
        self.assertEqual(answers, 5 * CONNECTIONS_EACH * len(APPLICATIONS))
        print(f"{answers} answers in {seconds} s", flush=True)

    def memory(self) -> int:
        """The daemon's resident memory in kB."""
        status = pathlib.Path(f"/proc/{self.session.accountd.pid}/status").read_text(encoding="utf-8")
        return int(status.split("VmRSS:")[1].split()[0])

    def descriptors(self) -> int:
        return len(os.listdir(f"/proc/{self.session.accountd.pid}/fd"))


if __name__ == "__main__":
    unittest.main(verbosity=2)
