"""What the account services of an image hear when account-settings turns dataclasses on and off."""

import json
import os
import shutil
import subprocess
import tempfile
import unittest
from pathlib import Path

ACCOUNT_SETTINGS, DEVICE_IMAGE = os.environ["ACCOUNT_SETTINGS"], os.environ["DEVICE_IMAGE"]
DATACLASS = "com.vantor.Dataclass."


class AccountSettings(unittest.TestCase):
    def setUp(self):
        self.directory = Path(tempfile.mkdtemp())
        self.addCleanup(shutil.rmtree, self.directory)
        self.image = self.directory / "image"
        self.succeed(DEVICE_IMAGE, "create", self.image)
        self.succeed(DEVICE_IMAGE, "add-account", self.image, "--type", "Exchange", "--identifier",
                     "office", "--enable", "mail")

    def succeed(self, *command):
        ended = subprocess.run([str(word) for word in command], capture_output=True, text=True, timeout=60)
        self.assertEqual(ended.returncode, 0, ended.stderr)

    def heard(self) -> list:
        """The lines of the image's journal, without their times."""
        lines = (self.image / "var/log/account-changes.jsonl").read_text().splitlines()
        return [{key: value for key, value in json.loads(line).items() if key != "time"}
                for line in lines]

    def test_services_hear_of_enabled_dataclasses_when_they_are_to_be_told(self):
        self.succeed(ACCOUNT_SETTINGS, "enable", "office", "contacts", "--image", self.image)
        self.assertEqual(self.heard(), [])
        self.succeed(ACCOUNT_SETTINGS, "enable", "office", "calendars", "--image", self.image, "--notify")
        self.assertEqual(self.heard(), [
            {"notifier": "CalendarServiceNotifier", "record": 1, "of": 1, "change": "modified",
             "account": "office", "type": "Exchange",
             "originalDataclasses": [DATACLASS + "Mail", DATACLASS + "Contacts"]}])

    def test_every_service_of_a_deleted_account_hears_of_it(self):
        self.succeed(ACCOUNT_SETTINGS, "enable", "office", "calendars", "--image", self.image)
        self.succeed(ACCOUNT_SETTINGS, "delete", "office", "--image", self.image, "--notify")
        self.assertEqual([(line["notifier"], line["change"]) for line in self.heard()],
                         [("CalendarServiceNotifier", "deleted"), ("MailServiceNotifier", "deleted")])


if __name__ == "__main__":
    unittest.main()
