"""Every translation is in its language: its texts are not the English ones, and are written as the language is written.

What all languages share (keys, placeholders, headers) is checked by Tools/lint/check_string_keys.py.
"""

import pathlib
import re
import sys
import unittest

ROOT = pathlib.Path(__file__).resolve().parents[2]
sys.path.insert(0, str(ROOT / "Tools/lint"))

import po  # noqa: E402

# Words that a language shares with English: language, text, reason.
SHARED = {
    ("de", "Chats"): "the German word, capital included",
}

# Letters of languages that do not use Latin ones.
SCRIPTS = {
    "ar": "\u0600-\u06FF",
    "he": "\u0590-\u05FF",
    "ja": "\u3040-\u30FF\u4E00-\u9FFF",
    "ko": "\uAC00-\uD7A3",
    "ru": "\u0400-\u04FF",
    "zh_CN": "\u4E00-\u9FFF",
    "zh_TW": "\u4E00-\u9FFF",
}

# Small words of English that are no words of the other languages.
ENGLISH_WORDS = re.compile(r"\b(your|and|the|would|with|friends|of|not)\b", re.IGNORECASE)

# French sets a no-break space before these, and inside quotation marks.
FRENCH_WITHOUT_SPACE = re.compile("(?<![\u00A0\u202F])[:;?!»]|«(?![\u00A0\u202F])")


def texts(language):
    """The texts that hold words, by key."""
    messages = po.read(ROOT / "Resources" / f"{language}.po")
    return {message.key: message.text for message in messages if message.key not in ("", "WORD_LIST_SEPARATOR")}


ENGLISH = texts("en")
LANGUAGES = sorted(path.stem for path in (ROOT / "Resources").glob("*.po") if path.stem != "en")
TRANSLATIONS = [(language, key, text) for language in LANGUAGES for key, text in texts(language).items()]


class ATranslation(unittest.TestCase):
    def assert_none(self, found):
        found = list(found)
        self.assertFalse(found, "\n".join(["", *(f"{language}: {key}: {text}" for language, key, text in found)]))

    def test_is_not_the_english_text(self):
        self.assert_none((language, key, text) for language, key, text in TRANSLATIONS
                         if text.casefold() == ENGLISH.get(key, "").casefold() and (language, text) not in SHARED)

    def test_shares_no_more_words_than_it_must(self):
        self.assertEqual({(language, text) for language, key, text in TRANSLATIONS
                          if text.casefold() == ENGLISH.get(key, "").casefold()}, set(SHARED))

    def test_holds_no_english_words(self):
        self.assert_none(one for one in TRANSLATIONS if ENGLISH_WORDS.search(one[2]))

    def test_is_written_in_its_script(self):
        def is_in_script(language, text):
            words = text.replace("%@", "").replace("Facebook", "")
            return not words or (re.search(f"[{SCRIPTS[language]}]", words) and not re.search("[A-Za-z]", words))

        self.assert_none((language, key, text) for language, key, text in TRANSLATIONS
                         if language in SCRIPTS and not is_in_script(language, text))

    def test_has_typographic_quotation_marks_and_apostrophes(self):
        self.assert_none(one for one in TRANSLATIONS if re.search("[\"'`]", one[2]))

    def test_has_the_spaces_of_french(self):
        self.assert_none(one for one in TRANSLATIONS if one[0] == "fr" and FRENCH_WITHOUT_SPACE.search(one[2]))


if __name__ == "__main__":
    unittest.main()
