"""A bus that pins the processes behind its connections: a real one, which cannot, behind a thread that adds what newer ones say.

Whoever connects here is connected with the real bus; in its answers to GetConnectionCredentials, ProcessFD is added.
"""

import array
import contextlib
import os
import pathlib
import socket
import struct
import threading

from bus_wire import (CALL, DESCRIPTORS, DESTINATION, FIELD_TYPES, MEMBER, REPLY, REPLY_SERIAL, SENDER, SIGNATURE, Message,
                      marshalled, pad, socket_of, write)


def receive(connected: socket.socket) -> tuple[bytes, list[int]]:
    data, rights, _, _ = connected.recvmsg(1 << 18, socket.CMSG_SPACE(64 * 4), socket.MSG_CMSG_CLOEXEC)
    descriptors = array.array("i")
    for level, kind, content in rights:
        if (level, kind) == (socket.SOL_SOCKET, socket.SCM_RIGHTS):
            descriptors.frombytes(content)
    return data, list(descriptors)


def send(connected: socket.socket, data: bytes, descriptors: list[int]) -> None:
    if descriptors:
        rights = [(socket.SOL_SOCKET, socket.SCM_RIGHTS, array.array("i", descriptors))]
        data = data[connected.sendmsg([data], rights):]
        for descriptor in descriptors:
            os.close(descriptor)
    connected.sendall(data)


class Messages:
    """The messages in a stream that begins with lines of text."""

    def __init__(self, last_line: bytes):
        self._last_line = last_line
        self._bytes = b""
        self._descriptors: list[int] = []
        self._is_text = True

    def take(self, data: bytes, descriptors: list[int]):
        """What is whole now: each piece's bytes, its descriptors, and the message that it is, or None for lines of text."""
        self._bytes += data
        self._descriptors += descriptors
        while self._is_text and b"\r\n" in self._bytes:
            line, _, self._bytes = self._bytes.partition(b"\r\n")
            self._is_text = not line.startswith(self._last_line)
            yield line + b"\r\n", [], None
        while not self._is_text and len(self._bytes) >= 16:
            body, _, fields = struct.unpack_from("<III", self._bytes, 4)
            length = 16 + fields + -fields % 8 + body
            if len(self._bytes) < length:
                break
            whole, self._bytes = self._bytes[:length], self._bytes[length:]
            message = Message(whole)
            count = message.fields.get(DESCRIPTORS, 0)
            own, self._descriptors = self._descriptors[:count], self._descriptors[count:]
            yield whole, own, message


class PinningBus:
    def __init__(self, bus: str, folder: pathlib.Path):
        self._real = socket_of(bus)
        self.address = f"unix:path={folder}/pinning-bus"
        # Each connection's process, pinned when it was made. What is not here is pinned when it is asked for.
        self.pins: dict[str, int] = {}
        self._listener = socket.socket(socket.AF_UNIX)
        self._listener.bind(socket_of(self.address))
        self._listener.listen()
        self._sockets = [self._listener]
        self._threads: list[threading.Thread] = []
        self._start(self._serve)

    def close(self) -> None:
        # A call that waits at a socket does not end with the descriptor alone.
        for connected in self._sockets:
            with contextlib.suppress(OSError):
                connected.shutdown(socket.SHUT_RDWR)
        for thread in self._threads:
            thread.join()
        for connected in self._sockets:
            connected.close()

    def _start(self, work, *values) -> None:
        self._threads.append(threading.Thread(target=work, args=values))
        self._threads[-1].start()

    def _serve(self) -> None:
        with contextlib.suppress(OSError):
            while True:
                client, _ = self._listener.accept()
                real = socket.socket(socket.AF_UNIX)
                self._sockets += [client, real]
                real.connect(self._real)
                asked: dict[int, str] = {}
                self._start(self._carry_calls, client, real, asked)
                self._start(self._carry_answers, client, real, asked)

    @staticmethod
    def _carry_calls(client: socket.socket, real: socket.socket, asked: dict[int, str]) -> None:
        messages = Messages(b"BEGIN")
        with contextlib.suppress(OSError):
            while True:
                data, descriptors = receive(client)
                for piece, own, message in messages.take(data, descriptors):
                    if message and message.kind == CALL and message.fields.get(MEMBER) == "GetConnectionCredentials":
                        asked[struct.unpack_from("<I", piece, 8)[0]] = message.values[0]
                    send(real, piece, own)
                if not data:
                    real.shutdown(socket.SHUT_WR)
                    return

    def _carry_answers(self, client: socket.socket, real: socket.socket, asked: dict[int, str]) -> None:
        messages = Messages(b"AGREE_UNIX_FD")
        with contextlib.suppress(OSError):
            while True:
                data, descriptors = receive(real)
                for piece, own, message in messages.take(data, descriptors):
                    if message and message.kind == REPLY and message.fields[REPLY_SERIAL] in asked:
                        piece, own = self._with_pin(piece, message, asked.pop(message.fields[REPLY_SERIAL]))
                    send(client, piece, own)
                if not data:
                    client.shutdown(socket.SHUT_WR)
                    return

    def _with_pin(self, piece: bytes, message: Message, name: str) -> tuple[bytes, list[int]]:
        said = message.values[0]
        pin = os.dup(self.pins[name]) if name in self.pins else os.pidfd_open(said["ProcessID"])
        answer = {"ProcessID": ("u", said["ProcessID"]), "UnixUserID": ("u", said["UnixUserID"]), "ProcessFD": ("h", 0)}
        content = marshalled("a{sv}", [answer])
        fields = {code: message.fields[code] for code in (REPLY_SERIAL, DESTINATION, SENDER)}
        fields |= {SIGNATURE: "a{sv}", DESCRIPTORS: 1}
        header = bytearray(piece[:4] + struct.pack("<I", len(content)) + piece[8:12])
        write(header, "a(yv)", [(code, (FIELD_TYPES[code], value)) for code, value in fields.items()])
        pad(header, 8)
        return bytes(header) + content, [pin]
