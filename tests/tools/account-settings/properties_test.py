"""account-settings set and unset, and what every changing command keeps to."""

import datetime
import fcntl
import os
import plistlib
import stat
import unittest

from settingstest import MAIL, QUILLNET, SettingsTest, run


class Set(SettingsTest):
    def test_writes_typed_values_as_other_readers_see_them(self):
        cases = [
            ("Nick", "a=b:c", "a=b:c"),
            ("Nick:string", "", ""),
            ("a:b:string", "x", "x"),
            ("Port:integer", "18446744073709551615", 2**64 - 1),
            ("Half:real", "0.5", 0.5),
            ("On:boolean", "true", True),
            ("Since:date", "2026-11-21T02:40:00Z", datetime.datetime(2026, 11, 21, 2, 40)),
            ("Token:data", "00fF", b"\x00\xff"),
        ]
        expected = dict(MAIL)
        for key, text, value in cases:
            with self.subTest(key):
                self.assertEqual(self.succeed("set", "M1", key, text), "")
                expected[key.rpartition(":")[0] or key] = value
                self.assertEqual(self.account("M1"), expected)
        self.assertEqual(self.account("Q1"), QUILLNET)
        self.assertEqual(self.settings()["Version"], 12)

    def test_notes_that_a_value_changed_its_kind_unless_it_was_told_to(self):
        ended = self.run_on_image("set", "M1", "PortNumber", "995")
        self.assertEqual(ended.returncode, 0)
        self.assertIn(b"PortNumber:integer keeps the kind", ended.stderr)
        self.assertEqual(self.account("M1")["PortNumber"], "995")
        self.succeed("set", "M1", "PortNumber:integer", "995")

    def test_takes_a_negative_number_behind_two_dashes(self):
        self.succeed("set", "M1", "Offset:integer", "--", "-5")
        self.assertEqual(self.account("M1")["Offset"], -5)

    def test_changes_a_child_where_it_stands(self):
        self.succeed("set", "Q1C", "DisplayName", "Neu")
        first = dict(QUILLNET["ChildAccounts"][0], DisplayName="Neu")
        self.assertEqual(self.account("Q1"), dict(QUILLNET, ChildAccounts=[first, QUILLNET["ChildAccounts"][1]]))

    def test_tells_programs_what_changed(self):
        answer = self.answer("set", "Q1C", "DisplayName", "Neu")
        self.assertEqual(
            answer,
            {
                "image": str(self.image), "dry_run": False, "saved": True, "notified": False,
                "changes": [
                    {
                        "account": "Q1C", "parent": "Q1", "change": "modified", "key": "DisplayName",
                        "before": "Kalender", "after": "Neu",
                    }
                ],
            },
        )  # fmt: skip

    def test_refuses_what_the_library_would_ignore_or_what_would_break_the_account(self):
        before = self.state()
        cases = [("Type", "type"), ("Class", "class"), ("Identifier", "merges"), ("ChildAccounts", "add-child"),
                 ("Enabled Dataclasses", "enable")]  # fmt: skip
        for key, text in cases:
            with self.subTest(key):
                said = self.fail_with(7, "set", "M1", key, "x")
                self.assertIn(f'"{key}" is not changed', said)
                self.assertIn(text, said)
        self.assertEqual(self.state(), before)

    def test_wrong_values_are_wrong_usage(self):
        for key, value in [("A:integer", "x"), ("A:colour", "red"), ("A:data", "0"), ("", "x"), ("A", b"\xff")]:
            with self.subTest(key):
                self.fail_with(2, "set", "M1", key, value)


