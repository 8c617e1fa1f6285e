"""account-settings convert."""

import base64
import datetime
import json
import math
import os
import plistlib
import random
import stat
import unittest
from pathlib import Path

from settingstest import DATA, SettingsTest, run

FIXTURES = sorted((DATA / "propertylists").glob("*.plist"))
ACCEPTED = [
    DATA / "malformed" / line.split("\t")[0]
    for line in (DATA / "malformed/index.tsv").read_text().splitlines()[1:]
    if line.split("\t")[1] == "accept"
]
# What lies on the way through a form that cannot hold everything.
LOSSLESS = ["json", "binary"]


def value_of_json(value):
    """What the JSON form stands for, by a reader of its own."""
    if isinstance(value, list):
        return [value_of_json(member) for member in value]
    if not isinstance(value, dict):
        return value
    if len(value) == 1:
        (key, content), = value.items()
        if key == "@data":
            return base64.b64decode(content, validate=True)
        if key == "@real":
            return float(content)
        if key == "@date":
            whole, _, fraction = content.removesuffix("Z").partition(".")
            date = datetime.datetime.strptime(whole, "%Y-%m-%dT%H:%M:%S")
            return date + datetime.timedelta(seconds=float("0." + (fraction or "0")))
        if key.startswith("@@"):
            return {key[1:]: value_of_json(content)}
    return {key: value_of_json(member) for key, member in value.items()}


def random_value(source: random.Random, depth: int = 0):
    texts = ["", "@", "@date", "@@data", "a b", "Zoë", "住所録", "\U0001f4d2", "x" * 300, "quote \" back \\ line\n"]
    kinds = ["string", "integer", "real", "boolean", "date", "data"] + ["array", "dictionary"] * (depth < 5)
    kind = source.choice(kinds)
    if kind == "string":
        return source.choice(texts)
    if kind == "integer":
        return source.choice([0, -1, 2**63 - 1, -(2**63), 2**64 - 1, source.randrange(-(2**40), 2**40)])
    if kind == "real":
        return source.choice([0.0, 1.0, 0.1, 1e300, -5e-324, math.inf, -math.inf, source.uniform(-1e6, 1e6)])
    if kind == "boolean":
        return source.random() < 0.5
    if kind == "date":
        return datetime.datetime(source.randrange(1900, 2100), 3, 4, 5, 6, 7, source.choice([0, 500000, 250000]))
    if kind == "data":
        return source.randbytes(source.randrange(0, 40))
    if kind == "array":
        return [random_value(source, depth + 1) for _ in range(source.randrange(0, 5))]
    keys = source.sample(texts[1:], source.randrange(0, 4))
    return {key: random_value(source, depth + 1) for key in keys}


