#!/usr/bin/env python3
"""`appindex lint` and `appindex show`, run as their users run them.

    lint_command_test.py APPINDEX SCRATCH_DIR
"""
import json
import os
import shutil
import subprocess
import sys
import unittest
from pathlib import Path

TOP = Path(__file__).resolve().parents[2]
EXAMPLES = TOP / "examples/device"
APPINDEX = Path(sys.argv[1]).resolve()
SCRATCH = Path(sys.argv[2]).resolve() / "lint_command"

DONE, FAILED, USAGE, FINDINGS = 0, 1, 2, 5
CLEAN = {"app": "Example.App", "title": "Example", "desc": "Shows how"}


class CommandTest(unittest.TestCase):
    def setUp(self):
        shutil.rmtree(SCRATCH, ignore_errors=True)
        SCRATCH.mkdir(parents=True)

    def run_in(self, directory, *arguments):
        return subprocess.run([APPINDEX, *arguments], cwd=directory, capture_output=True, text=True,
                              encoding="utf-8")

    def assert_ends(self, result, code):
        self.assertEqual(result.returncode, code, result.stdout + result.stderr)

    def package(self, descriptor):
        file = SCRATCH / "pkg/ui/index.conf"
        file.parent.mkdir(parents=True, exist_ok=True)
        file.write_text(json.dumps(descriptor), encoding="utf-8")
        return SCRATCH / "pkg"

    def test_examples_are_clean_even_strictly(self):
        result = self.run_in(TOP, "--json", "lint", "--strict", "examples/device")
        self.assert_ends(result, DONE)
        found = json.loads(result.stdout)
        self.assertGreater(len(found["checked"]), 20)
        self.assertEqual((found["errors"], found["warnings"]), (0, 0))

    def test_point_is_the_package(self):
        package = self.package(CLEAN | {"title": "Example: what a colon does"})
        result = self.run_in(package, "lint", ".")
        self.assert_ends(result, FINDINGS)
        self.assertIn("ui/index.conf:1:1: error: ", result.stdout)
        self.assertIn("[texts-not-found]", result.stdout)

    def test_nothing_found_says_nothing_on_standard_output(self):
        result = self.run_in(self.package(CLEAN), "lint", ".")
        self.assert_ends(result, DONE)
        self.assertEqual(result.stdout, "")
        self.assertEqual(result.stderr, "1 descriptor checked: 0 errors, 0 warnings, 0 notes\n")
        self.assertEqual(self.run_in(SCRATCH / "pkg", "--quiet", "lint", ".").stderr, "")

    def test_warnings_count_with_strict_only(self):
        package = self.package(CLEAN | {"unknown": 1})
        self.assert_ends(self.run_in(package, "lint", "."), DONE)
        self.assert_ends(self.run_in(package, "lint", "--strict", "."), FINDINGS)

    def test_notes_never_count(self):
        self.package(CLEAN)
        result = self.run_in(SCRATCH, "lint", "--strict", "pkg/ui/index.conf")
        self.assert_ends(result, DONE)
        self.assertIn("note: ", result.stdout)
        result = self.run_in(SCRATCH, "lint", "--package", "pkg", "pkg/ui/index.conf")
        self.assertEqual(result.stdout, "")

    def test_annotations(self):
        package = self.package(CLEAN | {"app": 1})
        result = self.run_in(package, "lint", "--format", "github", ".")
        self.assert_ends(result, FINDINGS)
        self.assertEqual(result.stdout, "::error file=ui/index.conf,line=1,col=9,title=wrong-type::"
                                        '"app" must be a text, not a number\n')

    def test_json(self):
        package = self.package(CLEAN | {"app": 1})
        result = self.run_in(package, "--json", "lint", ".")
        self.assert_ends(result, FINDINGS)
        finding, = json.loads(result.stdout)["findings"]
        self.assertEqual(finding, {
            "tag": "wrong-type", "severity": "error", "file": "ui/index.conf", "line": 1,
            "column": 9, "pointer": "/app", "message": '"app" must be a text, not a number',
            "languages": []})

    def test_known_names(self):
        package = self.package(CLEAN | {"enable": {"model": ["M1"]}})
        (SCRATCH / "known.json").write_text('{"models": ["M2"]}', encoding="utf-8")
        result = self.run_in(package, "--json", "lint", "--known", "../known.json", ".")
        tags = [finding["tag"] for finding in json.loads(result.stdout)["findings"]]
        self.assertEqual(sorted(tags), ["filter-never-passes", "model-unknown"])
        (SCRATCH / "known.json").write_text('{"models": "M2"}', encoding="utf-8")
        result = self.run_in(package, "lint", "--known", "../known.json", ".")
        self.assert_ends(result, FAILED)
        self.assertIn("../known.json: ", result.stderr)

    def test_every_tag_is_listed_and_explained(self):
        tags = self.run_in(SCRATCH, "lint", "--list-tags").stdout.split()
        self.assertGreater(len(tags), 25)
        for tag in tags:
            result = self.run_in(SCRATCH, "lint", "--explain", tag)
            self.assert_ends(result, DONE)
            self.assertIn(tag, result.stdout)
        listed = json.loads(self.run_in(SCRATCH, "--json", "lint", "--list-tags").stdout)
        self.assertEqual([tag["tag"] for tag in listed], tags)
        explained = json.loads(
            self.run_in(SCRATCH, "--json", "lint", "--explain", tags[0]).stdout)
        self.assertEqual(explained, listed[0])

    def test_usage(self):
        for arguments in (["lint"], ["lint", "--explain", "no-such-tag"],
                          ["lint", "--explain", "wrong-type", "."], ["lint", "--list-tags", "."],
                          ["lint", "--explain", ""], ["lint", "--explain", "", "."],
                          ["lint", "--explain", "wrong-type", "--list-tags"],
                          ["lint", "--format", "xml", "."], ["lint", "--unknown", "."],
                          ["--json", "lint", "--format", "github", "."],
                          ["show"], ["show", "--lang", "eng", "."]):
            with self.subTest(arguments):
                result = self.run_in(SCRATCH, *arguments)
                self.assert_ends(result, USAGE)
                self.assertEqual(result.stdout, "")
                self.assertTrue(result.stderr)

    def test_paths_that_cannot_be_read(self):
        for command in ("lint", "show"):
            result = self.run_in(SCRATCH, command, "nothing")
            self.assert_ends(result, FAILED)
            self.assertIn("nothing: No such file or directory", result.stderr)
            self.assertIn("; see whether the path is right", result.stderr)
        self.package(CLEAN)
        (SCRATCH / "pkg/ui/index.conf").unlink()
        os.mkfifo(SCRATCH / "pkg/ui/index.conf")
        result = self.run_in(SCRATCH, "show", "pkg")
        self.assert_ends(result, FAILED)
        self.assertEqual(result.stderr, "appindex: pkg/ui/index.conf: cannot be read: not a "
                                        "regular file; put a regular file in its place\n")
        result = self.run_in(SCRATCH, "lint", "pkg", "--package", "nothing")
        self.assert_ends(result, FAILED)
        self.assertIn("nothing: there is no such directory; ", result.stderr)

    def test_descriptor_that_cannot_be_read_is_a_finding_among_others(self):
        packages = SCRATCH / "var/packages"
        for name in ("Fifo", "Long", "Wrong"):
            (packages / name).mkdir(parents=True)
        os.mkfifo(packages / "Fifo/index.conf")
        with open(packages / "Long/index.conf", "wb") as file:
            file.truncate(17 << 20)
        (packages / "Wrong/index.conf").write_text(json.dumps(CLEAN | {"app": 1}), encoding="utf-8")
        result = self.run_in(SCRATCH, "--json", "lint", "var/packages")
        self.assert_ends(result, FINDINGS)
        found = {(finding["file"], finding["tag"], finding["message"], finding["line"],
                  finding["pointer"]) for finding in json.loads(result.stdout)["findings"]}
        self.assertEqual(found, {
            ("var/packages/Fifo/index.conf", "descriptor-unreadable",
             "cannot be read: not a regular file", 1, ""),
            ("var/packages/Long/index.conf", "descriptor-unreadable",
             "cannot be read: longer than 16 MiB", 1, ""),
            ("var/packages/Wrong/index.conf", "wrong-type", '"app" must be a text, not a number',
             1, "/app")})

    def test_texts_of_two_string_sets_are_told_apart(self):
        package = self.package([CLEAN | {"app": name, "stringset": name, "title": "app:title"}
                                for name in ("one", "two")])
        for name, text in (("one", "One"), ("two", "")):
            texts = package / "ui" / name / "enu/strings"
            texts.parent.mkdir(parents=True)
            texts.write_text(f'[app]\ntitle="{text}"\nother="o"\n', encoding="utf-8")
        tables = json.loads(self.run_in(package, "--json", "lint", ".").stdout)["texts"]
        states = {table["root"]: table["references"]["app:title"]["enu"] for table in tables}
        self.assertEqual(states, {"ui/one/": "present", "ui/two/": "empty"})
        self.assertEqual({table["file"] for table in tables}, {"ui/index.conf"})

    def test_output_that_cannot_be_written_is_a_failure(self):
        with open("/dev/full", "wb") as full:
            result = subprocess.run([APPINDEX, "lint", "--list-tags"], stdout=full,
                                    stderr=subprocess.PIPE, text=True, check=False)
        self.assertEqual(result.returncode, FAILED)
        self.assertEqual(result.stderr, "appindex: standard output cannot be written: No space "
                                        "left on device; direct it to another place\n")

    def test_options_of_all_commands_may_stand_behind_them(self):
        result = self.run_in("/", "lint", "/var/packages/PhotoAlbum", "--root", str(EXAMPLES),
                             "--json")
        self.assert_ends(result, DONE)
        self.assertEqual(json.loads(result.stdout)["checked"],
                         ["/var/packages/PhotoAlbum/target/ui/index.conf"])

    def test_lint_in_a_device_root(self):
        result = self.run_in("/", "--root", str(EXAMPLES), "--json", "lint",
                             "/var/packages/PhotoAlbum")
        self.assert_ends(result, DONE)
        self.assertEqual(json.loads(result.stdout)["checked"],
                         ["/var/packages/PhotoAlbum/target/ui/index.conf"])

    def test_show_is_the_same_from_a_source_directory_and_installed(self):
        for package in ("PhotoAlbum", "NotePad", "Calendar", "DeveloperTools"):
            inside = self.run_in("/", "--root", str(EXAMPLES), "--json", "show",
                                 f"/var/packages/{package}")
            shutil.rmtree(SCRATCH / "src", ignore_errors=True)
            shutil.copytree(EXAMPLES / "var/packages" / package, SCRATCH / "src")
            outside = self.run_in(SCRATCH / "src", "--json", "show", ".")
            with self.subTest(package):
                self.assert_ends(inside, DONE)
                self.assert_ends(outside, DONE)
                documents = [json.loads(result.stdout)["descriptors"][0]["documents"]
                             for result in (inside, outside)]
                self.assertEqual(documents[0], documents[1])
                self.assertEqual(len({made["lang"] for made in documents[0]}), 21)

    def test_show_in_one_language(self):
        result = self.run_in(EXAMPLES / "var/packages/PhotoAlbum", "show", "--lang", "ger", ".")
        self.assert_ends(result, DONE)
        self.assertIn("  ger  title     Fotoalbum\n", result.stdout)
        self.assertNotIn("  enu  ", result.stdout)

    def test_show_for_another_device(self):
        package = str(EXAMPLES / "var/packages/RackManager")
        result = self.run_in(SCRATCH, "show", "--lang", "enu", "--model", "M1", "--platform", "p1",
                             package)
        self.assert_ends(result, DONE)
        self.assertIn('TOVO.RackManager: "enable" does not list the model M1\n', result.stdout)
        result = self.run_in(SCRATCH, "show", "--lang", "enu", "--model", "M820_rack", package)
        self.assert_ends(result, DONE)
        self.assertIn("  enu  title  ", result.stdout)
        self.assertNotIn("Left out", result.stdout)

    def test_show_takes_one_language_at_a_time(self):
        package = self.package(CLEAN)
        for arguments in (["--lang", "enu", package, "--model", "M"],
                          ["--lang", "enu", "--lang", "ger", package],
                          [package, "--lang", "enu"]):
            with self.subTest(arguments):
                result = self.run_in(SCRATCH, "--json", "show", *arguments)
                self.assert_ends(result, DONE)
                langs = [made["lang"] for made in
                         json.loads(result.stdout)["descriptors"][0]["documents"]]
                self.assertEqual(langs, [lang for lang in arguments if lang in ("enu", "ger")])

    def test_show_says_what_adding_would_end_in(self):
        package = self.package(CLEAN | {"app": 7})
        result = self.run_in(SCRATCH, "show", "--platform", "p", "--model", "m", package)
        self.assert_ends(result, FAILED)
        self.assertTrue(result.stderr.endswith("` says where (code 120)\n"), result.stderr)
        self.assertEqual(result.stderr.count("appindex lint"), 1, result.stderr)
        result = self.run_in(SCRATCH, "--json", "show", package)
        self.assertEqual(json.loads(result.stdout)["error"]["code"], 120)

    def test_show_names_what_gives_nothing(self):
        package = self.package([CLEAN | {"modules": {"a": {"params": "p", "title": "t",
                                                          "enable": {}}, "b": 7}},
                                "text", CLEAN | {"app": "B", "modules": [[]]}])
        result = self.run_in(SCRATCH, "show", "--model", "m", "--platform", "p", package)
        self.assert_ends(result, DONE)
        self.assertEqual(result.stdout.partition("Left out on this device:\n")[2],
                         "  /0/modules/b: gives nothing: not an object\n"
                         "  /1: gives nothing: not an object\n"
                         "  /2/modules/0: gives nothing: not an object\n"
                         '  Example.App?p: "enable" lists no model and no platform\n')
        result = self.run_in(SCRATCH, "--json", "show", "--model", "m", "--platform", "p", package)
        left_out = json.loads(result.stdout)["descriptors"][0]["left_out"]
        self.assertEqual([item["pointer"] for item in left_out],
                         ["/0/modules/b", "/1", "/2/modules/0", "/0/modules/a"])
        self.assertEqual(left_out[3], {"id": "Example.App?p", "pointer": "/0/modules/a",
                                       "filter": "enable",
                                       "reason": '"enable" lists no model and no platform'})

    def test_show_of_what_is_no_descriptor(self):
        result = self.run_in(SCRATCH, "show", "--model", "m", "--platform", "p", self.package(7))
        self.assert_ends(result, DONE)
        self.assertIn("\nLeft out on this device:\n"
                      "  the descriptor: gives nothing: not an object\n", result.stdout)

    def test_show_says_what_to_do_when_the_device_has_no_name(self):
        (SCRATCH / "root/etc").mkdir(parents=True)
        shutil.copytree(EXAMPLES / "var/packages/RackManager",
                        SCRATCH / "root/var/packages/RackManager")
        result = self.run_in("/", "--root", str(SCRATCH / "root"), "show",
                             "/var/packages/RackManager")
        self.assert_ends(result, FAILED)
        self.assertIn("--model and --platform", result.stderr)

    def test_show_without_a_descriptor(self):
        (SCRATCH / "empty").mkdir()
        result = self.run_in(SCRATCH, "show", "empty")
        self.assert_ends(result, FAILED)
        self.assertIn("there is no index.conf", result.stderr)


unittest.main(argv=sys.argv[:1])
