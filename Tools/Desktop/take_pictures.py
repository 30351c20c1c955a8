"""Shows alerts one after another and takes a picture of each. Run by Tools/Desktop/pictures."""

import gettext
import pathlib
import subprocess
import sys
import tempfile
import time

from alert import Alert

BUILD, FOLDER = map(pathlib.Path, sys.argv[1:3])
PROJECT = pathlib.Path(__file__).resolve().parents[2]
HELPER = BUILD / "bin/palisade-alert"
NAMES = {"ar": "صور", "ja": "フォト"}
# What a window needs to appear and to arm itself.
LONGEST_WAIT = 20
SETTLED_AFTER = 1.5


def texts(language):
    """The texts of the alert in that language, as the sample application would cause them."""
    with tempfile.NamedTemporaryFile(suffix=".mo") as file:
        subprocess.run(["msgfmt", "-o", file.name, PROJECT / f"Resources/{language}.po"], check=True)
        table = gettext.GNUTranslations(open(file.name, "rb")).gettext
    name = NAMES.get(language, "Photos")
    return {
        "title": table("ACCOUNT_ACCESS_REQUEST_TITLE"),
        "message": table("ACCOUNT_ACCESS_BASIC_MESSAGE").replace("%@", f"\u2068{name}\u2069"),
        "allow": table("ACCOUNT_ACCESS_ALLOW_BUTTON_TITLE"),
        "refuse": table("ACCOUNT_ACCESS_DO_NOT_ALLOW_BUTTON_TITLE"),
        "languages": language,
        "subject": {"name": name, "id": "org.example.photos", "identity": "certain", "account": "ada@example.org"},
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
    print(f"{FOLDER / name}.png")


def picture(name, question, environment=None):
    with Alert(str(HELPER), question, {"GTK_THEME": "Adwaita", **(environment or {})}) as alert:
        take(window_of(alert.process.pid), name)


def picture_of_terminal(name):
    command = f"'{PROJECT}/Tools/Trial/session' '{BUILD}' 2>/dev/null"
    xterm = ["xterm", "-fa", "Noto Sans Mono", "-fs", "11", "-geometry", "100x18", "-bg", "white", "-fg", "black", "-T", "Terminal"]
    with subprocess.Popen([*xterm, "-e", "bash", "-c", command], stderr=subprocess.DEVNULL) as terminal:
        window = window_of(terminal.pid)
        time.sleep(8)
        take(window, name)
        terminal.terminate()


picture("alert-light", texts("en"))
picture("alert-dark", texts("en"), {"GTK_THEME": "Adwaita:dark"})
claimed = texts("en")
claimed["subject"] = {"name": "photos", "id": "/home/ada/bin/photos", "identity": "claimed", "account": "ada@example.org"}
picture("alert-claimed", claimed)
picture("alert-arabic", texts("ar"))
picture("alert-japanese", texts("ja"))
picture("alert-doubled", texts("en"), {"GDK_SCALE": "2"})
picture_of_terminal("alert-terminal")
