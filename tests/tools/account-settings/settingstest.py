"""What the tests of the account-settings tool share: a device image in a temporary directory whose settings
file is written and read with Python's own property lists. The tools' paths are in the environment as
ACCOUNT_SETTINGS and DEVICE_IMAGE."""

import json
import os
import plistlib
import shutil
import subprocess
import tempfile
import unittest
from pathlib import Path

TOOL = os.environ["ACCOUNT_SETTINGS"]
DEVICE_IMAGE = os.environ["DEVICE_IMAGE"]
DATA = Path(os.environ["SOURCE_TREE"], "tests/data")
SETTINGS = "var/mobile/Library/Preferences/com.vantor.accountsettings.plist"
DATACLASS = "com.vantor.Dataclass."

MAIL = {
    "Identifier": "M1",
    "Type": "Mail",
    "Class": "IMAPAccount",
    "DisplayName": "Post",
    "Enabled Dataclasses": [DATACLASS + "Mail"],
    "PortNumber": 993,
}
QUILLNET = {
    "Identifier": "Q1",
    "Type": "Quillnet",
    "Class": "QuillnetAccount",
    "DisplayName": "ada@quillnet.example",
    "Username": "ada",
    "Provisioned Dataclasses": [DATACLASS + "Contacts", DATACLASS + "Notes"],
    "Enabled Dataclasses": [DATACLASS + "Contacts", DATACLASS + "Mail"],
    "ChildAccounts": [
        {"Identifier": "Q1C", "Type": "CalDAV", "Class": "MobileCalDAVAccount", "DisplayName": "Kalender"},
        {"Identifier": "Q1D", "Type": "CardDAV", "Class": "CardDAVAccount"},
    ],
}


def run(*arguments, tool=TOOL, **options) -> subprocess.CompletedProcess:
    """Runs the tool; its output is bytes."""
    words = [word if isinstance(word, bytes) else str(word) for word in arguments]
    return subprocess.run([tool, *words], capture_output=True, check=False, timeout=100, **options)


class SettingsTest(unittest.TestCase):
    """Each test has a new image with the accounts M1 and Q1, the latter with two children."""

    def setUp(self):
        self.directory = Path(tempfile.mkdtemp())
        self.addCleanup(shutil.rmtree, self.directory)
        self.image = self.directory / "image"
        made = run("create", self.image, tool=DEVICE_IMAGE)
        self.assertEqual(made.returncode, 0, made.stderr.decode())
        self.write({"Version": 12, "Accounts": [MAIL, QUILLNET]})

    @property
    def settings_file(self) -> Path:
        return self.image / SETTINGS

    def write(self, settings, form=plistlib.FMT_BINARY) -> None:
        """`settings` are a value or bytes."""
        content = settings if isinstance(settings, bytes) else plistlib.dumps(settings, fmt=form)
        self.settings_file.write_bytes(content)
        self.settings_file.chmod(0o600)

    def settings(self) -> dict:
        return plistlib.loads(self.settings_file.read_bytes())

    def account(self, identifier: str) -> dict:
        """The account or child account, as the file has it."""
        accounts = self.settings()["Accounts"]
        accounts += [child for account in accounts for child in account.get("ChildAccounts", [])]
        found = [account for account in accounts if account.get("Identifier") == identifier]
        self.assertEqual(len(found), 1, identifier)
        return found[0]

    def run_on_image(self, *arguments, **options) -> subprocess.CompletedProcess:
        command, *rest = arguments
        return run(command, "--image", self.image, *rest, **options)

    def succeed(self, *arguments) -> str:
        """What the command printed on this test's image."""
        ended = self.run_on_image(*arguments)
        self.assertEqual((ended.returncode, ended.stderr.decode()), (0, ""))
        return ended.stdout.decode()

    def answer(self, *arguments):
        return json.loads(self.succeed(*arguments, "--json"))

    def fail_with(self, code: int, *arguments) -> str:
        """What the run said on standard error; it must have ended with `code` and printed nothing."""
        ended = self.run_on_image(*arguments)
        said = ended.stderr.decode(errors="replace")
        self.assertEqual((ended.returncode, ended.stdout), (code, b""), said)
        return said

    def state(self) -> dict:
        """Every file of the image with its content, mode and time."""
        return {
            path: (path.stat().st_mode, path.stat().st_mtime_ns, path.read_bytes() if path.is_file() else None)
            for path in sorted(self.image.rglob("*"))
            if path.name != "image.lock"
        }
