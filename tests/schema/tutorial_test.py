#!/usr/bin/env python3
"""The tutorial of doc/descriptor.md, carried out in the shell that it opens, and what doc/strings.md
says of the files.

    tutorial_test.py BUILD_DIR

Every block of shell commands runs, in order, in one shell that stops at the first failure. Each
line of a block of output must appear, in order, in what the commands before it write.
"""
import json
import os
import re
import shutil
import subprocess
import sys
import tempfile
import unittest
from pathlib import Path

TOP = Path(__file__).resolve().parents[2]
BUILD = Path(sys.argv[1]).resolve()
MARK = "-- block %d --"


def blocks():
    """The commands of the tutorial and the output that they are said to have."""
    text = (TOP / "doc/descriptor.md").read_text(encoding="utf-8")
    tutorial = text[text.index("\n## Tutorial"):text.index("\n## Reference")]
    found = []
    for kind, content in re.findall(r"^```(\w+)\n(.*?)^```$", tutorial, re.M | re.S):
        if kind == "sh":
            found.append((content, []))
        elif kind == "text":
            found[-1][1].extend(content.splitlines())
        else:
            raise ValueError(f"a block of {kind}")
    return found


class TutorialTest(unittest.TestCase):
    def test_commands_work_and_say_what_is_said(self):
        found = blocks()
        self.assertGreater(len(found), 8)
        script = "set -e\n" + "".join(f"echo '{MARK % number}'\n{commands}\n"
                                      for number, (commands, _) in enumerate(found))
        with tempfile.TemporaryDirectory() as tree:
            # A device without other applications: to index those takes its time.
            shutil.copytree(TOP / "examples/device/etc", Path(tree, "etc"))
            result = subprocess.run(
                [TOP / "scripts/shell", BUILD, "-c", script], text=True, encoding="utf-8",
                stdout=subprocess.PIPE, stderr=subprocess.STDOUT,
                env={**os.environ, "SHELL": "/bin/bash", "LC_ALL": "C.UTF-8",
                     "DEVICE_TREE": tree})
        self.assertEqual(result.returncode, 0, result.stdout)
        outputs = re.split("^" + MARK.replace("%d", r"\d+") + "\n", result.stdout, flags=re.M)[1:]
        self.assertEqual(len(outputs), len(found))
        for (commands, lines), output in zip(found, outputs):
            rest = output
            for line in lines:
                with self.subTest(commands):
                    self.assertIn(line, rest, output)
                rest = rest.partition(line)[2]

    def test_every_tag_is_in_the_reference(self):
        text = (TOP / "doc/descriptor.md").read_text(encoding="utf-8")
        rows = dict(re.findall(r"^\| `([a-z0-9-]+-[a-z0-9-]+)` \| (error|warning|note) \|", text, re.M))
        listed = subprocess.run([BUILD / "tool/appindex", "lint", "--list-tags"], check=True,
                                capture_output=True, text=True).stdout.split()
        self.assertEqual(list(rows), listed)
        for tag, severity in rows.items():
            explained = subprocess.run([BUILD / "tool/appindex", "lint", "--explain", tag],
                                       check=True, capture_output=True, text=True).stdout
            self.assertIn(f"{tag} ({severity})\n", explained)


class StringsTest(unittest.TestCase):
    """The facts of doc/strings.md."""

    TEXT = (TOP / "doc/strings.md").read_text(encoding="utf-8")

    def package(self, directory):
        descriptor = {"app": "A", "title": "app:title", "desc": "app:desc", "keywords": ["scan:title"]}
        strings = re.search(r"^The file is text.*:$", self.TEXT, re.M)
        block = re.match(r"(?:    .*\n|\n)+", self.TEXT[strings.end():]).group()
        texts = Path(directory) / "texts/enu/strings"
        texts.parent.mkdir(parents=True)
        texts.write_text(re.sub("^    ", "", block, flags=re.M), encoding="utf-8")
        (Path(directory) / "index.conf").write_text(json.dumps(descriptor), encoding="utf-8")

    def run_json(self, *arguments):
        return json.loads(subprocess.run([BUILD / "tool/appindex", "--json", *arguments], check=True,
                                         capture_output=True, text=True, encoding="utf-8").stdout)

    def test_example_is_read_as_it_says(self):
        with tempfile.TemporaryDirectory() as directory:
            self.package(directory)
            shown = self.run_json("show", "--lang", "enu", directory)
        document = shown["descriptors"][0]["documents"][0]["document"]
        self.assertEqual(document["title"], "Recipe Box")
        self.assertEqual(document["desc"], 'Says "bon appétit"\nand means it.')
        self.assertEqual(document["keywords"], "Recipe Box Scan a Recipe Scan a Recipe ")

    def test_languages_are_all_there(self):
        section = self.TEXT[self.TEXT.index("## The languages"):self.TEXT.index("## Where they")]
        with tempfile.TemporaryDirectory() as directory:
            self.package(directory)
            states = self.run_json("lint", directory)["texts"][0]["references"]["app:title"]
        self.assertEqual(sorted(re.findall(r"`([a-z]{3})`", section)), sorted(states))


unittest.main(argv=sys.argv[:1])
