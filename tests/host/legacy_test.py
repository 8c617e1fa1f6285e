"""The legacy step of a run: the settings file that is made, before anything else, of what older systems left.
The accounts data migrator is the sample one, or one that fails as it is told."""
import fcntl
import os
import pathlib
import plistlib
import re
import shutil
import signal
import subprocess
import unittest

import hosttest
from hosttest import account, card, record

MIGRATOR = "System/Library/DataClassMigrators/AccountMigrator.migrator"
MAIL = "var/mobile/Library/Mail/Accounts.plist"
LOCK = "tmp/AccountMigrationInProgress"
COPY = hosttest.SETTINGS + ".before-migration-1"
QUILLNET = {"Class": "QuillnetAccount", "UniqueIdentifier": "Q", "AccountName": "ada", "QuillnetStatus": 1,
            "Dataclasses": ["Contacts"]}
PLAIN = {"Class": "IMAPAccount", "UniqueIdentifier": "M", "AccountName": "Post", "Dataclasses": ["Mail"]}
LOCAL_RECORDS = [record("contacts", None, "local", card("local", "Lo"))]
SERVICE_RECORDS = [record("contacts", hosttest.SERVICE, "new", card("new", "Nora"))]


class LegacyTestCase(hosttest.HostTestCase):
    def setUp(self):
        super().setUp()
        self.make_image(LOCAL_RECORDS)
        self.write_agent_name("ada")
        self.place(os.environ["ACCOUNT_MIGRATOR"])
        self.write_settings(account("M", "Mail", ("Mail",), Class="IMAPAccount"))

    def place(self, bundle):
        shutil.rmtree(self.image / MIGRATOR, ignore_errors=True)
        shutil.copytree(bundle, self.image / MIGRATOR)

    def script(self, behaviour):
        self.place(os.environ["TEST_ACCOUNT_MIGRATOR"])
        (self.image / "tmp/behaviour").write_text(behaviour + "\n")

    def write_legacy(self, *entries):
        self.write_plist(MAIL, {"MailAccounts": list(entries)})

    def bytes_of(self, file):
        return (self.image / file).read_bytes()

    def identifiers(self):
        return [entry["Identifier"] for entry in self.settings()["Accounts"] if "Identifier" in entry]

    def run_legacy(self, *arguments):
        return self.run_host("--legacy", "--json", "--quiet", *arguments)

    def run_while_another_writes(self):
        """A run whose step waits for the lock of another program, which writes the account O and frees it."""
        with open(self.image / LOCK, "a", encoding="ascii") as lock:
            fcntl.flock(lock, fcntl.LOCK_EX)
            process = self.start("--legacy", "--json", "--quiet")
            while not any("->" in line and f":{os.fstat(lock.fileno()).st_ino} " in line
                          for line in pathlib.Path("/proc/locks").read_text(encoding="ascii").splitlines()):
                self.assertIsNone(process.poll())
            self.write_settings(account("O", "Mail"))
        return self.finish(process)

    def names(self):
        return sorted(path.name for path in (self.image / hosttest.SETTINGS).parent.glob("*before-migration*"))


