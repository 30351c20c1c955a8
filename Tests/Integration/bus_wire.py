"""A D-Bus client that says exactly what it is told to, well-formed or not, and hears everything that comes back.

Values are Python's own: a variant is a pair (signature, value), a dictionary a dict, an array a list, a struct a tuple. What is read
comes without the variants' signatures.
"""

import array
import os
import re
import socket
import struct
import time

# Whether the daemons run under a sanitizer, and how many times slower everything is then.
IS_SANITIZED = any(name.endswith("SAN_OPTIONS") for name in os.environ)
SLOWNESS = 5 if IS_SANITIZED else 1
# How many seconds may pass until what must come has come.
PATIENCE = 20 * SLOWNESS

CALL, REPLY, ERROR, SIGNAL = 1, 2, 3, 4
PATH, INTERFACE, MEMBER, ERROR_NAME, REPLY_SERIAL, DESTINATION, SENDER, SIGNATURE, DESCRIPTORS = range(1, 10)
FIELD_TYPES = {PATH: "o", INTERFACE: "s", MEMBER: "s", ERROR_NAME: "s", REPLY_SERIAL: "u", DESTINATION: "s", SENDER: "s",
               SIGNATURE: "g", DESCRIPTORS: "u"}
NUMBERS = {"y": "B", "n": "h", "q": "H", "i": "i", "u": "I", "x": "q", "t": "Q", "d": "d", "b": "I", "h": "I"}
ALIGNMENTS = {"s": 4, "o": 4, "g": 1, "v": 1, "a": 4, "(": 8, "{": 8}


def types_in(signature: str) -> list[str]:
    """The single complete types of a signature."""
    types, at = [], 0
    while at < len(signature):
        end = at
        while signature[end] == "a":
            end += 1
        if signature[end] in "({":
            depth = 0
            while True:
                depth += {"(": 1, "{": 1, ")": -1, "}": -1}.get(signature[end], 0)
                if depth == 0:
                    break
                end += 1
        types.append(signature[at:end + 1])
        at = end + 1
    return types


def alignment_of(kind: str) -> int:
    return ALIGNMENTS.get(kind[0]) or struct.calcsize(NUMBERS[kind[0]])


def pad(out: bytearray, alignment: int) -> None:
    out.extend(bytes(-len(out) % alignment))


def write(out: bytearray, kind: str, value) -> None:
    pad(out, alignment_of(kind))
    if kind in NUMBERS:
        out += struct.pack("<" + NUMBERS[kind], value)
    elif kind in "so":
        content = value if isinstance(value, bytes) else value.encode()
        out += struct.pack("<I", len(content)) + content + b"\0"
    elif kind == "g":
        out += bytes([len(value)]) + value.encode() + b"\0"
    elif kind == "v":
        write(out, "g", value[0])
        write(out, value[0], value[1])
    elif kind == "ay":
        out += struct.pack("<I", len(value)) + value
    elif kind[0] == "a":
        length_at = len(out)
        out += bytes(4)
        pad(out, alignment_of(kind[1:]))
        start = len(out)
        for element in value.items() if kind[1] == "{" else value:
            write(out, kind[1:], element)
        struct.pack_into("<I", out, length_at, len(out) - start)
    else:
        for part, content in zip(types_in(kind[1:-1]), value, strict=True):
            write(out, part, content)


def marshalled(signature: str, values) -> bytes:
    out = bytearray()
    for kind, value in zip(types_in(signature), values, strict=True):
        write(out, kind, value)
    return bytes(out)


def read(data: bytes, at: int, kind: str):
    """The value at a place of a message, and where the next one begins."""
    at += -at % alignment_of(kind)
    if kind in NUMBERS:
        value, = struct.unpack_from("<" + NUMBERS[kind], data, at)
        return (bool(value) if kind == "b" else value), at + struct.calcsize(NUMBERS[kind])
    if kind in "so":
        length, = struct.unpack_from("<I", data, at)
        return data[at + 4:at + 4 + length].decode(), at + 5 + length
    if kind == "g":
        return data[at + 1:at + 1 + data[at]].decode(), at + 2 + data[at]
    if kind == "v":
        signature, at = read(data, at, "g")
        return read(data, at, signature)
    if kind[0] == "a":
        length, = struct.unpack_from("<I", data, at)
        at += 4
        at += -at % alignment_of(kind[1:])
        end, elements = at + length, []
        while at < end:
            element, at = read(data, at, kind[1:])
            elements.append(element)
        return (dict(elements) if kind[1] == "{" else elements), at
    parts = []
    for part in types_in(kind[1:-1]):
        value, at = read(data, at, part)
        parts.append(value)
    return tuple(parts), at


def read_all(data: bytes, signature: str) -> list:
    values, at = [], 0
    for kind in types_in(signature):
        value, at = read(data, at, kind)
        values.append(value)
    return values


class BusError(Exception):
    """An error that came as the reply to a call."""

    def __init__(self, name: str, message: str):
        super().__init__(f"{name}: {message}")
        self.name = name.rpartition(".")[2]
        self.message = message


class Message:
    def __init__(self, data: bytes, descriptors=()):
        self.kind = data[1]
        fields, at = read(data, 12, "a(yv)")
        self.fields = dict(fields)
        self.signature = self.fields.get(SIGNATURE, "")
        self.body = data[at + -at % 8:]
        self.descriptors = descriptors

    @property
    def values(self) -> list:
        return read_all(self.body, self.signature)

    def answer(self) -> list:
        """The values of a reply; an error reply is raised."""
        if self.kind == ERROR:
            raise BusError(self.fields[ERROR_NAME], self.values[0] if self.signature.startswith("s") else "")
        return self.values


