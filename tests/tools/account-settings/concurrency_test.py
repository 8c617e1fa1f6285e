"""Two programs that change one settings file, and one that is killed."""

import os
import plistlib
import signal
import subprocess
import time
import unittest

from settingstest import MAIL, SettingsTest, TOOL


class Concurrency(SettingsTest):
    def start(self, *arguments) -> subprocess.Popen:
        command, *rest = [str(word) for word in arguments]
        return subprocess.Popen([TOOL, command, "--image", str(self.image), *rest], stderr=subprocess.PIPE)

    def test_two_that_change_one_account_lose_nothing_of_each_other(self):
        for number in range(50):
            started = [
                self.start("set", "M1", f"{side}{number}", "x", "--wait", "60") for side in ("left", "right")
            ]
            for process in started:
                said = process.communicate(timeout=100)[1]
                self.assertEqual(process.returncode, 0, said)
        expected = {f"{side}{number}": "x" for side in ("left", "right") for number in range(50)}
        self.assertEqual(self.account("M1"), dict(MAIL, **expected))

    def test_one_that_is_killed_leaves_a_whole_file(self):
        accounts = [dict(MAIL, Identifier=f"A{number}", Text="x" * 2000) for number in range(300)]
        self.write({"Version": 12, "Accounts": accounts})
        started = time.monotonic()
        process = self.start("set", "A7", "Round", "first")
        process.communicate(timeout=100)
        self.assertEqual(process.returncode, 0)
        whole = time.monotonic() - started
        killed = 0
        for number in range(60):
            process = self.start("set", "A7", "Round", number)
            time.sleep(whole * number / 60)  # a different moment of its life each time
            process.send_signal(signal.SIGKILL)
            process.communicate(timeout=100)
            killed += process.returncode == -signal.SIGKILL
            settings = plistlib.loads(self.settings_file.read_bytes())
            self.assertEqual(len(settings["Accounts"]), 300)
            changed = settings["Accounts"][7].pop("Round")
            self.assertIn(changed, {"first", *(str(earlier) for earlier in range(number + 1))})
            self.assertEqual(settings["Accounts"], accounts)
        self.assertGreater(killed, 0)
        self.succeed("set", "A7", "Round", "last")  # the lock went with its holders
        self.assertEqual(self.account("A7")["Round"], "last")
        self.assertEqual(os.stat(self.settings_file).st_mode & 0o777, 0o600)


if __name__ == "__main__":
    unittest.main()
