"""The command migrate-legacy of account-settings: the image's own accounts data migrator, and one that fails as
it is told, whose folder is in the environment as TEST_ACCOUNT_MIGRATOR."""

import fcntl
import json
import os
import plistlib
import shutil
import signal
import subprocess
import unittest
from pathlib import Path

from settingstest import DEVICE_IMAGE, MAIL, QUILLNET, TOOL, SettingsTest, run

MIGRATOR = "System/Library/DataClassMigrators/AccountMigrator.migrator"
KEPT = ".before-migration-"


class LegacyTest(SettingsTest):
    @property
    def mail_file(self) -> Path:
        return self.image / "var/mobile/Library/Mail/Accounts.plist"

    @property
    def data_access_file(self) -> Path:
        return self.image / "var/mobile/Library/Preferences/com.vantor.DataAccess.plist"

    @property
    def lock_file(self) -> Path:
        return self.image / "tmp/AccountMigrationInProgress"

    def write_legacy_mail(self, *identifiers) -> None:
        entries = [{"Class": "IMAPAccount", "UniqueIdentifier": identifier} for identifier in identifiers]
        self.mail_file.parent.mkdir(exist_ok=True)
        self.mail_file.write_bytes(plistlib.dumps({"MailAccounts": entries}))

    def identifiers(self) -> list:
        return [account["Identifier"] for account in self.settings()["Accounts"]]

    def kept(self, number: int = 1) -> Path:
        return self.settings_file.with_name(f"{self.settings_file.name}{KEPT}{number}")

    def copies(self) -> list:
        return sorted(self.settings_file.parent.glob(f"*{KEPT}*"))

    def use_scripted_migrator(self, behaviour: str) -> None:
        shutil.rmtree(self.image / MIGRATOR)
        shutil.copytree(os.environ["TEST_ACCOUNT_MIGRATOR"], self.image / MIGRATOR)
        (self.image / "tmp/behaviour").write_text(behaviour + "\n")


    def assert_says_as_json(self, code: int, reason: str, *arguments) -> None:
        ended = self.run_on_image("migrate-legacy", "--json", *arguments)
        answer = json.loads(ended.stdout)
        self.assertEqual((ended.returncode, answer["result"], answer["settings"], answer["kept_copies"]),
                         (code, "refused", "untouched", []))
        self.assertIn(reason, answer["reasons"][0])

    def holders(self) -> list:
        """The processes that hold or wait for the migration lock, as the kernel's table has them."""
        inode = str(self.lock_file.stat().st_ino)
        table = [line.replace("->", "").split() for line in Path("/proc/locks").read_text().splitlines()]
        return [int(row[4]) for row in table if row[5].split(":")[2] == inode]


