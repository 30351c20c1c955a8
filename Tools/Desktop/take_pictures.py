"""Shows alerts one after another and takes a picture of each. Run by Tools/Desktop/pictures.

    take_pictures.py x11 | wayland BUILD-FOLDER FOLDER
"""

import gettext
import html
import os
import pathlib
import re
import subprocess
import sys
import tempfile
import time

from alert import Alert

BUILD, FOLDER = map(pathlib.Path, sys.argv[2:4])
PROJECT = pathlib.Path(__file__).resolve().parents[2]
HELPER = BUILD / "bin/palisade-alert"
NAMES = {"ar": "صور", "ja": "フォト"}
# What the sample application asks for, as the pages in Docs/sentences call it.
ASKED_FOR = "two things of the user; posts for friends"
# What a window needs to appear, and to arm itself.
LONGEST_WAIT = 20
SETTLED_AFTER = 1.5


def sentence(language, name):
    page = (PROJECT / f"Docs/sentences/{language}.md").read_text(encoding="utf-8")
    row = re.search(rf"^\| {ASKED_FOR} \| (.*) \|$", page, re.MULTILINE)[1]
    return html.unescape(re.sub("<[^>]*>", "", row)).replace("Photo Wall", f"\u2068{name}\u2069")


def question(language, **subject):
    """What the alert says in that language, as the sample application would cause it."""
    with tempfile.NamedTemporaryFile(suffix=".mo") as file:
        subprocess.run(["msgfmt", "-o", file.name, PROJECT / f"Resources/{language}.po"], check=True)
        table = gettext.GNUTranslations(open(file.name, "rb")).gettext
    name = subject.get("name", NAMES.get(language, "Photos"))
    return {
        "title": table("ACCOUNT_ACCESS_REQUEST_TITLE"),
        "message": sentence(language, name),
        "allow": table("ACCOUNT_ACCESS_ALLOW_BUTTON_TITLE"),
        "refuse": table("ACCOUNT_ACCESS_DO_NOT_ALLOW_BUTTON_TITLE"),
        "languages": language,
        "subject": {"name": name, "id": "org.example.photos", "identity": "likely", "account": "ada@example.org", **subject},
    }


def window_of(pid):
    deadline = time.monotonic() + LONGEST_WAIT
    while time.monotonic() < deadline:
        found = subprocess.run(["xdotool", "search", "--onlyvisible", "--pid", str(pid)], capture_output=True, text=True, check=False)
        if found.stdout.split():
            return found.stdout.split()[-1]
        time.sleep(0.05)
    raise SystemExit(f"no window of process {pid} appeared")


def take(window, name):
    time.sleep(SETTLED_AFTER)
    subprocess.run(["import", "-frame", "-window", window, FOLDER / f"{name}.png"], check=True)


def picture(name, asked, theme="Adwaita", **environment):
    with Alert(str(HELPER), asked, {"GTK_THEME": theme, **environment}) as alert:
        take(window_of(alert.process.pid), name)


def picture_of_terminal(name, language):
    """A session in which the sample application asks. It makes a file when the question stands."""
    command = f"'{PROJECT}/Tools/Trial/session' '{BUILD}' 2>/dev/null"
    look = ["-fa", "DejaVu Sans Mono", "-fd", "Noto Sans Mono CJK JP", "-fs", "11", "-bg", "white", "-fg", "black", "-xrm",
            "XTerm*forceBoxChars: true"]
    xterm = ["xterm", "-u8", *look, "-geometry", "84x19", "-T", "Terminal", "-e", "bash", "-c", command]
    with subprocess.Popen(xterm, env=os.environ | {"LANGUAGE": language}, stderr=subprocess.DEVNULL) as terminal:
        window = window_of(terminal.pid)
        time.sleep(6)
        take(window, name)
        terminal.terminate()


def pictures_on_x11():
    english = question("en")
    picture("alert-light", english)
    picture("alert-dark", english, theme="Adwaita:dark")
    picture("alert-doubled", english, GDK_SCALE="2")
    picture("alert-claimed", question("en", name="photos", id="/home/ada/bin/photos", identity="claimed"))
    picture("alert-arabic", question("ar"))
    picture("alert-japanese", question("ja"))
    picture_of_terminal("alert-terminal", "en")
    picture_of_terminal("alert-terminal-japanese", "ja")


def pictures_on_wayland():
    with Alert(str(HELPER), question("en"), {"GTK_THEME": "Adwaita"}):
        time.sleep(LONGEST_WAIT / 4)
        picture_file = FOLDER / "alert-wayland.png"
        subprocess.run(["grim", picture_file], check=True)
        # The window with a margin of what is below it.
        subprocess.run(["convert", picture_file, "-fuzz", "2%", "-trim", "-bordercolor", "#323232", "-border", "36", picture_file],
                       check=True)


{"x11": pictures_on_x11, "wayland": pictures_on_wayland}[sys.argv[1]]()
