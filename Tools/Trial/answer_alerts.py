#!/usr/bin/env python3
"""Answers the account daemon's alerts where nobody sits at a terminal: on a build machine, in a test.

Opens a pseudo-terminal, prints its path, and plays the person in front of it: reads the alert, says on standard output what it
read and what it answers, and presses the keys that a person would press, once the alert has stood long enough to be read.
"""

import argparse
import os
import pty
import re
import select
import sys
import tty

ESCAPE_SEQUENCE = re.compile(r"\x1b\[[0-9;]*[A-Za-z]")
LAST_LINE = "┘"
KEYS = {"allow": b"\r", "refuse": b"\t\r", "close": b"\x1b", "nothing": b""}


def text_of(dialog: str) -> str:
    """The dialog's own words, without its frame."""
    lines = (line.removeprefix("│ ").rstrip("│ \r") for line in ESCAPE_SEQUENCE.sub("", dialog).splitlines())
    return "\n".join("    " + line for line in lines if line and line[0] not in "┌└")


def main() -> None:
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--answer", choices=KEYS, default="allow", help="what to press (default: allow)")
    parser.add_argument("--when-asked", metavar="FILE", help="make this file when an alert has been read")
    arguments = parser.parse_args()

    screen, terminal = pty.openpty()
    tty.setraw(terminal)
    print(os.ttyname(terminal), flush=True)

    dialog = ""
    is_answered = False
    while True:
        # A daemon that redraws the dialog while it is being answered is not asking again.
        readable, _, _ = select.select([screen], [], [], 0.6 if LAST_LINE in dialog and not is_answered else None)
        if readable:
            dialog += os.read(screen, 4096).decode(errors="replace")
            if is_answered and "┌" in dialog and dialog.startswith("\r\n"):
                is_answered = False
            continue
        print(text_of(dialog), f"\n    No terminal here, so this is answered by itself: {arguments.answer}.", sep="\n", flush=True)
        if arguments.when_asked:
            open(arguments.when_asked, "a", encoding="utf-8").close()
        os.write(screen, KEYS[arguments.answer])
        dialog, is_answered = "", True


if __name__ == "__main__":
    try:
        main()
    except (KeyboardInterrupt, BrokenPipeError):
        sys.exit(0)