class LegacyStepNeeded(LegacyTestCase):
    def test_accounts_of_a_legacy_file_are_made_and_then_migrated(self):
        self.make_image(SERVICE_RECORDS)
        before = self.bytes_of(hosttest.SETTINGS)
        self.write_legacy(PLAIN, QUILLNET)
        legacy = self.bytes_of(MAIL)
        run = self.run_legacy()
        self.assertEqual((0, "done"), (run.code, run.report["outcome"]), run.output)
        step = dict(run.report["legacy"])
        self.assertEqual("done", step.pop("migrator")["result"])
        self.assertEqual({"result": "done", "mail_accounts": True, "data_access": False, "older_version": False,
                          "settings": "replaced", "kept_copies": [str(self.image / COPY)]}, step)
        self.assertEqual([("M", "not selected"), ("Q", "retired")],
                         [(entry["identifier"], entry["outcome"]) for entry in run.report["accounts"]])
        self.assertEqual(["Quillnet Account Removal"], [each["name"] for each in run.report["migrators"]])
        self.assertIn("AccountMigrator: built ", run.report["log"][0])
        self.assertEqual(["M"], self.identifiers())
        self.assertEqual(sorted([card("local", "Lo").encode(), card("new", "Nora").encode()]),
                         self.contents("contacts"))
        self.assertEqual(before, self.bytes_of(COPY))
        self.assertEqual(0o600, (self.image / COPY).stat().st_mode & 0o7777)
        self.assertEqual(legacy, self.bytes_of(MAIL))

    def test_accounts_that_only_the_settings_before_had_are_left_behind_with_their_records(self):
        self.make_image(SERVICE_RECORDS)
        self.write_settings(account("Q", "Quillnet", ("Contacts",), status=1), account("N", "Mail"))
        self.write_legacy(PLAIN)
        run = self.run_legacy()
        self.assertEqual((3, "left behind", True), (run.code, run.report["outcome"], run.report["balanced"]))
        self.assertEqual(
            ["The Quillnet account q@example.net of the settings file from before is not in the new one; "
             f"{self.image / COPY} still has it.",
             f"The Mail account n@example.net of the settings file from before is not in the new one; "
             f"{self.image / COPY} still has it.",
             "1 record of contacts in the store Quillnet:ada belongs to no account of the settings file and "
             "cannot be migrated."], run.report["reasons"])
        self.assertEqual(["M"], self.identifiers())
        self.assertEqual([card("new", "Nora").encode()], self.contents("contacts", hosttest.SERVICE))

    def test_records_of_lost_settings_are_left_behind(self):
        self.make_image(SERVICE_RECORDS)
        (self.image / hosttest.SETTINGS).unlink()
        self.write_legacy(PLAIN)
        run = self.run_legacy()
        self.assertEqual((3, "left behind"), (run.code, run.report["outcome"]))
        self.assertIn("in the store Quillnet:ada belongs to no account", run.report["reasons"][0])

    def test_the_text_says_what_was_made_and_kept(self):
        self.write_legacy(PLAIN)
        run = self.run_host("--legacy", "--quiet")
        self.assertEqual(["Legacy settings: built from the legacy mail accounts",
                          f"Settings from before a migration: {self.image / COPY}"], run.output.splitlines()[:2])

    def test_an_older_version_is_brought_up_to_date_first(self):
        self.write_plist(hosttest.SETTINGS, {"Version": 11, "Accounts": [account("N", "Mail", ("Mail",))]})
        run = self.run_legacy()
        self.assertEqual((0, "done"), (run.code, run.report["legacy"]["result"]), run.output)
        self.assertTrue(run.report["legacy"]["older_version"])
        self.assertEqual(["N"], self.identifiers())
        self.assertEqual(12, self.settings()["Version"])

    def test_unreadable_settings_are_replaced_and_kept(self):
        (self.image / hosttest.SETTINGS).write_bytes(b"no property list")
        self.write_legacy(PLAIN)
        run = self.run_legacy()
        self.assertEqual((0, "done"), (run.code, run.report["legacy"]["result"]), run.output)
        self.assertEqual(b"no property list", self.bytes_of(COPY))

    def test_what_the_step_has_made_is_checked_too(self):
        self.write_plist(hosttest.SETTINGS, {"Version": 11, "Accounts": [account("T", "Telegraph")]})
        run = self.run_legacy()
        self.assert_refused(run, "account T", '"Telegraph"', "take the account out")
        self.assertEqual("done", run.report["legacy"]["result"])
        self.assertEqual([], run.report["migrators"])

    def test_what_another_program_migrated_meanwhile_is_not_migrated_again(self):
        self.write_plist(hosttest.SETTINGS, {"Version": 11, "Accounts": [account("N", "Mail")]})
        run = self.run_while_another_writes()
        self.assertEqual((0, "done", "not needed"),
                         (run.code, run.report["legacy"]["result"], run.report["legacy"]["migrator"]["result"]))
        self.assertEqual([], [line for line in run.report["log"] if line.startswith("AccountMigrator")])
        self.assertEqual((["O"], []), (self.identifiers(), self.names()))

    def test_what_another_program_wrote_meanwhile_is_kept(self):
        self.write_legacy(PLAIN)
        run = self.run_while_another_writes()
        self.assertEqual("replaced", run.report["legacy"]["settings"], run.output)
        self.assertEqual(["com.vantor.accountsettings.plist.before-migration-1"], self.names())
        self.assertEqual("O", plistlib.loads(self.bytes_of(COPY))["Accounts"][0]["Identifier"])

    def test_what_another_program_wrote_meanwhile_is_put_back(self):
        self.script("answers false")
        self.write_legacy(PLAIN)
        run = self.run_while_another_writes()
        self.assertEqual((1, "put back"), (run.code, run.report["legacy"]["settings"]), run.output)
        self.assertEqual((["O"], []), (self.identifiers(), self.names()))


