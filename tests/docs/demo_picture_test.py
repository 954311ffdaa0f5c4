#!/usr/bin/env python3
"""The picture of the demo shows what the demo prints now: the same searches, in a device with the
same documents, give the same picture. The documents are sent straight to the daemon, without the
pauses that the library makes for the daemon's sake.

    tests/docs/demo_picture_test.py APPINDEX DEVICE_ROOT    where the indexes are empty
"""

import difflib
import json
import socket
import struct
import subprocess
import sys
from pathlib import Path

sys.path.insert(0, str(Path(__file__).resolve().parents[2] / "scripts"))
sys.dont_write_bytecode = True

from demo_picture import PICTURE, commands, picture_of
from terminal_picture import run_in_terminal

APPINDEX, ROOT = sys.argv[1:]


def ask(command, data):
    text = json.dumps({"command": command, "data": data}).encode()
    with socket.socket(socket.AF_UNIX) as connection:
        connection.connect(f"{ROOT}/var/run/tovoelasticd.sock")
        connection.sendall(struct.pack(">I", len(text)) + text)
        with connection.makefile("rb") as reader:
            (length,) = struct.unpack(">I", reader.read(4))
            reply = json.loads(reader.read(length))
    if not reply["success"]:
        sys.exit(f"{command} failed: {reply}")


def fill(languages):
    """Writes the documents of every application."""
    show = [APPINDEX, "--root", ROOT, "--json", "show", "/"]
    for language in languages:
        show += ["--lang", language]
    shown = json.loads(subprocess.run(show, check=True, capture_output=True).stdout)
    for descriptor in shown["descriptors"]:
        for entry in descriptor["documents"]:
            document = entry["document"]
            place = {"id": f"appindex_{entry['lang']}", "doc_id": document["id"]}
            ask("document_upsert_by_id", {**place, "data": document})
    for language in languages:
        ask("commit", {"id": f"appindex_{language}"})


def search(arguments):
    written, status = run_in_terminal([APPINDEX, "--root", ROOT, *arguments])
    if status != 0:
        sys.exit(f"{arguments} ended with {status}: {written}")
    return f"\x1b[1m$ appindex {' '.join(arguments)}\x1b[0m\n{written}\n"


shown = commands()
if len(shown) < 4:
    sys.exit(f"few searches are shown: {shown}")
fill(sorted({arguments[2] for arguments in shown}))
now = picture_of("".join(map(search, shown))).splitlines()
then = PICTURE.read_text(encoding="utf-8").splitlines()
if now != then:
    print("\n".join(difflib.unified_diff(then, now, "the picture", "the demo", "", "", 0, "")))
    sys.exit(f"{PICTURE.name} shows another demo. Make it anew: scripts/record-demo build/release")
