"""device-image check, and what the other commands say of a damaged image."""

import json
import os
import plistlib
import shutil
import subprocess
import unittest
from pathlib import Path

from imagetest import SETTINGS, TOOL, ImageTest, run

SERVICES = "System/Library/AccountServices"
MIGRATOR = "System/Library/DataClassMigrators/AccountMigrator.migrator"

CARD = "BEGIN:VCARD\r\nVERSION:3.0\r\nUID:ada\r\nFN:Ada\r\nEND:VCARD\r\n"


class Check(ImageTest):
    def findings(self) -> dict:
        """What check says, by path in the image; asked twice, since looking changes nothing."""
        ended = run("check", self.image, "--json")
        report = json.loads(ended.stdout)
        self.assertEqual(set(report), {"image", "sound", "findings", "warnings"})
        self.assertEqual(report["sound"], not report["findings"])
        self.assertEqual(ended.returncode, 6 if report["findings"] else 0)
        self.assertEqual(run("check", self.image, "--json").stdout, ended.stdout)
        return {finding["path"]: finding["text"] for finding in report["findings"]}

    def contacts_database(self):
        (path,) = self.databases()
        return path

    def test_a_new_image_is_sound(self):
        self.assertEqual(self.findings(), {})
        self.assertEqual(self.succeed("check", self.image).decode(), f"{self.image.resolve()}: sound\n")

    def test_an_image_in_use_is_sound(self):
        self.add_account("Quillnet", "Q1")
        self.import_text("contacts", "a.vcf", CARD, "--account", "Q1")
        self.retire_stores()
        self.assertEqual(self.findings(), {})

    def warnings(self) -> dict:
        report = json.loads(run("check", self.image, "--json").stdout)
        return {warning["path"]: warning["text"] for warning in report["warnings"]}

    def test_finds_a_missing_account_service(self):
        (self.image / SERVICES / "MailService.so").unlink()
        self.assertEqual(set(self.findings()), {f"{SERVICES}/MailService.so"})
        self.assertEqual(self.warnings(), {})
        self.assertIn(f"{SERVICES}/MailService.so: is missing, and accounts need this service; copy ",
                      self.fail_with(6, "check", self.image))

    def test_finds_an_account_service_that_others_can_change(self):
        (self.image / SERVICES / "MailService.so").chmod(0o622)
        self.assertEqual(set(self.findings()), {f"{SERVICES}/MailService.so"})

    def test_warns_of_an_account_service_that_is_not_the_installed_one(self):
        for content in (b"", b"other", (self.image / SERVICES / "MailService.so").read_bytes()[:-1]):
            with self.subTest(len(content)):
                (self.image / SERVICES / "MailService.so").write_bytes(content)
                self.assertEqual(self.findings(), {})
                self.assertEqual(set(self.warnings()), {f"{SERVICES}/MailService.so"})
                ended = run("check", self.image)
                self.assertEqual(ended.stdout.decode(), f"{self.image.resolve()}: sound\n")
                self.assertIn(f"{SERVICES}/MailService.so: warning: is not the installed service",
                              ended.stderr.decode())

    def test_an_image_without_account_services_is_sound(self):
        self.image = self.directory / "bare"
        self.succeed("create", self.image, "--without-services")
        self.assertFalse((self.image / SERVICES).exists())
        self.assertEqual(self.findings(), {})
        self.assertEqual(self.warnings(), {})

    def test_a_new_image_has_private_copies_of_the_account_services(self):
        files = sorted((self.image / SERVICES).iterdir())
        self.assertEqual([path.name for path in files],
                         ["CalendarService.so", "ContactsService.so", "DeviceService.so", "MailService.so"])
        installed = Path(os.environ["INSTALLED_SERVICES"])
        for path in files:
            self.assertEqual(path.stat().st_mode & 0o7777, 0o600)
            self.assertEqual(path.read_bytes(), (installed / path.name).read_bytes())

    def test_a_new_image_has_private_copies_of_the_accounts_data_migrator(self):
        files = sorted((self.image / MIGRATOR).iterdir())
        self.assertEqual([path.name for path in files],
                         ["AccountMigrator.so", "AccountTypesProperties.plist", "Info.plist"])
        installed = Path(os.environ["INSTALLED_SERVICES"]) / "AccountMigrator.migrator"
        for path in files:
            self.assertEqual(path.stat().st_mode & 0o7777, 0o600)
            self.assertEqual(path.read_bytes(), (installed / path.name).read_bytes())

    def test_warns_of_another_accounts_data_migrator_than_the_installed_one(self):
        (self.image / MIGRATOR / "AccountMigrator.so").write_bytes(b"other")
        self.assertEqual(set(self.warnings()), {f"{MIGRATOR}/AccountMigrator.so"})
        shutil.rmtree(self.image / MIGRATOR)
        self.assertEqual(self.warnings(), {})
        self.assertEqual(self.findings(), {})

    def run_alone(self, *arguments) -> subprocess.CompletedProcess:
        """Runs a copy of the tool beside which nothing is installed."""
        programs = self.directory / "bin"
        programs.mkdir(exist_ok=True)
        shutil.copy(TOOL, programs)
        environment = {"LD_LIBRARY_PATH": str(Path(TOOL).resolve().parents[1] / "lib")}
        return subprocess.run([programs / "device-image", *arguments], capture_output=True,
                              env=environment, timeout=60)

    def test_no_image_is_made_where_the_account_services_are_not_installed(self):
        ended = self.run_alone("create", self.directory / "new")
        self.assertEqual(ended.returncode, 7, ended.stderr)
        self.assertIn(b"AccountCreators.plist", ended.stderr)
        self.assertIn(b"--without-services", ended.stderr)
        self.assertFalse((self.directory / "new").exists())
        ended = self.run_alone("create", "--without-services", self.directory / "new")
        self.assertEqual(ended.returncode, 0, ended.stderr)

    def test_warns_where_account_services_cannot_be_compared(self):
        ended = self.run_alone("check", self.image)
        self.assertEqual(ended.returncode, 0, ended.stderr)
        self.assertIn(f"{SERVICES}: warning: cannot be compared with what is installed: ",
                      ended.stderr.decode())

    def test_finds_what_stopped_programs_left_behind(self):
        (self.image / "tmp/settings.abc").touch(0o600)
        (self.image / "tmp/AccountMigrationInProgress").touch(0o600)
        (self.image / (SETTINGS + ".unreadable-1")).touch(0o600)
        self.assertEqual(set(self.findings()), {"tmp/settings.abc", SETTINGS + ".unreadable-1"})

    def test_finds_files_that_others_can_read(self):
        (self.image / SETTINGS).chmod(0o644)
        self.assertEqual(set(self.findings()), {SETTINGS})

    def test_finds_unreadable_settings(self):
        (self.image / SETTINGS).write_bytes(b"rubbish")
        self.assertEqual(set(self.findings()), {SETTINGS})
        self.assertIn(SETTINGS, self.fail_with(6, "check", self.image))
        self.fail_with(6, "show", self.image)

    def test_finds_accounts_that_the_device_would_drop(self):
        cases = [
            ({"Identifier": "X", "Type": "Nope", "Class": "C"}, 'unknown type "Nope"'),
            ({"Identifier": "X", "Type": "Gmail"}, "no class"),
            ({"Identifier": "X", "Type": "Mail", "Class": "Nope"}, 'no mail class "Nope"'),
        ]
        for account, text in cases:
            with self.subTest(text):
                (self.image / SETTINGS).write_bytes(plistlib.dumps({"Accounts": [account]}))
                self.assertIn(text, self.findings()[SETTINGS])

    def test_finds_a_record_whose_content_was_changed(self):
        self.import_text("contacts", "a.vcf", CARD)
        for database in self.databases().values():
            with database:
                database.execute("UPDATE records SET content = X'00'")
            database.close()
        self.assertEqual(set(self.findings()), {str(self.contacts_database().relative_to(self.image))})

    def test_finds_a_damaged_database_and_nobody_writes_to_it(self):
        self.import_text("contacts", "a.vcf", CARD)
        path = self.contacts_database()
        damaged = b"not a database" * 100
        path.write_bytes(damaged)
        name = str(path.relative_to(self.image))
        self.assertEqual(set(self.findings()), {name})
        file = self.file("b.vcf", CARD)
        self.assertIn(name, self.fail_with(6, "import", self.image, "--dataclass", "contacts", file))
        self.assertIn(name, self.fail_with(6, "export", self.image, "--dataclass", "contacts"))
        self.assertIn(name, self.fail_with(6, "show", self.image))
        self.assertEqual(path.read_bytes(), damaged)


if __name__ == "__main__":
    unittest.main()
