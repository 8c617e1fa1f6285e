"""How long the commands of account-settings wait for locks with --wait. Time is what the tests say: a library,
in the environment as SCRIPTED_TIME, lets each pause of the command take a second and a half of its clock, and
tells of its timer instead of waiting for it."""

import contextlib
import fcntl
import os
import subprocess
import unittest

from legacy_test import LegacyTest
from settingstest import TOOL


class Command:
    """A command whose clock stands still while it pauses."""

    def __init__(self, *arguments):
        self._hears, command_tells = os.pipe()
        command_hears, self._tells = os.pipe()
        environment = {**os.environ, "LD_PRELOAD": os.environ["SCRIPTED_TIME"],
                       "ASAN_OPTIONS": "verify_asan_link_order=0",
                       "SCRIPTED_TIME_TELLS": str(command_tells), "SCRIPTED_TIME_HEARS": str(command_hears)}
        self._process = subprocess.Popen([TOOL, *map(str, arguments)], env=environment, stdout=subprocess.PIPE,
                                         stderr=subprocess.PIPE, pass_fds=(command_tells, command_hears))
        os.close(command_tells)
        os.close(command_hears)
        self._events = os.fdopen(self._hears)

    def event(self) -> str:
        """What the command does next that takes time; empty when it has ended."""
        return self._events.readline().rstrip("\n")

    def end_pause(self) -> None:
        os.write(self._tells, b"x")

    def pauses(self) -> int:
        """Lets it go on until it pauses no more; how often it has."""
        count = 0
        while self.event() == "pause":
            count += 1
            self.end_pause()
        return count

    def end(self) -> tuple:
        """The exit code, and what it said on standard error."""
        output, said = self._process.communicate(timeout=100)
        os.close(self._tells)
        self._events.close()
        return self._process.returncode, output, said.decode()


class OneDeadline(LegacyTest):
    def setUp(self):
        super().setUp()
        self.write_legacy_mail("L1")

    @contextlib.contextmanager
    def held(self, *paths):
        """The files, locked. Closing one frees its lock."""
        with contextlib.ExitStack() as stack:
            files = [stack.enter_context(open(path, "a")) for path in paths]
            for file in files:
                fcntl.flock(file, fcntl.LOCK_EX)
            yield files

    @property
    def image_lock(self):
        return self.image / "var/run/image.lock"

    def busy_image(self, seconds: str) -> tuple:
        return 11, b"", (f'account-settings: another run holds the device image "{self.image}"; wait until it has '
                         f"ended (waited {seconds} seconds; --wait gives another time)\n")

    def busy_settings(self, seconds: str) -> tuple:
        return 11, b"", (f"account-settings: {self.image}: another program migrates the settings; nothing was changed; "
                         f"wait until it has ended (waited {seconds} seconds; --wait gives another time)\n")

    def test_a_lock_that_is_held_to_the_end_takes_all_of_the_wait(self):
        for command in (["migrate-legacy"], ["set", "M1", "Key", "value"], ["delete", "M1"]):
            with self.subTest(command[0]), self.held(self.image_lock):
                before = self.state()
                waiting = Command(*command, "--image", self.image, "--wait", "10")
                self.assertEqual(waiting.pauses(), 7)  # of 1.5 seconds
                self.assertEqual(waiting.end(), self.busy_image("10"))
                self.assertEqual(self.state(), before)

    def test_without_a_wait_the_lock_is_asked_for_once(self):
        with self.held(self.image_lock):
            waiting = Command("migrate-legacy", "--image", self.image, "--wait", "0")
            self.assertEqual(waiting.pauses(), 0)
            self.assertEqual(waiting.end(), self.busy_image("0"))

    def test_the_second_lock_has_all_of_the_wait_when_the_first_is_free(self):
        with self.held(self.lock_file):
            waiting = Command("migrate-legacy", "--image", self.image, "--wait", "10")
            self.assertEqual(waiting.event(), "timer 10")
            self.assertEqual(waiting.end(), self.busy_settings("10"))

    def test_the_second_lock_has_what_the_first_has_left_of_the_wait(self):
        with self.held(self.image_lock, self.lock_file) as (first, _):
            waiting = Command("migrate-legacy", "--image", self.image, "--wait", "10")
            for pause in range(3):
                self.assertEqual(waiting.event(), "pause")
                if pause == 2:
                    first.close()
                waiting.end_pause()
            self.assertEqual(waiting.event(), "timer 5.5")
            self.assertEqual(waiting.end(), self.busy_settings("10"))
        self.assertEqual(self.copies(), [])

    def test_the_second_lock_is_tried_for_a_moment_when_the_first_has_used_up_the_wait(self):
        with self.held(self.image_lock, self.lock_file) as (first, _):
            waiting = Command("migrate-legacy", "--image", self.image, "--wait", "1")
            self.assertEqual(waiting.event(), "pause")
            first.close()
            waiting.end_pause()
            self.assertEqual(waiting.event(), "timer 0.1")
            self.assertEqual(waiting.end(), self.busy_settings("1"))


if __name__ == "__main__":
    unittest.main()
