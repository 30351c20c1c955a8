"""A session for tests: a private bus, a Facebook server, both daemons and a person, each of which a test can start, stop and alter."""

import contextlib
import json
import os
import pathlib
import pty
import select
import shutil
import signal
import sqlite3
import subprocess
import sys
import tempfile
import termios
import threading
import time

from accounts import NAME, Caller
from bus_wire import MEMBER, PATIENCE, BusError, socket_of

PROJECT = pathlib.Path(__file__).resolve().parents[2]
sys.path.insert(0, str(PROJECT / "Tools/Trial"))
from alert_screen import CLOSE, PRESS, READY_AFTER, STEP, AlertScreen, selected_button  # noqa: E402

BUILD = PROJECT / "build/debug"
DAEMONS = ("accountd", "vantad")
# The program that this is: what the daemon takes a caller in this process for.
THIS_PROGRAM = os.path.realpath("/proc/self/exe")

BUS_CONFIGURATION = """<!DOCTYPE busconfig PUBLIC "-//freedesktop//DTD D-Bus Bus Configuration 1.0//EN"
 "http://www.freedesktop.org/standards/dbus/1.0/busconfig.dtd">
<busconfig>
  <type>session</type>
  <listen>unix:path={path}</listen>
  <auth>EXTERNAL</auth>
  <policy context="default">
    <allow send_destination="*" eavesdrop="true"/> <allow eavesdrop="true"/> <allow own="*"/>
  </policy>
  <limit name="max_completed_connections">4000</limit>
  <limit name="max_incomplete_connections">4000</limit>
  <limit name="max_connections_per_user">4000</limit>
  <limit name="max_replies_per_connection">50000</limit>
  <limit name="max_match_rules_per_connection">4000</limit>
  <limit name="max_incoming_bytes">1000000000</limit>
  <limit name="max_outgoing_bytes">1000000000</limit>
  <limit name="max_incoming_unix_fds">250000000</limit>
  <limit name="max_outgoing_unix_fds">250000000</limit>
  <limit name="max_message_size">134217728</limit>
</busconfig>
"""

# The daemons refuse configuration that others may write, whatever this user's files are like otherwise.
os.umask(0o022)


def use_build_of_command_line() -> None:
    """Takes the build folder from the command line, before unittest reads it."""
    global BUILD
    if len(sys.argv) > 1 and "/" in sys.argv[1]:
        BUILD = pathlib.Path(sys.argv.pop(1)).resolve()


def wait_until(is_true, what: str, timeout: float = PATIENCE):
    """Asks again and again for what nobody announces."""
    deadline = time.monotonic() + timeout
    while not (result := is_true()):
        if time.monotonic() > deadline:
            raise TimeoutError(f"Gave up waiting: {what}")
        time.sleep(0.01)
    return result


class Person:
    """Sits at a terminal of their own and answers what the daemon asks there."""

    def __init__(self, answer: str):
        # "allow", "refuse", "close" or "nothing"; may change while an alert stands.
        self.answer = answer
        self.alerts = 0
        # The alert that was seen last, as it was drawn.
        self.dialog = ""
        self._selected = None
        self._changed = threading.Condition()
        self._screen, self._terminal = pty.openpty()
        settings = termios.tcgetattr(self._terminal)
        settings[3] &= ~termios.ECHO
        termios.tcsetattr(self._terminal, termios.TCSANOW, settings)
        self.path = os.ttyname(self._terminal)
        self._leave, self._left = os.pipe()
        self._thread = threading.Thread(target=self._watch, daemon=True)
        self._thread.start()

    def leave(self) -> None:
        os.write(self._left, b"x")
        self._thread.join()
        for descriptor in (self._screen, self._terminal, self._leave, self._left):
            os.close(descriptor)

    def wait_for_alert(self, number: int, timeout: float = PATIENCE) -> None:
        with self._changed:
            if not self._changed.wait_for(lambda: self.alerts >= number, timeout):
                raise TimeoutError(f"{self.alerts} alerts came instead of {number}.")

    def press(self, keys: bytes) -> None:
        os.write(self._screen, keys)

    def _watch(self) -> None:
        seen = AlertScreen()
        while True:
            readable, _, _ = select.select([self._screen, self._leave], [], [], READY_AFTER if self._alert_stands() else None)
            if self._leave in readable:
                return
            if not readable:
                # An alert that stands on has not taken the key: it came too early.
                if self.answer in ("allow", "refuse"):
                    self.press(PRESS if self._selected == self.answer else STEP)
                    self._selected = None
                continue
            for dialog, is_new in seen.read(os.read(self._screen, 1 << 16).decode(errors="replace")):
                self._selected = selected_button(dialog)
                self.dialog = dialog
                if is_new:
                    self._meet_alert()
                if self.answer in ("allow", "refuse") and self._selected != self.answer:
                    self.press(STEP)

    def _meet_alert(self) -> None:
        with self._changed:
            self.alerts += 1
            self._changed.notify_all()
        if self.answer == "close":
            self.press(CLOSE)

    def _alert_stands(self) -> bool:
        """While one stands, the terminal gives key by key."""
        return not termios.tcgetattr(self._terminal)[3] & termios.ICANON


