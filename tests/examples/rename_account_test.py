"""The example program for users of the account settings library, on an image with account services."""

import fcntl
import json
import os
import plistlib
import shutil
import subprocess
import tempfile
import unittest
from pathlib import Path

PROGRAM, TOOL, RESOURCES = (os.environ[name] for name in ("RENAME_ACCOUNT", "DEVICE_IMAGE", "RESOURCES"))
SETTINGS = "var/mobile/Library/Preferences/com.vantor.accountsettings.plist"


class RenameAccount(unittest.TestCase):
    def setUp(self):
        self.directory = Path(tempfile.mkdtemp())
        self.addCleanup(shutil.rmtree, self.directory)
        self.image = self.directory / "image"
        subprocess.run([TOOL, "create", self.image], check=True)
        for kind, identifier, name in (("CalDAV", "club", "Verein"), ("Mail", "post", "Post")):
            subprocess.run([TOOL, "add-account", self.image, "--type", kind, "--identifier", identifier,
                            "--display-name", name, "--enable", "calendars"],
                           check=True, stdout=subprocess.DEVNULL)

    def run_program(self, code, *arguments):
        """What the run put out; it must have ended with the code."""
        ended = subprocess.run([PROGRAM, *map(str, arguments)], capture_output=True, text=True, timeout=60)
        self.assertEqual(ended.returncode, code, ended.stderr)
        return ended.stderr if code else ended.stdout

    def names(self):
        settings = plistlib.loads((self.image / SETTINGS).read_bytes())
        return [account["DisplayName"] for account in settings["Accounts"]]

    def test_lists_the_accounts_and_changes_nothing(self):
        before = (self.image / SETTINGS).read_bytes()
        self.assertEqual(self.run_program(0, self.image, RESOURCES),
                         "club  CalDAV  Verein\npost  Mail  Post\n")
        self.assertEqual((self.image / SETTINGS).read_bytes(), before)

    def test_renames_an_account_and_has_its_services_told(self):
        self.assertEqual(self.run_program(0, self.image, RESOURCES, "club", "Klub"),
                         "club  CalDAV  Klub\npost  Mail  Post\n")
        self.assertEqual(self.names(), ["Klub", "Post"])
        lines = (self.image / "var/log/account-changes.jsonl").read_text().splitlines()
        heard = [json.loads(line) for line in lines]
        self.assertRegex(heard[0].pop("time"), r"^\d{4}-\d\d-\d\dT\d\d:\d\d:\d\dZ$")
        self.assertEqual(heard, [{
            "notifier": "CalendarServiceNotifier", "record": 1, "of": 1, "change": "modified",
            "account": "club", "type": "CalDAV",
            "originalDataclasses": ["com.vantor.Dataclass.Calendars"]}])

    def test_says_that_there_is_no_such_account(self):
        self.assertEqual(self.run_program(1, self.image, RESOURCES, "nobody", "x"),
                         'rename-account: there is no account "nobody"\n')

    def test_does_not_take_the_parent_for_its_child(self):
        settings = plistlib.loads((self.image / SETTINGS).read_bytes())
        settings["Accounts"][0]["ChildAccounts"] = [
            {"Identifier": "child", "Type": "CalDAV", "Class": "C", "DisplayName": "Child"}]
        (self.image / SETTINGS).write_bytes(plistlib.dumps(settings))
        self.assertEqual(self.run_program(1, self.image, RESOURCES, "child", "x"),
                         'rename-account: there is no account "child"\n')
        self.assertEqual(self.names(), ["Verein", "Post"])

    def test_says_that_the_account_could_not_be_saved(self):
        users = self.image / "etc/passwd"
        users.write_text(users.read_text().replace("mobile:", "nobody:"))
        said = self.run_program(1, self.image, RESOURCES, "club", "Klub")
        self.assertIn("Failed to save accounts to filesystem.", said)
        self.assertTrue(said.endswith("\nrename-account: the account was not renamed\n"), said)
        self.assertEqual(self.names(), ["Verein", "Post"])

    def test_says_that_there_is_no_image(self):
        self.assertIn("rename-account: cannot open the device image",
                      self.run_program(1, self.directory / "none", RESOURCES))

    def test_says_what_an_installation_lacks(self):
        self.assertIn("rename-account: the installation is broken: ",
                      self.run_program(1, self.image, self.directory))
        self.assertEqual(self.names(), ["Verein", "Post"])

    def test_leaves_an_image_alone_that_another_program_changes(self):
        with open(self.image / "var/run/image.lock", "rb") as lock:
            fcntl.flock(lock, fcntl.LOCK_EX)
            self.run_program(1, self.image, RESOURCES, "club", "Klub")
        self.assertEqual(self.names(), ["Verein", "Post"])

    def test_knows_its_usage(self):
        self.assertTrue(self.run_program(2).startswith("usage: rename-account IMAGE RESOURCES [ID NAME]\n"))


if __name__ == "__main__":
    unittest.main()
