"""Each rule in Tools/lint is run on a small project that breaks it, and has to fail there with a message that says where.

A rule that passes whatever it is given would look like a rule that is kept.
"""

import os
import pathlib
import subprocess
import sys
import tempfile
import unittest

LINT = pathlib.Path(__file__).resolve().parents[2] / "Tools" / "lint"

SOUND = {
    "Platform/Value.h": "#pragma once\n#include <string>\n",
    "Platform/Value.cpp": '#include "Platform/Value.h"\n',
    "Facebook/Palisade/Plugin.cpp": '#include "Platform/Value.h"\n\n#include <vector>\n',
    "Host/Json/Json.cpp": '#include <nlohmann/json.hpp>\n\n#include "Platform/Value.h"\n',
    "README.md": "What it is.\n",
}

# A rule, what is added to the sound project, and what the rule has to say of it.
BROKEN = [
    ("includes", {"Facebook/A.cpp": "#include <nlohmann/json.hpp>\n"}, "Facebook/A.cpp:1: includes <nlohmann/json.hpp>"),
    ("includes", {"Platform/A.h": "\n#include <sys/stat.h>\n"}, "Platform/A.h:2: includes <sys/stat.h>; GNU/Linux belongs"),
    ("includes", {"Facebook/A.cpp": '#include "Host/B.h"\n', "Host/B.h": ""}, 'Facebook/A.cpp:1: includes "Host/B.h"'),
    ("includes", {"Platform/A.cpp": '#include "Host/B.h"\n', "Host/B.h": ""}, 'Platform/A.cpp:1: includes "Host/B.h"'),
    ("includes", {"Host/A.cpp": '#include "Facebook/B.h"\n', "Facebook/B.h": ""}, 'Host/A.cpp:1: includes "Facebook/B.h"'),
    ("includes", {"Testing/A.h": '#include "Host/B.h"\n', "Host/B.h": ""}, 'Testing/A.h:1: includes "Host/B.h"'),
    ("includes", {"Cli/A.cpp": '#include "Host/B.h"\n', "Host/B.h": ""}, 'Cli/A.cpp:1: includes "Host/B.h"'),
    ("includes", {"AlertHelper/A.cpp": '#include "Host/B.h"\n', "Host/B.h": ""}, 'AlertHelper/A.cpp:1: includes "Host/B.h"'),
    ("includes", {"Tools/A.cpp": '#include "Facebook/B.h"\n', "Facebook/B.h": ""}, 'Tools/A.cpp:1: includes "Facebook/B.h"'),
    ("includes", {"Host/Bus/A.cpp": "#include <nlohmann/json.hpp>\n"}, "nlohmann/json belongs to Host/Json"),
    ("includes", {"Testing/A.h": "#include <gmock/gmock.h>\n"}, "GoogleTest belongs to Tests"),
    ("includes", {"Host/A.cpp": "#include <zip.h>\n"}, "Host/A.cpp:1: includes <zip.h>, which is neither"),
    ("includes", {"Host/A.cpp": '#include "Gone.h"\n'}, 'includes "Gone.h", which is no file of the project'),
    ("includes", {"Host/B.h": "", "Host/A.cpp": '#include "B.h"\n'}, 'includes "B.h", which is no file of the project'),
    ("includes", {"Host/A.cpp": "#  include HEADER\n"}, "Host/A.cpp:1: names what it includes through a macro"),
    ("includes", {"Elsewhere/A.cpp": ""}, "Elsewhere/A.cpp: lies in a folder that include_rules.toml does not know"),
    ("include_cycles", {"Host/A.h": '#include "Host/A.h"\n'}, "cycle: Host/A.h -> Host/A.h"),
    (
        "include_cycles",
        {
            "Host/A.h": '#include "Platform/Value.h"\n#include "Host/B.h"\n',
            "Host/B.h": '#include "Host/C.h"\n',
            "Host/C.h": '#include "Host/B.h"\n',
        },
        "cycle: Host/B.h -> Host/C.h -> Host/B.h",
    ),
    ("file_length", {"Host/A.cpp": "//\n" * 601}, "Host/A.cpp: 601 lines"),
    ("named_tests", {"Docs/a.md": "Refused.\n[`ATest`, `Integration.Gone`]\n", "Tests/ATest.cpp": "TEST(ATest, Runs) {}\n"},
     "Docs/a.md:2: names the test Integration.Gone"),
    ("format", {"Host/A.cpp": "int  main( ) { }\n", ".clang-format": "BasedOnStyle: Google\n"}, "Host/A.cpp:1:4: error"),
]


