"""Which migrators a run takes, what it prints where, and what it puts right first."""
import os
import pathlib
import shutil
import subprocess

import hosttest
from hosttest import account

GOOD = hosttest.BUNDLES / "LogsAndSucceeds.migrator"


class Bundles(hosttest.HostTestCase):
    def setUp(self):
        super().setUp()
        self.migrators = self.image / "System/Library/DataClassMigrators"

    def names(self, *arguments):
        run = self.run_host("--json", "--quiet", *arguments)
        self.assertEqual(0, run.code, run.output)
        return [migrator["name"] for migrator in run.report["migrators"]]

    def test_the_installed_migrator_runs_alone_on_a_new_image(self):
        self.assertEqual(["Quillnet Account Removal"], self.names())

    def test_the_images_migrators_follow_in_name_order(self):
        for name in ("B", "A"):
            shutil.copytree(GOOD, self.migrators / f"{name}.migrator")
        shutil.copytree(GOOD, self.migrators / "C.other")
        (self.migrators / "D.migrator").mkdir()
        shutil.copytree(hosttest.BUNDLES / "OtherKind.migrator", self.migrators / "E.migrator")
        self.assertEqual(["Quillnet Account Removal", "Test Migrator", "Test Migrator"],
                         self.names())

    def test_a_named_bundle_runs_alone(self):
        shutil.copytree(GOOD, self.migrators / "A.migrator")
        self.assertEqual(["Test Migrator"], self.names("--bundle", GOOD))

    def test_a_bundle_may_be_named_by_a_relative_path(self):
        process = subprocess.run(self.command("--bundle", GOOD.name, "--quiet"), cwd=GOOD.parent,
                                 capture_output=True, check=False)
        self.assertEqual(0, process.returncode)

    def test_an_image_may_be_named_by_a_relative_path(self):
        process = subprocess.run([hosttest.HOST, "run", "--image", "image", "--bundle", str(GOOD),
                                  "--json"], cwd=self.directory, capture_output=True, check=False)
        self.assertEqual(0, process.returncode)
        self.assertEqual(str(self.image), hosttest.json.loads(process.stdout)["image"])


class LessThanUsual(hosttest.HostTestCase):
    def run_without(self, call, name, limit=60):
        run = self.run_host("--json", "--quiet", "--bundle", hosttest.BUNDLES / f"{name}.migrator",
                            "--timeout", limit, prefix=(hosttest.WITHOUT_CALL, call))
        return run.code, run.report["migrators"][0]["result"], run.report["log"]

    def test_a_run_needs_no_openat2(self):
        self.assertEqual((0, "done", self.run_bundle("LogsAndSucceeds").report["log"]),
                         self.run_without("openat2", "LogsAndSucceeds"))

    def test_a_run_needs_no_pidfd(self):
        self.assertEqual((0, "done", self.run_bundle("LogsAndSucceeds").report["log"]),
                         self.run_without("pidfd_open", "LogsAndSucceeds"))

    def test_a_run_sees_all_that_happens_when_each_wait_fails(self):
        self.assertEqual((0, "done", self.run_bundle("LogsAndSucceeds").report["log"]),
                         self.run_without("poll", "LogsAndSucceeds", limit=5))

    def test_a_limit_holds_when_each_wait_fails(self):
        self.assertEqual((8, "timed out"), self.run_without("poll", "Sleeps", limit=1)[:2])

    def test_a_limit_needs_no_pidfd(self):
        self.assertEqual((8, "timed out"), self.run_without("pidfd_open", "Sleeps", limit=1)[:2])


