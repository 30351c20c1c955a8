#!/usr/bin/env python3
"""The daemon is killed at every point of each operation that changes what is granted, and started again.

Real daemon, bus, stores, vault and server. The points are the daemon's calls that others can see (KillPoint.cpp): an operation is
begun again and again from the same state, and ended one call later each time, until it comes to its end. What a kill has left half
done is mended by the next start; that start is killed too, at every seventh of its points.
"""

import concurrent.futures
import dataclasses
import pathlib
import shutil
import sqlite3
import unittest
from typing import Callable

import trial
from accounts import FACEBOOK, GRANTED, PENDING, REFUSED, WITHDRAWN, Caller
from bus_wire import BusError
from kill_points import KillPoints, Stores

trial.use_build_of_command_line()

LEAST_POINTS = 200
# A start makes many calls, most of which write nothing.
MENDING_STEP = 7
PHOTOS = "org.example.photos"
OTHERS = {"mail": "2000000001", "calendar": "2000000002"}
APPS = {PHOTOS: "1234567890"} | {f"org.example.{name}": app for name, app in OTHERS.items()}
BASIC, MORE = {"email"}, {"email", "user_photos"}
EVERYBODY = {client: BASIC for client in APPS}
OTHERS_ONLY = {client: BASIC for client in APPS if client != PHOTOS}

# Each grant that stands at the beginning, with its permissions.
STATES = {"account": {}, "granted": EVERYBODY, "refused": OTHERS_ONLY}


@dataclasses.dataclass
class Operation:
    name: str
    state: str
    carry_out: Callable[[Caller], bool]
    """Answers whether the daemon said that it was done."""
    granted: dict[str, set[str]]
    """Each grant that stands at the end."""
    answer: str = "allow"
    """What the person answers, if they are asked."""
    lanes: int = 1
    """How many sessions share the operation's points."""


def request(permissions: set[str]) -> Callable[[Caller], bool]:
    return lambda caller: caller.start_request(permissions=sorted(permissions)).outcome()[0] == GRANTED


def be_refused(caller: Caller) -> bool:
    return caller.start_request().outcome()[0] == REFUSED


def authorize(caller: Caller) -> bool:
    return caller.start_authorize(PHOTOS).outcome()[0] == GRANTED


def revoke(caller: Caller) -> bool:
    caller.manage("Revoke", "ss", [FACEBOOK, PHOTOS])
    return True


def revoke_all(caller: Caller) -> bool:
    caller.manage("RevokeAll", "s", [FACEBOOK])
    return True


OPERATIONS = [
    Operation("grant", "account", request(BASIC), {PHOTOS: BASIC}, lanes=2),
    Operation("extend", "granted", request(MORE), EVERYBODY | {PHOTOS: MORE}, lanes=2),
    Operation("refuse", "account", be_refused, {}, answer="refuse"),
    Operation("authorize", "refused", authorize, EVERYBODY),
    Operation("revoke", "granted", revoke, OTHERS_ONLY),
    Operation("revoke all", "granted", revoke_all, {}),
]


def permissions_granted(caller: Caller) -> dict[str, set[str]]:
    return {client: set(row["permissions"]) for client, row in caller.grants().items() if row["granted"]}


