"""A file that is left out of the build is found: small trees with a list of what is compiled."""

import json
import tempfile
import unittest
from pathlib import Path

import built_tests


class BuiltTests(unittest.TestCase):
    def problems(self, files: list[str], compiled: list[str]) -> list[str]:
        """What the check says of a tree with `files`, of which `compiled` are built."""
        with tempfile.TemporaryDirectory() as folder:
            tree = Path(folder)
            for file in files:
                (tree / file).parent.mkdir(parents=True, exist_ok=True)
                (tree / file).touch()
            entries = [{"directory": folder, "file": str(tree / file)} for file in compiled]
            (tree / "compile_commands.json").write_text(json.dumps(entries), encoding="utf-8")
            found, count = built_tests.check(tree, tree)
            self.assertEqual(count, len(files))
            return [problem.removeprefix(f"{folder}/") for problem in found]

    def test_a_tree_that_is_built_whole_passes(self):
        files = ["tests/host/run_test.cpp", "host/run.cpp"]
        self.assertEqual(self.problems(files, files), [])

    def test_a_test_that_nothing_builds_is_found(self):
        found = self.problems(["tests/host/run_test.cpp", "host/run.cpp"], ["host/run.cpp"])
        self.assertEqual(found, ["tests/host/run_test.cpp: no target builds it"])

    def test_a_source_that_nothing_builds_is_found(self):
        self.assertEqual(
            self.problems(["host/run.cpp"], []), ["host/run.cpp: no target builds it"]
        )


if __name__ == "__main__":
    unittest.main()
