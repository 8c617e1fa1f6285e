"""The option --notify of account-settings' changing commands."""

import json
import os
import plistlib
import shutil
import unittest
from pathlib import Path

from settingstest import DATACLASS, MAIL, TOOL, SettingsTest

SERVICES = "System/Library/AccountServices"


class Notify(SettingsTest):
    def journal(self) -> list:
        path = self.image / "var/log/account-changes.jsonl"
        return [json.loads(line) for line in path.read_text().splitlines()] if path.exists() else []

    def test_has_the_services_hear_of_the_change(self):
        self.succeed("set", "M1", "PortNumber:integer", "995")
        self.assertEqual(self.journal(), [])
        answer = self.answer("set", "M1", "PortNumber:integer", "996", "--notify")
        self.assertEqual((answer["saved"], answer["notified"]), (True, True))
        heard = self.journal()
        self.assertEqual(len(heard), 1)
        self.assertIn("M1", json.dumps(heard[0]))

    def test_is_silent_when_nothing_changed_or_in_a_dry_run(self):
        self.succeed("set", "M1", "PortNumber:integer", "993", "--notify")
        self.succeed("set", "M1", "PortNumber:integer", "994", "--notify", "--dry-run")
        self.assertEqual(self.journal(), [])

    def test_is_refused_where_others_could_have_put_code(self):
        before = self.settings_file.read_bytes()
        for name in [SERVICES, "System/Library", SERVICES + "/MailService.so"]:
            with self.subTest(name):
                path = self.image / name
                mode = path.stat().st_mode
                path.chmod(mode | 0o002)
                said = self.fail_with(7, "set", "M1", "A", "b", "--notify")
                self.assertIn(str(path), said)
                self.assertIn("--notify", said)
                self.assertEqual(self.settings_file.read_bytes(), before)
                path.chmod(mode)
        target = self.image / SERVICES
        shutil.move(target, self.directory / "elsewhere")
        target.symlink_to(self.directory / "elsewhere")
        self.assertIn(str(target), self.fail_with(7, "set", "M1", "A", "b", "--notify"))
        self.assertEqual(self.settings_file.read_bytes(), before)

    def test_of_root_is_refused_on_an_image_of_somebody_else(self):
        if os.geteuid() != 0:
            self.skipTest("only root meets images of others that it can write")
        for path in [self.image, *self.image.rglob("*")]:
            os.chown(path, 65534, 65534)
        self.assertIn("another user", self.fail_with(7, "set", "M1", "A", "b", "--notify"))

    def test_says_what_is_missing_and_that_the_accounts_are_saved(self):
        (self.image / SERVICES / "MailService.so").unlink()
        said = self.fail_with(1, "set", "M1", "A", "b", "--notify")
        self.assertIn("saved, but not every notifier was told", said)
        self.assertIn("Could not load the account creator framework", said)
        self.assertIn(str(self.image / SERVICES / "MailService.so"), said)
        self.assertIn("AccountCreators.plist", said)
        self.assertIn("leave --notify out", said)
        self.assertEqual(self.account("M1"), dict(MAIL, A="b"))
        self.succeed("set", "M1", "A", "c")

    def test_says_which_resource_of_the_installation_is_broken(self):
        installation = self.directory / "installation"
        bundle = "lib/account-retirement/migrators/QuillnetAccountRemoval.migrator"
        built = Path(TOOL).parent.parent / bundle
        shutil.copytree(built, installation / bundle)
        (installation / "bin").mkdir()
        tool = installation / "bin/account-settings"
        shutil.copy2(TOOL, tool)
        creators = installation / bundle / "AccountCreators.plist"
        creators.write_bytes(plistlib.dumps({"Mail": [{"Type": "NotifierAccount", "Description": {
            "Supported Dataclasses": [DATACLASS + "Mail"], "Framework": SERVICES + "/Absent.so", "Class": "Absent",
        }}]}))  # fmt: skip
        ended = self.run_on_image("set", "M1", "A", "b", "--notify", tool=tool)
        self.assertEqual(ended.returncode, 1)
        self.assertIn(str(creators).encode(), ended.stderr)
        self.assertIn(b"Absent.so", ended.stderr)
        self.assertEqual(self.account("M1")["A"], "b")
        (installation / bundle / "AccountTypesProperties.plist").unlink()
        before = self.settings_file.read_bytes()
        ended = self.run_on_image("set", "M1", "A", "c", tool=tool)
        self.assertEqual(ended.returncode, 1)
        self.assertIn(b"AccountTypesProperties.plist", ended.stderr)
        self.assertIn(b"nothing was changed", ended.stderr)
        self.assertEqual(self.settings_file.read_bytes(), before)


if __name__ == "__main__":
    unittest.main()