class Output(hosttest.HostTestCase):
    def test_log_lines_go_to_the_standard_error(self):
        run = self.run_host("--bundle", GOOD)
        self.assertEqual("first line of the test\n", run.errors.splitlines(True)[0])
        self.assertEqual(2, len(run.errors.splitlines()))
        self.assertEqual(f"{self.image}: done and verified\n", run.output)

    def test_quiet_shows_no_log_lines(self):
        self.assertEqual("", self.run_host("--bundle", GOOD, "--quiet").errors)

    def test_the_log_file_gets_the_lines_also_when_quiet(self):
        path = self.directory / "run.log"
        run = self.run_host("--bundle", GOOD, "--quiet", "--json", "--log", path)
        self.assertEqual(run.report["log"], path.read_text().splitlines())
        self.assertEqual(0o600, path.stat().st_mode & 0o7777)

    def test_a_log_file_that_is_there_is_emptied_and_made_private(self):
        path = self.directory / "run.log"
        path.write_text("what was there before is longer than what comes\n" * 10)
        path.chmod(0o644)
        run = self.run_host("--bundle", GOOD, "--quiet", "--json", "--log", path)
        self.assertEqual(run.report["log"], path.read_text().splitlines())
        self.assertEqual(0o600, path.stat().st_mode & 0o7777)

    def test_a_log_file_that_cannot_be_written_to_its_end_is_a_failure(self):
        mode = os.stat("/dev/full").st_mode
        run = self.run_host("--bundle", GOOD, "--quiet", "--json", "--log", "/dev/full")
        self.assertEqual((1, "failed", True),
                         (run.code, run.report["outcome"], run.report["balanced"]))
        self.assertIn("could not be written to its end", run.report["reasons"][0])
        self.assertIn("could not be written to its end", run.errors)
        self.assertEqual(mode, os.stat("/dev/full").st_mode)

    def test_a_report_that_cannot_be_written_is_a_failure(self):
        for accounts, code in ((), 0), ([account("Q", "Quillnet", ["contacts"], status=1)], 3):
            with self.subTest(code=code):
                self.write_settings(*accounts)
                self.assertEqual(code, self.run_host("--bundle", GOOD, "--quiet").code)
                with open("/dev/full", "wb") as full:
                    done = subprocess.run(self.command("--bundle", GOOD, "--quiet"), stdout=full,
                                          check=False)
                self.assertEqual(1, done.returncode)

    def test_the_images_system_log_gets_the_lines(self):
        self.run_host("--bundle", GOOD)
        lines = (self.image / "var/log/system.log").read_text().splitlines()
        self.assertTrue(lines[-2].endswith("first line of the test"), lines)

    def test_a_log_file_that_cannot_be_opened_is_wrong_usage(self):
        run = self.run_host("--log", self.directory / "no/such/folder/log")
        self.assertEqual(2, run.code)
        self.assertIn("name another file with --log", run.errors)

    def test_json_is_all_that_goes_to_the_standard_output(self):
        report = self.run_host("--bundle", GOOD, "--json").report
        self.assertEqual(str(self.image), report["image"])

    def test_a_table_has_a_line_for_each_account_without_control_characters(self):
        self.write_settings(account("A", "Mail", Class="IMAPAccount", DisplayName="Ada\x1b[2J"),
                            account("B", "Exchange", DisplayName="Zoë"))
        run = self.run_host("--quiet")
        self.assertEqual(f"Mail      Ada?[2J  not selected\n"
                         f"Exchange  Zoë      not selected\n"
                         f"{self.image}: done and verified\n", run.output)


class Usage(hosttest.HostTestCase):
    def check_usage(self, code, *arguments):
        process = subprocess.run([hosttest.HOST, *arguments], capture_output=True, check=False)
        self.assertEqual(code, process.returncode)
        return process

    def test_no_subcommand_is_wrong_usage(self):
        self.check_usage(2)

    def test_an_unknown_subcommand_is_wrong_usage(self):
        self.check_usage(2, "walk")

    def test_a_run_without_an_image_is_wrong_usage(self):
        self.check_usage(2, "run")

    def test_an_unknown_option_is_wrong_usage(self):
        self.check_usage(2, "run", "--image", "x", "--loud")

    def test_a_limit_that_is_no_number_of_seconds_is_wrong_usage(self):
        for limit in ("0", "-1", "soon", "1e9", ""):
            with self.subTest(limit):
                self.check_usage(2, "run", "--image", "x", "--timeout", limit)

    def test_help_has_examples_and_exit_codes(self):
        for arguments in (("--help",), ("run", "--help")):
            output = self.check_usage(0, *arguments).stdout.decode()
            self.assertIn("migration-host run --image", output)
            self.assertIn("130 interrupted", output)

    def test_the_version_is_printed(self):
        output = self.check_usage(0, "--version").stdout.decode()
        self.assertRegex(output, r"^migration-host \d+\.\d+\.\d+\n$")


class StaleFiles(hosttest.HostTestCase):
    def place(self, name, content, mode=0o600):
        path = self.image / "tmp" / name
        path.write_bytes(content)
        path.chmod(mode)
        return path

    def test_temporary_files_of_a_killed_save_are_swept(self):
        for name, content in (("fileAb12Cd", b"bplist00 and half a file"), ("filezzzzzz", b""),
                              ("file000000", b"bpl")):
            self.place(name, content)
        if os.geteuid() == 0:
            os.chown(self.place("fileMobile", b"bplist00"), 501, 501)
        self.run_host("--bundle", GOOD)
        self.assertEqual([], os.listdir(self.image / "tmp"))

    def test_files_of_others_stay(self):
        kept = [self.place("file12345", b""), self.place("file1234567", b""),
                self.place("file12-456", b""), self.place("note.txt", b"bplist00"),
                self.place("fileAAAAAA", b"a letter of mine"), self.place("fileBBBBBB", b"", 0o644),
                self.place("fileCCCCCC.unreadable-1", b"bplist00")]
        os.link(self.place("linked", b"bplist00"), self.image / "tmp/fileDDDDDD")
        (self.image / "tmp/fileEEEEEE").mkdir()
        (self.image / "tmp/fileFFFFFF").symlink_to(kept[0])
        before = sorted(os.listdir(self.image / "tmp"))
        self.run_host("--bundle", GOOD)
        self.assertEqual(before, sorted(os.listdir(self.image / "tmp")))

    def test_a_refused_run_sweeps_nothing(self):
        self.place("fileAb12Cd", b"bplist00")
        self.write_settings(account("B", "Telegraph"))
        with self.unchanged_image():
            self.assertEqual(7, self.run_host().code)


