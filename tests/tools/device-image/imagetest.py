"""What the tests of the device-image tool share: an image in a temporary directory, and ways to look at
it that do not go through the tool. The tool's path is in the environment as DEVICE_IMAGE."""

import json
import os
import plistlib
import shutil
import sqlite3
import subprocess
import tempfile
import unittest
from pathlib import Path

TOOL = os.environ["DEVICE_IMAGE"]
SETTINGS = "var/mobile/Library/Preferences/com.vantor.accountsettings.plist"


def run(*arguments, **options) -> subprocess.CompletedProcess:
    """Runs the tool; its output is bytes."""
    words = [word if isinstance(word, bytes) else str(word) for word in arguments]
    return subprocess.run([TOOL, *words], capture_output=True, check=False, timeout=60, **options)


class ImageTest(unittest.TestCase):
    """Each test has a new image, made with the sync account name "ada"."""

    def setUp(self):
        self.directory = Path(tempfile.mkdtemp())
        self.addCleanup(shutil.rmtree, self.directory)
        self.image = self.directory / "image"
        self.succeed("create", self.image, "--sync-account-name", "ada")

    def succeed(self, *arguments) -> bytes:
        ended = run(*arguments)
        self.assertEqual(ended.returncode, 0, ended.stderr.decode())
        return ended.stdout

    def fail_with(self, code: int, *arguments) -> str:
        """What the run said on standard error; it must have ended with `code`."""
        ended = run(*arguments)
        self.assertEqual(ended.returncode, code, ended.stderr.decode())
        return ended.stderr.decode()

    def add_account(self, kind: str, identifier: str, *options) -> None:
        self.succeed("add-account", self.image, "--type", kind, "--identifier", identifier, *options)

    def file(self, name: str, content) -> Path:
        path = self.directory / name
        path.write_bytes(content if isinstance(content, bytes) else content.encode())
        return path

    def import_text(self, dataclass: str, name: str, content, *options) -> bytes:
        return self.succeed("import", self.image, "--dataclass", dataclass, *options, self.file(name, content))

    def export(self, dataclass: str, *options) -> bytes:
        return self.succeed("export", self.image, "--dataclass", dataclass, *options)

    def show(self) -> dict:
        return json.loads(self.succeed("show", self.image, "--json"))

    def stores(self, dataclass: str) -> dict:
        """Records by store and state."""
        return {
            (store["store"], store["state"]): store["records"]
            for store in self.show()["stores"]
            if store["dataclass"] == dataclass
        }

    def settings(self) -> dict:
        return plistlib.loads((self.image / SETTINGS).read_bytes())

    def databases(self) -> dict:
        """The image's databases, by their path."""
        return {
            path: sqlite3.connect(path)
            for path in self.image.rglob("*")
            if path.is_file() and path.read_bytes()[:15] == b"SQLite format 3"
        }

    def records(self) -> list:
        """(account, kind, uid, content) of every record that no store has retired."""
        rows = []
        for database in self.databases().values():
            rows += database.execute(
                "SELECT stores.account, kind, uid, content FROM records JOIN stores ON stores.id = store "
                "WHERE retired_at IS NULL"
            )
            database.close()
        return sorted(rows, key=lambda row: (row[0] or "", *row[1:]))

    def retire_stores(self) -> None:
        """Does what the migration does to a service's store."""
        for database in self.databases().values():
            with database:
                database.execute("UPDATE stores SET retired_at = 1000 WHERE account IS NOT NULL")
            database.close()
