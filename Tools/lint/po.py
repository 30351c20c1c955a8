"""Reads gettext catalogues, as far as the project's checks need them."""

import dataclasses
import pathlib
import re

_LINE = re.compile(r'(?:(msgctxt|msgid_plural|msgid|msgstr)\s+)?"((?:[^"\\]|\\.)*)"$')
_ESCAPES = {"n": "\n", "t": "\t", '"': '"', "\\": "\\"}


@dataclasses.dataclass
class Message:
    key: str = ""
    text: str = ""
    line: int = 0
    fuzzy: bool = False


class CatalogueError(Exception):
    """The file is no catalogue of the kind that the project uses. Says file, line and what is wrong."""


def _unescaped(literal, place):
    def replacement(match):
        if match[1] not in _ESCAPES:
            raise CatalogueError(f"{place}: unknown escape \\{match[1]}")
        return _ESCAPES[match[1]]

    return re.sub(r"\\(.)", replacement, literal)


def read(path):
    """The messages of a catalogue in their order, the header first. Obsolete messages (#~) are left out."""
    messages = []
    field = None
    fuzzy = False
    for number, line in enumerate(pathlib.Path(path).read_text(encoding="utf-8").splitlines(), start=1):
        place = f"{path}:{number}"
        line = line.strip()
        if not line or line.startswith("#"):
            fuzzy = fuzzy or (line.startswith("#,") and "fuzzy" in line)
            field = None
            continue
        match = _LINE.match(line)
        if not match or (match[1] is None and field is None):
            raise CatalogueError(f"{place}: neither a comment, a keyword nor a text in quotes")
        if match[1] in ("msgctxt", "msgid_plural"):
            raise CatalogueError(f"{place}: {match[1]} is not used; a message is named by its key alone")
        if match[1] == "msgid":
            messages.append(Message(line=number, fuzzy=fuzzy))
            fuzzy = False
        elif match[1] == "msgstr" and not messages:
            raise CatalogueError(f"{place}: a text without a key")
        field = match[1] or field
        text = _unescaped(match[2], place)
        if field == "msgid":
            messages[-1].key += text
        else:
            messages[-1].text += text
    return messages


def header_field(header, name):
    """The value of a field of the header message's text, or none."""
    match = re.search(rf"^{re.escape(name)}:[ ]*(.*)$", header, re.MULTILINE)
    return match[1] if match else None
