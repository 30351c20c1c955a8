#!/usr/bin/env python3
"""Checks that every C++ file includes only what its folder may include.

The rules are data: include_rules.toml says for each folder whose headers it may include, and for each library in which
folders its headers may occur. The project's headers are included in quotation marks by their path from the top.
"""

import fnmatch
import pathlib
import re
import tomllib

import project

STANDARD_HEADER = re.compile(r"[a-z_]+")


def holds(folder, name):
    return pathlib.PurePath(name).is_relative_to(folder)


def folder_rule(rules, name):
    """The folders that `name` may include from, or None when no rule covers it."""
    matching = [folder for folder in rules["folders"] if holds(folder, name)]
    return rules["folders"][max(matching, key=len)] if matching else None


def library_of(rules, header):
    for library, rule in rules["libraries"].items():
        if header.startswith(tuple(rule["headers"])):
            return library, rule["folders"]
    return None, []


def from_the_top(rules, name, header):
    """The path from the top of what `name` includes as `header`."""
    root = next((root for root in rules.get("roots", []) if holds(root, name)), None)
    return header if root is None or "/" in header else f"{root}/{header}"


def problem_with(root, rules, name, header, quoted):
    """What is wrong with `name` including `header`, or None."""
    if header is None:
        return "names what it includes through a macro, so that nobody can check it"
    if quoted:
        header = from_the_top(rules, name, header)
        is_generated = any(fnmatch.fnmatchcase(header, pattern) for pattern in rules["generated"])
        if not is_generated and not (root / header).is_file():
            return f'includes "{header}", which is no file of the project by its path from the top'
        allowed = folder_rule(rules, name)
        if not any(holds(folder, header) for folder in allowed):
            return f'includes "{header}"; of the project it may include {", ".join(allowed)} only'
        return None
    if STANDARD_HEADER.fullmatch(header):
        return None
    library, folders = library_of(rules, header)
    if library is None:
        return f"includes <{header}>, which is neither the standard library's nor a library's in include_rules.toml"
    if not any(holds(folder, name) for folder in folders):
        return f"includes <{header}>; {library} belongs to {', '.join(folders)}"
    return None


def main():
    def configure(parser):
        parser.add_argument("--rules", type=pathlib.Path, default=pathlib.Path(__file__).with_name("include_rules.toml"))

    options = project.arguments(__doc__, configure)
    rules = tomllib.loads(options.rules.read_text(encoding="utf-8"))
    problems = []
    names = project.cxx_files(options.root)
    for name in names:
        if folder_rule(rules, name) is None:
            problems.append(f"{name}: lies in a folder that include_rules.toml does not know")
            continue
        for number, header, quoted in project.includes(options.root, name):
            problem = problem_with(options.root, rules, name, header, quoted)
            if problem:
                problems.append(f"{name}:{number}: {problem}")
    project.finish(problems, f"{len(names)} files include what they may")


if __name__ == "__main__":
    main()
