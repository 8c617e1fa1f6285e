"""account-settings enable, disable, insert, delete, add-child and remove-child."""

import json
import plistlib
import subprocess
import unittest

from settingstest import DATACLASS, DEVICE_IMAGE, MAIL, QUILLNET, TOOL, SettingsTest, run

LOCAL = {"Identifier": "DeviceLocalAccount", "Type": "OnMyDevice", "Class": "ASSDeviceLocalAccount"}
LDAP = {"Identifier": "L1", "Type": "LDAP", "Class": "LDAPAccount"}
SMTP = {"Identifier": "S1", "Type": "SMTP", "Class": "SMTPAccount"}


class Dataclasses(SettingsTest):
    def test_are_turned_on_and_off_by_short_name_or_identifier(self):
        self.assertEqual(self.succeed("enable", "Q1", "notes"), "")
        self.assertEqual(
            self.account("Q1")["Enabled Dataclasses"],
            [DATACLASS + "Mail", DATACLASS + "Contacts", DATACLASS + "Notes"],
        )
        self.succeed("disable", "Q1", "notes", DATACLASS + "Mail")
        self.assertEqual(self.account("Q1")["Enabled Dataclasses"], [DATACLASS + "Contacts"])
        self.assertEqual(self.account("M1"), MAIL)

    def test_that_are_as_wanted_already_change_nothing(self):
        before = self.state()
        self.assertEqual(self.succeed("enable", "Q1", "contacts"), "")
        self.assertEqual(self.succeed("disable", "Q1", "notes"), "")
        self.assertEqual(self.state(), before)

    def test_that_the_type_does_not_support_are_refused_with_those_it_does(self):
        before = self.state()
        said = self.fail_with(7, "enable", "M1", "mail", "contacts")
        self.assertIn('type "Mail", which does not support contacts', said)
        self.assertIn("it supports mail, notes", said)
        self.assertIn("it supports none", self._refusal_of(SMTP))
        self.write({"Version": 12, "Accounts": [MAIL, QUILLNET]})
        self.fail_with(2, "enable", "M1", "dreams")
        self.assertEqual(self.settings_file.read_bytes(), before[self.settings_file][2])

    def _refusal_of(self, account) -> str:
        self.write({"Version": 12, "Accounts": [account]})
        return self.fail_with(7, "disable", account["Identifier"], "mail")

    def test_of_a_child_are_stored_with_a_note_while_the_parent_decides(self):
        ended = self.run_on_image("enable", "Q1C", "calendars")
        self.assertEqual((ended.returncode, ended.stdout), (0, b""))
        self.assertIn(b'"Q1C" follows its parent "Q1"', ended.stderr)
        self.assertEqual(self.account("Q1C")["Enabled Dataclasses"], [DATACLASS + "Calendars"])

    def test_that_are_not_provisioned_are_stored_with_a_note(self):
        ended = self.run_on_image("enable", "Q1", "calendars")
        self.assertEqual(ended.returncode, 0)
        self.assertIn(b"not provisioned", ended.stderr)
        self.assertIn(DATACLASS + "Calendars", self.account("Q1")["Enabled Dataclasses"])

    def test_of_the_device_itself_turn_syncing_on_and_off_unless_it_is_a_dry_run(self):
        self.write({"Version": 12, "Accounts": [LOCAL]})
        before = self.state()
        self.assertIn("Enabled Dataclasses", self.succeed("enable", "DeviceLocalAccount", "contacts", "--dry-run"))
        self.assertEqual(self.state(), before)
        self.succeed("enable", "DeviceLocalAccount", "contacts")
        self.assertEqual(self.account("DeviceLocalAccount")["Enabled Dataclasses"], [DATACLASS + "Contacts"])
        self.succeed("disable", "DeviceLocalAccount", "contacts")
        self.assertEqual(self.account("DeviceLocalAccount")["Enabled Dataclasses"], [])


    def test_of_the_device_itself_are_as_before_when_the_save_fails(self):
        self.write({"Version": 12, "Accounts": [LOCAL]})
        self.succeed("enable", "DeviceLocalAccount", "contacts")
        self.succeed("disable", "DeviceLocalAccount", "contacts")
        before = self.records()
        users = (self.image / "etc/passwd").read_text()
        (self.image / "etc/passwd").write_text("nobody:x:1:1::/:/bin/sh\n")
        said = self.fail_with(1, "enable", "DeviceLocalAccount", "contacts", "calendars")
        self.assertIn("the accounts were not saved", said)
        self.assertIn("on the device contacts, calendars turned off again", said)
        (self.image / "etc/passwd").write_text(users)
        self.assertEqual(self.account("DeviceLocalAccount")["Enabled Dataclasses"], [])
        self.assertEqual(self.records(), before)

    def records(self):
        """What the device's stores hold."""
        return run("show", self.image, tool=DEVICE_IMAGE).stdout


