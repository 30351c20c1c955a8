#!/usr/bin/env python3
"""Writes a string table in no language: English letters with accents, for finding texts that do not come from a table.

A text becomes ⟦ text ⟧, a third longer than in English, as many languages are; "%@" becomes ⟨%@⟩. So whoever sees a sentence that
is made from the table sees where each text begins and ends, and where something was put in: letters without accents and
everything outside the brackets come from elsewhere.
"""

import argparse
import pathlib
import sys

sys.dont_write_bytecode = True  # the source tree stays as it is
sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[1] / "lint"))

import po  # noqa: E402

LANGUAGE = "en_XA"

ACCENTS = str.maketrans("ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz",
                        "ÅƁÇÐÉƑĜĤÎĴĶĻṀÑÖÞǪŔŠŢÛṼŴẊÝŽåƀçðéƒĝĥîĵķļɱñöþǫŕšţûṽŵẋýž")


def pseudo_text(text):
    words = text.split("%@")
    padding = "·" * -(-sum(map(len, words)) // 3)
    return "⟦" + "⟨%@⟩".join(word.translate(ACCENTS) for word in words) + padding + "⟧"


def pseudo_catalogue(messages):
    """The catalogue's file; the header is the English one's with another language."""
    quoted = lambda text: '"' + text.replace("\\", "\\\\").replace('"', '\\"').replace("\n", "\\n") + '"'  # noqa: E731
    entries = []
    for message in messages:
        text = pseudo_text(message.text) if message.key else message.text.replace("Language: en\n", f"Language: {LANGUAGE}\n")
        entries.append(f"msgid {quoted(message.key)}\nmsgstr {quoted(text)}\n")
    return "\n".join(entries)


def main(argv=None):
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("english", type=pathlib.Path, help="the English catalogue (.po)")
    parser.add_argument("output", type=pathlib.Path, help="the catalogue to write (.po)")
    arguments = parser.parse_args(argv)
    try:
        messages = po.read(arguments.english)
        arguments.output.parent.mkdir(parents=True, exist_ok=True)
        arguments.output.write_text(pseudo_catalogue(messages), encoding="utf-8")
    except (po.CatalogueError, OSError, UnicodeDecodeError) as error:
        raise SystemExit(str(error)) from error


if __name__ == "__main__":
    main()
