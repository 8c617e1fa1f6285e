"""account-settings validate."""

import json
import plistlib
import unittest

from settingstest import DATA, DATACLASS, MAIL, QUILLNET, SettingsTest


class Validate(SettingsTest):
    def findings(self, settings=None) -> list:
        """(place, identifier, key) of each finding, and its text and effect."""
        if settings is not None:
            self.write(settings)
        ended = self.run_on_image("validate", "--json")
        answer = json.loads(ended.stdout)
        self.assertEqual(answer["file"], str(self.settings_file))
        self.assertEqual(ended.returncode, 0 if answer["sound"] else 6, ended.stderr)
        self.assertEqual(answer["sound"], answer["findings"] == [])
        return answer["findings"]

    def places(self, settings=None) -> list:
        return [(f["place"], f["identifier"], f["key"]) for f in self.findings(settings)]

    def test_finds_nothing_in_a_sound_file(self):
        sound = dict(QUILLNET, **{"Enabled Dataclasses": [DATACLASS + "Contacts"]})
        self.assertEqual(self.places({"Version": 12, "Accounts": [MAIL, sound]}), [])
        self.assertEqual(self.succeed("validate"), f"{self.settings_file}: sound\n")

    def test_finds_each_oddity_with_its_place(self):
        local = {"Type": "OnMyDevice", "Class": "ASSDeviceLocalAccount", "Identifier": "DeviceLocalAccount"}
        child = {"Type": "CalDAV", "Class": "C", "Identifier": "K"}
        account = "Accounts[0]"
        cases = [
            ("no version", {"Accounts": [MAIL]}, [(None, None, "Version")]),
            ("another version", {"Version": 9, "Accounts": []}, [(None, None, "Version")]),
            ("a version of another kind", {"Version": "12", "Accounts": []}, [(None, None, "Version")]),
            ("an unknown key", {"Version": 12, "Other": 1, "Accounts": []}, [(None, None, "Other")]),
            ("accounts that are no array", {"Version": 12, "Accounts": {}}, [(None, None, "Accounts")]),
            ("no dictionary", {"Version": 12, "Accounts": [7]}, [(account, None, None)]),
            ("unknown type", [dict(MAIL, Type="Nope")], [(account, "M1", "Type")]),
            ("type of another kind", [dict(MAIL, Type=7)], [(account, "M1", "Type")]),
            ("no class", [{"Type": "LDAP", "Identifier": "L"}], [(account, "L", "Class")]),
            ("empty class", [dict(MAIL, Class="")], [(account, "M1", "Class")]),
            ("mail class that implies none", [dict(MAIL, Class="Toad")], [(account, "M1", "Class")]),
            ("mail class that implies another", [dict(MAIL, Class="Toad", AccountPath="Mail/POP-a")],
             [(account, "M1", "Class")]),
            ("no identifier", [{"Type": "LDAP", "Class": "C"}], [(account, None, "Identifier")]),
            ("empty identifier", [{"Type": "LDAP", "Class": "C", "Identifier": ""}], [(account, None, "Identifier")]),
            ("two of one identifier", [MAIL, MAIL], [("Accounts[1]", "M1", "Identifier")]),
            ("two device-local accounts", [local, dict(local, Identifier="other")],
             [("Accounts[1]", "DeviceLocalAccount", "Identifier")]),
            ("unsupported dataclass", [dict(MAIL, **{"Enabled Dataclasses": [DATACLASS + "Contacts"]})],
             [(account, "M1", "Enabled Dataclasses")]),
            ("dataclasses that are no array", [dict(MAIL, **{"Enabled Dataclasses": "x"})],
             [(account, "M1", "Enabled Dataclasses")]),
            ("children that are no array", [dict(MAIL, ChildAccounts={})], [(account, "M1", "ChildAccounts")]),
            ("child that is no dictionary", [dict(MAIL, ChildAccounts=[1])],
             [("Accounts[0].ChildAccounts[0]", None, None)]),
            ("child without identifier", [dict(MAIL, ChildAccounts=[child, {"Type": "CalDAV", "Class": "C"}])],
             [("Accounts[0].ChildAccounts[1]", None, "Identifier")]),
            ("child with the parent's identifier", [dict(MAIL, ChildAccounts=[dict(child, Identifier="M1")])],
             [("Accounts[0].ChildAccounts[0]", "M1", "Identifier")]),
            ("child with children", [dict(MAIL, ChildAccounts=[dict(child, ChildAccounts=[])])],
             [("Accounts[0].ChildAccounts[0]", "K", "ChildAccounts")]),
            ("child with unsupported dataclass",
             [dict(MAIL, ChildAccounts=[dict(child, **{"Enabled Dataclasses": [DATACLASS + "Mail"]})])],
             [("Accounts[0].ChildAccounts[0]", "K", "Enabled Dataclasses")]),
        ]  # fmt: skip
        for name, settings, expected in cases:
            with self.subTest(name):
                whole = settings if isinstance(settings, dict) else {"Version": 12, "Accounts": settings}
                self.assertEqual(self.places(whole), expected)

    def test_says_which_entries_the_next_save_loses(self):
        effects = {
            (f["place"], f["key"]): f["effect"]
            for f in self.findings({"Version": 11, "Accounts": [7, MAIL, dict(MAIL, ChildAccounts=[1])]})
        }
        self.assertEqual(
            effects,
            {
                (None, "Version"): "none",
                ("Accounts[0]", None): "lost at the next save",
                ("Accounts[2]", "Identifier"): "lost at the next save",
                ("Accounts[2].ChildAccounts[0]", None): "passed over",
            },
        )

    def test_finds_a_mode_that_lets_others_in(self):
        self.write({"Version": 12, "Accounts": []})
        self.settings_file.chmod(0o644)
        self.assertIn("0644", self.findings()[0]["text"])

    def test_finds_a_missing_file(self):
        self.settings_file.unlink()
        self.assertIn("does not exist", self.findings()[0]["text"])

    def test_names_the_byte_at_which_a_file_cannot_be_read(self):
        good = plistlib.dumps({"Version": 12, "Accounts": [MAIL]}, fmt=plistlib.FMT_BINARY)
        finding = self.findings(good[:8] + b"\xff" + good[9:])[0]
        self.assertRegex(finding["text"], r"cannot be read: .*byte")
        self.assertEqual(finding["effect"], "lost at the next save")

    def test_prints_a_line_for_each_finding(self):
        self.write({"Version": 12, "Accounts": [dict(MAIL, Type="Nope")]})
        said = self.fail_with(6, "validate")
        self.assertIn(f'{self.settings_file}: Accounts[0] (M1): Type: "Nope" is unknown', said)

    def test_changes_nothing_not_even_the_log(self):
        self.write({"Version": 9, "Accounts": [7, {"Type": "Nope"}, dict(MAIL, Class="Toad")]})
        before = self.state()
        self.findings()
        self.assertEqual(self.state(), before)


class HostileFiles(SettingsTest):
    def test_get_an_answer_and_are_left_as_they_are(self):
        expected = (DATA / "malformed/index.tsv").read_text().splitlines()[1:]
        self.assertGreater(len(expected), 50)
        for line in expected:
            name, expectation = line.split("\t")[:2]
            path = DATA / "malformed" / name
            if not path.exists():
                continue
            with self.subTest(name):
                content = path.read_bytes()
                self.write(content)
                for arguments in [["validate"], ["list"], ["set", "nobody", "A", "b"]]:
                    ended = self.run_on_image(*arguments)
                    codes = {"validate": {0, 6}, "list": {0, 6}, "set": {6, 7}}[arguments[0]]
                    self.assertIn(ended.returncode, codes, ended.stderr)
                    if expectation == "reject":
                        self.assertEqual(ended.returncode, 6, ended.stderr)
                        self.assertIn(str(self.settings_file).encode(), ended.stderr)
                    self.assertEqual(self.settings_file.read_bytes(), content)


if __name__ == "__main__":
    unittest.main()
