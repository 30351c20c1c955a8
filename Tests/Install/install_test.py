#!/usr/bin/env python3
"""What `cmake --install` leaves behind: everything that is needed, in the right component, and enough to write a plug-in with.

Installs a build below a folder of its own, and from then on uses nothing but what lies there.
"""

import json
import os
import pathlib
import shutil
import subprocess
import sys
import tempfile
import unittest

PROJECT = pathlib.Path(__file__).resolve().parents[2]
BUILD = pathlib.Path(sys.argv.pop(1)).resolve()
CMAKE = sys.argv.pop(1)

RUNTIME = """
    bin/palisade
    libexec/accountd
    libexec/vantad
    etc/xdg/palisade/accountd.toml
    etc/xdg/palisade/server.toml
    lib/systemd/user/accountd.service
    lib/systemd/user/vantad.service
    share/bash-completion/completions/palisade
    share/zsh/site-functions/_palisade
    share/fish/vendor_completions.d/palisade.fish
    share/dbus-1/services/com.veltran.Accounts1.service
    share/dbus-1/services/com.veltran.Vantad1.service
    LIB/palisade/plugins/VXFacebookAccountAccessPlugin/VXFacebookAccountAccessPlugin.so
    LIB/palisade/plugins/VXFacebookAccountAccessPlugin/Resources/en/LC_MESSAGES/Localizable.mo
""".split()
DEVELOPMENT = """
    bin/plugin-replay
    bin/palisade-sandbox
    include/palisade/Platform/AccountAccessPlugin.h
    include/palisade/Testing/FakePlatform.h
    LIB/libpalisade-platform.a
    LIB/libpalisade-testing.a
    LIB/cmake/Palisade/PalisadeConfig.cmake
    LIB/cmake/Palisade/PluginFolder.cmake
    share/dbus-1/interfaces/com.veltran.Accounts1.xml
    share/palisade/scenarios/first-consent.json
""".split()
if shutil.which("scdoc"):
    RUNTIME += ["share/man/man1/palisade.1", "share/man/man8/accountd.8", "share/man/man5/accountd.toml.5"]
    DEVELOPMENT += ["share/man/man1/plugin-replay.1"]

SCENARIO = {"id": "planner",
            "accountType": {"identifier": "org.example.accounttype.calendar"},
            "clients": {"planner": {"bundleID": "org.example.planner", "appName": "Planner"}},
            "accounts": [{"id": "1", "type": "org.example.accounttype.calendar"}],
            "alert": {"word": 0},
            "operations": [{"name": "handleAccessRequest", "client": "planner"}]}


def run(*command, **options) -> str:
    """What the command prints; what it says when it fails is the test's failure."""
    done = subprocess.run([str(word) for word in command], text=True, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                          stderr=subprocess.STDOUT, check=False, **options)
    if done.returncode != 0:
        raise AssertionError(f"{' '.join(map(str, command))} ended with {done.returncode}:\n{done.stdout}")
    return done.stdout


def install(prefix: pathlib.Path, *options: str) -> None:
    run(CMAKE, "--install", BUILD, "--prefix", prefix, *options)


def library_folder() -> str:
    for line in (BUILD / "CMakeCache.txt").read_text(encoding="utf-8").splitlines():
        if line.startswith("CMAKE_INSTALL_LIBDIR:"):
            return line.partition("=")[2]
    raise AssertionError("the build does not say where libraries go")


def missing(prefix: pathlib.Path, names: "list[str]") -> "list[str]":
    return [name for name in names if not (prefix / name.replace("LIB", library_folder(), 1)).is_file()]


