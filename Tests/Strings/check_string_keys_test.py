"""The check of the string tables finds what it is there to find. Each test breaks a copy of the real sources or tables."""

import contextlib
import io
import pathlib
import shutil
import sys
import tempfile
import unittest

ROOT = pathlib.Path(__file__).resolve().parents[2]
sys.path.insert(0, str(ROOT / "Tools/lint"))

import check_string_keys  # noqa: E402


class TheStringKeyCheck(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.sources = pathlib.Path(folder.name) / "sources"
        self.resources = pathlib.Path(folder.name) / "resources"
        shutil.copytree(ROOT / "Facebook/Palisade", self.sources)
        self.resources.mkdir()
        shutil.copy(ROOT / "Resources/en.po", self.resources)

    def replace(self, path, old, new):
        text = path.read_text(encoding="utf-8")
        self.assertIn(old, text)
        path.write_text(text.replace(old, new, 1), encoding="utf-8")

    def source(self, subject):
        return self.sources / f"VXFacebookAccountAccessPlugin{subject}.cpp"

    def add_language(self, old="", new=""):
        """A German table that is English but for one replacement."""
        path = self.resources / "de.po"
        shutil.copy(self.resources / "en.po", path)
        self.replace(path, "Language: en", "Language: de")
        self.replace(path, old, new)

    def run_check(self):
        """What the check prints when all is well, and what it exits with when it is not."""
        output = io.StringIO()
        try:
            with contextlib.redirect_stdout(output):
                check_string_keys.main(["--sources", str(self.sources), "--resources", str(self.resources)])
        except SystemExit as end:
            return output.getvalue(), str(end)
        return output.getvalue(), ""

    def assert_accepts(self):
        output, findings = self.run_check()
        self.assertEqual(findings, "")
        return output

    def assert_finds(self, *sentences):
        _, findings = self.run_check()
        for sentence in sentences:
            self.assertIn(sentence, findings)
        self.assertEqual(len(findings.splitlines()), len(sentences), findings)

    def test_accepts_tables_that_fit(self):
        self.add_language()
        self.assertEqual(self.assert_accepts(), "81 keys, 2 languages: all as they should be.\n")

    def test_finds_a_key_that_english_lacks(self):
        self.replace(self.resources / "en.po", 'msgid "POST_PRIVATELY"\nmsgstr "so that only you can see them"\n', "")
        self.assert_finds("POST_PRIVATELY is missing; the plug-in uses it.")

    def test_finds_a_key_that_the_sources_began_to_use(self):
        self.replace(self.source("Phrasing"), '"POST_TO_FRIENDS"', '"POST_TO_FAMILY"')
        self.assert_finds("POST_TO_FAMILY is missing; the plug-in uses it.", "POST_TO_FRIENDS is unknown to the plug-in.")

    def test_forms_the_keys_of_new_permissions(self):
        self.replace(self.source("Catalogue"), '"read_insights",', '"read_insights", "user_games",')
        self.replace(self.source("Catalogue"), '"manage_pages",', '"manage_pages", "manage_games",')
        self.assert_finds(
            "FACEBOOK_READ_PERMISSION_USER_GAMES is missing", "FACEBOOK_MANAGE_PERMISSION_MANAGE_GAMES is missing"
        )

    def test_does_not_ask_for_names_of_basic_permissions(self):
        self.replace(self.source("Catalogue"), '"email",', '"email", "phone",')
        self.assert_accepts()

    def test_finds_a_list_format_without_its_form_for_several_names(self):
        self.replace(self.source("Phrasing"), '"ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS"', '"ACCOUNT_ACCESS_BASIC_MESSAGE"')
        self.assert_finds(
            "ACCOUNT_ACCESS_BASIC_MESSAGE_MULTIPLE is missing",
            "ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS is unknown to the plug-in",
            "ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS_MULTIPLE is unknown to the plug-in",
        )

    def test_ignores_keys_in_comments(self):
        self.replace(self.source("Phrasing"), "namespace palisade {", '// "A_KEY_OF_YORE"\nnamespace palisade {')
        self.assert_accepts()

    def test_finds_key_formats_that_it_does_not_know(self):
        self.replace(self.source("Phrasing"), '"POST_PRIVATELY"', '"POST_TO_%@"')
        self.assert_finds("'POST_TO_%@' forms keys at run time", "POST_PRIVATELY is unknown to the plug-in.")

    def test_finds_a_missing_placeholder_in_english(self):
        self.replace(self.resources / "en.po", "to %@, to %@, and to %@.", "to %@, and to %@.")
        self.assert_finds("ACCOUNT_ACCESS_THREE_PERMISSION_FORMAT has 3 of %@, the plug-in has 4.")

    def test_finds_a_key_that_a_language_lacks(self):
        self.add_language('msgid "POST_PRIVATELY"\nmsgstr "so that only you can see them"\n', "")
        self.assert_finds("de.po:1: POST_PRIVATELY is missing; en.po uses it.")

    def test_finds_a_key_that_only_one_language_has(self):
        self.add_language('msgid "POST_PRIVATELY"', 'msgid "POST_SECRETLY"\nmsgstr "x"\n\nmsgid "POST_PRIVATELY"')
        self.assert_finds("POST_SECRETLY is unknown to en.po.")

    def test_finds_another_number_of_placeholders_in_a_language(self):
        self.add_language("see %@ as well as %@", "see %@")
        self.assert_finds("ACCOUNT_ACCESS_EXTENDED_READ_MULTIPLE has 1 of %@, en.po has 2.")

    def test_finds_placeholders_of_other_kinds(self):
        self.add_language("see %@ as well as %@", "see %2$@ as well as %1$@")
        self.assert_finds(
            "ACCOUNT_ACCESS_EXTENDED_READ_MULTIPLE holds '%2$'; the only placeholder is %@.",
            "ACCOUNT_ACCESS_EXTENDED_READ_MULTIPLE has 0 of %@, en.po has 2.",
        )

    def test_finds_an_empty_text(self):
        self.add_language('msgstr "Allow"', 'msgstr ""')
        self.assert_finds("ACCOUNT_ACCESS_ALLOW_BUTTON_TITLE has no text.")

    def test_finds_a_fuzzy_text(self):
        self.add_language('msgid "POST_PRIVATELY"', '#, fuzzy\nmsgid "POST_PRIVATELY"')
        self.assert_finds("POST_PRIVATELY is marked fuzzy")

    def test_finds_a_key_that_occurs_twice(self):
        self.add_language('msgid "POST_PRIVATELY"', 'msgid "POST_PRIVATELY"\nmsgstr "x"\n\nmsgid "POST_PRIVATELY"')
        self.assert_finds("POST_PRIVATELY occurs twice.")

    def test_finds_a_blank_at_the_edge_of_a_text(self):
        self.add_language("so that only you can see them", "so that only you can see them ")
        self.assert_finds("POST_PRIVATELY begins or ends with a blank.")

    def test_finds_two_names_that_a_list_would_show_as_one(self):
        self.add_language('msgstr "custom friend lists"\n\nmsgid "FACEBOOK_MANAGE', 'msgstr "ads"\n\nmsgid "FACEBOOK_MANAGE')
        self.assert_finds("are both 'ads'; a list would show them as one.")

    def test_finds_a_header_of_another_language(self):
        self.add_language()
        (self.resources / "de.po").rename(self.resources / "fr.po")
        self.assert_finds("the header says 'Language: de', the file is named fr.po.")

    def test_finds_another_character_set(self):
        self.add_language("charset=UTF-8", "charset=ISO-8859-1")
        self.assert_finds("the header does not say")

    def test_says_where_a_file_is_no_catalogue(self):
        self.add_language('msgid "POST_PRIVATELY"', 'mgsid "POST_PRIVATELY"')
        self.assert_finds("neither a comment, a keyword nor a text in quotes")


if __name__ == "__main__":
    unittest.main()