class Migrating(LegacyTest):
    def test_says_that_there_is_nothing_to_migrate(self):
        before = self.state()
        self.assertEqual(self.succeed("migrate-legacy"), "nothing to migrate\n")
        self.assertEqual(self.answer("migrate-legacy"), {
            "image": str(self.image), "result": "not needed", "mail_accounts": False, "data_access": False,
            "older_version": False, "settings": "untouched", "accounts": 2, "kept_copies": [], "reasons": [], "log": [],
            "log_was_cut": False,
        })  # fmt: skip
        self.assertEqual(self.state(), before)

    def test_needs_no_migrator_when_there_is_nothing_to_migrate(self):
        shutil.rmtree(self.image / MIGRATOR)
        self.assertEqual(self.succeed("migrate-legacy"), "nothing to migrate\n")

    def test_builds_the_settings_of_both_legacy_files_and_keeps_what_was_there(self):
        before = self.settings_file.read_bytes()
        self.write_legacy_mail("L1")
        self.data_access_file.write_bytes(plistlib.dumps({"Accounts": [{"Class": "CalDAVAccount",
                                                                        "UniqueIdentifier": "L2"}]}))
        legacy = self.mail_file.read_bytes(), self.data_access_file.read_bytes()
        ended = self.run_on_image("migrate-legacy")
        self.assertEqual(ended.returncode, 0)
        self.assertEqual(ended.stdout.decode(),
                         f"{self.settings_file}: built from the legacy mail accounts and data-access preferences, "
                         f"2 accounts\n{self.kept()}: kept from before a migration\n")
        said = ended.stderr.decode().splitlines()
        self.assertEqual(len(said), 3)
        self.assertIn("Accounts settings needs migration! oldMailAccountsPresent=1, oldDAAccountsPresent=1", said[0])
        self.assertIn("AccountMigrator: built ", said[2])
        self.assertEqual(self.identifiers(), ["L1", "L2"])
        self.assertEqual((self.mail_file.read_bytes(), self.data_access_file.read_bytes()), legacy)
        self.assertEqual(self.kept().read_bytes(), before)
        self.assertEqual(self.kept().stat().st_mode & 0o7777, 0o600)
        self.assertEqual(self.settings_file.stat().st_mode & 0o7777, 0o600)

    def test_builds_the_settings_where_there_are_none(self):
        self.settings_file.unlink()
        self.write_legacy_mail("L1")
        answer = self.answer("migrate-legacy")
        log = answer.pop("log")
        self.assertEqual(answer, {
            "image": str(self.image), "result": "done", "mail_accounts": True, "data_access": False,
            "older_version": False, "settings": "replaced", "accounts": 1, "kept_copies": [], "reasons": [],
            "log_was_cut": False,
        })  # fmt: skip
        self.assertEqual(len(log), 3)
        self.assertEqual(self.identifiers(), ["L1"])

    def test_brings_an_older_version_up_to_date_and_keeps_it(self):
        self.write({"Version": 11, "Accounts": [MAIL, QUILLNET], "Other": 1})
        before = self.settings_file.read_bytes()
        ended = self.run_on_image("migrate-legacy")
        self.assertEqual(ended.returncode, 0)
        self.assertEqual(ended.stdout.decode(), f"{self.settings_file}: brought to version 12, 2 accounts\n"
                                                f"{self.kept()}: kept from before a migration\n")
        self.assertEqual(self.settings(), {"Version": 12, "Accounts": [MAIL, QUILLNET], "Other": 1})
        self.assertEqual(self.kept().read_bytes(), before)
        self.assertEqual(self.succeed("migrate-legacy").splitlines()[0], "nothing to migrate")

    def test_keeps_every_settings_file_that_it_replaces_and_each_once(self):
        self.write_legacy_mail("L1")
        for _ in range(3):
            self.run_on_image("migrate-legacy")
        self.assertEqual(self.copies(), [self.kept(1), self.kept(2)])  # the third replaced the same again
        self.succeed("set", "L1", "DisplayName", "mine")
        self.assertEqual(self.answer("migrate-legacy")["kept_copies"], [str(self.kept(n)) for n in (1, 2, 3)])
        kept = [plistlib.loads(copy.read_bytes())["Accounts"] for copy in self.copies()]
        self.assertEqual(kept[0], [MAIL, QUILLNET])
        self.assertEqual([account.get("DisplayName") for [account] in kept[1:]], [None, "mine"])

    def test_takes_the_image_s_lock(self):
        self.write_legacy_mail("L1")
        before = self.state()
        with open(self.image / "var/run/image.lock", "a") as file:
            fcntl.flock(file, fcntl.LOCK_EX)
            self.assertIn("another run holds", self.fail_with(11, "migrate-legacy", "--wait", "0"))
            self.assert_says_as_json(11, "another run holds", "--wait", "0")
        self.assertEqual(self.state(), before)

    def test_gives_up_when_another_program_migrates(self):
        self.write_legacy_mail("L1")
        with open(self.lock_file, "a") as file:
            fcntl.flock(file, fcntl.LOCK_EX)
            before = self.state()
            self.assertIn("another program migrates the settings; nothing was changed",
                          self.fail_with(11, "migrate-legacy", "--wait", "0.2"))
            self.assert_says_as_json(11, "another program migrates the settings", "--wait", "0.2")
            self.assertEqual(self.state(), before)


    def test_keeps_what_another_program_saved_while_it_waited_for_the_lock(self):
        self.write_legacy_mail("L1")
        with open(self.lock_file, "a") as file:
            fcntl.flock(file, fcntl.LOCK_EX)
            process = subprocess.Popen([TOOL, "migrate-legacy", "--image", self.image, "--wait", "1000"],
                                       stdout=subprocess.PIPE, stderr=subprocess.PIPE)
            while process.pid not in self.holders():
                self.assertIsNone(process.poll())
            self.write({"Version": 12, "Accounts": [MAIL], "newer": True})
        process.communicate(timeout=100)
        self.assertEqual(process.returncode, 0)
        self.assertEqual([plistlib.loads(copy.read_bytes()) for copy in self.copies()],
                         [{"Version": 12, "Accounts": [MAIL], "newer": True}])

    def test_believes_only_the_library_s_own_line_of_a_failure(self):
        self.write_legacy_mail("L1")
        self.use_scripted_migrator("writes, says [me] Accounts migration failed")
        self.assertEqual(self.answer("migrate-legacy")["result"], "done")