class LegacyStepNotNeeded(LegacyTestCase):
    def test_says_so_and_makes_no_lock(self):
        run = self.run_legacy()
        self.assertEqual(0, run.code)
        self.assertEqual({"result": "not needed", "mail_accounts": False, "data_access": False,
                          "older_version": False, "settings": "untouched", "kept_copies": []}, run.report["legacy"])
        self.assertFalse((self.image / LOCK).exists())
        self.assertEqual(["M"], self.identifiers())

    def test_needs_no_migrator(self):
        shutil.rmtree(self.image / MIGRATOR)
        self.assertEqual(0, self.run_legacy().code)


class LegacyStepNotAskedFor(LegacyTestCase):
    """A run without the option takes no migration lock and looks for no data-access daemon."""

    def start_daemon(self):
        program = self.image / "usr/libexec/tallowd"
        program.parent.mkdir(parents=True)
        shutil.copy2(os.environ["TEST_DAEMON"], program)
        daemon = subprocess.Popen([program, "ignores"], stdout=subprocess.PIPE)
        self.addCleanup(daemon.communicate)
        self.addCleanup(daemon.kill)
        self.assertEqual(b".", daemon.stdout.read(1))
        return daemon

    def test_leaves_legacy_files_locks_and_the_daemon_alone(self):
        self.write_legacy(PLAIN)
        self.write_plist(hosttest.SETTINGS, {"Version": 7, "Accounts": [account("Q", "Quillnet", ("Contacts",), status=1)]})
        legacy = self.bytes_of(MAIL)
        daemon = self.start_daemon()
        run = self.run_host("--json", "--quiet")
        self.assertEqual(0, run.code, run.output)
        self.assertNotIn("legacy", run.report)
        self.assertEqual(["retired"], [entry["outcome"] for entry in run.report["accounts"]])
        self.assertFalse((self.image / LOCK).exists())
        self.assertEqual([], self.names())
        self.assertEqual(legacy, self.bytes_of(MAIL))
        self.assertIsNone(daemon.poll())
        self.assertNotIn("WillStart", (self.image / "var/log/notifications.jsonl").read_text(encoding="utf-8"))
        for line in run.report["log"]:
            self.assertNotRegex(line, "migration!|out of date|tallowd")

    def looked_at(self, *command):
        """The processes whose executable the command's processes asked for."""
        trace = self.directory / "trace"
        ended = subprocess.run(["strace", "-f", "-qq", "-o", trace, "-e", "trace=readlink,readlinkat", "--", *command],
                               capture_output=True, check=False)
        self.assertEqual(0, ended.returncode, ended.stderr)
        return re.findall(r"/proc/(\d+)/exe", trace.read_text(encoding="utf-8"))

    @unittest.skipIf(shutil.which("strace") is None, "needs strace")
    @unittest.skipIf(os.environ["SANITIZED"], "a sanitizer does not work under strace")
    def test_looks_up_no_process(self):
        self.write_settings(account("Q", "Quillnet", ("Contacts",), status=1))
        daemon = self.start_daemon()
        self.assertEqual([], self.looked_at(*self.command("--quiet")))
        self.assertEqual([], self.identifiers())
        daemon.kill()
        daemon.wait()
        stop = [os.environ["ACCOUNT_SETTINGS"], "stop-daemon", "--image", str(self.image)]
        self.assertNotEqual([], self.looked_at(*stop))  # so that the look above could have seen it


