"""device-image create and add-account."""

import datetime
import fcntl
import plistlib
import resource
import stat
import unittest

from imagetest import SETTINGS, ImageTest, run


class Create(ImageTest):
    def test_makes_a_private_image_with_empty_settings(self):
        self.assertEqual(stat.S_IMODE(self.image.stat().st_mode), 0o700)
        self.assertEqual(self.settings(), {"Version": 12, "Accounts": []})
        self.assertEqual(self.show()["accounts"], [])
        self.assertEqual(self.show()["stores"], [])

    def test_gives_the_sync_agent_its_account_name(self):
        preferences = self.image / "var/mobile/Library/Preferences/com.vantor.OTASyncAgent.plist"
        self.assertEqual(plistlib.loads(preferences.read_bytes()), {"AccountName": "ada"})
        self.assertEqual(self.show()["sync_account_name"], "ada")

    def test_refuses_what_is_there_already(self):
        self.assertIn("is there already", self.fail_with(7, "create", self.image))
        self.assertIn("is there already", self.fail_with(7, "create", self.file("plain", "x")))


    def test_leaves_nothing_behind_when_it_cannot_write_to_the_end(self):
        empty = self.directory / "empty"
        empty.mkdir(mode=0o755)
        empty.chmod(0o755)
        cases = [
            ("the first file", 20, [], "etc/passwd"),
            ("the last file", 300, ["--sync-account-name", "a" * 500], "com.vantor.OTASyncAgent.plist"),
        ]
        for name, limit, options, file in cases:
            for directory in (self.directory / "new", empty):
                with self.subTest(name, directory=directory.name):
                    ended = run("create", directory, *options, restore_signals=False,
                                preexec_fn=lambda: resource.setrlimit(resource.RLIMIT_FSIZE, (limit, limit)))
                    self.assertEqual(ended.returncode, 1, ended.stderr)
                    self.assertIn(file, ended.stderr.decode())
                    self.assertIn("nothing is left of the image, make room for it and try again",
                                  ended.stderr.decode())
                    self.assertFalse((self.directory / "new").exists())
                    self.assertEqual(list(empty.iterdir()), [])
                    self.assertEqual(stat.S_IMODE(empty.stat().st_mode), 0o755)


