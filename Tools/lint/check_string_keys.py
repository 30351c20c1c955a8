#!/usr/bin/env python3
"""Compares the Facebook plug-in's string tables with what the plug-in looks up, and with each other.

Every key that the plug-in can look up must be in English, every English key must be one that it can look up, and every other
language must have exactly the English keys with as many "%@" in each text. Keys come from string literals of the sources; those
that are formed at run time are formed here in the same way, from the lists of the permission catalogue.

Prints one line a finding, FILE:LINE: SENTENCE, and exits with 1 if there are any.
"""

import argparse
import collections
import pathlib
import re
import sys

sys.dont_write_bytecode = True  # the source tree stays as it is

import po  # noqa: E402

CATALOGUE_FILE = "VXFacebookAccountAccessPluginCatalogue.cpp"
READ_LIST = "extendedReadNames"
MANAGE_LIST = "manageNames"

# Names that have a text without being permissions of the list: the user's basic profile and friend list.
FURTHER_READ_NAMES = ("basic_profile", "friends")

# Literals that are written like keys: words of the Facebook server.
NOT_KEYS = {"ALL_FRIENDS", "API_EC_PARAM"}

# How many arguments the plug-in hands to a text; all others get none.
PLACEHOLDERS = {
    "ACCOUNT_ACCESS_BASIC_MESSAGE": 1,
    "ACCOUNT_ACCESS_ONE_PERMISSION_SHORT_FORMAT": 2,
    "ACCOUNT_ACCESS_ONE_PERMISSION_FORMAT": 2,
    "ACCOUNT_ACCESS_TWO_PERMISSION_FORMAT": 3,
    "ACCOUNT_ACCESS_THREE_PERMISSION_FORMAT": 4,
    "ACCOUNT_ACCESS_UNKNOWN_FORMAT": 2,
    "ACCOUNT_ACCESS_UNKNOWN_ADDITIONAL_FORMAT": 1,
    "ACCOUNT_ACCESS_EXTENDED_READ": 1,
    "ACCOUNT_ACCESS_EXTENDED_READ_MULTIPLE": 2,
    "ACCOUNT_ACCESS_EXTENDED_READ_USER": 1,
    "ACCOUNT_ACCESS_EXTENDED_READ_USER_MULTIPLE": 2,
    "ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS": 1,
    "ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS_MULTIPLE": 2,
    "ACCCOUNT_ACCESS_WRITE": 1,
    "ACCOUNT_ACCESS_MANAGE": 1,
    "ACCOUNT_ACCESS_MANAGE_MULTIPLE": 2,
}

# Names of one list; two that read the same would be shown to the user as one.
NAME_LISTS = (
    re.compile(r"FACEBOOK_READ_PERMISSION_(?!FRIENDS_)"),
    re.compile(r"FACEBOOK_READ_PERMISSION_FRIENDS_"),
    re.compile(r"FACEBOOK_MANAGE_PERMISSION_"),
)

_TOKEN = re.compile(r'//[^\n]*|/\*.*?\*/|\'(?:\\.|[^\'\\])*\'|("(?:\\.|[^"\\\n])*"(?:\s*"(?:\\.|[^"\\\n])*")*)', re.DOTALL)
_KEY = re.compile(r"[A-Z][A-Z0-9]*(_[A-Z0-9]+)+$")


def string_literals(source):
    """The string literals of a C++ source, adjacent ones joined, comments left out."""
    for match in _TOKEN.finditer(source):
        if match[1]:
            yield "".join(re.findall(r'"((?:\\.|[^"\\])*)"', match[1]))


def permission_list(catalogue, name):
    match = re.search(rf"\b{name}\[\]\s*=\s*\{{(.*?)\}};", catalogue, re.DOTALL)
    if not match:
        raise SystemExit(f"{CATALOGUE_FILE}: there is no list '{name}'; has it been renamed? Then tell this check.")
    return list(string_literals(match[1]))


