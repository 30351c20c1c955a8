"""An application that may talk to the session's Secret Service and to nothing else: it reads, replaces and deletes what lies there."""

import json
import sys

from bus_wire import Connection

SERVICE = "org.freedesktop.secrets"
ROOT = "/org/freedesktop/secrets"
INTERFACE = "org.freedesktop.Secret."


class Thief(Connection):
    def __init__(self, bus_socket: str):
        super().__init__(bus_socket)
        _, self._session = self._ask(ROOT, "Service", "OpenSession", "sv", ["plain", ("s", "")])

    def _ask(self, path: str, interface: str, member: str, signature: str = "", values=()) -> list:
        return self.call(SERVICE, path, INTERFACE + interface, member, signature, values)

    def _items(self) -> "list[str]":
        unlocked, _ = self._ask(ROOT, "Service", "SearchItems", "a{ss}", [{}])
        return unlocked

    def read(self) -> "dict[str, str]":
        """Every secret, as hexadecimal digits, under its item."""
        secrets, = self._ask(ROOT, "Service", "GetSecrets", "aoo", [self._items(), self._session])
        return {item: bytes(secret[2]).hex() for item, secret in secrets.items()}

    def replace(self, secrets: "dict[str, str]") -> None:
        for item, secret in secrets.items():
            self._ask(item, "Item", "SetSecret", "(oayays)", [(self._session, b"", bytes.fromhex(secret), "text/plain")])

    def delete(self) -> None:
        for item in self._items():
            self._ask(item, "Item", "Delete")


def main() -> None:
    bus_socket, action, *more = sys.argv[1:]
    with Thief(bus_socket) as thief:
        print(json.dumps(getattr(thief, action)(*map(json.loads, more))))


if __name__ == "__main__":
    main()
