"""Asks palisade-alert a question the way the account daemon does, for pictures and tests."""

import json
import os
import socket
import struct
import subprocess

ALLOWED, REFUSED, CLOSED = 0, 1, 2
SIZE_OF_ANSWER = 48

EXAMPLE = {
    "title": "Allow Access to Your Facebook Account?",
    "message": "“\u2068Photos\u2069” would like to use your Facebook account to see your photos and videos, and to post on your behalf.",
    "refuse": "Don’t Allow",
    "allow": "Allow",
    "languages": "en",
    "topmost": True,
    "display": "",
    "subject": {"name": "Photos", "id": "org.example.photos", "identity": "certain", "account": "ada@example.org"},
}


class Alert:
    """One run of the helper."""

    def __init__(self, helper, question=None, environment=None):
        self.nonce = os.urandom(32)
        text = json.dumps({**EXAMPLE, **(question or {}), "nonce": self.nonce.hex()}).encode()
        self.host, theirs = socket.socketpair()
        # The helper finds its socket as descriptor 3.
        script = ["bash", "-c", 'fd=$1; shift; [ "$fd" = 3 ] || exec 3<&"$fd" {fd}<&-; exec "$@"', "start", str(theirs.fileno()), helper]
        self.process = subprocess.Popen(script, pass_fds=[theirs.fileno()], env={**os.environ, **(environment or {})})
        theirs.close()
        self.host.sendall(struct.pack("<I", len(text)) + text)

    def wait(self, timeout=10):
        """The word of its answer, None without one."""
        self.host.settimeout(timeout)
        received = b""
        while chunk := self.host.recv(256):
            received += chunk
        status = self.process.wait(timeout)
        if status != 0 or len(received) != SIZE_OF_ANSWER or received[4:36] != self.nonce:
            return None
        return struct.unpack("<I", received[36:40])[0]

    def end(self):
        self.host.close()
        try:
            self.process.wait(2)
        except subprocess.TimeoutExpired:
            self.process.kill()
            self.process.wait()

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.end()