class Project:
    """A small project in a folder of its own."""

    def __init__(self, files):
        self._folder = tempfile.TemporaryDirectory(prefix="palisade-lint-")
        self.root = pathlib.Path(self._folder.name)
        for name, content in files.items():
            path = self.root / name
            path.parent.mkdir(parents=True, exist_ok=True)
            path.write_text(content, encoding="utf-8")

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self._folder.cleanup()

    def check(self, rule):
        """Runs a rule; answers whether it passed, and what it said."""
        return run(LINT / f"check_{rule}.py", "--root", self.root)


def run(script, *words):
    ended = subprocess.run([sys.executable, "-B", script, *words], capture_output=True, text=True, check=False)
    return ended.returncode == 0, ended.stdout + ended.stderr


class ARule(unittest.TestCase):
    def test_passes_on_a_sound_project(self):
        with Project(SOUND) as sound:
            for rule in sorted({rule for rule, _, _ in BROKEN}):
                with self.subTest(rule):
                    passed, said = sound.check(rule)
                    self.assertTrue(passed, said)

    def test_fails_on_a_project_that_breaks_it_and_says_where(self):
        for rule, added, expected in BROKEN:
            with self.subTest(rule, expected=expected), Project({**SOUND, **added}) as broken:
                passed, said = broken.check(rule)
                self.assertFalse(passed, said)
                self.assertIn(expected, said)

    def test_explains_itself(self):
        for script in sorted(LINT.glob("check_*.py")):
            with self.subTest(script.name):
                passed, said = run(script, "--help")
                self.assertTrue(passed, said)
                self.assertIn("usage:", said)


class TheLengthRule(unittest.TestCase):
    def test_warns_before_it_fails(self):
        with Project({"Host/A.cpp": "//\n" * 401}) as long:
            passed, said = long.check("file_length")
            self.assertTrue(passed, said)
            self.assertIn("warning: Host/A.cpp: 401 lines", said)


class TheFormatRule(unittest.TestCase):
    def test_mends_what_it_found(self):
        with Project({"Host/A.cpp": "int  main( ) { }\n", ".clang-format": "BasedOnStyle: Google\n"}) as untidy:
            passed, said = run(LINT / "check_format.py", "--root", untidy.root, "--fix")
            self.assertTrue(passed, said)
            passed, said = untidy.check("format")
            self.assertTrue(passed, said)


class TheExportRule(unittest.TestCase):
    def check(self, source, *link_options):
        with Project({"module.cpp": source, "expected.txt": "# The entry.\nentry\n"}) as project:
            module = project.root / "module.so"
            compiler = os.environ.get("CXX", "c++")
            command = [compiler, "-shared", "-fPIC", "-fvisibility=hidden", project.root / "module.cpp", "-o", module]
            subprocess.run([*command, *link_options], check=True)
            return run(LINT / "check_exports.py", module, project.root / "expected.txt")

    SHOWN = '__attribute__((visibility("default")))'
    ENTRY = f'extern "C" {SHOWN} void entry() {{}}\n'

    def test_passes_a_module_that_shows_what_is_listed_and_stays(self):
        passed, said = self.check(self.ENTRY + "void hidden() {}\n", "-Wl,-z,nodelete")
        self.assertTrue(passed, said)

    def test_fails_on_a_symbol_that_is_not_listed(self):
        passed, said = self.check(self.ENTRY + f'extern "C" {self.SHOWN} void more() {{}}\n', "-Wl,-z,nodelete")
        self.assertFalse(passed, said)
        self.assertIn("more is exported but not listed", said)

    def test_fails_on_a_listed_symbol_that_is_missing(self):
        passed, said = self.check("void hidden() {}\n", "-Wl,-z,nodelete")
        self.assertFalse(passed, said)
        self.assertIn("entry is not exported", said)

    def test_fails_on_a_module_that_can_be_unloaded(self):
        passed, said = self.check(self.ENTRY)
        self.assertFalse(passed, said)
        self.assertIn("can be unloaded", said)


if __name__ == "__main__":
    unittest.main()