class LegacyStepRefused(LegacyTestCase):
    def plant_leftovers(self):
        """What killed programs have left, which a run that starts removes."""
        for name in ("tmp/fileAb12Zz", "var/mobile/Library/Preferences/.new-77-com.vantor.accountsettings.plist"):
            (self.image / name).write_bytes(b"bplist00")
            (self.image / name).chmod(0o600)

    def check_refusal(self, *words):
        self.write_legacy(PLAIN)
        self.plant_leftovers()
        with self.unchanged_image():
            run = self.run_legacy()
        self.assert_refused(run, *words)
        return run

    def test_without_the_migrator(self):
        shutil.rmtree(self.image / MIGRATOR)
        run = self.check_refusal(MIGRATOR, "is missing")
        self.assertEqual("refused", run.report["legacy"]["result"])

    def test_when_others_may_write_the_migrator(self):
        (self.image / MIGRATOR / "AccountMigrator.so").chmod(0o666)
        self.check_refusal("AccountMigrator.so may be written by others", "chmod go-w")

    def test_by_a_check_of_the_image_before_anything_is_made(self):
        (self.image / "etc/group").write_text("")
        run = self.check_refusal("etc/group", "mobile")
        self.assertNotIn("legacy", run.report)

    def test_by_a_migrator_that_is_not_whole(self):
        run = self.run_host("--legacy", "--json", "--quiet", "--bundle", self.directory)
        self.assert_refused(run, "Info.plist")
        self.assertNotIn("legacy", run.report)

    def test_when_another_run_holds_the_image(self):
        self.write_legacy(PLAIN)
        before = self.bytes_of(hosttest.SETTINGS)
        with open(self.image / hosttest.LOCK, "a", encoding="ascii") as lock:
            fcntl.flock(lock, fcntl.LOCK_EX)
            process = self.start("--legacy", "--json", "--quiet")
            process.communicate(timeout=100)
        self.assertEqual((11, before), (process.returncode, self.bytes_of(hosttest.SETTINGS)))


    def test_when_the_lock_cannot_be_made(self):
        (self.image / LOCK).mkdir()
        self.write_legacy(PLAIN)
        before = self.bytes_of(hosttest.SETTINGS)
        run = self.run_legacy()
        self.assert_refused(run, "Account Migrator was not run", LOCK, "could not be made")
        self.assertEqual("not begun", run.report["legacy"]["migrator"]["result"])
        self.assertEqual((before, []), (self.bytes_of(hosttest.SETTINGS), self.names()))

    def test_when_another_program_migrates_for_longer_than_the_limit(self):
        self.write_legacy(PLAIN)
        before = self.bytes_of(hosttest.SETTINGS)
        with open(self.image / LOCK, "a", encoding="ascii") as lock:
            fcntl.flock(lock, fcntl.LOCK_EX)
            run = self.run_legacy("--timeout", 1)
        self.assertEqual((11, "busy", "busy"), (run.code, run.report["outcome"],
                                                run.report["legacy"]["migrator"]["result"]), run.output)
        self.assertIn("another program migrates the settings", run.report["reasons"][0])
        self.assertEqual((before, []), (self.bytes_of(hosttest.SETTINGS), self.names()))

    def test_in_a_process_that_no_host_started(self):
        self.write_legacy(PLAIN)
        self.assertEqual(0, self.run_host("--quiet").code)  # makes the image's lock file
        with self.unchanged_image():
            ended = subprocess.run([hosttest.HOST, "--migrate-legacy-settings-in-this-process", self.image],
                                   capture_output=True, check=False)
        self.assertEqual((2, b"this argument is for processes that the program itself starts\n"),
                         (ended.returncode, ended.stderr))


