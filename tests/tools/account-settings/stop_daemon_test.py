"""The command stop-daemon of account-settings, with real daemons that run from the image. The daemon of the
tests, a program that behaves as its first argument says, is in the environment as TEST_DAEMON."""

import json
import os
import shutil
import signal
import subprocess
import unittest
from pathlib import Path

from settingstest import TOOL, SettingsTest, run

ASKED = "Performing account migration. Asking tallowd to exit"
KILLED = "tallowd does not seem to want to quit. Sending it a SIGKILL"
GIVEN_UP = ("tallowd decided it didn't want to play well with others and refused to exit. We're going to continue "
            "with the backup/restore anyway and hope for the best.")


class StopDaemon(SettingsTest):
    @property
    def notifications(self) -> Path:
        return self.image / "var/log/notifications.jsonl"

    def start_daemon(self, behaviour: str, folder: Path | None = None, **options) -> subprocess.Popen:
        folder = folder or self.image / "usr/libexec"
        folder.mkdir(parents=True, exist_ok=True)
        program = folder / "tallowd"
        shutil.copy2(os.environ["TEST_DAEMON"], program)
        daemon = subprocess.Popen([program, behaviour, self.notifications], stdout=subprocess.PIPE, **options)
        self.addCleanup(self.end, daemon)
        self.assertEqual(daemon.stdout.read(1), b".")
        return daemon

    def end(self, daemon: subprocess.Popen) -> None:
        daemon.kill()
        daemon.communicate(timeout=100)

    def log(self) -> list:
        path = self.image / "var/log/system.log"
        lines = path.read_text().splitlines() if path.exists() else []
        return [line.split("]: ", 1)[1] for line in lines]

    def notified(self) -> list:
        lines = self.notifications.read_text().splitlines() if self.notifications.exists() else []
        return [json.loads(line)["name"] for line in lines]

    def test_without_a_daemon_does_nothing(self):
        before = self.state()
        self.assertEqual(self.succeed("stop-daemon"), "the data-access daemon does not run\n")
        self.assertEqual(self.answer("stop-daemon"), {"image": str(self.image), "outcome": "not running",
                                                      "process": None, "signalled": False, "running": None})
        self.assertEqual(self.state(), before)

    def test_leaves_a_daemon_of_another_image_alone(self):
        daemon = self.start_daemon("ignores", self.directory / "another/usr/libexec")
        self.assertEqual(self.answer("stop-daemon")["outcome"], "not running")
        self.assertIsNone(daemon.poll())
        self.assertEqual(self.notified(), [])

    def test_has_a_daemon_leave_that_obeys(self):
        daemon = self.start_daemon("obeys")
        self.assertEqual(self.succeed("stop-daemon"), f"the data-access daemon, process {daemon.pid}, has left\n")
        self.assertEqual(daemon.wait(timeout=100), 0)
        self.assertEqual(self.log(), [ASKED])
        self.assertEqual(self.notified(), ["com.vantor.Orvette.BackupAgent.WillStart"])

    def test_says_to_programs_that_a_daemon_has_left(self):
        daemon = self.start_daemon("obeys")
        self.assertEqual(self.answer("stop-daemon"), {"image": str(self.image), "outcome": "left",
                                                      "process": daemon.pid, "signalled": False, "running": None})
        self.assertEqual(daemon.wait(timeout=100), 0)

    def test_kills_a_daemon_that_ignores_the_notification(self):
        daemon = self.start_daemon("ignores")
        self.assertEqual(self.answer("stop-daemon"), {"image": str(self.image), "outcome": "killed",
                                                      "process": daemon.pid, "signalled": True, "running": None})
        self.assertEqual(daemon.wait(timeout=100), -signal.SIGKILL)
        self.assertEqual(self.log(), [ASKED, KILLED])

    def test_says_that_a_daemon_was_started_anew(self):
        daemon = self.start_daemon("restarts")
        ended = self.run_on_image("stop-daemon", "--json")
        answer = json.loads(ended.stdout)
        self.addCleanup(os.kill, answer["running"], signal.SIGKILL)
        self.assertEqual(ended.returncode, 10)
        self.assertEqual((answer["outcome"], answer["process"], answer["signalled"]), ("restarted", daemon.pid, False))
        self.assertNotEqual(answer["running"], daemon.pid)
        self.assertEqual(ended.stderr.decode(),
                         f"account-settings: the data-access daemon, process {daemon.pid}, is gone, but another one "
                         f"runs as process {answer['running']}; stop what starts it, and repeat the command\n")
        self.assertEqual(self.log(), [ASKED])

    @unittest.skipUnless(os.geteuid() == 0, "only root can give up the right to end others' processes alone")
    def test_says_that_a_daemon_still_runs(self):
        os.chmod(self.directory, 0o755)
        for folder in (self.image, self.image / "var", self.image / "var/log"):
            folder.chmod(0o755)
        daemon = self.start_daemon("ignores", user=65534)
        ended = run("--bounding-set=-kill", TOOL, "stop-daemon", "--image", self.image, "--json", tool="setpriv")
        self.assertEqual(ended.returncode, 10)
        self.assertEqual(json.loads(ended.stdout), {"image": str(self.image), "outcome": "still running",
                                                    "process": daemon.pid, "signalled": False, "running": daemon.pid})
        self.assertEqual(ended.stderr.decode(),
                         f"account-settings: the data-access daemon, process {daemon.pid}, still runs although it was "
                         f"asked to leave; cannot signal process {daemon.pid}: Operation not permitted; end it as its "
                         "own user or as root\n")
        self.assertIsNone(daemon.poll())
        self.assertEqual(self.log(), [ASKED, KILLED, GIVEN_UP])

    @unittest.skipUnless(os.geteuid() == 0, "only root can work as another user")
    def test_is_refused_when_the_user_may_not_see_whether_it_is_the_daemon(self):
        os.chmod(self.directory, 0o755)
        for path in (self.image, *self.image.rglob("*")):
            path.chmod(0o755)
        daemon = self.start_daemon("ignores")
        nobody = {"user": 65534, "group": 65534, "extra_groups": [], "cwd": "/"}
        ended = self.run_on_image("stop-daemon", **nobody)
        self.assertEqual((ended.returncode, ended.stdout), (7, b""))
        self.assertEqual(ended.stderr.decode(),
                         f"account-settings: process {daemon.pid} is named as the data-access daemon, but this user may "
                         "not see whether it runs from the image; nothing was done; repeat the command as that "
                         "process's user or as root\n")
        answer = json.loads(self.run_on_image("stop-daemon", "--json", **nobody).stdout)
        self.assertEqual((answer["outcome"], answer["process"], answer["running"]), ("unknown", None, None))
        self.assertIsNone(daemon.poll())

    def test_is_refused_when_the_daemon_could_not_be_asked(self):
        self.notifications.unlink()
        self.notifications.symlink_to("/dev/null")
        daemon = self.start_daemon("ignores")
        said = self.fail_with(7, "stop-daemon")
        self.assertIn(f"{self.notifications}: ", said)
        self.assertIn("nothing was done", said)
        self.assertIsNone(daemon.poll())
        self.assertEqual(self.log(), [])


if __name__ == "__main__":
    unittest.main()