class Trial:
    def __init__(self, answer: str = "allow", log: str = "notice"):
        self.root = pathlib.Path(tempfile.mkdtemp(prefix="palisade-trial."))
        self.state = self.root / "state/palisade"
        self.configuration = self.root / "config/palisade"
        self.clients = self.root / "data/palisade/clients"
        for folder in ("home", "runtime", "bin"):
            (self.root / folder).mkdir(mode=0o700)
        for folder in (self.state, self.configuration, self.clients):
            folder.mkdir(mode=0o700, parents=True)
        self.environment = {
            "PATH": f"{self.root}/bin:{BUILD}/bin:{os.environ['PATH']}", "LC_ALL": "C.UTF-8", "NO_COLOR": "1",
            "HOME": f"{self.root}/home", "XDG_RUNTIME_DIR": f"{self.root}/runtime", "XDG_CONFIG_HOME": f"{self.root}/config",
            "XDG_STATE_HOME": f"{self.root}/state", "XDG_DATA_HOME": f"{self.root}/data",
        } | {name: value for name, value in os.environ.items() if name.endswith("SAN_OPTIONS")}
        self._processes: list[subprocess.Popen] = []
        self.person = Person(answer)
        self.log_level = log
        self.accountd: subprocess.Popen | None = None
        self.vantad: subprocess.Popen | None = None
        try:
            self._start_bus()
            self._start_sandbox()
            self.add_client("photos", THIS_PROGRAM)
            self.configure()
        except BaseException:
            self.close()
            raise

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.close()

    def close(self) -> None:
        """Ends everything. A daemon that does not end as it should has failed its test."""
        problems = self._end_daemons()
        for process in reversed(self._processes):
            if process.poll() is None:
                process.kill()
            process.wait()
            for stream in (process.stdin, process.stdout, process.stderr):
                if stream is not None:
                    stream.close()
        self.person.leave()
        shutil.rmtree(self.root, ignore_errors=True)
        if problems:
            raise RuntimeError("\n".join(problems))

    def _end_daemons(self) -> list[str]:
        """Tells the daemons that still run to end; what was wrong with how they did."""
        daemons = [process for process in self._processes if process.args[0] in DAEMONS and process.poll() is None]
        for daemon in daemons:
            daemon.terminate()
        problems = []
        for daemon in daemons:
            name = daemon.args[0]
            with contextlib.suppress(subprocess.TimeoutExpired):
                daemon.wait(PATIENCE)
            if daemon.poll() != 0:
                problems.append(f"{name}, told to end, ended with {daemon.returncode}: {self._log_of(name)}")
        return problems

    def start(self, *command, input_pipe: bool = False, **more) -> subprocess.Popen:
        process = subprocess.Popen([str(word) for word in command], env=self.environment | more.pop("environment", {}),
                                   stdin=subprocess.PIPE if input_pipe else subprocess.DEVNULL, **more)
        self._processes.append(process)
        return process

    def run(self, *command, **more) -> subprocess.CompletedProcess:
        """Runs a command to its end; what it prints, its errors among it, is `stdout`."""
        return subprocess.run([str(word) for word in command], env=self.environment, text=True, timeout=60, check=False,
                              stdout=subprocess.PIPE, stderr=subprocess.STDOUT, **more)

    def run_sandboxed(self, application: str, *command) -> subprocess.CompletedProcess:
        """Runs a command as Flatpak would run the application: in a root of its own that says which one it is."""
        info = self.root / "flatpak-info"
        info.write_text(f"[Application]\nname={application}\n", encoding="utf-8")
        seen = [word for folder in ("/usr", sys.base_prefix, PROJECT, BUILD, self.root) for word in ("--ro-bind", folder, folder)]
        links = [word for folder in ("bin", "lib", "lib64") for word in ("--symlink", f"usr/{folder}", f"/{folder}")]
        return self.run("bwrap", "--unshare-user", "--unshare-pid", "--dev", "/dev", "--proc", "/proc", *seen, *links,
                        "--ro-bind", info, "/.flatpak-info", *command)

    def _start_bus(self) -> None:
        path = self.root / "bus"
        configuration = self.root / "bus.conf"
        configuration.write_text(BUS_CONFIGURATION.format(path=path), encoding="utf-8")
        bus = self.start("dbus-daemon", "--nofork", "--print-address", f"--config-file={configuration}",
                         stdout=subprocess.PIPE, stderr=subprocess.DEVNULL)
        self.bus = bus.stdout.readline().decode().strip()
        self.bus_process = bus
        self.environment["DBUS_SESSION_BUS_ADDRESS"] = self.bus

    def start_keyring(self) -> None:
        """Starts a real keyring daemon with an unlocked keyring, which it makes the first time."""
        self.keyring = subprocess.Popen(["gnome-keyring-daemon", "--foreground", "--components=secrets", "--unlock"],
                                        env=self.environment, stdin=subprocess.PIPE, stdout=subprocess.DEVNULL,
                                        stderr=subprocess.DEVNULL)
        self._processes.append(self.keyring)
        self.keyring.stdin.write(b"password")
        self.keyring.stdin.close()

        def is_unlocked() -> bool:
            with self.caller() as caller, contextlib.suppress(BusError):
                return caller.call("org.freedesktop.secrets", "/org/freedesktop/secrets/collection/login",
                                   "org.freedesktop.DBus.Properties", "Get", "ss",
                                   ["org.freedesktop.Secret.Collection", "Locked"]) == [False]
            return False

        wait_until(is_unlocked, "the keyring is unlocked")

    def run_thief(self, action: str, *words):
        """What another application gets that may talk to the bus, and has neither files nor network."""
        bus = socket_of(self.bus)
        sandbox = ["bwrap", "--unshare-all", "--die-with-parent", "--ro-bind", "/usr", "/usr", "--symlink", "usr/lib", "/lib",
                   "--symlink", "usr/lib64", "/lib64", "--symlink", "usr/bin", "/bin", "--proc", "/proc", "--dev", "/dev",
                   "--ro-bind", PROJECT / "Tests/Integration", "/program", "--bind", bus, "/bus"]
        done = self.run(*sandbox, "python3", "-B", "/program/thief.py", "/bus", action, *map(json.dumps, words))
        if done.returncode != 0:
            raise RuntimeError(done.stdout)
        return json.loads(done.stdout)

    def _start_sandbox(self) -> None:
        with open(self.root / "sandbox.log", "ab") as log:
            sandbox = self.start("palisade-sandbox", "--configuration", self.configuration / "server.toml",
                                 stdout=subprocess.PIPE, stderr=log)
        if not sandbox.stdout.readline():
            raise RuntimeError((self.root / "sandbox.log").read_text(encoding="utf-8"))
        self.sandbox_process = sandbox
        self.master_token = (self.root / "runtime/palisade-sandbox/master-token").read_bytes()

    def add_client(self, name: str, program: str | None = None) -> None:
        """Writes the record of an application; without a program of its own it is the command line under another name."""
        if program is None:
            program = str(self.root / "bin" / name)
            shutil.copy(BUILD / "bin/palisade", program)
        (self.clients / f"org.example.{name}.toml").write_text(
            f'bundle_id = "org.example.{name}"\nname = "{name.capitalize()}"\n\n[match]\nexecutable = "{program}"\n',
            encoding="utf-8")

    def configure(self, **settings) -> None:
        """Writes accountd.toml, texts in quotes and numbers without."""
        settings = {"plugins": f"{BUILD}/plugins", "terminal": self.person.path, "keychain": "vault",
                    "log": self.log_level} | settings
        (self.configuration / "accountd.toml").write_text(
            "".join(f"{name} = {json.dumps(value)}\n" for name, value in settings.items()), encoding="utf-8")

    def start_accountd(self, **more) -> subprocess.Popen:
        """Starts the daemon and returns when it owns its name; what is called then is answered when it serves."""
        with Caller(self.bus) as listener:
            listener.call("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "AddMatch", "s",
                          [f"type='signal',member='NameOwnerChanged',arg0='{NAME}'"])
            with open(self.root / "accountd.log", "ab") as log:
                self.accountd = self.start("accountd", stderr=log, **more)
            while True:
                try:
                    change = listener.wait_for(lambda message: message.fields.get(MEMBER) == "NameOwnerChanged", 0.05)
                    if change.values[2]:
                        return self.accountd
                except TimeoutError:
                    if self.accountd.poll() is not None:
                        raise RuntimeError(f"accountd ended with {self.accountd.returncode}: {self.daemon_log()}") from None

    def start_vantad(self) -> subprocess.Popen:
        with open(self.root / "vantad.log", "ab") as log:
            self.vantad = self.start("vantad", "--keychain", "vault", stderr=log, stdout=log)
        return self.vantad

    def kill_accountd(self) -> None:
        self.accountd.send_signal(signal.SIGKILL)
        if self.accountd.wait() != -signal.SIGKILL:
            raise RuntimeError(f"accountd had ended with {self.accountd.returncode}: {self.daemon_log()}")

    def daemon_log(self) -> str:
        return self._log_of("accountd")

    def _log_of(self, daemon: str) -> str:
        return (self.root / f"{daemon}.log").read_text(encoding="utf-8", errors="replace")

    def caller(self) -> Caller:
        return Caller(self.bus)

    def add_account(self) -> str:
        with self.caller() as manager:
            return manager.add_account("ada", self.master_token)

    def stored_tokens(self) -> int:
        """How many tokens the vault holds: the account's own, and one a grant."""
        with contextlib.closing(sqlite3.connect(self.state / "vault.sqlite")) as vault:
            return vault.execute("SELECT count(*) FROM credentials").fetchone()[0]

    def sandbox(self, *words) -> str:
        return self.run("palisade-sandbox", *words).stdout


def trial_with_account(settings: dict | None = None, **more) -> Trial:
    trial = Trial(**more)
    try:
        trial.configure(**(settings or {}))
        trial.start_accountd()
        trial.add_account()
        return trial
    except BaseException:
        trial.close()
        raise