class LegacyStepFailed(LegacyTestCase):
    """A step that fails ends the run, and the image has its settings and records as before."""

    def check_failure(self, code, behaviour, *words, arguments=()):
        self.make_image(SERVICE_RECORDS)
        self.script(behaviour)
        self.write_legacy(PLAIN, QUILLNET)
        before = self.bytes_of(hosttest.SETTINGS)
        run = self.run_legacy(*arguments)
        self.assertEqual(code, run.code, run.output)
        self.assertEqual(("failed", "put back"), (run.report["legacy"]["result"], run.report["legacy"]["settings"]))
        self.assertEqual(([], []), (run.report["migrators"], run.report["accounts"]))
        for word in (*words, "was put back with what it held"):
            self.assertIn(word, " ".join(run.report["reasons"]))
        self.assertEqual(before, self.bytes_of(hosttest.SETTINGS))
        self.assertEqual([], self.names())
        self.assertEqual([card("new", "Nora").encode()], self.contents("contacts", hosttest.SERVICE))

    def test_by_its_answer(self):
        self.check_failure(1, "answers false", "Account Migrator reports that its migration failed")

    def test_by_making_nothing(self):
        self.check_failure(1, "answers true", "made no settings file")

    def test_by_a_crash(self):
        self.check_failure(8, "crashes", "Account Migrator crashed")

    def test_by_raising(self):
        self.check_failure(8, "raises", "raised a failure", "not today")

    def test_by_taking_too_long(self):
        self.check_failure(8, "stays", "ran past its limit", arguments=("--timeout", 1))

    def test_by_a_bundle_that_is_no_code(self):
        self.write_legacy(PLAIN)
        (self.image / MIGRATOR / "AccountMigrator.so").write_bytes(b"no code")
        before = self.bytes_of(hosttest.SETTINGS)
        self.assert_refused(self.run_legacy(), "could not be loaded")
        self.assertEqual((before, []), (self.bytes_of(hosttest.SETTINGS), self.names()))

    def start_staying(self):
        """A run whose step is at work and has discarded the settings file."""
        self.script("stays")
        self.write_legacy(PLAIN)
        process = self.start("--legacy")
        hosttest.wait_for_line(process.stderr, "ScriptedMigrator: stays")
        self.assertFalse((self.image / hosttest.SETTINGS).exists())
        return process

    def leave_a_killed_run(self):
        process = self.start_staying()
        process.kill()
        process.communicate(timeout=100)
        with open(self.image / hosttest.LOCK, "a", encoding="ascii") as lock:
            fcntl.flock(lock, fcntl.LOCK_EX)  # until the step's process, which dies with the host, has ended

    def test_by_an_interruption(self):
        before = self.bytes_of(hosttest.SETTINGS)
        process = self.start_staying()
        process.send_signal(signal.SIGTERM)
        self.assertEqual(130, self.finish(process).code)
        self.assertEqual((before, []), (self.bytes_of(hosttest.SETTINGS), self.names()))

    def test_after_a_kill_puts_the_settings_back(self):
        before = self.bytes_of(hosttest.SETTINGS)
        self.leave_a_killed_run()
        self.script("answers false")
        run = self.run_legacy()
        self.assertEqual((1, "put back"), (run.code, run.report["legacy"]["settings"]), run.output)
        self.assertIn("was missing; the newest copy was put back.", run.report["reasons"][1])
        self.assertEqual(before, self.bytes_of(hosttest.SETTINGS))

    def test_where_there_was_nothing_to_keep(self):
        self.script("writes, answers false")
        self.write_legacy(PLAIN)
        (self.image / hosttest.SETTINGS).unlink()
        run = self.run_legacy()
        self.assertEqual((1, "replaced"), (run.code, run.report["legacy"]["settings"]), run.output)
        self.assertEqual(f"{self.image / hosttest.SETTINGS} is a new one.", run.report["reasons"][1])

    def test_by_a_kill_leaves_the_copy_and_the_next_run_completes(self):
        before = self.bytes_of(hosttest.SETTINGS)
        self.leave_a_killed_run()
        self.assertEqual(before, self.bytes_of(COPY))
        self.place(os.environ["ACCOUNT_MIGRATOR"])
        run = self.run_legacy()
        self.assertEqual((0, "done"), (run.code, run.report["legacy"]["result"]), run.output)
        self.assertEqual([str(self.image / COPY)], run.report["legacy"]["kept_copies"])
        self.assertEqual(["M"], self.identifiers())
        self.assertEqual(before, self.bytes_of(COPY))


if __name__ == "__main__":
    unittest.main()
