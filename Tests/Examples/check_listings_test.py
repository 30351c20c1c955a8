"""The check of the documents' listings finds what it is there to find."""

import contextlib
import io
import pathlib
import sys
import tempfile
import unittest

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[2] / "Tools/lint"))

import check_listings  # noqa: E402

FILE = "int one();\n\nint two();\nint three();\n"


class TheListingCheck(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.root = pathlib.Path(folder.name)
        (self.root / "numbers.h").write_text(FILE, encoding="utf-8")

    def findings(self, document):
        """What the check exits with, empty when all is well."""
        path = self.root / "guide.md"
        path.write_text(document, encoding="utf-8")
        try:
            with contextlib.redirect_stdout(io.StringIO()):
                check_listings.main(["--root", str(self.root), str(path)])
        except SystemExit as end:
            return str(end)
        return ""

    def assert_finds(self, document, sentence):
        self.assertIn(sentence, self.findings(document))

    def test_accepts_a_whole_file(self):
        self.assertEqual(self.findings(f"Text\n```cpp file=numbers.h\n{FILE}```\n"), "")

    def test_accepts_a_file_in_pieces_with_text_and_commands_between(self):
        first = "```cpp file=numbers.h\nint one();\n```\n"
        pieces = first + "and\n```sh\nmake\n```\n```cpp file=numbers.h\nint two();\nint three();\n```\n"
        self.assertEqual(self.findings(pieces), "")

    def test_finds_a_changed_line(self):
        self.assert_finds(
            f"```cpp file=numbers.h\n{FILE.replace('two', 'zwei')}```\n",
            "guide.md:4: 'int zwei();' is 'int two();' in numbers.h:3.",
        )

    def test_finds_what_was_left_out_in_the_middle(self):
        self.assert_finds("```cpp file=numbers.h\nint one();\nint three();\n```\n", "'int three();' is 'int two();'")

    def test_finds_what_was_left_out_at_the_end(self):
        self.assert_finds("```cpp file=numbers.h\nint one();\n```\n", "numbers.h goes on with 'int two();' (line 3).")

    def test_finds_what_the_file_does_not_have(self):
        self.assert_finds(f"```cpp file=numbers.h\n{FILE}int four();\n```\n", "numbers.h has ended before 'int four();'.")

    def test_finds_a_file_that_is_gone(self):
        self.assert_finds(f"```cpp file=letters.h\n{FILE}```\n", "there is no letters.h.")

    def test_refuses_code_without_a_file(self):
        self.assert_finds(f"```cpp file=numbers.h\n{FILE}```\n```cpp\nint ten();\n```\n", "a listing in 'cpp' names no file")

    def test_refuses_a_document_without_listings(self):
        self.assert_finds("Text\n", "there is no listing to compare.")


if __name__ == "__main__":
    unittest.main()