class Verification(hosttest.HostTestCase):
    ACCOUNTS = (account("A", "Mail", Class="IMAPAccount"),
                account("Q", "Quillnet", ("Contacts",), status=1), account("E", "Exchange"))

    def setUp(self):
        super().setUp()
        self.write_agent_name("ada")
        self.write_settings(*self.ACCOUNTS)
        self.make_image([hosttest.record("contacts", hosttest.SERVICE, "a", hosttest.card("a", "Ada")),
                         hosttest.record("contacts", None, "b", hosttest.card("b", "Bo"))])

    def run_change(self, change):
        self.write_plist("var/mobile/Library/MigrationHost/Defaults.plist", {"TestChange": change})
        return self.run_bundle("ChangesSettings")

    def outcomes(self, run):
        return {entry["identifier"]: entry["outcome"] for entry in run.report["accounts"]}

    def test_records_of_a_retired_account_that_stayed_in_its_store_are_left_behind(self):
        run = self.run_change("retire")
        self.assertEqual((3, True), (run.code, run.report["balanced"]))
        self.assertEqual({"A": "not selected", "Q": "retired", "E": "not selected"},
                         self.outcomes(run))
        self.assertEqual([{"account": "Q", "dataclass": "contacts", "service_before": 1,
                           "local_before": 1, "local_after": 1, "moved": 0, "already_there": 0,
                           "conflict_copies": 0, "retired": 0, "left_behind": 1}],
                         run.report["dataclasses"])

    def test_an_account_that_was_to_be_retired_and_is_there_is_kept(self):
        run = self.run_bundle("LogsAndSucceeds")
        self.assertEqual((3, "left behind"), (run.code, run.report["outcome"]))
        self.assertEqual("kept", self.outcomes(run)["Q"])

    def test_accounts_that_are_gone_unasked_fail_the_verification(self):
        run = self.run_change("drop")
        self.assertEqual((5, False), (run.code, run.report["balanced"]))
        self.assertEqual({"A": "dropped", "Q": "retired", "E": "dropped"}, self.outcomes(run))
        self.assertIn("The Exchange account e@example.net was not to be retired and is gone from "
                      "the settings file.", run.report["reasons"])

    def test_settings_that_are_gone_fail_the_verification(self):
        self.assertEqual(5, self.run_change("remove").code)

    def test_an_account_that_came_new_fails_the_verification(self):
        run = self.run_change("add")
        self.assertEqual((5, False), (run.code, run.report["balanced"]))
        self.assertIn("The Mail account New was not there before.", run.report["reasons"])

    def test_a_changed_account_fails_the_verification(self):
        run = self.run_change("change")
        self.assertEqual((5, "verification failed", False),
                         (run.code, run.report["outcome"], run.report["balanced"]))

    def test_accounts_in_another_order_fail_the_verification(self):
        self.assertEqual(5, self.run_change("reverse").code)

    def check_written_settings(self, change, words):
        run = self.run_change(change)
        self.assertEqual((5, False), (run.code, run.report["balanced"]))
        self.assertTrue(any(words in reason for reason in run.report["reasons"]),
                        run.report["reasons"])

    def test_settings_that_are_written_as_they_must_be_pass(self):
        run = self.run_change("touch")
        self.assertEqual((3, True), (run.code, run.report["balanced"]))

    def test_settings_that_are_written_with_an_old_version_fail_the_verification(self):
        self.check_written_settings("version", "was written without the version 12")

    def test_settings_that_others_may_read_afterwards_fail_the_verification(self):
        self.check_written_settings("mode", "not readable and writable by its owner alone")

    @hosttest.skip_unless_root
    def test_settings_that_have_lost_their_owner_fail_the_verification(self):
        self.check_written_settings("owner", 'does not belong to "mobile"')

    def test_old_settings_that_are_not_written_pass(self):
        self.write_plist(hosttest.SETTINGS, {"Version": 3, "Accounts": list(self.ACCOUNTS)})
        (self.image / hosttest.SETTINGS).chmod(0o640)
        run = self.run_bundle("LogsAndSucceeds")
        self.assertEqual((3, True), (run.code, run.report["balanced"]))

    def test_destroyed_settings_fail_the_verification(self):
        self.assertEqual(5, self.run_change("destroy").code)

    def test_a_destroyed_database_fails_the_verification_whatever_the_migrator_says(self):
        run = self.run_bundle("RemovesADatabase")
        self.assertEqual("done", run.report["migrators"][0]["result"])
        self.assertEqual((5, False), (run.code, run.report["balanced"]))
        line = run.report["dataclasses"][0]
        self.assertEqual((1, 1, 0, 0), (line["service_before"], line["local_before"],
                                        line["local_after"], line["left_behind"]))