class Connection:
    """One connection to a bus. `address` is the bus's socket: a path, or a name in the abstract space behind a NUL."""

    def __init__(self, address: str):
        self._socket = socket.socket(socket.AF_UNIX)
        self._socket.connect(address)
        self._serial = 0
        self._received = bytearray()
        self._descriptors: list[int] = []
        self.inbox: list[Message] = []
        self._socket.sendall(b"\0AUTH EXTERNAL " + str(os.getuid()).encode().hex().encode() + b"\r\n")
        self._expect(b"OK")
        self._socket.sendall(b"NEGOTIATE_UNIX_FD\r\n")
        self._expect(b"AGREE_UNIX_FD")
        self._socket.sendall(b"BEGIN\r\n")
        self.name, = self.call("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "Hello")

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.close()

    def close(self) -> None:
        self._socket.close()

    def fileno(self) -> int:
        return self._socket.fileno()

    def _expect(self, word: bytes) -> None:
        line = b""
        while not line.endswith(b"\r\n"):
            line += self._socket.recv(1)
        if not line.startswith(word):
            raise ConnectionError(line.decode(errors="replace"))

    def send(self, destination: str, path: str, interface: str, member: str, signature: str = "", values=(), *,
             body: bytes | None = None, descriptors=()) -> int:
        """Sends a call, with `body` in place of the values' own bytes if it is given. Returns its serial number."""
        content = marshalled(signature, values) if body is None else body
        fields = {PATH: path, INTERFACE: interface, MEMBER: member, DESTINATION: destination, SIGNATURE: signature}
        return self._send(CALL, fields, content, descriptors)

    def emit(self, destination: str | None, path: str, interface: str, member: str, signature: str = "", values=()) -> None:
        """Sends a signal: to everybody who listens, or to one destination."""
        fields = {PATH: path, INTERFACE: interface, MEMBER: member, DESTINATION: destination, SIGNATURE: signature}
        self._send(SIGNAL, fields, marshalled(signature, values))

    def _send(self, kind: int, fields: dict, content: bytes, descriptors=()) -> int:
        if descriptors:
            fields[DESCRIPTORS] = len(descriptors)
        message = self.marshalled_message(kind, fields, content)
        if descriptors:
            rights = [(socket.SOL_SOCKET, socket.SCM_RIGHTS, array.array("i", descriptors))]
            message = message[self._socket.sendmsg([message], rights):]
        self.send_raw(message)
        return self._serial

    def marshalled_message(self, kind: int, fields: dict, content: bytes) -> bytes:
        """A message of this connection's next serial number. Fields of numbers that nobody knows are texts."""
        self._serial += 1
        header = bytearray(struct.pack("<BBBBII", ord("l"), kind, 0, 1, len(content), self._serial))
        write(header, "a(yv)", [(code, (FIELD_TYPES.get(code, "s"), value)) for code, value in fields.items() if value])
        pad(header, 8)
        return bytes(header) + content

    def send_raw(self, message: bytes) -> None:
        self._socket.sendall(message)

    def call(self, destination: str, path: str, interface: str, member: str, signature: str = "", values=(), *,
             timeout: float = PATIENCE, **more) -> list:
        serial = self.send(destination, path, interface, member, signature, values, **more)
        return self.reply_to(serial, timeout).answer()

    def reply_to(self, serial: int, timeout: float = PATIENCE) -> Message:
        return self.wait_for(lambda message: message.fields.get(REPLY_SERIAL) == serial, timeout)

    def signal(self, member: str, path: str | None = None, timeout: float = PATIENCE) -> Message:
        return self.wait_for(lambda message: message.kind == SIGNAL and message.fields[MEMBER] == member and
                             path in (None, message.fields[PATH]), timeout)

    def wait_for(self, is_meant, timeout: float = PATIENCE) -> Message:
        """Takes the first message that is meant out of the inbox, when it has come."""
        deadline = time.monotonic() + timeout
        while True:
            for place, message in enumerate(self.inbox):
                if is_meant(message):
                    return self.inbox.pop(place)
            self._socket.settimeout(max(0.001, deadline - time.monotonic()))
            self.receive()
            self._socket.settimeout(None)

    def receive(self) -> None:
        """Reads what is there, or waits for more; whole messages go into the inbox."""
        data, rights, _, _ = self._socket.recvmsg(1 << 18, socket.CMSG_SPACE(16 * 4), socket.MSG_CMSG_CLOEXEC)
        if not data:
            raise ConnectionError("The bus has ended the connection.")
        for level, kind, content in rights:
            if (level, kind) == (socket.SOL_SOCKET, socket.SCM_RIGHTS):
                self._descriptors += array.array("i", content)
        self._received += data
        while len(self._received) >= 16:
            body, _, fields = struct.unpack_from("<III", self._received, 4)
            length = 16 + fields + -fields % 8 + body
            if len(self._received) < length:
                break
            message = Message(bytes(self._received[:length]))
            count = message.fields.get(DESCRIPTORS, 0)
            message.descriptors, self._descriptors = self._descriptors[:count], self._descriptors[count:]
            self.inbox.append(message)
            del self._received[:length]


def socket_of(address: str) -> str:
    """The socket in a bus's address."""
    path = re.search(r"unix:(path|abstract)=([^,;]*)", address)
    return path[2] if path[1] == "path" else "\0" + path[2]
