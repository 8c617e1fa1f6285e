"""Whatever a migrator does, the host ends in time, says what happened, and leaves nothing behind."""
import json
import shutil
import signal
import subprocess
import time
import unittest.mock

import hosttest


class FaultyBundles(hosttest.HostTestCase):
    def check(self, name, code, result, limit=60, detail=""):
        run = self.run_bundle(name, limit=limit)
        self.assertEqual(code, run.code, run.output + run.errors)
        self.assertEqual(code, run.report["exit_code"])
        migrator = run.report["migrators"][0]
        self.assertEqual(result, migrator["result"])
        self.assertIn(detail, migrator.get("detail", ""))
        return run

    def test_one_that_does_well_is_done(self):
        run = self.check("LogsAndSucceeds", 0, "done")
        self.assertEqual("Test Migrator", run.report["migrators"][0]["name"])
        self.assertEqual(["first line of the test"], run.report["log"][:1])
        self.assertEqual(2, len(run.report["log"]))
        self.assertTrue(run.report["balanced"])

    def test_one_that_reports_failure_fails_the_run(self):
        self.check("ReportsFailure", 1, "failed")

    def test_one_that_aborts(self):
        self.check("Aborts", 8, "crashed", detail="signal 6")

    def test_one_that_throws_an_exception(self):
        self.check("ThrowsException", 8, "raised",
                   detail="std::runtime_error: the plug-in is out of ideas")

    def test_one_that_raises_an_internal_consistency_failure(self):
        self.check("RaisesInternalConsistencyFailure", 8, "raised",
                   detail="ASSBasicAccount:42: Unsupported account type")

    def test_one_that_throws_an_integer(self):
        self.check("ThrowsInteger", 8, "raised", detail="an object of type int")

    def test_one_that_throws_through_noexcept(self):
        self.check("ThrowsThroughNoexcept", 8, "crashed", detail="signal 6")

    def test_one_that_sleeps_and_ignores_signals(self):
        self.check("Sleeps", 8, "timed out", limit=1)

    def test_one_that_works_for_ever(self):
        self.check("Spins", 8, "timed out", limit=1)

    def test_one_that_exits_with_success(self):
        self.check("Exits", 8, "ended without an answer")

    def test_one_that_exits_at_once(self):
        self.check("ExitsAtOnce", 8, "ended without an answer", detail="exit status 0")

    def test_one_that_ends_its_thread(self):
        self.check("EndsItsThread", 8, "ended without an answer")

    def test_one_that_fills_its_output(self):
        run = self.check("FillsItsOutput", 0, "done")
        migrator = run.report["migrators"][0]
        self.assertEqual("x" * 64 * 1024, migrator["output"])
        self.assertTrue(migrator["output_was_cut"])

    def test_one_that_writes_output_for_ever(self):
        self.check("WritesOutputForEver", 8, "timed out", limit=1)

    def test_one_that_logs_for_ever(self):
        self.check("LogsForEver", 8, "timed out", limit=1)

    def test_one_that_logs_a_long_line(self):
        run = self.check("LogsALongLine", 0, "done")
        self.assertEqual(["y" * 300_000], run.report["log"])

    def test_one_that_closes_its_descriptors_writes_into_no_file(self):
        run = self.check("ClosesDescriptors", 8, "ended without an answer")
        self.assertEqual(b"", (self.image / "tmp/opened").read_bytes())
        self.assertNotIn("nobody hears this", run.report["log"])

    def test_one_that_leaves_grandchildren(self):
        run = self.check("LeavesGrandchildren", 0, "done")
        numbers = [int(word) for word in run.report["log"][0].split() if word.isdigit()]
        self.assertEqual(2, len(numbers))
        for number in numbers:
            with self.assertRaises(ProcessLookupError):
                hosttest.os.kill(number, 0)

    def test_one_whose_host_has_children_from_before(self):
        """They are not the migrator's, and live on, whatever their sessions; what it leaves is ended as ever."""
        script = ('sleep 300 >&- 2>&- & echo $! > "$0"; setsid sleep 300 >&- 2>&- & echo $! >> "$0"; '
                  'sh -c "sleep 300 >&- 2>&- & echo \\$!" >> "$0"; exec "$@"')
        numbers = self.directory / "numbers"
        process = self.start("--json", "--quiet", "--bundle", hosttest.BUNDLES / "LeavesAWriter.migrator",
                             prefix=("bash", "-c", script, str(numbers)))
        output, errors = process.communicate(timeout=100)
        earlier = [int(line) for line in numbers.read_text(encoding="ascii").splitlines()]
        for number in earlier:
            self.addCleanup(hosttest.os.kill, number, 9)
        self.assertEqual(0, process.returncode, output + errors)
        self.assertEqual(3, len(earlier))
        for number in earlier:
            hosttest.os.kill(number, 0)
        report = json.loads(output)
        with self.assertRaises(ProcessLookupError):
            hosttest.os.kill(int(report["log"][0].removeprefix("left ")), 0)

    def check_that_nobody_is_left(self, name, code, result, limit=60):
        run = self.check(name, code, result, limit)
        with self.assertRaises(ProcessLookupError):
            hosttest.os.kill(int(run.report["log"][0].removeprefix("left ")), 0)

    def test_one_that_leaves_a_daemon_that_writes_for_ever(self):
        self.check_that_nobody_is_left("LeavesAWriter", 0, "done")

    def test_one_that_leaves_its_output_open(self):
        self.check_that_nobody_is_left("KeepsItsOutputOpen", 0, "done")

    def test_one_that_ignores_what_asks_it_to_end(self):
        self.check_that_nobody_is_left("IgnoresTermination", 8, "timed out", limit=1)

    def test_one_that_is_traced_by_its_child(self):
        if hosttest.os.environ.get("SANITIZED"):
            self.skipTest("the search for leaks does not work in a traced process")
        self.check_that_nobody_is_left("IsTracedByItsChild", 0, "done")

    def check_what_cannot_be_killed(self, name):
        ended = subprocess.run(
            [hosttest.WITHOUT_CALL, "kill", *self.command(
                "--json", "--quiet", "--bundle", hosttest.BUNDLES / f"{name}.migrator")],
            capture_output=True, timeout=100, check=False)
        report = hosttest.json.loads(ended.stdout)
        left = int(report["log"][0].removeprefix("left "))
        hosttest.os.kill(left, signal.SIGKILL)
        self.assertEqual((8, "ended without an answer",
                          "processes that it started could not be ended"),
                         (ended.returncode, report["migrators"][0]["result"],
                          report["migrators"][0]["detail"]))

    def test_the_host_ends_when_a_writer_cannot_be_killed(self):
        self.check_what_cannot_be_killed("LeavesAWriter")

    def test_the_host_ends_when_what_holds_the_output_cannot_be_killed(self):
        self.check_what_cannot_be_killed("KeepsItsOutputOpen")

    def test_a_host_that_cannot_find_what_is_left_refuses(self):
        with self.unchanged_image():
            run = self.run_host("--json", "--quiet", prefix=(hosttest.WITHOUT_CALL, "subreaper"))
        self.assert_refused(run, "find what a migrator leaves running", "outside of the sandbox")

    def test_one_without_an_entry_is_refused(self):
        run = self.check("NoEntry", 7, "not loaded",
                         detail="offers no migrator class named TestMigrator")
        self.assertEqual("refused", run.report["outcome"])

    def test_one_with_an_unresolved_symbol_is_refused(self):
        self.check("UnresolvedSymbol", 7, "not loaded", detail="nobodyDefinesThis")

    def test_one_that_is_no_library_is_refused(self):
        bundle = self.directory / "Text.migrator"
        shutil.copytree(hosttest.BUNDLES / "LogsAndSucceeds.migrator", bundle)
        (bundle / "LogsAndSucceeds.so").write_text("no library")
        run = self.run_host("--json", "--bundle", bundle)
        self.assertEqual(7, run.code)
        self.assertEqual("not loaded", run.report["migrators"][0]["result"])

    def test_one_that_overflows_the_stack(self):
        run = self.run_bundle("OverflowsTheStack")
        self.assertEqual(8, run.code)
        # A sanitizer ends the process itself.
        self.assertIn(run.report["migrators"][0]["result"], ("crashed", "ended without an answer"))

    def test_one_that_crashes_when_it_is_loaded(self):
        run = self.run_bundle("CrashesWhenLoaded")
        self.assertEqual(8, run.code)
        self.assertIn(run.report["migrators"][0]["result"], ("crashed", "ended without an answer"))

    def test_one_that_allocates_without_end(self):
        if hosttest.os.environ.get("SANITIZED"):
            self.skipTest("a sanitizer needs more address space than the host allows")
        self.check("AllocatesWithoutEnd", 8, "raised", detail="std::bad_alloc")

    def test_surroundings_are_those_of_a_new_process(self):
        with unittest.mock.patch.dict(hosttest.os.environ, {
                "HOME": "/root", "LD_BIND_NOW": "1", "LC_ALL": "C", "ASAN_OPTIONS": "verbosity=0",
                "GCOV_PREFIX": "/nowhere", "SECRET": "x"}):
            run = self.check("ShowsItsSurroundings", 0, "done")
        environment = [f"TMPDIR={self.image}/tmp"]
        if hosttest.os.environ.get("SANITIZED"):
            environment.append("ASAN_OPTIONS=verbosity=0")
        self.assertEqual([*environment, "umask=63", "leads its session: 1", "few descriptors: 1",
                          "signals held back: 0", "a child holds the lock: 0"],
                         [line for line in run.report["log"]
                          if not line.startswith(("LSAN_", "TSAN_", "UBSAN_", "__LLVM_PROFILE_"))])

    def test_the_next_migrator_runs_after_one_that_crashed(self):
        migrators = self.image / "System/Library/DataClassMigrators"
        for name in ("Aborts", "LogsAndSucceeds"):
            shutil.copytree(hosttest.BUNDLES / f"{name}.migrator", migrators / f"{name}.migrator")
        run = self.run_host("--json", "--quiet")
        self.assertEqual(8, run.code)
        self.assertEqual(["done", "crashed", "done"],
                         [migrator["result"] for migrator in run.report["migrators"]])

    def test_one_that_cannot_be_loaded_after_another_has_run_is_a_failure(self):
        migrators = self.image / "System/Library/DataClassMigrators"
        shutil.copytree(hosttest.BUNDLES / "NoEntry.migrator", migrators / "NoEntry.migrator")
        run = self.run_host("--json", "--quiet")
        self.assertEqual(8, run.code)


