"""The account daemon's interface, called from Python. Each `Caller` is a connection of its own; who it is is up to the bus."""

import itertools
import os

from bus_wire import MEMBER, PATH, PATIENCE, SIGNAL, BusError, Connection, Message, socket_of

FACEBOOK = "com.veltran.accounttype.facebook"
NAME = "com.veltran.Accounts1"
OBJECT = "/com/veltran/Accounts1"
MANAGER = NAME + ".Manager"
REQUEST = NAME + ".Request"
GRANTED, REFUSED, WITHDRAWN, PENDING = range(4)

_handle_tokens = itertools.count(1)


def facebook_options(app_id="1234567890", permissions=("email",), audience=None) -> dict:
    options = {"FacebookAppIdKey": ("s", app_id), "FacebookPermissionsKey": ("as", list(permissions))}
    return options | ({"FacebookAudienceKey": ("s", audience)} if audience else {})


class Caller(Connection):
    def __init__(self, bus_address: str):
        super().__init__(socket_of(bus_address))

    def start(self, method: str, signature: str = "", values=(), **more) -> int:
        return self.send(NAME, OBJECT, MANAGER, method, signature, values, **more)

    def manage(self, method: str, signature: str = "", values=(), **more) -> list:
        """Calls a method of the manager; its last argument, the options, is added when it is left out."""
        if not signature.endswith("a{sv}"):
            signature, values = signature + "a{sv}", (*values, {})
        return self.call(NAME, OBJECT, MANAGER, method, signature, values, **more)

    def manage_for_descriptor(self, method: str, signature: str, values) -> int:
        """Calls a method that answers with a descriptor, which is the caller's to close."""
        serial = self.start(method, signature + "a{sv}", (*values, {}))
        message = self.reply_to(serial)
        place, = message.answer()
        return message.descriptors[place]

    def listen(self) -> None:
        """Has the bus deliver the daemon's signals, and tell of its end."""
        for rule in (f"type='signal',sender='{NAME}'", f"type='signal',member='NameOwnerChanged',arg0='{NAME}'"):
            self.call("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "AddMatch", "s", [rule])

    def start_request(self, **options) -> "Request":
        return self.start_request_with(facebook_options(**options))

    def start_request_with(self, access_options: dict) -> "Request":
        token = f"request{next(_handle_tokens)}"
        return Request(self, self.start("RequestAccess", "sa{sv}a{sv}",
                                        [FACEBOOK, access_options, {"handle_token": ("s", token)}]), token)

    def start_authorize(self, client: str) -> "Request":
        token = f"request{next(_handle_tokens)}"
        return Request(self, self.start("Authorize", "ssa{sv}", [FACEBOOK, client, {"handle_token": ("s", token)}]), token)

    def credential(self) -> str:
        with open(self.manage_for_descriptor("GetCredentialDescriptor", "s", [FACEBOOK]), encoding="utf-8") as pipe:
            return pipe.read()

    def grants(self) -> dict[str, dict]:
        """Each client's record."""
        return {row["client"]: row for row in self.manage("ListGrants", "s", [FACEBOOK])[0]}

    def revocations(self) -> list[dict]:
        return self.manage("ListRevocations")[0]

    def add_account(self, username: str, token: bytes) -> str:
        reading, writing = os.pipe()
        os.write(writing, token)
        os.close(writing)
        try:
            return self.manage("AddAccount", "ssh", [FACEBOOK, username, 0], descriptors=[reading])[0]
        finally:
            os.close(reading)


class Request:
    """A call of RequestAccess or Authorize, and what it comes to."""

    def __init__(self, caller: Caller, serial: int, token: str):
        self._caller = caller
        self._serial = serial
        self.path = f"{OBJECT}/request/{caller.name[1:].replace('.', '_')}/{token}"
        self.is_answered = False

    def reply(self, timeout: float = PATIENCE) -> tuple[int, dict]:
        """The word of the reply and its results."""
        _, word, results = self._caller.reply_to(self._serial, timeout).answer()
        self.is_answered = word != PENDING
        return word, results

    def outcome(self, timeout: float = PATIENCE) -> tuple[int, dict]:
        """The word that the request comes to in the end, and its results."""
        word, results = self.reply(timeout)
        return (word, results) if self.is_answered else self.response(timeout)

    def response(self, timeout: float = PATIENCE) -> tuple[int, dict]:
        """What the Response signal brings. A caller that listens learns here that the daemon has ended."""
        message = self._caller.wait_for(self._ends_with, timeout)
        if message.fields[MEMBER] == "NameOwnerChanged":
            raise BusError("org.freedesktop.DBus.Error.NoReply", "The daemon has ended.")
        self.is_answered = True
        return tuple(message.values)

    def _ends_with(self, message: Message) -> bool:
        if message.kind != SIGNAL:
            return False
        if message.fields[MEMBER] == "NameOwnerChanged":
            return message.values[2] == ""
        return (message.fields[MEMBER], message.fields[PATH]) == ("Response", self.path)

    def close(self) -> None:
        self._caller.call(NAME, self.path, REQUEST, "Close", "a{sv}", [{}])
