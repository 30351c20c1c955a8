"""The language of marked texts has all English texts, each marked, longer and without a letter of the English one."""

import pathlib
import re
import sys
import tempfile
import unittest

ROOT = pathlib.Path(__file__).resolve().parents[2]
sys.path.insert(0, str(ROOT / "Tools/strings"))

import pseudo_locale  # noqa: E402
from pseudo_locale import po  # noqa: E402

ENGLISH = ROOT / "Resources/en.po"


class TheMarkedLanguage(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        with tempfile.TemporaryDirectory() as folder:
            path = pathlib.Path(folder) / "new" / "en_XA.po"
            pseudo_locale.main([str(ENGLISH), str(path)])
            header, *texts = po.read(path)
        cls.header = header.text
        cls.pairs = [(english.text, marked.text) for english, marked in zip(po.read(ENGLISH)[1:], texts, strict=True)
                     if english.key == marked.key]

    def test_has_a_header_of_its_own(self):
        self.assertEqual(po.header_field(self.header, "Language"), "en_XA")

    def test_has_every_text_and_placeholder(self):
        self.assertEqual(len(self.pairs), len(po.read(ENGLISH)) - 1)
        for english, marked in self.pairs:
            self.assertEqual(marked.count("⟨%@⟩"), english.count("%@"))
            self.assertEqual(marked.count("%"), english.count("%@"))

    def test_marks_both_ends_of_each_text(self):
        for _, marked in self.pairs:
            self.assertRegex(marked, "^⟦[^⟦⟧]*⟧$")

    def test_has_texts_that_are_a_third_longer(self):
        for english, marked in self.pairs:
            words, inside = english.replace("%@", ""), re.sub("[⟦⟧⟨⟩]|%@", "", marked)
            self.assertGreaterEqual(3 * len(inside), 4 * len(words))

    def test_has_accents_on_all_letters(self):
        for _, marked in self.pairs:
            self.assertNotRegex(marked, "[A-Za-z]")


if __name__ == "__main__":
    unittest.main()