class Refusing(LegacyTest):
    def assert_refused(self, *words, makes_lock=False) -> None:
        before = self.state()
        said = self.fail_with(7, "migrate-legacy")
        for word in words:
            self.assertIn(str(word), said)
        after = self.state()
        if makes_lock:
            for path in (self.lock_file, self.image / "tmp"):
                after.pop(path, None)
                before.pop(path, None)
        self.assertEqual(after, before)

    def setUp(self):
        super().setUp()
        self.write_legacy_mail("L1")

    def test_without_the_migrator_changes_nothing(self):
        shutil.rmtree(self.image / MIGRATOR)
        self.assert_refused(self.image / MIGRATOR, "is missing")

    def test_a_migrator_that_others_may_write_changes_nothing(self):
        for name in ("", "AccountMigrator.so", "Info.plist", "../..", ".."):
            with self.subTest(name):
                path = (self.image / MIGRATOR / name).resolve()
                mode = path.stat().st_mode
                path.chmod(mode | 0o002)
                self.assert_refused(path, "may be written by others", "chmod go-w")
                path.chmod(mode)

    def test_a_migrator_that_is_a_link_changes_nothing(self):
        shutil.move(self.image / MIGRATOR, self.directory / "elsewhere")
        (self.image / MIGRATOR).symlink_to(self.directory / "elsewhere")
        self.assert_refused(self.image / MIGRATOR, "neither a file nor a folder")

    def test_a_migrator_of_somebody_else_changes_nothing(self):
        if os.geteuid() != 0:
            self.skipTest("only root can give files away")
        os.chown(self.image / MIGRATOR / "AccountMigrator.so", 65534, 65534)
        self.assert_refused("AccountMigrator.so belongs to another user")

    def test_settings_that_cannot_be_copied_change_nothing(self):
        elsewhere = self.directory / "elsewhere.plist"
        shutil.move(self.settings_file, elsewhere)
        self.settings_file.symlink_to(elsewhere)
        self.assert_refused(self.settings_file, "cannot be copied, so that nothing was done", makes_lock=True)
        self.assertTrue(elsewhere.exists())

    def test_without_a_temporary_directory_changes_nothing(self):
        (self.image / "tmp").rmdir()
        self.assert_says_as_json(7, "is no directory")
        self.assert_refused(self.image / "tmp", "is no directory")

    def test_a_temporary_directory_in_which_everybody_may_replace_files_changes_nothing(self):
        (self.image / "tmp").chmod(0o777)
        self.assert_refused(self.image / "tmp", "everybody may replace the files")