def keys_of_sources(folder):
    """The keys that the plug-in can look up, and what stands in the way of knowing them."""
    problems = []
    keys = {}
    sources = {path.name: path.read_text(encoding="utf-8") for path in sorted(pathlib.Path(folder).glob("*.[ch]*"))}
    if CATALOGUE_FILE not in sources:
        raise SystemExit(f"{folder}: there is no {CATALOGUE_FILE}.")
    catalogue = sources[CATALOGUE_FILE]
    list_keys = re.findall(r'_commaSeparatedListWithFormat\(\s*"(\w+)"', "".join(sources.values()))
    read_names = permission_list(catalogue, READ_LIST) + list(FURTHER_READ_NAMES)
    formed = {
        "FACEBOOK_READ_PERMISSION_%@": [name.upper() for name in read_names],
        "FACEBOOK_MANAGE_PERMISSION_%@": [name.upper() for name in permission_list(catalogue, MANAGE_LIST)],
        "%@_MULTIPLE": list_keys,
    }
    unused_formats = set(formed)
    for file, source in sources.items():
        for literal in string_literals(source):
            if literal in formed:
                unused_formats.discard(literal)
                for argument in formed[literal]:
                    keys.setdefault(literal.replace("%@", argument), file)
            elif re.fullmatch(r"[A-Z_%@]*%@[A-Z_%@]*", literal) and re.search("[A-Z]", literal):
                problems.append(f"{file}: '{literal}' forms keys at run time, and this check does not know from what.")
            elif _KEY.match(literal) and literal not in NOT_KEYS:
                keys.setdefault(literal, file)
    for literal in sorted(unused_formats):
        problems.append(f"{folder}: no source forms keys with '{literal}' any more; this check still does.")
    return keys, problems


def header_problems(path, messages):
    header = messages[0].text if messages and messages[0].key == "" else ""
    if "charset=UTF-8" not in (po.header_field(header, "Content-Type") or ""):
        yield f"{path}:1: the header does not say 'Content-Type: text/plain; charset=UTF-8'."
    if (language := po.header_field(header, "Language")) != path.stem:
        yield f"{path}:1: the header says 'Language: {language}', the file is named {path.name}."


def text_problems(path, messages):
    """What is wrong with a catalogue whatever the others hold."""
    seen = set()
    for message in messages:
        place = f"{path}:{message.line}: {message.key}"
        if message.key in seen:
            yield f"{place} occurs twice."
        seen.add(message.key)
        if message.fuzzy:
            yield f"{place} is marked fuzzy, so it would not be used."
        if not message.text:
            yield f"{place} has no text."
        if message.key and (wrong := re.search(r"%(?!@).{0,2}|(?<!%)@", message.text)):
            yield f"{place} holds '{wrong[0]}'; the only placeholder is %@."
        if message.key not in ("", "WORD_LIST_SEPARATOR") and message.text != message.text.strip():
            yield f"{place} begins or ends with a blank."
    for name_list in NAME_LISTS:
        by_text = collections.defaultdict(list)
        for message in messages:
            if name_list.match(message.key):
                by_text[message.text].append(message.key)
        for text, names in by_text.items():
            if len(names) > 1:
                yield f"{path}:1: {' and '.join(names)} are both '{text}'; a list would show them as one."


def comparison_problems(path, messages, keys, placeholders, reference):
    """Keys that are missing or surplus, and texts with another number of placeholders than `reference` has."""
    texts = {message.key: message for message in messages if message.key}
    for key in sorted(keys - texts.keys()):
        yield f"{path}:1: {key} is missing; {reference} uses it."
    for key, message in sorted(texts.items()):
        if key not in keys:
            yield f"{path}:{message.line}: {key} is unknown to {reference}."
        elif (found := message.text.count("%@")) != (wanted := placeholders.get(key, 0)):
            yield f"{path}:{message.line}: {key} has {found} of %@, {reference} has {wanted}."


def check(sources, resources):
    keys, problems = keys_of_sources(sources)
    catalogues = {path: po.read(path) for path in sorted(pathlib.Path(resources).glob("*.po"))}
    english = pathlib.Path(resources) / "en.po"
    if english not in catalogues:
        raise SystemExit(f"{resources}: there is no en.po.")
    english_texts = {message.key: message.text for message in catalogues[english] if message.key}
    for path, messages in catalogues.items():
        problems += [*header_problems(path, messages), *text_problems(path, messages)]
        if path == english:
            problems += comparison_problems(path, messages, set(keys), PLACEHOLDERS, "the plug-in")
        else:
            placeholders = {key: text.count("%@") for key, text in english_texts.items()}
            problems += comparison_problems(path, messages, set(english_texts), placeholders, "en.po")
    return problems, len(keys), len(catalogues)


def main(argv=None):
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--sources", required=True, help="folder of the plug-in's sources")
    parser.add_argument("--resources", required=True, help="folder of the catalogues, en.po among them")
    arguments = parser.parse_args(argv)
    try:
        problems, key_count, language_count = check(arguments.sources, arguments.resources)
    except (po.CatalogueError, OSError, UnicodeDecodeError) as error:
        raise SystemExit(str(error)) from error
    if problems:
        sys.exit("\n".join(problems))
    print(f"{key_count} keys, {language_count} {'language' if language_count == 1 else 'languages'}: all as they should be.")


if __name__ == "__main__":
    main()