class Stopping(hosttest.HostTestCase):
    def start_sleeping(self):
        process = self.start("--bundle", hosttest.BUNDLES / "Sleeps.migrator", "--timeout", 90)
        hosttest.wait_for_line(process.stderr, "sleeping")
        return process

    def check_that_the_signal_interrupts(self, number):
        process = self.start_sleeping()
        process.send_signal(number)
        run = self.finish(process)
        self.assertEqual(130, run.code)
        self.assertIn("interrupted", run.output)

    def test_sigint_stops_the_migrator_and_exits_with_130(self):
        self.check_that_the_signal_interrupts(signal.SIGINT)

    def test_sigterm_stops_the_migrator_and_exits_with_130(self):
        self.check_that_the_signal_interrupts(signal.SIGTERM)

    def test_a_killed_host_takes_its_migrator_along(self):
        process = self.start_sleeping()
        process.kill()
        process.communicate(timeout=60)
        deadline = time.monotonic() + 60
        while self.processes_of_runs() and time.monotonic() < deadline:
            time.sleep(0.01)
        # A process that ends loses its environment before its descriptors.
        with open(self.image / hosttest.LOCK, "rb") as lock:
            hosttest.fcntl.flock(lock, hosttest.fcntl.LOCK_EX)
        self.assert_nothing_is_left()

    def test_the_migrator_shares_the_lock_so_that_it_outlives_a_killed_host(self):
        process = self.start_sleeping()
        migrator, = self.processes_of_runs()
        self.assertEqual(str(self.image / hosttest.LOCK),
                         hosttest.os.readlink(f"/proc/{migrator}/fd/4"))
        process.send_signal(signal.SIGINT)
        self.assertEqual(130, self.finish(process).code)

    def test_a_reader_that_goes_away_does_not_stop_the_migration(self):
        process = self.start("--bundle", hosttest.BUNDLES / "LogsAndSucceeds.migrator")
        process.stdout.close()
        process.stderr.close()
        self.assertEqual(1, process.wait(timeout=60))
        self.assertIn("second line", (self.image / "var/log/system.log").read_text())

    def test_a_second_host_is_turned_away(self):
        process = self.start_sleeping()
        second = subprocess.run(self.command("--json"), capture_output=True, timeout=60, check=False)
        report = hosttest.json.loads(second.stdout)
        self.assertEqual((11, "busy", []), (second.returncode, report["outcome"],
                                            report["migrators"]))
        process.send_signal(signal.SIGINT)
        self.assertEqual(130, self.finish(process).code)