class AddAccount(ImageTest):
    def test_writes_the_account_as_other_readers_see_it(self):
        self.add_account("OnMyDevice", "DeviceLocalAccount")
        self.add_account(
            "Quillnet", "Q1", "--display-name", "Zoë", "--username", "zoe", "--status", "1",
            "--enable", "contacts", "--enable", "mail", "--enable", "com.vantor.Dataclass.Backup",
            "--child", "type=CalDAV,class=MobileCalDAVAccount,identifier=Q1C,display-name=K,enable=calendars",
            "--property", "AccountPath=Mail/Quillnet-zoe", "--property", "Port:integer=-993",
            "--property", "Big:integer=18446744073709551615", "--property", "Half:real=0.5",
            "--property", "On:boolean=true", "--property", "Since:date=2026-11-21T02:40:00Z",
            "--property", "Token:data=00fF", "--property", "URL:string=a=b:c", "--property", "Empty=",
        )  # fmt: skip
        self.assertEqual(
            self.settings(),
            {
                "Version": 12,
                "Accounts": [
                    {"Type": "OnMyDevice", "Class": "ASSDeviceLocalAccount", "Identifier": "DeviceLocalAccount"},
                    {
                        "Type": "Quillnet",
                        "Class": "QuillnetAccount",
                        "Identifier": "Q1",
                        "DisplayName": "Zoë",
                        "Username": "zoe",
                        "QuillnetStatus": 1,
                        "Enabled Dataclasses": [
                            "com.vantor.Dataclass.Contacts",
                            "com.vantor.Dataclass.Mail",
                            "com.vantor.Dataclass.Backup",
                        ],
                        "ChildAccounts": [
                            {
                                "Type": "CalDAV",
                                "Class": "MobileCalDAVAccount",
                                "Identifier": "Q1C",
                                "DisplayName": "K",
                                "Enabled Dataclasses": ["com.vantor.Dataclass.Calendars"],
                            }
                        ],
                        "AccountPath": "Mail/Quillnet-zoe",
                        "Port": -993,
                        "Big": 2**64 - 1,
                        "Half": 0.5,
                        "On": True,
                        "Since": datetime.datetime(2026, 11, 21, 2, 40),
                        "Token": b"\x00\xff",
                        "URL": "a=b:c",
                        "Empty": "",
                    },
                ],
            },
        )
        path = self.image / SETTINGS
        self.assertEqual(path.read_bytes()[:8], b"bplist00")
        self.assertEqual(stat.S_IMODE(path.stat().st_mode), 0o600)

    def test_shows_the_accounts_in_their_order(self):
        self.add_account("Mail", "M1", "--display-name", "Post")
        self.add_account("Quillnet", "Q1", "--enable", "notes", "--enable", "com.vantor.Dataclass.Backup",
                         "--child", "type=CalDAV,identifier=Q1C")
        self.assertEqual(
            self.show()["accounts"],
            [
                {
                    "identifier": "M1", "type": "Mail", "class": "IMAPAccount", "display_name": "Post",
                    "enabled_dataclasses": [], "children": [],
                },
                {
                    "identifier": "Q1", "type": "Quillnet", "class": "QuillnetAccount", "display_name": "",
                    "enabled_dataclasses": ["notes", "com.vantor.Dataclass.Backup"],
                    "children": [
                        {"identifier": "Q1C", "type": "CalDAV", "class": "MobileCalDAVAccount", "display_name": ""}
                    ],
                },
            ],
        )  # fmt: skip

    def test_makes_an_identifier_that_the_stores_share(self):
        printed = self.succeed("add-account", self.image, "--type", "CardDAV").decode().strip()
        self.assertRegex(printed, r"^[0-9A-F]{8}(-[0-9A-F]{4}){3}-[0-9A-F]{12}$")
        account = self.settings()["Accounts"][0]
        self.assertEqual(account["Identifier"], printed)
        self.assertEqual(account["Sync Identifier"], printed)

    def test_keeps_everything_else_in_the_file(self):
        before = {"Version": 7, "Other": [1, {"a": b"b"}], "Accounts": [{"Identifier": "X", "Type": "Odd"}, "stray"]}
        (self.image / SETTINGS).write_bytes(plistlib.dumps(before))
        self.add_account("LDAP", "L1")
        before["Accounts"].append({"Identifier": "L1", "Type": "LDAP", "Class": "LDAPAccount"})
        self.assertEqual(self.settings(), before)

    def test_refuses_what_the_device_could_not_use_and_changes_nothing(self):
        self.add_account("Mail", "M1", "--child", "type=SMTP,identifier=S1")
        before = (self.image / SETTINGS).read_bytes()
        cases = [
            ("unknown type", 2, ["--type", "Nope"], "account type"),
            ("no type", 2, [], "--type"),
            ("unknown child type", 2, ["--type", "Mail", "--child", "type=Nope"], "account type"),
            ("bad child", 2, ["--type", "Mail", "--child", "type=SMTP,colour=red"], "colour=red"),
            ("unknown dataclass", 2, ["--type", "Mail", "--enable", "dreams"], "dreams"),
            ("mail class", 2, ["--type", "Mail", "--class", "Nope"], "mail class"),
            ("bad integer", 2, ["--type", "Mail", "--property", "A:integer=x"], "A:integer=x"),
            ("bad boolean", 2, ["--type", "Mail", "--property", "A:boolean=1"], "A:boolean=1"),
            ("bad data", 2, ["--type", "Mail", "--property", "A:data=0"], "A:data=0"),
            ("bad date", 2, ["--type", "Mail", "--property", "A:date=soon"], "A:date=soon"),
            ("bad kind", 2, ["--type", "Mail", "--property", "A:colour=x"], "A:colour=x"),
            ("no value", 2, ["--type", "Mail", "--property", "A"], "KEY=VALUE"),
            ("property twice", 2, ["--type", "Mail", "--property", "Type=Mail"], "twice"),
            ("not UTF-8", 2, ["--type", "Mail", "--display-name", b"\xff"], "UTF-8"),
            ("taken", 7, ["--type", "Mail", "--identifier", "M1"], "M1"),
            ("taken by a child", 7, ["--type", "Mail", "--identifier", "S1"], "S1"),
            ("its own child's", 7, ["--type", "Mail", "--identifier", "N", "--child", "type=SMTP,identifier=N"], "N"),
        ]
        for name, code, options, text in cases:
            with self.subTest(name):
                ended = run("add-account", self.image, *options)
                self.assertEqual(ended.returncode, code)
                self.assertIn(text, ended.stderr.decode())
                self.assertEqual((self.image / SETTINGS).read_bytes(), before)

    def test_leaves_unreadable_settings_alone(self):
        (self.image / SETTINGS).write_bytes(b"bplist00 and rubbish")
        self.assertIn("accountsettings.plist", self.fail_with(6, "add-account", self.image, "--type", "Mail"))
        self.assertEqual((self.image / SETTINGS).read_bytes(), b"bplist00 and rubbish")

    def test_waits_for_nobody(self):
        with open(self.image / "var/run/image.lock", "rb") as lock:
            fcntl.flock(lock, fcntl.LOCK_EX)
            said = self.fail_with(11, "add-account", self.image, "--type", "Mail")
            self.assertIn("another run", said)
            self.assertEqual(self.show()["accounts"], [])  # to look takes no lock
        self.add_account("Mail", "M1")


if __name__ == "__main__":
    unittest.main()