class Failing(LegacyTest):
    """A migrator that fails leaves the settings as they were, whatever it did."""

    def check_failure(self, behaviour: str, *words, settings="put back", arguments=(), code=1) -> dict:
        self.use_scripted_migrator(behaviour)
        before = self.settings_file.read_bytes()
        legacy = self.mail_file.read_bytes() if self.mail_file.exists() else None
        ended = self.run_on_image("migrate-legacy", "--json", *arguments)
        said = ended.stderr.decode()
        self.assertEqual(ended.returncode, code, said)
        for word in words:
            self.assertIn(word, said)
        answer = json.loads(ended.stdout)
        self.assertEqual((answer["result"], answer["settings"]), ("failed", settings))
        if settings != "replaced":
            self.assertEqual(self.settings_file.read_bytes(), before)
            self.assertEqual(self.copies(), [])
        else:
            self.assertEqual(self.kept().read_bytes(), before)
        self.assertEqual(self.settings_file.stat().st_mode & 0o7777, 0o600)
        self.assertEqual(self.mail_file.read_bytes() if self.mail_file.exists() else None, legacy)
        return answer

    def test_by_its_answer(self):
        self.write_legacy_mail("L1")
        answer = self.check_failure("answers false", "Account Migrator reports that its migration failed. "
                                    f"{self.settings_file} was put back with what it held.", "The legacy files are")
        self.assertEqual(answer["log"][2:], ["ScriptedMigrator: answers false",
                                             "[+[ASSAccountsManager _migrateAccountsIfNeeded]] Accounts migration failed"])

    def test_by_a_crash(self):
        self.write_legacy_mail("L1")
        self.check_failure("crashes", "Account Migrator crashed (signal 6", "was put back")

    def test_by_raising(self):
        self.write_legacy_mail("L1")
        self.check_failure("raises", "raised a failure (std::runtime_error: not today)", "was put back")

    def test_by_taking_too_long(self):
        self.write_legacy_mail("L1")
        self.check_failure("stays", "ran past its limit", "was put back", "with a longer --timeout",
                           arguments=("--timeout", "1"), code=9)

    def test_by_writing_nothing(self):
        self.write_legacy_mail("L1")
        self.check_failure("answers true", "made no settings file of what older systems left", "was put back")

    def test_by_a_bundle_that_is_no_code(self):
        self.write_legacy_mail("L1")
        (Path(self.image) / MIGRATOR / "AccountMigrator.so").write_bytes(b"no code")
        before = self.settings_file.read_bytes()
        ended = self.run_on_image("migrate-legacy")
        self.assertEqual(ended.returncode, 7)
        self.assertIn(b"Account Migrator could not be loaded", ended.stderr)
        self.assertIn(b"was put back", ended.stderr)
        self.assertEqual(self.settings_file.read_bytes(), before)

    def test_with_an_older_version_leaves_the_file_alone(self):
        for behaviour in ("answers false", "crashes", "answers true"):
            with self.subTest(behaviour):
                self.write({"Version": 11, "Accounts": [MAIL]})
                self.check_failure(behaviour, f"{self.settings_file} is as it was.", settings="untouched")

    def test_by_writing_an_older_version_keeps_what_was_there(self):
        self.write_legacy_mail("L1")
        self.check_failure("writes version 7", "was written without the version 12", "kept beside it",
                           settings="replaced")

    def test_by_its_answer_after_writing_keeps_what_was_there(self):
        self.write_legacy_mail("L1")
        answer = self.check_failure("writes, answers false", "reports that its migration failed", "kept beside it",
                                    settings="replaced")
        self.assertEqual(answer["kept_copies"], [str(self.kept())])

    def test_with_unreadable_settings_puts_them_back_too(self):
        self.write_legacy_mail("L1")
        self.write(b"no property list")
        self.check_failure("answers false", "was put back")

    def start(self, behaviour="stays") -> subprocess.Popen:
        """The command, when the settings file is gone and the migrator is at work."""
        self.use_scripted_migrator(behaviour)
        process = subprocess.Popen([TOOL, "migrate-legacy", "--image", self.image], stdout=subprocess.PIPE,
                                   stderr=subprocess.PIPE)
        while b"ScriptedMigrator: stays" not in process.stderr.readline():
            self.assertIsNone(process.poll())
        self.assertFalse(self.settings_file.exists())
        return process

    def test_by_an_interruption(self):
        self.write_legacy_mail("L1")
        before = self.settings_file.read_bytes()
        process = self.start()
        process.send_signal(signal.SIGINT)
        said = process.communicate(timeout=100)[1]
        self.assertEqual(process.returncode, 130)
        self.assertIn(b"stopped because the run was interrupted", said)
        self.assertEqual(self.settings_file.read_bytes(), before)
        self.assertEqual(self.copies(), [])

    def test_holds_the_migration_lock_until_the_settings_are_back(self):
        self.write_legacy_mail("L1")
        process = self.start()
        self.assertEqual(self.holders(), [process.pid])  # not the migrator's process, which ends before
        process.send_signal(signal.SIGINT)
        process.communicate(timeout=100)
        self.assertEqual(self.holders(), [])

    def test_does_not_migrate_by_the_migrator_s_argument_alone(self):
        self.write_legacy_mail("L1")
        before = self.state()
        ended = run("--migrate-legacy-settings-in-this-process", self.image, stdin=subprocess.DEVNULL)
        self.assertNotEqual(ended.returncode, 0)
        self.assertEqual(self.state(), before)

    def test_by_a_kill_leaves_the_copy_and_the_next_run_completes(self):
        self.write_legacy_mail("L1")
        before = self.settings_file.read_bytes()
        process = self.start()
        process.kill()
        process.communicate(timeout=100)
        self.assertFalse(self.settings_file.exists())
        self.assertEqual(self.kept().read_bytes(), before)
        self.assertEqual(self.kept().stat().st_mode & 0o7777, 0o600)
        shutil.rmtree(self.image / MIGRATOR)
        whole = self.directory / "whole"
        run("create", whole, tool=DEVICE_IMAGE)
        shutil.copytree(whole / MIGRATOR, self.image / MIGRATOR)
        answer = self.answer("migrate-legacy")
        self.assertEqual((answer["result"], answer["kept_copies"]), ("done", [str(self.kept())]))
        self.assertEqual(self.identifiers(), ["L1"])
        self.assertEqual(self.kept().read_bytes(), before)


if __name__ == "__main__":
    unittest.main()
