"""A portal backend that does what its questions tell it, for tests of what may come from one.

    portal_backend.py NAME

Takes the name on the session bus, also from another backend, and lets others take it. A question's title is a list of orders,
carried out one after another: "after SECONDS"; "reply WORD" is a well-formed reply; "form SIGNATURE" a reply of other types, whose
numbers are 0; "error"; "accomplice" has another connection reply 0; "exit"; "stop" stops the process; "release" gives the name
up; "deaf" has the first word to close the question unheard. Says on standard output, a line of JSON each, what it is asked and when it is told to close that.
"""

import json
import os
import signal
import sys

import dbus
import dbus.bus
import dbus.lowlevel
import dbus.mainloop.glib
from gi.repository import GLib

ACCESS = "org.freedesktop.impl.portal.Access"
REQUEST = "org.freedesktop.impl.portal.Request"
PARTS = ("handle", "app_id", "parent", "title", "subtitle", "body", "options")
# One value of each type that a reply may be made of.
VALUES = {"u": 0, "i": 0, "t": 0, "y": 0, "b": False, "s": "0", "v": dbus.UInt32(0), "a{sv}": {}, "a{ss}": {}, "au": [0],
          "(ua{sv})": (0, {})}

NAME = sys.argv[1]
deaf = set()
bus = dbus.SessionBus(mainloop=dbus.mainloop.glib.DBusGMainLoop())
another_bus = dbus.bus.BusConnection(os.environ["DBUS_SESSION_BUS_ADDRESS"], mainloop=dbus.mainloop.glib.DBusGMainLoop())


def say(**what):
    print(json.dumps(what), flush=True)


def reply(call, *values, signature, connection=bus):
    message = dbus.lowlevel.MethodReturnMessage(call)
    if signature:
        message.append(*values, signature=signature)
    connection.send_message(message)


def types_in(signature):
    """The first types first: "ua{sv}" is "u" and "a{sv}"."""
    while signature:
        found = max((known for known in VALUES if signature.startswith(known)), key=len)
        yield found
        signature = signature[len(found):]


def carry_out(call, orders):
    while orders:
        order = orders.pop(0)
        if order == "after":
            GLib.timeout_add(int(float(orders.pop(0)) * 1000), carry_out, call, orders)
            return False
        if order == "reply":
            reply(call, int(orders.pop(0)), {}, signature="ua{sv}")
        elif order == "form":
            signature = orders.pop(0) if orders and orders[0] != "after" else ""
            reply(call, *(VALUES[known] for known in types_in(signature)), signature=signature)
        elif order == "error":
            bus.send_message(dbus.lowlevel.ErrorMessage(call, "org.example.Error", "consent"))
        elif order == "accomplice":
            reply(call, 0, {}, signature="ua{sv}", connection=another_bus)
        elif order == "exit":
            os._exit(0)
        elif order == "stop":
            os.kill(os.getpid(), signal.SIGSTOP)
        elif order == "deaf":
            deaf.add(call.get_args_list()[0])
        elif order == "release":
            bus.release_name(NAME)
        else:
            raise SystemExit(f"unknown order: {order}")
    return False


def answer(_, message):
    if message.get_type() != dbus.lowlevel.MESSAGE_TYPE_METHOD_CALL:
        return dbus.lowlevel.HANDLER_RESULT_NOT_YET_HANDLED
    if message.is_method_call(ACCESS, "AccessDialog"):
        parts = dict(zip(PARTS, message.get_args_list()))
        say(**parts, path=message.get_path(), signature=message.get_signature())
        carry_out(message, str(parts["title"]).split())
        return dbus.lowlevel.HANDLER_RESULT_HANDLED
    if message.is_method_call(REQUEST, "Close"):
        if message.get_path() in deaf:
            deaf.remove(message.get_path())
            bus.send_message(dbus.lowlevel.ErrorMessage(message, "org.freedesktop.DBus.Error.UnknownMethod", "not yet"))
        else:
            say(closed=message.get_path())
            reply(message, signature="")
        return dbus.lowlevel.HANDLER_RESULT_HANDLED
    return dbus.lowlevel.HANDLER_RESULT_NOT_YET_HANDLED


bus.add_message_filter(answer)
bus.request_name(NAME, dbus.bus.NAME_FLAG_ALLOW_REPLACEMENT | dbus.bus.NAME_FLAG_REPLACE_EXISTING)
say(serves=NAME)
GLib.MainLoop().run()
