"""A document that points at nothing is found: small trees with one document each."""

import tempfile
import unittest
from pathlib import Path

import documentation


class Documentation(unittest.TestCase):
    def problems(self, text: str) -> list[str]:
        """What the check says of a tree with a script `check`, a tool and this README."""
        with tempfile.TemporaryDirectory() as folder:
            tree = Path(folder)
            self._script(tree / "check", "  --all  more\n")
            (tree / "programs").mkdir()
            self._script(tree / "programs" / "device-image", "  create  makes one\n  --json  so\n")
            (tree / "host").mkdir()
            (tree / "host" / "Run.h").touch()
            (tree / "README.md").write_text(text, encoding="utf-8")
            found, _ = documentation.check(tree, tree / "programs")
            return [problem.removeprefix(f"{folder}/") for problem in found]

    def _script(self, path: Path, help_text: str) -> None:
        path.write_text(f"#!/bin/sh\ncat <<'end'\n{help_text}end\n", encoding="utf-8")
        path.chmod(0o755)

    def test_references_to_what_exists_pass(self):
        text = """# First steps
See [the run](host/Run.h), [here](#first-steps), `host/Run.h` and [them](https://example.org).

    ./check --all    # everything

```
device-image create DIR --json
```
"""
        self.assertEqual(self.problems(text), [])

    def test_each_reference_to_nothing_is_found(self):
        for text, problem in (
            ("[a](host/Ran.h)", "links to host/Ran.h, which does not exist"),
            ("[a](#elsewhere)", "links to #elsewhere, but there is no such heading"),
            ("`host/Ran.h`", "names host/Ran.h, which does not exist"),
            ("`./demo`", "shows demo, which does not exist"),
            ("`migration-host run`", "shows migration-host, which does not exist"),
            ("    ./check --most", "shows --most of check, which its --help does not know"),
            ("`device-image make`", "shows device-image make, which its --help does not know"),
            (
                "    $ device-image create --jsn",
                "shows --jsn of device-image, which its --help does not know",
            ),
        ):
            with self.subTest(text=text):
                self.assertEqual(self.problems(text), [f"README.md:1: {problem}"])


if __name__ == "__main__":
    unittest.main()
