#!/usr/bin/env python3
"""A connection to the bus outlives the process that made it, and another application gets that process's number: whoever holds
the connection is not taken for that application.

The numbers of processes are turned round in a PID namespace of the test's own, so that an ordinary user can.
"""

import contextlib
import os
import pathlib
import signal
import socket
import subprocess
import sys
import time
import unittest

import trial
from accounts import GRANTED, MANAGER, NAME, OBJECT, Caller, Request
from bus_wire import BusError, socket_of
from pinning_bus import PinningBus
from trial import THIS_PROGRAM, wait_until

MARK = "PALISADE_TEST_HAS_NUMBERS_OF_ITS_OWN"
NUMBERS = pathlib.Path("/proc/sys/kernel/ns_last_pid")
# The application whose identity is wanted: the interpreter under another name, with a connection of its own.
VICTIM = "from accounts import Caller; import sys; caller = Caller(sys.argv[1]); print('ready', flush=True); sys.stdin.read()"
NOT_A_CLIENT = "import sys; print('ready', flush=True); sys.stdin.read()"


def take_numbers_of_our_own() -> None:
    """Starts this test again as the first process of a PID namespace."""
    if os.environ.pop(MARK, None):
        return
    user = [] if os.geteuid() == 0 else ["--user", "--map-root-user"]
    os.environ[MARK] = "1"
    os.execvp("unshare", ["unshare", *user, "--pid", "--fork", "--kill-child", "--mount-proc", sys.executable, *sys.argv])