class Sweep:
    """A session in which an operation is cut at every so many of its points."""

    def __init__(self, operation: Operation, first: int):
        self._operation = operation
        self._first = first
        self.places: list[str] = []
        self.problems: list[str] = []

    def run(self) -> "Sweep":
        with trial.Trial(log="error") as self._trial:
            self._kill_points = KillPoints(self._trial)
            self._snapshot = self._trial.root / "snapshot"
            # The first state that has to be mended.
            self._half_done = self._trial.root / "half-done"
            self._prepare()
            number = self._first
            while self._cuts_at(number):
                number += self._operation.lanes
            number = self._first
            while self._half_done.exists() and self._cuts_mending_at(number):
                number += MENDING_STEP * self._operation.lanes
        return self

    def _start(self) -> None:
        self._trial.start_accountd(environment=self._kill_points.environment)

    def _prepare(self) -> None:
        """Makes the state from which the operation begins."""
        for name in OTHERS:
            self._trial.add_client(name)
        self._start()
        self._trial.add_account()
        if self._operation.state != "account":
            for name, app in OTHERS.items():
                answer = self._trial.run(name, "request", "--app", app, "--permission", "email")
                if answer.returncode != 0:
                    raise RuntimeError(answer.stdout)
            with self._trial.caller() as caller:
                request(BASIC)(caller)
                if self._operation.state == "refused":
                    revoke(caller)
        self._trial.kill_accountd()
        with sqlite3.connect(self._trial.state / "outbox.sqlite") as outbox:
            outbox.execute("DELETE FROM invalidations")
        outbox.close()
        shutil.copytree(self._trial.state, self._snapshot, ignore=shutil.ignore_patterns("*-shm"))

    def _cuts_at(self, number: int) -> bool:
        """Whether the operation has a point of that number."""
        self._restore(self._snapshot)
        self._kill_points.arm(0)
        self._start()
        self._trial.person.answer = self._operation.answer
        is_acknowledged = self._carry_out(number)
        call = self._kill_points.fatal_call()
        if not call:
            self._trial.kill_accountd()
        self._trial.accountd.wait()

        place = f"{self._operation.name}, killed before call {number}, {call or 'at rest'}"
        left = Stores(self._trial.state, self._trial.root / "left")
        if left.are_half_done() and not self._half_done.exists():
            shutil.copytree(self._trial.state, self._half_done, ignore=shutil.ignore_patterns("*-shm"))
        self._look_after(place, is_acknowledged, left)
        if call:
            self.places.append(place)
        return bool(call)

    def _cuts_mending_at(self, number: int) -> bool:
        """Whether the start that mends what is half done has a point of that number."""
        self._restore(self._half_done)
        left = Stores(self._trial.state, self._trial.root / "left")
        self._kill_points.arm(number)
        try:
            self._start()
            with self._trial.caller() as caller:
                caller.grants()
        except (RuntimeError, BusError):
            pass
        call = self._kill_points.fatal_call()
        if not call:
            self._trial.kill_accountd()
        self._trial.accountd.wait()
        place = f"{self._operation.name}, killed and killed again while it is mended, before call {number}, {call or 'at rest'}"
        self._look_after(place, False, left)
        if call:
            self.places.append(place)
        return bool(call)

    def _restore(self, state: pathlib.Path) -> None:
        shutil.rmtree(self._trial.state)
        shutil.copytree(state, self._trial.state)

    def _look_after(self, place: str, is_acknowledged: bool, left: Stores) -> None:
        """Starts the daemon again, notes what is wrong then, and ends it."""
        self._kill_points.arm(0)
        self._trial.person.answer = "nothing"
        self._start()
        self.problems += [f"{place}: {problem}" for problem in self._problems(is_acknowledged, left)]
        self._trial.kill_accountd()

    def _carry_out(self, number: int) -> bool:
        """Whether the operation was acknowledged."""
        is_acknowledged = False
        with self._trial.caller() as caller:
            caller.listen()
            # From here on the daemon knows who this is; nothing of that is to be counted.
            caller.grants()
            self._kill_points.arm(number)
            try:
                is_acknowledged = self._operation.carry_out(caller)
                caller.grants()
            except BusError as error:
                # The answer comes first, and the signals follow: the daemon may be gone by the next call.
                if error.name not in ("NoReply", "ServiceUnknown"):
                    raise
        return is_acknowledged

    def _problems(self, is_acknowledged: bool, left: Stores):
        """What is wrong after the daemon has been started again."""
        before, after = STATES[self._operation.state], self._operation.granted
        with self._trial.caller() as caller:
            caller.listen()
            granted = permissions_granted(caller)
            if is_acknowledged and granted != after:
                yield f"it was acknowledged, and is lost: {granted}"
            if granted not in (before, after):
                yield f"half of it is done: {granted}"
            now = Stores(self._trial.state, self._trial.root / "now")
            yield from now.damage()
            if now.token_holders() != set(granted):
                yield f"grants and tokens are not the same: {set(granted)}, {now.token_holders()}"
            for client in (left.token_holders() | left.granted()) - set(granted):
                if APPS[client] not in now.pending():
                    yield f"nobody will take the token of {client} back"
            for client in granted:
                if APPS[client] in now.pending():
                    yield f"the token of {client} will be made invalid, and the grant stands"
            is_refused = is_acknowledged and self._operation.answer == "refuse"
            yield from self._next_request_problems(caller, PHOTOS in granted, is_refused)

    @staticmethod
    def _next_request_problems(caller: Caller, is_granted: bool, is_refused: bool):
        asked = caller.start_request()
        word, _ = asked.reply()
        if is_granted:
            if word != GRANTED:
                yield f"the next request of a granted application is answered {word}"
            try:
                caller.credential()
            except BusError as error:
                yield f"the grant is worth nothing: {error}"
        elif word == PENDING:
            asked.close()
            if asked.response()[0] != WITHDRAWN:
                yield "the next request cannot be withdrawn"
            if is_refused:
                yield "the person's refusal is lost"
        elif word != REFUSED:
            yield f"the next request of an application without a grant is answered {word}"


class ADaemonThatIsKilled(unittest.TestCase):
    def test_has_done_all_of_an_operation_or_nothing_and_keeps_what_it_acknowledged(self):
        sweeps = [Sweep(operation, first) for operation in OPERATIONS for first in range(1, operation.lanes + 1)]
        with concurrent.futures.ThreadPoolExecutor(len(sweeps)) as pool:
            done = list(pool.map(Sweep.run, sweeps))
        places = [place for sweep in done for place in sweep.places]
        problems = [problem for sweep in done for problem in sweep.problems]
        print(f"{len(places)} points", flush=True)
        self.assertEqual(problems, [], "\n".join(problems))
        self.assertGreaterEqual(len(places), LEAST_POINTS)


class AnAdditionOfAnAccountThatIsCutOff(unittest.TestCase):
    def test_can_be_repeated_until_the_account_can_be_used(self):
        points = 0
        with trial.Trial(log="error") as session:
            kill_points = KillPoints(session)
            while True:
                shutil.rmtree(session.state, ignore_errors=True)
                kill_points.arm(0)
                session.start_accountd(environment=kill_points.environment)
                with session.caller() as caller:
                    caller.grants()
                    kill_points.arm(points + 1)
                    try:
                        caller.add_account("ada", session.master_token)
                    except BusError as error:
                        self.assertEqual(error.name, "NoReply")
                call = kill_points.fatal_call()
                kill_points.arm(0)
                if not call:
                    break
                points += 1
                session.accountd.wait()
                session.start_accountd(environment=kill_points.environment)
                with self.subTest(f"killed before call {points}, {call}"), session.caller() as caller:
                    caller.listen()
                    try:
                        caller.add_account("ada", session.master_token)
                    except BusError as error:
                        self.assertIn("already", str(error))
                    self.assertTrue(request(BASIC)(caller))
                session.kill_accountd()
        self.assertGreater(points, 10)


if __name__ == "__main__":
    unittest.main(verbosity=2)
