#!/usr/bin/env python3
"""The schema of index.conf, and that the linter has exactly the same rules.

    schema_test.py APPINDEX SCRATCH_DIR

An independent validator reads the schema; the linter must report the same places of the same
descriptors: the examples, made-up packages, the bad ones beside this script, and many that are
put together here out of good and bad parts, always the same ones.
"""
import copy
import json
import random
import shutil
import subprocess
import sys
import unittest
from pathlib import Path

import jsonschema

TOP = Path(__file__).resolve().parents[2]
BAD = sorted((TOP / "tests/schema/bad").glob("*.json"))
GENERATED = 800
BATCH = 100  # the linter compares ids among all descriptors of a run, which are the same here
APPINDEX, SCRATCH = Path(sys.argv[1]).resolve(), Path(sys.argv[2]).resolve()

SCHEMA = json.loads((TOP / "schema/index.conf.schema.json").read_text(encoding="utf-8"))
VALIDATOR = jsonschema.Draft7Validator(SCHEMA)

GOOD = {
    "app": "Example.App",
    "title": "Title",
    "desc": "A description",
    "stringset": "strs",
    "keywords": ["one", {"text": "two", "weight": 3}, {"text": "three"}],
    "enable": {"model": ["M1", "M2"], "platform": ["p1"]},
    "disable": {"model": ["M3"]},
    "modules": [
        {"params": "tab=a", "title": "A", "desc": "d", "keywords": [{"text": "k", "weight": 1}],
         "enable": {"platform": []}},
        {"params": "tab=b", "title": "B", "disable": {}},
    ],
}
VALUES = [None, True, False, 0, 1, 5, 6, -1, 2.0, 2.5, 10**12, "", "text", "a:b", [], ["x"], [1],
          [""], {}, {"text": "t"}, {"text": ""}, {"weight": 9}, {"model": ["M"]}, {"model": "M"},
          {"params": "p", "title": "t"}, {"title": "t"}, [{"params": "p", "title": "t"}], [[]]]
NAMES = ["app", "title", "desc", "stringset", "keywords", "enable", "disable", "modules", "params",
         "text", "weight", "model", "platform", "$schema", "other", "a/b~c"]


def pointer(path):
    return "".join("/" + str(part).replace("~", "~0").replace("/", "~1") for part in path)


def schema_places(descriptor):
    """The pointers that the schema complains about; for members that it does not know, theirs."""
    places = set()
    for error in VALIDATOR.iter_errors(descriptor):
        path = list(error.absolute_path)
        if error.validator == "additionalProperties":
            known = error.schema["properties"]
            places |= {pointer(path + [name]) for name in error.instance if name not in known}
        else:
            places.add(pointer(path))
    return places


def run(*arguments):
    result = subprocess.run([APPINDEX, "--json", *arguments], capture_output=True, text=True,
                            encoding="utf-8")
    if result.returncode not in (0, 5):
        raise AssertionError(f"appindex {arguments[0]} ended with {result.returncode}: "
                             f"{result.stderr}")
    return json.loads(result.stdout)


TAGS = {tag["tag"] for tag in run("lint", "--list-tags") if tag["schema"]}


def lint(paths):
    """The findings that the schema has a rule for, by file."""
    findings = {str(path): [] for path in paths}
    names = list(findings)
    for begin in range(0, len(names), BATCH):
        for finding in run("lint", *names[begin:begin + BATCH])["findings"]:
            if finding["tag"] in TAGS:
                findings[str(Path.cwd() / finding["file"])].append(finding)
    return findings


def places_in(value, path=()):
    """Every place of a descriptor, as a path."""
    yield path
    if isinstance(value, dict):
        for name, member in value.items():
            yield from places_in(member, path + (name,))
    elif isinstance(value, list):
        for number, element in enumerate(value):
            yield from places_in(element, path + (number,))


