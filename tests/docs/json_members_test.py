#!/usr/bin/env python3
"""What `appindex --json` writes has the members that doc/appindex.md lists, with values of the
types of its examples, and no others. To be run in the root of a device with NotePad, on which
`appindex` works.

    tests/docs/json_members_test.py
"""

import json
import re
import subprocess
import sys
from pathlib import Path

DOCUMENT = Path(__file__).resolve().parents[2] / "doc/appindex.md"
PACKAGE = "/var/packages/NotePad"

failures = []


def run(*arguments, expected=0):
    finished = subprocess.run(
        ["appindex", "--json", *arguments], capture_output=True, text=True, check=False
    )
    if finished.returncode != expected:
        sys.exit(f"{arguments} ended with {finished.returncode}: {finished.stderr}")
    return json.loads(finished.stdout)


def section(heading):
    text = DOCUMENT.read_text(encoding="utf-8").split("\n## JSON\n")[1]
    return re.split(r"\n### ", text.split(f"### {heading}\n")[1] if heading else text)[0]


def example(heading):
    return json.loads(re.search(r"```json\n(.*?)```", section(heading), re.DOTALL)[1])


def kind(value):
    return "number" if type(value) in (int, float) else type(value).__name__


def most_alike(documented, element):
    """The documented element with the same members, if there is one: "op" need not have a path."""
    if isinstance(element, dict):
        for candidate in documented:
            if candidate.keys() == element.keys():
                return candidate
    return documented[0]


def compare(where, documented, written):
    """An empty list or object in an example says nothing of what is in it."""
    if kind(documented) != kind(written):
        failures.append(f"{where}: {kind(documented)} in the document, {kind(written)} in fact")
    elif isinstance(documented, dict) and documented:
        same_names(where, documented, written)
        for name in documented.keys() & written.keys():
            compare(f"{where}.{name}", documented[name], written[name])
    elif isinstance(documented, list) and documented:
        if not written:
            failures.append(f"{where}: nothing is written to compare with")
        for element in written:
            compare(f"{where}[]", most_alike(documented, element), element)


def same_names(where, documented, written):
    for name in set(documented) - set(written):
        failures.append(f"{where}.{name} is documented and not written")
    for name in set(written) - set(documented):
        failures.append(f"{where}.{name} is written and not documented")


def listed(heading):
    """The members in the first column of a section's table."""
    rows = re.findall(r"^\| (`[^|]*`) \|", section(heading), re.MULTILINE)
    return {name for row in rows for name in re.findall(r"`([^`]*)`", row)}


compare("enqueue add", example("enqueue"), run("enqueue", "add", PACKAGE))
compare("enqueue reindex", example("enqueue"), run("enqueue", "reindex"))
status = run("status")
outer = {name for name in status if name != "daemon"}
outer |= {f"daemon.{name}" for name in status["daemon"]}
absent = {"daemon.problem", "daemon.code", "held_up_by", "waiting"}  # where all is well
same_names("status", listed("status") - absent, outer)

compare("process-queue", example("process-queue"), run("process-queue"))
compare("add", example("add, del"), run("add", PACKAGE))
compare("del", example("add, del"), run("del", PACKAGE))
compare("reindex", example("reindex"), run("reindex"))
compare("search", example("search"), run("search", "--lang", "enu", "note"))
compare("show", example("show"), run("show", PACKAGE))
same_names("lint", listed("lint"), run("lint", PACKAGE[1:]))
compare("lint --list-tags", [example("lint")], run("lint", "--list-tags"))
compare("lint --explain", example("lint"), run("lint", "--explain", "no-entries"))
failed = run("add", "/var/packages/Nothing", expected=1)
failed["error"].setdefault("code", 0)  # only where the failure is one of the library's
compare("a failure", example(""), failed)

sys.exit("\n".join(dict.fromkeys(failures)) or 0)