class WhatIsInstalled(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls._folder = tempfile.TemporaryDirectory(prefix="palisade-install-")
        cls.folder = pathlib.Path(cls._folder.name)
        cls.prefix = cls.folder / "prefix"
        os.umask(0o002)
        install(cls.prefix)

    @classmethod
    def tearDownClass(cls):
        cls._folder.cleanup()

    def test_is_complete(self):
        self.assertEqual(missing(self.prefix, RUNTIME + DEVELOPMENT), [])

    def test_keeps_the_settings_that_somebody_has_written(self):
        written = self.prefix / "etc/xdg/palisade/server.toml"
        original = written.read_text(encoding="utf-8")
        written.write_text("# ours\n", encoding="utf-8")
        install(self.prefix, "--component", "runtime")
        self.assertEqual(written.read_text(encoding="utf-8"), "# ours\n")
        written.write_text(original, encoding="utf-8")

    def test_puts_settings_where_they_are_looked_for_below_usr(self):
        staged = self.folder / "staged"
        run(CMAKE, "--install", BUILD, "--prefix", "/usr", "--component", "runtime", env=dict(os.environ, DESTDIR=str(staged)))
        self.assertEqual(missing(staged, ["etc/xdg/palisade/accountd.toml", "usr/libexec/accountd"]), [])
        service = staged / "usr/share/dbus-1/services/com.veltran.Accounts1.service"
        self.assertIn("Exec=/usr/libexec/accountd\n", service.read_text(encoding="utf-8"))

    def test_comes_in_two_components(self):
        for component, own, other in [("runtime", RUNTIME, DEVELOPMENT), ("development", DEVELOPMENT, RUNTIME)]:
            with self.subTest(component):
                prefix = self.folder / component
                install(prefix, "--component", component)
                self.assertEqual(missing(prefix, own), [])
                self.assertEqual(missing(prefix, other), other)

    def test_names_the_daemons_where_they_were_installed(self):
        for name, daemon in [("lib/systemd/user/accountd.service", "accountd"), ("lib/systemd/user/vantad.service", "vantad"),
                             ("share/dbus-1/services/com.veltran.Accounts1.service", "accountd")]:
            self.assertIn(f"{self.prefix}/libexec/{daemon}\n", (self.prefix / name).read_text(encoding="utf-8"))

    def test_mentions_the_build_and_the_sources_nowhere(self):
        for path in self.prefix.rglob("*"):
            if path.suffix in (".cmake", ".service", ".toml", ".xml", ".h"):
                content = path.read_text(encoding="utf-8")
                self.assertNotIn(str(BUILD), content, path)
                self.assertNotIn(str(PROJECT), content, path)

    def test_runs_where_it_was_installed(self):
        for program in ["bin/palisade", "libexec/accountd", "libexec/vantad"]:
            self.assertIn(pathlib.Path(program).name, run(self.prefix / program, "--version"))

    def test_replays_a_scenario_through_the_facebook_plugin(self):
        plugins = self.prefix / library_folder() / "palisade/plugins"
        events = run(self.prefix / "bin/plugin-replay", "--module",
                     plugins / "VXFacebookAccountAccessPlugin/VXFacebookAccountAccessPlugin.so",
                     self.prefix / "share/palisade/scenarios/first-consent.json")
        self.assertIn("events", json.loads(events))

    def test_is_enough_to_write_test_and_try_a_plugin(self):
        calendar = self.folder / "calendar"
        shutil.copytree(PROJECT / "Examples/Calendar", calendar)
        shutil.copytree(PROJECT / "Tests/Install/Outside", self.folder / "outside")
        scenario = self.folder / "planner.json"
        scenario.write_text(json.dumps(SCENARIO), encoding="utf-8")

        self.build("calendar")
        self.build("outside", f"-DCALENDAR={calendar}")
        module = self.folder / "calendar-build/plugins/CalendarAccessPlugin/CalendarAccessPlugin.so"
        trace = json.loads(run(self.prefix / "bin/plugin-replay", "--module", module, scenario))
        self.assertIn("would like to see and change the events", json.dumps(trace))
        self.assertEqual(run(self.folder / "outside-build/outside-test"), "granted\n")

        run(CMAKE, "--install", self.folder / "calendar-build", "--prefix", self.prefix)
        installed = ["LIB/palisade/plugins/CalendarAccessPlugin/" + name
                     for name in ("CalendarAccessPlugin.so", "Resources/en/LC_MESSAGES/Localizable.mo")]
        self.assertEqual(missing(self.prefix, installed), [])

    def build(self, name: str, *options: str) -> None:
        run(CMAKE, "-S", self.folder / name, "-B", self.folder / f"{name}-build", "-G", "Ninja",
            f"-DCMAKE_PREFIX_PATH={self.prefix}", f"-DCMAKE_INSTALL_LIBDIR={library_folder()}", *options)
        run(CMAKE, "--build", self.folder / f"{name}-build")


if __name__ == "__main__":
    unittest.main(verbosity=2)