def changed(root, choose):
    """The descriptor with one part replaced, removed or added."""
    root = copy.deepcopy(root)
    path = choose.choice(list(places_in(root)))
    if not path:
        return choose.choice([root, [root], [root, root], [], choose.choice(VALUES)])
    holder = root
    for part in path[:-1]:
        holder = holder[part]
    what = choose.randrange(3)
    if what == 0:
        holder[path[-1]] = copy.deepcopy(choose.choice(VALUES))
    elif what == 1:
        del holder[path[-1]]
    elif isinstance(holder, dict):
        holder[choose.choice(NAMES)] = copy.deepcopy(choose.choice(VALUES))
    else:
        holder.append(copy.deepcopy(choose.choice(VALUES)))
    return root


def generated():
    choose = random.Random(20)
    for _ in range(GENERATED):
        descriptor = GOOD
        for _ in range(choose.choice([0, 1, 1, 1, 2, 3, 5])):
            descriptor = changed(descriptor, choose)
        yield descriptor


class SchemaTest(unittest.TestCase):
    maxDiff = None

    def assert_same(self, descriptors):
        """Both complain about the same places of these descriptors, given by path.
        Returns the linter's findings."""
        all_findings = lint(descriptors)
        for path, findings in all_findings.items():
            descriptor = json.loads(Path(path).read_text(encoding="utf-8"))
            with self.subTest(path, descriptor=descriptor):
                self.assertEqual({finding["pointer"] for finding in findings},
                                 schema_places(descriptor))
        return all_findings

    def test_schema_is_a_draft_07_schema(self):
        self.assertEqual(SCHEMA["$schema"], "http://json-schema.org/draft-07/schema#")
        self.assertTrue(SCHEMA["$id"])
        jsonschema.Draft7Validator.check_schema(SCHEMA)

    def test_every_member_has_a_title_and_a_description(self):
        def members(schema):
            for name, member in schema.get("properties", {}).items():
                yield name, member
        for definition in SCHEMA["definitions"].values():
            for name, member in members(definition):
                if "$ref" in member:
                    member = SCHEMA["definitions"][member["$ref"].rsplit("/", 1)[1]]
                with self.subTest(name):
                    self.assertIn("title", member)
                    self.assertIn("description", member)

    def test_examples_are_valid(self):
        paths = sorted((TOP / "examples/device").rglob("index.conf"))
        self.assertGreater(len(paths), 20)
        for path in paths:
            self.assertEqual(schema_places(json.loads(path.read_text(encoding="utf-8"))), set(), path)
        self.assert_same(paths)

    def test_made_up_packages_are_valid(self):
        root = SCRATCH / "foreign"
        shutil.rmtree(root, ignore_errors=True)
        subprocess.run([TOP / "bench/make-foreign-root", root], check=True)
        paths = sorted(root.rglob("index.conf"))
        self.assertGreater(len(paths), 100)
        for path in paths:
            self.assertEqual(schema_places(json.loads(path.read_text(encoding="utf-8"))), set(), path)
        self.assert_same(paths)

    def test_bad_ones_are_invalid_and_get_the_tag_in_their_name(self):
        self.assertGreater(len(BAD), 20)
        for path, findings in self.assert_same(BAD).items():
            with self.subTest(path):
                tag = Path(path).name.split(".")[0]
                self.assertEqual({finding["tag"] for finding in findings}, {tag})
        self.assertEqual({path.name.split(".")[0] for path in BAD}, TAGS)

    def test_linter_and_schema_agree_on_generated_descriptors(self):
        shutil.rmtree(SCRATCH / "generated", ignore_errors=True)
        paths = []
        for number, descriptor in enumerate(generated()):
            path = SCRATCH / f"generated/{number:04}/index.conf"
            path.parent.mkdir(parents=True)
            path.write_text(json.dumps(descriptor), encoding="utf-8")
            paths.append(path)
        findings = self.assert_same(paths).values()
        self.assertGreater(sum(not found for found in findings), GENERATED // 20)
        self.assertEqual({finding["tag"] for found in findings for finding in found}, TAGS)


unittest.main(argv=sys.argv[:1])
