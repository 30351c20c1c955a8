#!/usr/bin/env python3
"""Compares the server contract with what the daemons send and the sandbox answers.

Every path, form field, status and member that the contract names has to occur in an exchange, and nothing else may.
"""

import argparse
import json
import pathlib
import subprocess
import sys
import tempfile
from collections import defaultdict

import yaml


def resolved(contract, node):
    while "$ref" in node:
        target = contract
        for step in node["$ref"].removeprefix("#/").split("/"):
            target = target[step]
        node = target
    return node


def members_of(contract, response):
    schema = response.get("content", {}).get("application/json", {}).get("schema", {})
    return set(resolved(contract, schema).get("properties", {}))


def promised(contract):
    """(method, path) -> (form fields, required fields, members by status), as the contract has it."""
    operations = {}
    for path, methods in contract["paths"].items():
        for method, operation in methods.items():
            form = operation.get("requestBody", {}).get("content", {}).get("application/x-www-form-urlencoded", {})
            schema = form.get("schema", {})
            answers = {int(status): members_of(contract, resolved(contract, response))
                       for status, response in operation["responses"].items()}
            operations[method.upper(), path] = (set(schema.get("properties", {})), set(schema.get("required", [])), answers)
    return operations


def seen(requests):
    """The same as it happened: fields that were sent, fields that were sent always, members by status."""
    fields, required, answers = defaultdict(set), {}, defaultdict(dict)
    for request in requests:
        key = request["method"], request["path"]
        names = set(request["fields"])
        fields[key] |= names
        required[key] = required.get(key, names) & names
        answers[key].setdefault(request["status"], set()).update(request["members"])
    return {key: (fields[key], required[key], answers[key]) for key in answers}


def exchange(options, contract, folder):
    """Everything that the sandbox was asked."""
    def sandbox(*words):
        return subprocess.run([options.sandbox, *words, "--directory", folder], check=True, capture_output=True, text=True).stdout

    with subprocess.Popen([options.sandbox, "--directory", folder], stdout=subprocess.PIPE, stderr=subprocess.DEVNULL,
                          text=True) as server:
        try:
            address, _, authorities = server.stdout.readline().split()
            token = (pathlib.Path(folder) / "master-token").read_text(encoding="utf-8").strip()
            once = [options.exchange, address, authorities, token]
            subprocess.run(once, check=True)
            for path in contract["paths"]:
                sandbox("fault", "unavailable", "--path", path, "--times", "0")
            subprocess.run([*once, "busy"], check=True)
            return json.loads(sandbox("requests"))
        finally:
            server.terminate()


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("contract", type=pathlib.Path)
    parser.add_argument("sandbox")
    parser.add_argument("exchange")
    options = parser.parse_args()

    contract = yaml.safe_load(options.contract.read_text(encoding="utf-8"))
    with tempfile.TemporaryDirectory() as folder:
        happened = seen(exchange(options, contract, folder))
    expected = promised(contract)

    problems = []
    for key in sorted(expected.keys() | happened.keys()):
        name = " ".join(key)
        if key not in expected or key not in happened:
            problems.append(f"{name}: {'not in the contract' if key not in expected else 'in the contract, but never asked for'}")
            continue
        fields, required, answers = expected[key]
        seen_fields, always_sent, seen_answers = happened[key]
        if fields != seen_fields:
            problems.append(f"{name}: the contract has the fields {fields}, seen were {seen_fields}")
        if not required <= always_sent:
            problems.append(f"{name}: required, but not always sent: {required - always_sent}")
        if answers != seen_answers:
            problems.append(f"{name}: the contract has the answers {answers}, seen were {dict(seen_answers)}")
    print("\n".join(problems) or f"{len(expected)} operations are as the contract has them")
    sys.exit(1 if problems else 0)


if __name__ == "__main__":
    main()
