"""The command wait-for-migration of account-settings, with other processes that hold the migration lock."""

import fcntl
import json
import os
import signal
import subprocess
import sys
import unittest
from pathlib import Path

from settingstest import TOOL, SettingsTest

HOLDER = """
import fcntl, sys
file = open(sys.argv[1], "a")
fcntl.flock(file, fcntl.LOCK_EX)
print("held", flush=True)
sys.stdin.buffer.read(1)
"""


class WaitForMigration(SettingsTest):
    @property
    def lock_file(self) -> Path:
        return self.image / "tmp/AccountMigrationInProgress"

    def start_holder(self) -> subprocess.Popen:
        """A program that holds the lock until its input ends."""
        holder = subprocess.Popen([sys.executable, "-c", HOLDER, str(self.lock_file)], stdin=subprocess.PIPE,
                                  stdout=subprocess.PIPE)
        self.addCleanup(self.end, holder)
        self.assertEqual(holder.stdout.readline(), b"held\n")
        return holder

    def end(self, holder: subprocess.Popen) -> None:
        holder.kill()
        holder.communicate(timeout=100)

    def start_waiter(self, *arguments) -> subprocess.Popen:
        """The command, when it waits for a lock."""
        waiter = subprocess.Popen([TOOL, "wait-for-migration", "--image", str(self.image), *arguments],
                                  stdout=subprocess.PIPE, stderr=subprocess.PIPE)
        while not any("->" in line and f" {waiter.pid} " in line for line in Path("/proc/locks").read_text().splitlines()):
            self.assertIsNone(waiter.poll())
        return waiter

    def assert_is_free(self) -> None:
        with open(self.lock_file) as file:
            fcntl.flock(file, fcntl.LOCK_EX | fcntl.LOCK_NB)

    def test_returns_at_once_without_a_migration_and_holds_nothing(self):
        before = self.state()
        self.assertEqual(self.succeed("wait-for-migration"), "no migration runs\n")
        self.assert_is_free()
        self.assertEqual(self.answer("wait-for-migration", "--timeout", "100"),
                         {"image": str(self.image), "outcome": "free"})
        after = self.state()
        self.assertEqual(after.pop(self.lock_file)[2], b"")
        after.pop(self.image / "tmp")
        before.pop(self.image / "tmp")
        self.assertEqual(after, before)

    def test_needs_no_lock_of_the_image(self):
        with open(self.image / "var/run/image.lock", "a") as file:
            fcntl.flock(file, fcntl.LOCK_EX)
            self.succeed("wait-for-migration")

    @unittest.skipUnless(os.geteuid() == 0, "only root can work as two users")
    def test_by_root_leaves_the_lock_to_the_device_s_user(self):
        os.chmod(self.directory, 0o755)
        for path in (self.image, *self.image.rglob("*")):
            os.chown(path, 501, 501)
        self.succeed("wait-for-migration")
        ended = self.run_on_image("wait-for-migration", user=501, group=501, extra_groups=[], cwd="/")
        self.assertEqual((ended.returncode, ended.stdout, ended.stderr), (0, b"no migration runs\n", b""))

    def test_returns_when_the_migration_has_ended(self):
        holder = self.start_holder()
        waiter = self.start_waiter("--timeout", "1000")
        holder.stdin.write(b"x")
        holder.stdin.flush()
        self.assertEqual(waiter.communicate(timeout=100), (b"no migration runs\n", b""))
        self.assertEqual(waiter.returncode, 0)
        self.assert_is_free()

    def test_returns_when_the_migration_was_killed(self):
        holder = self.start_holder()
        waiter = self.start_waiter()
        holder.send_signal(signal.SIGKILL)
        self.assertEqual(waiter.communicate(timeout=100), (b"no migration runs\n", b""))
        self.assertEqual(waiter.returncode, 0)

    def test_gives_up_when_the_time_is_up(self):
        self.start_holder()
        said = self.fail_with(9, "wait-for-migration", "--timeout", "0.25")
        self.assertEqual(said, f"account-settings: {self.image}: a migration still runs after 0.25 seconds; wait on, "
                               f"or see which program holds {self.lock_file}\n")
        ended = self.run_on_image("wait-for-migration", "--timeout", "0.25", "--json")
        self.assertEqual(ended.returncode, 9)
        self.assertEqual(json.loads(ended.stdout), {"image": str(self.image), "outcome": "timed out"})

    def test_gives_up_also_when_it_was_started_with_the_alarm_blocked_or_ignored(self):
        self.start_holder()
        for prepare in (lambda: signal.pthread_sigmask(signal.SIG_BLOCK, {signal.SIGALRM}),
                        lambda: signal.signal(signal.SIGALRM, signal.SIG_IGN)):  # fmt: skip
            ended = self.run_on_image("wait-for-migration", "--timeout", "0.25", preexec_fn=prepare)
            self.assertEqual(ended.returncode, 9)

    def test_says_that_the_lock_cannot_be_opened(self):
        for place in (lambda: self.lock_file.symlink_to("/dev/null"), self.lock_file.mkdir):
            with self.subTest(place):
                place()
                said = self.fail_with(7, "wait-for-migration", "--timeout", "100")
                self.assertIn(f"{self.lock_file}: ", said)
                self.assertIn("so nobody can tell whether a migration runs", said)
                if self.lock_file.is_symlink():
                    self.lock_file.unlink()

    def test_of_a_path_without_an_image_is_refused(self):
        os.rename(self.image, self.directory / "elsewhere")
        self.assertIn(str(self.image), self.fail_with(7, "wait-for-migration"))


if __name__ == "__main__":
    unittest.main()
