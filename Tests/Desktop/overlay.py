"""A window that covers a point of the screen, above all others, as an attacker would put it. Says so when it stands."""

import sys

import gi

gi.require_version("Gtk", "3.0")
from gi.repository import Gtk  # noqa: E402

x, y = map(int, sys.argv[1:])
window = Gtk.Window(type=Gtk.WindowType.POPUP)
window.set_default_size(60, 30)
window.connect("map-event", lambda *_: print("covered", flush=True))
window.move(x - 30, y - 15)
window.show_all()
Gtk.main()
