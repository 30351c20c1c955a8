"""Kills the daemon at a chosen point of an operation, and tells what its stores hold then."""

import mmap
import pathlib
import shutil
import sqlite3
import struct

import trial


class KillPoints:
    """The control of KillPoint.cpp's library, which counts the daemon's calls that reach out of it."""

    _LAYOUT = "QQ48s"

    def __init__(self, session: trial.Trial):
        file = session.root / "kill-point"
        file.write_bytes(bytes(struct.calcsize(self._LAYOUT)))
        with open(file, "r+b") as opened:
            self._control = mmap.mmap(opened.fileno(), 0)
        library = trial.BUILD / "Tests/Integration/libpalisade-kill-point.so"
        self.environment = {"KILL_POINT_FILE": str(file), "LD_PRELOAD": str(library)}

    def arm(self, number: int) -> None:
        """The daemon's call of that number, from now on, ends it; with 0 none does."""
        self._control[:] = struct.pack(self._LAYOUT, 0, number, b"")

    def fatal_call(self) -> str:
        """The name of the call that ended the daemon, or nothing."""
        return struct.unpack(self._LAYOUT, self._control[:])[2].rstrip(b"\0").decode()


class Stores:
    """What a daemon that was killed has left on the disk: a copy, so that the looking repairs nothing."""

    NAMES = ("accounts.sqlite", "vault.sqlite", "outbox.sqlite")

    def __init__(self, state: pathlib.Path, copy: pathlib.Path):
        shutil.rmtree(copy, ignore_errors=True)
        shutil.copytree(state, copy, ignore=shutil.ignore_patterns("*-shm"))
        self._copy = copy

    def ask(self, store: str, query: str) -> list[tuple]:
        connection = sqlite3.connect(self._copy / store)
        try:
            return connection.execute(query).fetchall()
        finally:
            connection.close()

    def token_holders(self) -> set[str]:
        return {row[0] for row in self.ask("vault.sqlite", "SELECT client_id FROM credentials WHERE has_client = 1")}

    def granted(self) -> set[str]:
        return {row[0] for row in self.ask("accounts.sqlite", "SELECT client_id FROM authorizations WHERE granted = 1")}

    def pending(self) -> set[str]:
        """The apps whose tokens are to be made invalid."""
        return {row[0] for row in self.ask("outbox.sqlite", "SELECT app_id FROM invalidations WHERE state = 'pending'")}

    def are_half_done(self) -> bool:
        return self.token_holders() != self.granted() or self.ask("accounts.sqlite", "SELECT * FROM intents") != []

    def damage(self) -> list[str]:
        answers = {name: self.ask(name, "PRAGMA integrity_check") for name in self.NAMES}
        return [f"{name} is damaged: {answer}" for name, answer in answers.items() if answer != [("ok",)]]