class Unset(SettingsTest):
    def test_removes_the_property(self):
        self.assertEqual(self.succeed("unset", "M1", "PortNumber"), "")
        self.assertEqual(self.account("M1"), {key: value for key, value in MAIL.items() if key != "PortNumber"})

    def test_names_the_parent_that_a_child_has_the_property_from(self):
        self.assertIn('parent "Q1"', self.fail_with(7, "unset", "Q1C", "Username"))

    def test_refuses_what_makes_the_account_an_account(self):
        for key in ["Type", "Class", "Identifier", "ChildAccounts"]:
            with self.subTest(key):
                self.fail_with(7, "unset", "M1", key)


class EveryChange(SettingsTest):
    def test_that_changes_nothing_writes_nothing(self):
        before = self.state()
        self.assertEqual(self.succeed("set", "M1", "PortNumber:integer", "993"), "")
        self.assertEqual(self.succeed("unset", "M1", "Nothing"), "")
        self.assertEqual(self.answer("unset", "M1", "Nothing")["saved"], False)
        self.assertEqual(self.state(), before)

    def test_shows_with_dry_run_what_it_would_do_and_does_not_do_it(self):
        before = self.state()
        self.assertEqual(
            self.succeed("set", "M1", "PortNumber:integer", "995", "--dry-run"), "M1: PortNumber: 993 -> 995\n"
        )
        self.assertEqual(self.succeed("set", "M1", "New", "x", "--dry-run"), 'M1: New: "x" added\n')
        self.assertEqual(self.succeed("unset", "Q1C", "DisplayName", "--dry-run"),
                         'Q1/Q1C: DisplayName: "Kalender" removed\n')  # fmt: skip
        self.assertEqual(self.succeed("unset", "M1", "Nothing", "--dry-run"), "nothing would change\n")
        answer = self.answer("set", "M1", "New", "x", "--dry-run")
        self.assertEqual((answer["dry_run"], answer["saved"]), (True, False))
        self.assertEqual(self.state(), before)

    def test_shows_no_control_characters_and_no_turned_writing(self):
        bad = "a\x1b[31m\x9b\u202eb\u2066\u00fc"
        shown = "a\\x1b[31m\\u009b\\u202eb\\u2066\u00fc"
        self.assertIn(f'"{shown}" added', self.succeed("set", "M1", "Nick", bad, "--dry-run"))
        self.assertIn(shown, self.fail_with(7, "delete", bad))
        self.succeed("set", "M1", "DisplayName", bad)
        self.assertIn(shown, self.succeed("list"))
        self.write({"Version": 12, "Accounts": [dict(MAIL, Identifier=bad)]})
        self.assertIn(shown, self.succeed("delete", bad, "--dry-run"))

    def test_cuts_long_texts_of_the_file_in_its_messages(self):
        long = "x" * 1_000_000
        for settings in ({"Accounts": [], long: 1}, {"Accounts": [dict(MAIL, Type=long, Identifier=long)]}):
            self.write(dict(settings, Version=12))
            self.assertLess(len(self.fail_with(6, "set", "M1", "A", "b")), 2000)

    def test_keeps_the_file_private(self):
        self.succeed("set", "M1", "A", "b")
        self.assertEqual(stat.S_IMODE(self.settings_file.stat().st_mode), 0o600)
        self.assertEqual(list((self.image / "tmp").iterdir()), [])

    def test_leaves_files_of_which_a_save_would_lose_something_alone(self):
        cases = [
            ("rubbish", b"bplist00 and rubbish"),
            ("no dictionary", plistlib.dumps("x")),
            ("an unknown key at the top", plistlib.dumps({"Version": 12, "Accounts": [MAIL], "Other": 1})),
            ("no array", plistlib.dumps({"Accounts": {"a": MAIL}})),
            ("a stray entry", plistlib.dumps({"Accounts": [MAIL, 7]})),
            ("an unknown type", plistlib.dumps({"Accounts": [MAIL, {"Type": "Nope", "Class": "C"}]})),
            ("no class", plistlib.dumps({"Accounts": [MAIL, {"Type": "LDAP"}]})),
            ("an unknown mail class", plistlib.dumps({"Accounts": [MAIL, {"Type": "Mail", "Class": "C"}]})),
            ("one identifier twice", plistlib.dumps({"Accounts": [MAIL, dict(QUILLNET, Identifier="M1")]})),
        ]
        for name, content in cases:
            with self.subTest(name):
                self.write(content)
                before = self.state()
                said = self.fail_with(6, "set", "M1", "A", "b")
                self.assertIn(str(self.settings_file), said)
                self.assertIn("nothing was changed", said)
                self.assertEqual(self.state(), before)

    def test_waits_for_the_lock_as_long_as_it_is_told(self):
        with open(self.image / "var/run/image.lock", "ab") as lock:
            fcntl.flock(lock, fcntl.LOCK_EX)
            before = self.state()
            self.assertIn("another run", self.fail_with(11, "set", "M1", "A", "b", "--wait", "0"))
            self.assertEqual(self.state(), before)
            self.succeed("list")  # to look takes no lock
            self.succeed("set", "M1", "A", "b", "--dry-run")
            self.succeed("set", "M1", "A", "b", "--no-lock")
        self.assertEqual(self.account("M1")["A"], "b")

    def test_takes_only_numbers_as_time_to_wait(self):
        for text in ("nan", "inf", "-1", "long"):
            with self.subTest(text):
                self.fail_with(2, "set", "M1", "A", "b", f"--wait={text}")

    def test_says_that_the_save_failed_and_why(self):
        before = self.settings_file.read_bytes()
        (self.image / "etc/passwd").write_text("nobody:x:1:1::/:/bin/sh\n")
        said = self.fail_with(1, "set", "M1", "A", "b")
        self.assertIn("Failed to save accounts to filesystem.", said)
        self.assertIn("the accounts were not saved, the file is as it was", said)
        self.assertIn("mobile", said)
        self.assertEqual(self.settings_file.read_bytes(), before)

    def test_works_for_an_ordinary_user_on_an_image_of_his_own(self):
        if os.geteuid() != 0:
            self.skipTest("every test runs as an ordinary user already")
        self.directory.chmod(0o755)
        home = self.directory / "nobody"
        home.mkdir()
        os.chown(home, 65534, 65534)
        image = home / "image"
        as_nobody = {"user": 65534, "group": 65534, "extra_groups": [], "cwd": "/"}
        made = run("create", image, tool=os.environ["DEVICE_IMAGE"], **as_nobody)
        self.assertEqual(made.returncode, 0, made.stderr)
        added = run("add-account", image, "--type", "LDAP", "--identifier", "L1", tool=os.environ["DEVICE_IMAGE"],
                    **as_nobody)  # fmt: skip
        self.assertEqual(added.returncode, 0, added.stderr)
        done = run("set", "L1", "A", "b", "--image", image, **as_nobody)
        self.assertEqual((done.returncode, done.stderr), (0, b""))
        self.image = image
        self.assertEqual(self.account("L1")["A"], "b")
        self.assertEqual(self.settings_file.stat().st_uid, 65534)

    def test_of_root_keeps_the_file_the_property_of_mobile(self):
        if os.geteuid() != 0:
            self.skipTest("only root can give a file away")
        self.succeed("set", "M1", "A", "b")
        self.assertEqual(self.settings_file.stat().st_uid, 501)

    def test_writes_the_library_s_lines_into_the_image_s_log_under_its_own_name(self):
        orphan = {"Type": "Nope", "Class": "C", "Identifier": "X"}
        self.write({"Version": 12, "Accounts": [dict(MAIL, ChildAccounts=[orphan])]})
        self.succeed("set", "M1", "A", "b")
        log = (self.image / "var/log/system.log").read_text()
        self.assertRegex(log, r"account-settings\[\d+\]: Ignoring unknown child account")
        self.assertEqual(self.account("M1")["ChildAccounts"], [orphan])


if __name__ == "__main__":
    unittest.main()
