"""account-settings list and show."""

import unittest

from settingstest import DATACLASS, MAIL, QUILLNET, SettingsTest


class List(SettingsTest):
    def test_shows_the_accounts_in_file_order_with_children_below_their_parent(self):
        self.assertEqual(
            self.succeed("list").splitlines(),
            [
                "ACCOUNT  TYPE      NAME                  ENABLED",
                "M1       Mail      Post                  mail",
                "Q1       Quillnet  ada@quillnet.example  contacts",
                "  Q1C    CalDAV    Kalender              contacts",
                "  Q1D    CardDAV   ada@quillnet.example  contacts",
            ],
        )

    def test_as_json(self):
        self.assertEqual(
            self.answer("list")["accounts"],
            [
                {
                    "identifier": "M1", "type": "Mail", "class": "IMAPAccount", "display_name": "Post",
                    "enabled_dataclasses": ["mail"], "children": [],
                },
                {
                    "identifier": "Q1", "type": "Quillnet", "class": "QuillnetAccount",
                    "display_name": "ada@quillnet.example", "enabled_dataclasses": ["contacts"],
                    "children": [
                        {
                            "identifier": "Q1C", "type": "CalDAV", "class": "MobileCalDAVAccount",
                            "display_name": "Kalender", "enabled_dataclasses": ["contacts"],
                        },
                        {
                            "identifier": "Q1D", "type": "CardDAV", "class": "CardDAVAccount",
                            "display_name": "ada@quillnet.example", "enabled_dataclasses": ["contacts"],
                        },
                    ],
                },
            ],
        )  # fmt: skip

    def test_says_that_some_entries_are_not_shown(self):
        self.write({"Version": 12, "Accounts": [7, {"Type": "Nope", "Class": "C"}, MAIL]})
        ended = self.run_on_image("list")
        self.assertEqual(ended.returncode, 0)
        self.assertEqual(len(ended.stdout.splitlines()), 2)
        self.assertIn(b"validate", ended.stderr)

    def test_shows_no_identifier_that_no_file_holds(self):
        self.write({"Version": 12, "Accounts": [{"Type": "LDAP", "Class": "LDAPAccount"}]})
        self.assertEqual(self.succeed("list").splitlines()[1].split(), ["-", "LDAP"])
        self.assertIsNone(self.answer("list")["accounts"][0]["identifier"])

    def test_changes_nothing_not_even_the_log(self):
        self.write({"Version": 12, "Accounts": [MAIL, {"Type": "Nope"}]})
        before = self.state()
        self.run_on_image("list")
        self.run_on_image("show", "M1")
        self.assertEqual(self.state(), before)

    def test_an_image_without_a_settings_file_has_no_accounts(self):
        self.settings_file.unlink()
        self.assertEqual(self.answer("list")["accounts"], [])

    def test_names_an_unreadable_file_and_the_place_in_it(self):
        self.write(b"bplist00 and rubbish")
        said = self.fail_with(6, "list")
        self.assertIn(str(self.settings_file), said)
        self.assertIn("repair the file", said)

    def test_names_a_folder_that_is_no_image(self):
        self.image = self.directory
        self.assertIn(str(self.directory), self.fail_with(7, "list"))


class Show(SettingsTest):
    def test_of_a_top_level_account(self):
        shown = self.answer("show", "Q1")
        self.assertEqual(shown["identifier"], "Q1")
        self.assertIsNone(shown["parent"])
        self.assertEqual(shown["children"], ["Q1C", "Q1D"])
        self.assertEqual(shown["supported_dataclasses"][:3], ["mail", "contacts", "calendars"])
        self.assertEqual(shown["provisioned_dataclasses"], ["contacts", "notes"])
        self.assertEqual(shown["enabled_dataclasses"], ["contacts"])
        self.assertEqual(shown["properties"], QUILLNET)
        self.assertEqual(shown["inherited_properties"], {})

    def test_of_a_child_parts_own_from_inherited_properties(self):
        shown = self.answer("show", "Q1C")
        self.assertEqual(shown["parent"], "Q1")
        self.assertEqual(shown["children"], [])
        self.assertEqual(shown["supported_dataclasses"], ["calendars", "reminders"])
        self.assertEqual(shown["properties"], QUILLNET["ChildAccounts"][0])
        self.assertEqual(
            shown["inherited_properties"],
            {key: QUILLNET[key] for key in ["Username", "Provisioned Dataclasses", "Enabled Dataclasses"]},
        )

    def test_in_tables(self):
        lines = self.succeed("show", "Q1C").splitlines()
        self.assertIn("PARENT       Q1", lines)
        self.assertIn("SUPPORTED    calendars reminders", lines)
        self.assertIn("ENABLED      contacts (as the parent)", lines)
        rows = [line.split() for line in lines]
        self.assertIn(["Class", "string", "own", "MobileCalDAVAccount"], rows)
        self.assertIn(["Username", "string", "parent", "ada"], rows)

    def test_of_an_unknown_account_suggests_what_may_be_meant(self):
        said = self.fail_with(7, "show", "q1")
        self.assertIn('did you mean "Q1"', said)
        self.assertIn("account-settings list", said)
        self.assertNotIn("did you mean", self.fail_with(7, "show", "nobody-at-all"))

    def test_of_an_identifier_that_two_accounts_have_is_refused(self):
        self.write({"Version": 12, "Accounts": [MAIL, dict(MAIL, DisplayName="again")]})
        self.assertIn("2 accounts", self.fail_with(7, "show", "M1"))

    def test_keeps_every_kind_of_value(self):
        extra = {"Big": 2**64 - 1, "Half": 0.5, "On": True, "Blob": b"\x00\xff", "List": [1, {"a": DATACLASS}]}
        self.write({"Version": 12, "Accounts": [dict(MAIL, **extra)]})
        shown = self.answer("show", "M1")["properties"]
        self.assertEqual(shown, dict(MAIL, **dict(extra, Blob={"@data": "AP8="})))


if __name__ == "__main__":
    unittest.main()
