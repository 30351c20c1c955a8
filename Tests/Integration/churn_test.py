#!/usr/bin/env python3
"""An application that closes connections to the bus while its children still hold them is known all the same.

A child has every connection of its parent from its fork until it runs its program, which takes a while on a busy machine.
"""

import contextlib
import os
import select
import socket
import unittest

import trial
from accounts import GRANTED, Caller
from bus_wire import BusError, socket_of

trial.use_build_of_command_line()

# How long the daemon is watched while the child holds the connection. A daemon that is slower than that makes the test say less;
# it does not make it fail.
WHILE_HELD = 0.5


class Child:
    """A child that holds what this process has open, until it is let go."""

    def __init__(self):
        reading, self._writing = os.pipe()
        self._process = os.fork()
        if self._process == 0:
            os.close(self._writing)
            os.read(reading, 1)
            os._exit(0)
        os.close(reading)

    def let_go(self) -> None:
        if self._process:
            os.close(self._writing)
            os.waitpid(self._process, 0)
            self._process = 0


class AnApplicationThatClosesConnections(unittest.TestCase):
    def setUp(self):
        self.session = self.enterContext(trial.Trial(log="error"))
        self.session.start_accountd()
        self.session.add_account()
        with self.session.caller() as caller:
            self.assertEqual(caller.start_request().outcome()[0], GRANTED)

    @contextlib.contextmanager
    def closed_connection_in_child(self):
        closed = self.session.caller()
        child = Child()
        try:
            closed.close()
            yield child
        finally:
            child.let_go()

    def outcome(self, caller: Caller) -> int:
        return caller.start_request().outcome()[0]

    def test_is_known_when_a_child_lets_go_of_them_a_moment_later(self):
        with self.closed_connection_in_child() as child, self.session.caller() as caller:
            request = caller.start_request()
            answered, _, _ = select.select([caller], [], [], WHILE_HELD)
            child.let_go()
            self.assertEqual(request.outcome()[0], GRANTED)
            self.assertEqual(answered, [], "somebody was answered whose connection might be another process's")

    def test_is_known_while_it_opens_and_closes_more_of_them(self):
        with self.closed_connection_in_child() as child, self.session.caller() as caller:
            request = caller.start_request()
            for _ in range(50):
                self.session.caller().close()
            with self.session.caller(), self.session.caller():
                child.let_go()
                self.assertEqual(request.outcome()[0], GRANTED)

    def test_is_not_known_by_sockets_that_it_gains_while_the_daemon_waits(self):
        """The bus counts no connection that has no name yet."""
        with self.closed_connection_in_child(), self.session.caller() as caller, contextlib.ExitStack() as more:
            request = caller.start_request()
            select.select([caller], [], [], WHILE_HELD)
            for _ in range(3):
                more.enter_context(socket.socket(socket.AF_UNIX)).connect(socket_of(self.session.bus))
            with self.assertRaisesRegex(BusError, "UnknownCaller: The bus counts more connections"):
                request.outcome()

    def test_is_refused_for_good_on_a_connection_whose_owner_stays_in_doubt(self):
        with self.closed_connection_in_child() as child, self.session.caller() as caller:
            for _ in range(2):
                with self.assertRaisesRegex(BusError, "UnknownCaller: The bus counts more connections"):
                    self.outcome(caller)
                child.let_go()
            with self.session.caller() as another:
                self.assertEqual(self.outcome(another), GRANTED)


if __name__ == "__main__":
    unittest.main(verbosity=2)