class Inherited(Caller):
    """A connection that another process has made. It has its name, or gets it when `say_hello` is called."""

    def __init__(self, connected: socket.socket, name: str = ""):
        self._socket = connected
        self._serial = 1000
        self._received = bytearray()
        self._descriptors = []
        self.inbox = []
        self.name = name

    def say_hello(self) -> None:
        self._socket.sendall(b"\0AUTH EXTERNAL " + str(os.getuid()).encode().hex().encode() + b"\r\n")
        self._expect(b"OK")
        self._socket.sendall(b"BEGIN\r\n")
        self.name, = self.call("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "Hello")


def connect_and_die(bus: str, says_hello: bool, pin=lambda name, process: None) -> tuple[int, Inherited]:
    """The number of a process that is no more, and the connection that it leaves. `pin` is called while the process lives."""
    here, there = socket.socketpair()
    process = os.fork()
    if process == 0:
        try:
            name = b"none"
            if says_hello:
                caller = Caller(bus)
                name, descriptor = caller.name.encode(), caller.fileno()
            else:
                connected = socket.socket(socket.AF_UNIX)
                connected.connect(socket_of(bus))
                descriptor = connected.fileno()
            here.close()
            socket.send_fds(there, [name], [descriptor])
            there.recv(1)
        finally:
            os._exit(0)
    there.close()
    name, descriptors, _, _ = socket.recv_fds(here, 256, 1)
    pin(name.decode(), process)
    here.close()
    os.waitpid(process, 0)
    return process, Inherited(socket.socket(fileno=descriptors[0]), name.decode() if says_hello else "")


def ticks() -> int:
    """The clock that the starts of processes are noted by."""
    return time.clock_gettime_ns(time.CLOCK_BOOTTIME) // (1_000_000_000 // os.sysconf("SC_CLK_TCK"))


def let_daemon_note_names(caller: Caller) -> None:
    """Returns when the daemon has noted every name that is there, and whatever starts now started later than that.

    The bus keeps the order: what it announced before this call, the daemon has handled when it answers.
    """
    caller.call(NAME, OBJECT, "org.freedesktop.DBus.Properties", "Get", "ss", [MANAGER, "version"])
    now = ticks()
    wait_until(lambda: ticks() > now, "the clock goes on")


class DeadProcesses(unittest.TestCase):
    reason = "has ended"

    def setUp(self):
        self.session = self.enterContext(trial.Trial(log="error"))
        self.album = self.session.root / "bin/album"
        self.album.write_bytes(pathlib.Path(THIS_PROGRAM).read_bytes())
        self.album.chmod(0o755)
        self.session.add_client("album", str(self.album))
        self.start_daemon()
        self.session.add_account()
        self.assertEqual(self.ask_as_album(), GRANTED)

    def start_daemon(self) -> None:
        self.session.start_accountd()

    def pin(self, name: str, process: int) -> None:
        """A connection was made by a process that lives."""

    def run_album(self, script: str, **more) -> subprocess.Popen:
        environment = {"PYTHONHOME": sys.base_prefix, "PYTHONPATH": str(pathlib.Path(__file__).parent),
                       "PYTHONDONTWRITEBYTECODE": "1"}
        return subprocess.Popen([self.album, "-c", script, self.session.bus], env=self.session.environment | environment,
                                stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True, **more)

    def end(self, process: subprocess.Popen) -> None:
        process.kill()
        process.wait()
        process.stdin.close()
        process.stdout.close()

    def album_with_number(self, number: int, script: str = VICTIM, **more) -> subprocess.Popen | None:
        """The application, started until it has the number; None when something else that runs got it."""
        NUMBERS.write_text(str(number - 1), encoding="ascii")
        album = self.run_album(script, **more)
        if album.pid == number:
            album.stdout.readline()
            return album
        self.end(album)
        return None

    def reuse(self, says_hello: bool, script: str, before_start, **more) -> tuple[subprocess.Popen, Inherited] | None:
        """The application that got a dead process's number, and that process's connection; None when another got it."""
        number, connection = connect_and_die(self.session.bus, says_hello, self.pin)
        before_start()
        album = self.album_with_number(number, script, **more)
        if album is None:
            connection.close()
            return None
        return album, connection

    def attempt_often(self, times: int, says_hello: bool, script: str = VICTIM, before_start=lambda: None,
                      before_call=lambda: None, **more) -> None:
        """Gets so many numbers; then the holder of each connection must be refused. All ask at once: a refusal takes a while."""
        with contextlib.ExitStack() as ends:
            connections = []
            for _ in range(10 * times):
                if len(connections) == times:
                    break
                if reused := self.reuse(says_hello, script, before_start, **more):
                    album, connection = reused
                    ends.callback(self.end, album)
                    connections.append(ends.enter_context(connection))
            self.assertEqual(len(connections), times)
            before_call()
            for connection in connections:
                if not says_hello:
                    connection.say_hello()
            for _ in range(3):
                for request in [connection.start_request() for connection in connections]:
                    self.check_refusal(request)
        print(f"{times} numbers reused", flush=True)

    def check_refusal(self, request: Request) -> None:
        with self.assertRaises(BusError, msg="the holder of the connection is taken for album") as refused:
            request.outcome()
        self.assertEqual(refused.exception.name, "UnknownCaller", refused.exception)
        self.assertRegex(refused.exception.message, self.reason)

    def ask_as_album(self) -> int:
        album = self.run_album("from accounts import Caller; import sys; print(Caller(sys.argv[1]).start_request().outcome()[0])")
        return int(album.communicate(timeout=30)[0])


class AConnectionOfADeadProcess(DeadProcesses):
    def test_is_nobodys_in_two_hundred_attempts(self):
        for _ in range(10):
            self.attempt_often(20, True)

    def test_is_nobodys_when_its_name_comes_after_the_other_application_has_started(self):
        self.attempt_often(20, False)

    def test_is_nobodys_when_the_other_application_has_a_connection_to_spare(self):
        """A launcher that leaves its own connection open in what it starts. The time alone tells the two apart."""
        with self.session.caller() as launcher:
            self.attempt_often(20, True, before_start=lambda: let_daemon_note_names(launcher), pass_fds=[launcher.fileno()])

    def test_is_nobodys_when_it_is_older_than_the_daemon(self):
        def start_daemon_again():
            self.session.kill_accountd()
            self.session.start_accountd()

        for script in (VICTIM, NOT_A_CLIENT):
            self.attempt_often(3, True, script, before_call=start_daemon_again)

    def test_does_not_keep_the_other_application_from_its_own(self):
        number, connection = connect_and_die(self.session.bus, True)
        with self.session.caller() as bystander:
            let_daemon_note_names(bystander)
        NUMBERS.write_text(str(number - 1), encoding="ascii")
        self.assertEqual(self.ask_as_album(), GRANTED)
        connection.close()


class AConnectionOfADeadProcessOnABusThatPins(DeadProcesses):
    """The bus hands out the process that made a connection, not only its number."""

    reason = "^The process that made the caller's connection has ended.$"

    def start_daemon(self):
        self.bus = PinningBus(self.session.bus, self.session.root)
        daemon = self.session.start_accountd(environment={"DBUS_SESSION_BUS_ADDRESS": self.bus.address})

        def end():
            daemon.terminate()
            self.assertEqual(daemon.wait(), 0)
            self.bus.close()

        self.addCleanup(end)

    def pin(self, name, process):
        self.bus.pins[name] = os.pidfd_open(process)
        self.addCleanup(os.close, self.bus.pins[name])

    def test_is_nobodys(self):
        self.attempt_often(20, True)

    def test_does_not_keep_the_other_application_from_its_own(self):
        self.attempt_often(1, True)
        self.assertEqual(self.ask_as_album(), GRANTED)


if __name__ == "__main__":
    take_numbers_of_our_own()
    trial.use_build_of_command_line()
    unittest.main(verbosity=2)