class FileTest(SettingsTest):
    """Tests of commands that read a file with accounts."""

    def file(self, value, form: str = "json"):
        path = self.directory / "accounts"
        if form == "json":
            path.write_text(json.dumps(value))
        else:
            path.write_bytes(plistlib.dumps(value, fmt=plistlib.FMT_XML if form == "xml" else plistlib.FMT_BINARY))
        return path


class Insert(FileTest):
    def test_appends_one_account_or_an_array_of_every_form(self):
        self.assertEqual(self.succeed("insert", self.file(LDAP)), "L1\n")
        more = [dict(SMTP, Blob=b"\x01"), dict(LDAP, Identifier="L2", ChildAccounts=[dict(SMTP, Identifier="L2S")])]
        self.assertEqual(self.succeed("insert", self.file(more[:1], "xml")), "S1\n")
        self.assertEqual(self.succeed("insert", self.file(more[1:], "binary")), "L2\n")
        self.assertEqual(self.settings(), {"Version": 12, "Accounts": [MAIL, QUILLNET, LDAP, *more]})

    def test_makes_identifiers_and_prints_them(self):
        printed = self.succeed("insert", self.file({"Type": "LDAP", "Class": "LDAPAccount"})).strip()
        self.assertRegex(printed, r"^[0-9A-F]{8}(-[0-9A-F]{4}){3}-[0-9A-F]{12}$")
        self.assertEqual(self.settings()["Accounts"][2]["Identifier"], printed)

    def test_prints_the_identifiers_in_the_order_of_the_file(self):
        accounts = [dict(LDAP, Identifier=name) for name in ("Z", "A", "M")]
        self.assertEqual(self.succeed("insert", self.file(accounts)), "Z\nA\nM\n")

    def test_says_that_the_accounts_were_saved_when_their_identifiers_cannot_be_printed(self):
        for options in ([], ["--json"]):
            with self.subTest(options), open("/dev/full", "wb") as full:
                account = dict(LDAP, Identifier="full" + "".join(options))
                ended = subprocess.run(
                    [TOOL, "insert", self.file(account), "--image", self.image, *options],
                    stdout=full, stderr=subprocess.PIPE, check=False, timeout=100,
                )  # fmt: skip
                self.assertEqual(ended.returncode, 1)
                self.assertIn(b"cannot write standard output", ended.stderr)
                self.assertIn(b"the accounts were saved", ended.stderr)
                self.assertEqual(self.account(account["Identifier"]), account)

    def test_takes_the_account_of_the_device_itself(self):
        self.assertEqual(self.succeed("insert", self.file(LOCAL)), "DeviceLocalAccount\n")
        self.fail_with(7, "insert", self.file(LOCAL))

    def test_inserts_everything_or_nothing(self):
        before = self.state()
        cases = [
            ("taken", [LDAP, MAIL], '"M1" is taken'),
            ("taken by a child", [LDAP, dict(SMTP, Identifier="Q1C")], '"Q1C" is taken'),
            ("its child's taken", [dict(LDAP, ChildAccounts=[dict(SMTP, Identifier="M1")])], '"M1" is taken'),
            ("twice in the file", [LDAP, LDAP], "Accounts[1] (L1): Identifier"),
            ("unknown type", [LDAP, dict(LDAP, Type="Nope")], 'Accounts[1] (L1): Type: "Nope" is unknown'),
            ("no class", [{"Type": "LDAP"}], "Accounts[0]: Class"),
            ("unknown mail class", [{"Type": "Mail", "Class": "Toad"}], "mail engine"),
            ("nothing", [], "holds no account"),
            ("an empty identifier", dict(LDAP, Identifier=""), '"Identifier" is empty or no string'),
            ("an identifier that is a number", dict(LDAP, Identifier=7), '"Identifier" is empty or no string'),
            ("another name for the device", dict(LOCAL, Identifier="other"), '"DeviceLocalAccount" and no other'),
            ("the device as a child", dict(LDAP, ChildAccounts=[LOCAL]), "is nobody's child"),
            ("a number", [LDAP, 7], "Accounts[1]"),
            ("no account", "text", "neither"),
            ("a settings file", {"Accounts": [LDAP]}, "whole settings file"),
            ("a nameless child", [dict(LDAP, ChildAccounts=[{"Type": "SMTP", "Class": "C"}])], "ChildAccounts[0]"),
        ]
        for name, value, text in cases:
            with self.subTest(name):
                said = self.fail_with(7, "insert", self.file(value))
                self.assertIn(text, said)
                self.assertIn("nothing was changed", said)
                self.assertEqual(self.state(), before)

    def test_names_the_place_in_a_broken_file(self):
        path = self.directory / "broken.json"
        path.write_text('{"Type": "LDAP",\n "Class": }')
        said = self.fail_with(6, "insert", path)
        self.assertIn(str(path), said)
        self.assertIn("line 2, column 11", said)

    def test_with_dry_run_only_tells(self):
        before = self.state()
        self.assertEqual(self.succeed("insert", self.file(LDAP), "--dry-run"), "L1: added, of type LDAP\n")
        self.assertEqual(self.state(), before)


