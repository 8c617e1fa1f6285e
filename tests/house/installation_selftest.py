"""An installation that lacks something is found: cmake is played by scripts that install too little."""

import tempfile
import unittest
from pathlib import Path

import installation


class Installation(unittest.TestCase):
    def problems(self, script: str) -> list[str]:
        """What the check says when `script` runs in the place of cmake; $4 is the prefix."""
        with tempfile.TemporaryDirectory() as folder:
            cmake = Path(folder) / "cmake"
            cmake.write_text(f"#!/bin/sh\n{script}\n", encoding="utf-8")
            cmake.chmod(0o755)
            found, _ = installation.check(str(cmake), "build")
            return found

    def test_an_installation_that_fails_is_found(self):
        (problem,) = self.problems("echo disk full >&2; exit 1")
        self.assertEqual(problem, "cmake --install: 1: disk full\n")

    def test_what_is_not_installed_is_found(self):
        found = self.problems('mkdir -p "$4/lib" && : >"$4/lib/libaccount-retirement-platform.so"')
        self.assertNotIn("lib/libaccount-retirement-platform.so: not installed", found)
        self.assertIn("lib/libaccount-retirement-propertylist.so: not installed", found)
        self.assertIn("bin/migration-host: not installed", found)

    def test_a_link_of_a_document_to_one_that_is_not_installed_is_found(self):
        found = self.problems('mkdir -p "$4" && echo "[a](docs/a.md) [b](b.md)" >"$4/b.md"')
        self.assertIn("b.md: links to docs/a.md, which does not exist", found)
        self.assertNotIn("b.md: links to b.md, which does not exist", found)


if __name__ == "__main__":
    unittest.main()
