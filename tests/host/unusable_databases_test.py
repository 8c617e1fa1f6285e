"""A database that cannot be used is left alone and told of; the others are migrated."""
import contextlib
import os
import shutil
import sqlite3
import subprocess
import unittest

import hosttest
from hosttest import SERVICE, account, card, event, record

CONTACTS = hosttest.KINDS["contacts"][1]
JOURNAL_BEGIN = bytes.fromhex("d9d505f920a163d7")  # written when the rest is on the disk


class UnusableDatabases(hosttest.HostTestCase):
    def setUp(self):
        super().setUp()
        self.write_agent_name("ada")
        self.write_settings(account("Q", "Quillnet", ("Contacts", "Calendars"), status=1),
                            account("E", "Exchange", ("Contacts",)))
        self.make_image([record("contacts", SERVICE, "a", card("a", "Ada")),
                         record("contacts", None, "b", card("b", "Bo")),
                         record("calendars", SERVICE, "c", event("c", "Tea"))])
        self.contacts_file = self.image / CONTACTS

    def check_that_contacts_are_left_alone(self, *words, prefix=()):
        before = self.contacts_file.read_bytes()
        run = self.run_host("--json", "--quiet", prefix=prefix)
        self.assertEqual((3, "left behind", True),
                         (run.code, run.report["outcome"], run.report["balanced"]), run.output)
        self.assertTrue(any(all(word in reason for word in (CONTACTS, "was left alone", *words))
                            for reason in run.report["reasons"]), run.report["reasons"])
        self.assertEqual(before, self.contacts_file.read_bytes())
        self.assertEqual(1, len(self.contents("calendars")))
        self.assertEqual([], self.contents("calendars", SERVICE))
        self.assertEqual("retired", run.report["accounts"][0]["outcome"])
        return run

    def damage(self, begin, end):
        content = bytearray(self.contacts_file.read_bytes())
        content[begin:end] = bytes(end - begin)
        self.contacts_file.write_bytes(content)

    def test_a_damaged_one_is_not_opened_by_the_migrator(self):
        self.damage(100, 200)
        run = self.check_that_contacts_are_left_alone("damaged", "bring back a sound copy")
        self.assertIn("What account Q has of contacts is left as it was, in a database that cannot "
                      "be used; when it can, put the account back into the settings and run the host "
                      "again.", run.report["reasons"])
        self.assertEqual(["calendars"], [line["dataclass"] for line in run.report["dataclasses"]])
        self.assertTrue(any("is left alone" in line for line in run.report["log"]))

    def test_one_that_was_brought_back_has_records_that_no_account_owns_any_more(self):
        sound = self.contacts_file.read_bytes()
        self.damage(100, 200)
        self.check_that_contacts_are_left_alone("damaged")
        self.contacts_file.write_bytes(sound)
        for _ in range(2):  # nobody moves them meanwhile
            run = self.run_host("--json", "--quiet")
            self.assertEqual((3, "left behind"), (run.code, run.report["outcome"]))
            self.assertEqual([f"1 record of contacts in the store {SERVICE} belongs to no account of "
                              "the settings file and cannot be migrated."], run.report["reasons"])

    @unittest.skipIf(shutil.which("strace") is None, "needs strace")
    @unittest.skipIf(os.environ["SANITIZED"], "a sanitizer does not work under strace")
    def test_one_that_cannot_be_read_at_the_moment_refuses_the_run(self):
        before = (self.image / hosttest.SETTINGS).read_bytes()
        run = self.run_host("--json", "--quiet", prefix=(
            "strace", "-f", "-qq", "-o", os.devnull, "-P", str(self.contacts_file),
            "-e", "inject=pread64:error=EIO"))
        self.assertEqual((7, "refused"), (run.code, run.report["outcome"]))
        self.assertEqual(1, len(run.report["reasons"]))
        self.assertIn("cannot be looked at now", run.report["reasons"][0])
        self.assertEqual(before, (self.image / hosttest.SETTINGS).read_bytes())
        self.assertEqual(1, len(self.contents("calendars", SERVICE)))

    @unittest.skipIf(shutil.which("strace") is None, "needs strace")
    @unittest.skipIf(os.environ["SANITIZED"], "a sanitizer does not work under strace")
    def test_one_in_which_the_migrator_died_is_rolled_back_before_it_is_judged(self):
        run = self.run_host("--json", "--quiet", prefix=(
            "strace", "-f", "-qq", "-o", os.devnull, "-P", str(self.contacts_file),
            "-e", "inject=fdatasync:signal=SIGKILL:when=2"))  # the host makes one, the migrator more
        self.assertEqual((8, "migrator failed", True),
                         (run.code, run.report["outcome"], run.report["balanced"]), run.output)
        self.assertFalse(any("damaged" in reason for reason in run.report["reasons"]),
                         run.report["reasons"])
        self.assertFalse(self.contacts_file.with_name("Contacts.sqlite-journal").exists())
        self.assertEqual(0, self.run_host("--quiet").code)
        self.assertEqual(2, len(self.contents("contacts")))

    def leave_a_journal(self):
        """As a program does that was killed when the journal was on the disk and the change was not."""
        journal = self.contacts_file.with_name("Contacts.sqlite-journal")
        with contextlib.closing(sqlite3.connect(self.contacts_file, isolation_level=None)) as database:
            database.execute("BEGIN")
            database.execute("UPDATE records SET modified_at = 1")
            content = JOURNAL_BEGIN + journal.read_bytes()[len(JOURNAL_BEGIN):]
            database.execute("ROLLBACK")
        journal.write_bytes(content)
        return journal

    @unittest.skipIf(shutil.which("strace") is None, "needs strace")
    @unittest.skipIf(os.environ["SANITIZED"], "a sanitizer does not work under strace")
    def test_one_that_cannot_be_rolled_back_at_the_moment_refuses_the_run(self):
        journal = self.leave_a_journal()
        before = (self.image / hosttest.SETTINGS).read_bytes()
        run = self.run_host("--json", "--quiet", prefix=(
            "strace", "-f", "-qq", "-o", os.devnull, "-e", "inject=unlink:error=EIO"))
        self.assertEqual((7, "refused"), (run.code, run.report["outcome"]), run.output)
        self.assertIn("cannot be looked at now", run.report["reasons"][0])
        self.assertTrue(journal.exists())
        self.assertEqual(before, (self.image / hosttest.SETTINGS).read_bytes())
        self.assertEqual(1, len(self.contents("calendars", SERVICE)))
        self.assertEqual(0, self.run_host("--quiet").code)
        self.assertFalse(journal.exists())
        self.assertEqual(2, len(self.contents("contacts")))

    def test_one_with_another_content_than_its_hashes_say(self):
        with sqlite3.connect(self.contacts_file) as database:
            database.execute("UPDATE records SET content = x'78'")
        database.close()
        self.check_that_contacts_are_left_alone("another content than its hash says")

    @contextlib.contextmanager
    def held(self, begin):
        # In a process of its own: whoever closes a file loses the locks that he has on it.
        with subprocess.Popen(["sqlite3", self.contacts_file], stdin=subprocess.PIPE,
                              stdout=subprocess.PIPE, text=True) as holder:
            holder.stdin.write(f"{begin}; SELECT 'held';\n")
            holder.stdin.flush()
            self.assertEqual("held\n", holder.stdout.readline())
            yield

    def test_one_that_somebody_else_holds(self):
        with self.held("BEGIN EXCLUSIVE"):
            self.check_that_contacts_are_left_alone("database is locked")

    def test_one_that_somebody_is_about_to_write_is_accounted_for(self):
        with self.held("BEGIN IMMEDIATE"):
            run = self.check_that_contacts_are_left_alone("it is in use", "database is locked")
        self.assertEqual((1, 1), (run.report["dataclasses"][0]["service_before"],
                                  run.report["dataclasses"][0]["left_behind"]))

    @hosttest.skip_unless_root
    def test_one_that_can_only_be_read_is_accounted_for(self):
        run = self.check_that_contacts_are_left_alone(
            "cannot be written", "give the right to write",
            prefix=("unshare", "-m", "sh", "-c",
                    f'mount --bind "{self.contacts_file}" "{self.contacts_file}" && '
                    f'mount -o remount,bind,ro "{self.contacts_file}" && exec "$@"', "sh"))
        line = run.report["dataclasses"][0]
        self.assertEqual(("contacts", 1, 1), (line["dataclass"], line["service_before"],
                                              line["left_behind"]))

    def test_one_that_was_not_used_is_told_of_too(self):
        notes = self.image / hosttest.KINDS["notes"][1]
        notes.parent.mkdir(mode=0o700, exist_ok=True)
        notes.write_bytes(b"")
        run = self.run_host("--json", "--quiet")
        self.assertEqual(3, run.code)
        self.assertEqual(2, len(self.contents("contacts")))
        self.assertTrue(any("an empty file and no database" in reason
                            for reason in run.report["reasons"]), run.report["reasons"])

    def test_one_that_the_migrator_damages_fails_the_verification(self):
        (self.image / hosttest.KINDS["notes"][1]).parent.mkdir(mode=0o700, exist_ok=True)
        (self.image / hosttest.KINDS["notes"][1]).write_bytes(b"")
        run = self.run_bundle("RemovesADatabase")
        self.assertEqual((5, False), (run.code, run.report["balanced"]))
