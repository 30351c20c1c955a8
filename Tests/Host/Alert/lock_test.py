#!/usr/bin/env python3
"""An alert goes away within a second when the session locks, as nobody's answer, and stands through everything else.

The screen saver and the login manager are played by python3-dbusmock on buses of the test's own.
"""

import os
import subprocess
import sys
import time
import unittest

try:
    import dbus
    import dbusmock
except ImportError:
    print("Skipped: there is no python3-dbusmock here, so no session can be locked.")
    sys.exit(77)

PROGRAM, HELPER = sys.argv[1:3]
del sys.argv[1:3]
LOGINS = "org.freedesktop.login1"
MOCK = dbusmock.MOCK_IFACE


class AnAlert(dbusmock.DBusTestCase):
    @classmethod
    def setUpClass(cls):
        cls.start_session_bus()
        cls.start_system_bus()
        cls.saver = cls.spawn_server("org.freedesktop.ScreenSaver", "/org/freedesktop/ScreenSaver", "org.freedesktop.ScreenSaver",
                                     stdout=subprocess.DEVNULL)
        cls.logins, manager = cls.spawn_server_template("logind", {}, stdout=subprocess.DEVNULL)
        manager.AddSession("c1", "seat0", dbus.UInt32(os.getuid()), "me", True, dbus_interface=MOCK)
        manager.AddSession("c2", "seat1", dbus.UInt32(os.getuid() + 1), "other", True, dbus_interface=MOCK)

    @classmethod
    def tearDownClass(cls):
        for server in (cls.saver, cls.logins):
            server.terminate()
            server.wait()
        super().tearDownClass()

    def setUp(self):
        self.alert = subprocess.Popen([PROGRAM, "desktop", "linger", HELPER], stdout=subprocess.PIPE, text=True)
        self.addCleanup(self.end)
        self.assertEqual(self.alert.stdout.readline(), "shown by desktop\n")

    def end(self):
        self.alert.kill()
        self.alert.wait()
        self.alert.stdout.close()

    def emit(self, bus, name, path, *signal):
        bus.get_object(name, path).EmitSignal(*signal, dbus_interface=MOCK)

    def save_screen(self, is_active):
        self.emit(self.get_dbus(), "org.freedesktop.ScreenSaver", "/org/freedesktop/ScreenSaver", "org.freedesktop.ScreenSaver",
                  "ActiveChanged", "b", [is_active])

    def lock(self, session):
        self.emit(self.get_dbus(system_bus=True), LOGINS, f"/org/freedesktop/login1/session/{session}", f"{LOGINS}.Session", "Lock",
                  "", [])

    def assert_goes_away(self):
        before = time.monotonic()
        self.assertEqual(self.alert.stdout.readline(), "nobody\n")
        self.assertLess(time.monotonic() - before, 1)

    def assert_stands(self):
        with self.assertRaises(subprocess.TimeoutExpired):
            self.alert.wait(0.5)

    def test_goes_away_when_the_screen_saver_locks(self):
        self.save_screen(True)
        self.assert_goes_away()

    def test_goes_away_when_the_login_manager_locks(self):
        self.lock("c1")
        self.assert_goes_away()

    def test_goes_away_when_the_desktop_says_that_it_is_locked(self):
        session = self.get_dbus(system_bus=True).get_object(LOGINS, "/org/freedesktop/login1/session/c1")
        session.EmitSignal("org.freedesktop.DBus.Properties", "PropertiesChanged", "sa{sv}as",
                           [f"{LOGINS}.Session", dbus.Dictionary({"LockedHint": True}, signature="sv"), dbus.Array([], signature="s")],
                           dbus_interface=MOCK)
        self.assert_goes_away()

    def test_stands_through_an_unlock_and_another_users_lock(self):
        self.save_screen(False)
        self.lock("c2")
        self.assert_stands()
        self.lock("c1")
        self.assert_goes_away()

    def forge(self, bus, path, interface, member, signature, *values):
        """Says on a connection of its own what somebody else would: to everybody, and to each connection alone."""
        forger = dbus.connection.Connection(os.environ[bus])
        forger.call_blocking("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "Hello", "", [])
        names = forger.call_blocking("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "ListNames", "", [])
        for destination in [None, *(name for name in names if name.startswith(":"))]:
            signal = dbus.lowlevel.SignalMessage(path, interface, member)
            signal.append(*values, signature=signature)
            if destination:
                signal.set_destination(destination)
            forger.send_message(signal)
        forger.flush()
        forger.close()

    def test_stands_through_locks_that_others_claim(self):
        session, system = "DBUS_SESSION_BUS_ADDRESS", "DBUS_SYSTEM_BUS_ADDRESS"
        for saver in ("org.freedesktop.ScreenSaver", "org.gnome.ScreenSaver"):
            self.forge(session, "/org/freedesktop/ScreenSaver", saver, "ActiveChanged", "b", True)
        path = "/org/freedesktop/login1/session/c1"
        self.forge(system, path, f"{LOGINS}.Session", "Lock", "")
        self.forge(system, path, "org.freedesktop.DBus.Properties", "PropertiesChanged", "sa{sv}as", f"{LOGINS}.Session",
                   {"LockedHint": True}, [])
        # Nor does it help to claim the name for oneself.
        for bus, name in ((session, "org.freedesktop.ScreenSaver"), (session, "org.gnome.ScreenSaver"), (system, LOGINS)):
            self.forge(bus, "/org/freedesktop/DBus", "org.freedesktop.DBus", "NameOwnerChanged", "sss", name, "", ":1.0")
        self.assert_stands()
        self.lock("c1")
        self.assert_goes_away()


class AnAlertWithoutABus(unittest.TestCase):
    def test_stands(self):
        nowhere = dict(os.environ, DBUS_SESSION_BUS_ADDRESS="unix:path=/nonexistent", DBUS_SYSTEM_BUS_ADDRESS="unix:path=/nonexistent")
        with subprocess.Popen([PROGRAM, "desktop", "linger", HELPER], stdout=subprocess.PIPE, text=True, env=nowhere) as alert:
            self.assertEqual(alert.stdout.readline(), "shown by desktop\n")
            alert.kill()


if __name__ == "__main__":
    unittest.main(verbosity=2)