class Children(FileTest):
    def test_are_added_behind_the_others(self):
        self.assertEqual(self.succeed("add-child", "Q1", self.file(SMTP)), "S1\n")
        self.assertEqual(self.account("Q1"), dict(QUILLNET, ChildAccounts=[*QUILLNET["ChildAccounts"], SMTP]))
        self.succeed("add-child", "M1", self.file([dict(SMTP, Identifier="S2")]))
        self.assertEqual(self.account("M1"), dict(MAIL, ChildAccounts=[dict(SMTP, Identifier="S2")]))

    def test_get_an_identifier_when_they_have_none(self):
        printed = self.succeed("add-child", "M1", self.file({"Type": "SMTP", "Class": "SMTPAccount"})).strip()
        self.assertEqual(self.account(printed)["Type"], "SMTP")

    def test_are_refused_where_they_cannot_be(self):
        before = self.state()
        cases = [
            ("Q1C", SMTP, "child account itself"),
            ("Q1", dict(SMTP, Identifier="M1"), "taken"),
            ("Q1", dict(SMTP, ChildAccounts=[]), "has no children"),
            ("Q1", dict(SMTP, Type="Nope"), '"Nope" is unknown'),
            ("Q1", [SMTP, LDAP], "more than one"),
            ("Q1", [7], "no dictionary"),
            ("Q1", [], "holds no account"),
            ("Q1", dict(SMTP, Identifier=7), '"Identifier" is empty or no string'),
            ("Q1", dict(SMTP, Identifier=""), '"Identifier" is empty or no string'),
            ("Q1", LOCAL, "is nobody's child"),
            ("nobody", SMTP, "there is no account"),
        ]
        for parent, value, text in cases:
            with self.subTest(text):
                self.assertIn(text, self.fail_with(7, "add-child", parent, self.file(value)))
                self.assertEqual(self.state(), before)

    def test_are_refused_by_a_parent_whose_children_are_no_array(self):
        self.write({"Version": 12, "Accounts": [dict(MAIL, ChildAccounts={"kept": 1})]})
        before = self.state()
        said = self.fail_with(7, "add-child", "M1", self.file(SMTP))
        self.assertIn('"M1" has "ChildAccounts" that are no array', said)
        self.assertEqual(self.state(), before)

    def test_are_removed_from_their_parent(self):
        self.assertEqual(self.succeed("remove-child", "Q1C"), "")
        self.assertEqual(self.account("Q1"), dict(QUILLNET, ChildAccounts=QUILLNET["ChildAccounts"][1:]))
        self.assertIn("account-settings delete", self.fail_with(7, "remove-child", "M1"))


class Delete(SettingsTest):
    def test_takes_the_children_along(self):
        self.assertEqual(self.succeed("delete", "Q1", "--dry-run"), "Q1: deleted, with 2 child accounts\n")
        self.assertEqual(self.succeed("delete", "Q1"), "")
        self.assertEqual(self.settings(), {"Version": 12, "Accounts": [MAIL]})
        self.succeed("delete", "M1")
        self.assertEqual(self.settings(), {"Version": 12, "Accounts": []})

    def test_of_no_identifier_is_wrong_usage(self):
        self.write({"Version": 12, "Accounts": [LDAP, {"Type": "SMTP", "Class": "SMTPAccount"}]})
        before = self.state()
        commands = [
            ("delete", ""), ("remove-child", ""), ("show", ""), ("set", "", "A", "b"), ("unset", "", "A"),
            ("enable", "", "mail"), ("disable", "", "mail"), ("add-child", "", "/dev/null"),
        ]  # fmt: skip
        for command in commands:
            with self.subTest(command[0]):
                self.assertIn("an identifier is not empty", self.fail_with(2, *command))
        self.assertEqual(self.state(), before)

    def test_of_a_child_is_refused(self):
        self.assertIn("account-settings remove-child", self.fail_with(7, "delete", "Q1C"))


if __name__ == "__main__":
    unittest.main()
