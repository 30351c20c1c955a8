"""What an alert on a terminal looks like to whoever answers it: where it begins, and what is selected."""

import re

# One that is drawn again is drawn over the earlier one.
DIALOG = re.compile(r"(\x1b\[\d+A\r\x1b\[J)?┌.*?┘", re.DOTALL)
SELECTED_BUTTON = re.compile(r"\x1b\[7m\[ [^\x1b]* \]\x1b\[0m(  \[)?")
STEP, PRESS, CLOSE = b"\t", b"\r", b"\x1b"
# A key presses a button half a second after the selection came to it.
READY_AFTER = 0.55


def selected_button(dialog: str) -> str | None:
    """"refuse" or "allow", or None when the selection is elsewhere."""
    found = SELECTED_BUTTON.search(dialog)
    return found and ("refuse" if found[1] else "allow")


class AlertScreen:
    """Reads what the daemon writes to a terminal, dialog by dialog."""

    def __init__(self):
        self._unread = ""

    def read(self, text: str):
        """The dialogs that are whole now, each with whether it is a new alert's."""
        self._unread += text
        while whole := DIALOG.search(self._unread):
            self._unread = self._unread[whole.end():]
            yield whole[0], whole[1] is None