class Convert(SettingsTest):
    def convert(self, path: Path, form: str, name: str = "converted") -> Path:
        output = self.directory / name
        ended = run("convert", path, "--to", form, "--output", output)
        self.assertEqual((ended.returncode, ended.stdout), (0, b""), ended.stderr.decode())
        return output

    def file(self, name: str, content) -> Path:
        path = self.directory / name
        path.write_bytes(content if isinstance(content, bytes) else content.encode())
        return path

    def test_there_and_back_is_the_same_for_every_known_property_list(self):
        seed = int.from_bytes(os.urandom(4), "big")
        source = random.Random(seed)
        self.assertGreater(len(FIXTURES), 20)
        self.assertGreater(len(ACCEPTED), 20)
        for fixture in FIXTURES + [path for path in ACCEPTED if path.exists()]:
            with self.subTest(fixture.name, seed=seed):
                canonical = self.convert(fixture, "binary", "canonical").read_bytes()
                text = self.convert(fixture, "json", "text").read_bytes()
                way = [source.choice(LOSSLESS) for _ in range(4)]
                path = fixture
                for number, form in enumerate(way):
                    path = self.convert(path, form, f"step-{number}")
                self.assertEqual(self.convert(path, "binary", "binary-end").read_bytes(), canonical, way)
                self.assertEqual(self.convert(path, "json", "json-end").read_bytes(), text, way)

    def test_there_and_back_is_the_same_for_random_values(self):
        seed = int.from_bytes(os.urandom(4), "big")
        source = random.Random(seed)
        for number in range(60):
            with self.subTest(number, seed=seed):
                value = random_value(source)
                given = self.file("given", plistlib.dumps(value, fmt=plistlib.FMT_BINARY))
                text = self.convert(given, "json", "text")
                self.assertEqual(value_of_json(json.loads(text.read_text())), value)
                self.assertEqual(plistlib.loads(self.convert(text, "binary").read_bytes()), value)

    def test_to_xml_is_what_other_readers_read(self):
        value = {"a": [1, 0.5, True, b"\x00", datetime.datetime(2026, 11, 21, 2, 40), {"@date": "x"}], "b": "Zoë"}
        given = self.file("given", plistlib.dumps(value, fmt=plistlib.FMT_BINARY))
        printed = run("convert", given, "--to", "xml")
        self.assertEqual((printed.returncode, printed.stderr), (0, b""))
        self.assertTrue(printed.stdout.startswith(b"<?xml"))
        self.assertEqual(plistlib.loads(printed.stdout), value)

    def test_to_xml_says_that_parts_of_a_second_are_left_out(self):
        given = self.file("given", '{"a": {"@date": "2026-11-21T02:40:00.25Z"}}')
        printed = run("convert", given, "--to", "xml")
        self.assertEqual(printed.returncode, 0)
        self.assertIn(b"parts of a second", printed.stderr)
        self.assertEqual(plistlib.loads(printed.stdout), {"a": datetime.datetime(2026, 11, 21, 2, 40)})

    def test_refuses_what_the_form_cannot_hold_and_writes_nothing(self):
        given = self.file("given", '{"a": "\\u0001"}')
        output = self.directory / "output"
        ended = run("convert", given, "--to", "xml", "--output", output)
        self.assertEqual((ended.returncode, output.exists()), (7, False))
        self.assertIn(b"--to json", ended.stderr)

    def test_names_the_place_in_what_is_no_property_list(self):
        cases = [
            ("half an object", '{"a": 1', "line 1, column 8"),
            ("null", '{"a": [1, null]}', "a[1]"),
            ("too large", '{"a": 18446744073709551616}', "64 bits"),
            ("an unknown form", '{"a": {"@colour": "red"}}', "@colour"),
            ("a day that is none", '{"b": {"@date": "2026-02-30T00:00:00Z"}}', "(at b)"),
            ("a key twice", '{"a": 1, "a": 2}', "twice"),
            ("nested too deep", "[" * 513 + "]" * 513, "512"),
            ("two values", "1 2", "column 3"),
            ("not UTF-8", b'"\xff"', "UTF-8"),
            ("half XML", "<plist><dict>", "line 1"),
            ("half binary", b"bplist00 and rubbish", "given"),
            ("nothing", b"", "given"),
        ]
        for name, content, text in cases:
            with self.subTest(name):
                given = self.file("given", content)
                ended = run("convert", given, "--to", "json")
                self.assertEqual((ended.returncode, ended.stdout), (6, b""))
                self.assertIn(text, ended.stderr.decode(errors="replace"))
                self.assertIn(str(given), ended.stderr.decode(errors="replace"))

    def test_takes_what_is_nested_as_deep_as_is_allowed(self):
        given = self.file("given", "[" * 512 + '{"@data": "AA=="}' + "]" * 512)
        self.assertEqual(self.convert(self.convert(given, "binary"), "json", "json").read_text().split(),
                         ["["] * 512 + ['{"@data":', '"AA=="}'] + ["]"] * 512)  # fmt: skip

    def test_refuses_every_malformed_property_list(self):
        for line in (DATA / "malformed/index.tsv").read_text().splitlines()[1:]:
            name, expectation = line.split("\t")[:2]
            path = DATA / "malformed" / name
            if expectation == "reject" and path.exists() and name != "x99_json.plist":
                with self.subTest(name):
                    ended = run("convert", path, "--to", "json")
                    self.assertEqual((ended.returncode, ended.stdout), (6, b""), ended.stderr)

    def test_of_root_leaves_a_file_to_its_owner_but_for_folders_that_others_may_write(self):
        if os.geteuid() != 0:
            self.skipTest("only root replaces files of others")
        given = self.file("given.json", "{}")
        for mode, owner in ((0o755, (12345, 12346)), (0o777, (0, 0)), (0o775, (0, 0))):
            with self.subTest(oct(mode)):
                folder = self.directory / oct(mode)
                folder.mkdir()
                folder.chmod(mode)
                output = folder / "accounts.plist"
                output.write_bytes(b"earlier")
                os.chown(output, 12345, 12346)
                ended = run("convert", given, "--to", "binary", "--output", output)
                self.assertEqual((ended.returncode, ended.stderr), (0, b""))
                status = output.stat()
                self.assertEqual((status.st_uid, status.st_gid), owner)
                self.assertEqual(stat.S_IMODE(status.st_mode), 0o600)
                self.assertEqual([path.name for path in folder.iterdir()], ["accounts.plist"])

    def test_writes_a_private_file(self):
        given = self.file("given", "{}")
        self.assertEqual(stat.S_IMODE(self.convert(given, "binary").stat().st_mode), 0o600)


if __name__ == "__main__":
    unittest.main()
