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

from alert_screen import CLOSE, PRESS, READY_AFTER, STEP, AlertScreen, selected_button

ESCAPE_SEQUENCE = re.compile(r"\x1b\[[0-9;]*[A-Za-z]")
ANSWERS = ("allow", "refuse", "close", "nothing")


def text_of(dialog: str) -> str:
    """The dialog's own words, without its frame."""
    lines = (line.removeprefix("│").removeprefix(" ").rstrip("│ \r") for line in ESCAPE_SEQUENCE.sub("", dialog).splitlines())
    return "\n".join("    " + line for line in lines if line and line[0] not in "┌└")


def key_for(answer: str, selected: str | None) -> bytes:
    """What a person presses next who wants to give that answer."""
    if answer == "close":
        return CLOSE
    if answer == "nothing":
        return b""
    return PRESS if selected == answer else STEP


def main() -> None:
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--answer", choices=ANSWERS, default="allow", help="what to answer (default: allow)")
    parser.add_argument("--when-asked", metavar="FILE", help="make this file when an alert has been read")
    arguments = parser.parse_args()

    screen, terminal = pty.openpty()
    tty.setraw(terminal)
    print(os.ttyname(terminal), flush=True)

    seen = AlertScreen()
    # The dialog that stands, as it was drawn last, and whether it was read.
    dialog = ""
    is_read = False
    while True:
        readable, _, _ = select.select([screen], [], [], READY_AFTER if dialog else None)
        if readable:
            for dialog, is_new in seen.read(os.read(screen, 4096).decode(errors="replace")):
                is_read = is_read and not is_new
            # A step needs no wait.
            if is_read and key_for(arguments.answer, selected_button(dialog)) == STEP:
                os.write(screen, STEP)
            continue
        if not is_read:
            print(text_of(dialog), f"\n    No terminal here, so this is answered by itself: {arguments.answer}.", sep="\n", flush=True)
            if arguments.when_asked:
                open(arguments.when_asked, "a", encoding="utf-8").close()
            is_read = True
        key = key_for(arguments.answer, selected_button(dialog))
        os.write(screen, key)
        if key != STEP:
            dialog = ""


if __name__ == "__main__":
    try:
        main()
    except (KeyboardInterrupt, BrokenPipeError):
        sys.exit(0)
