"""fuzz/run prints each target's line whole, even when two targets end at the same moment."""

import collections
import importlib.machinery
import importlib.util
import os
import subprocess
import sys
import threading
import unittest
from pathlib import Path

PROGRAM = Path(__file__).resolve().parents[2] / "fuzz/run"
TIMES = 20_000


def say_often():
    """Two threads, which print a line each at the same moment, again and again."""
    loader = importlib.machinery.SourceFileLoader("fuzz_run", os.fspath(PROGRAM))
    module = importlib.util.module_from_spec(importlib.util.spec_from_loader("fuzz_run", loader))
    loader.exec_module(module)
    barrier = threading.Barrier(2)

    def speak(name):
        for _ in range(TIMES):
            barrier.wait()
            module.say(name)

    threads = [threading.Thread(target=speak, args=(name,)) for name in ("one", "another")]
    for thread in threads:
        thread.start()
    for thread in threads:
        thread.join()


class FuzzLines(unittest.TestCase):
    def test_lines_of_two_targets_never_share_a_line(self):
        said = subprocess.run([sys.executable, "-B", __file__, "say"], stdout=subprocess.PIPE, text=True, check=True)
        self.assertEqual(collections.Counter(said.stdout.splitlines()), {"one": TIMES, "another": TIMES})


if __name__ == "__main__":
    if sys.argv[1:] == ["say"]:
        say_often()
    else:
        unittest.main()
