"""A text that no test compares is found: small trees with one source and one test."""

import tempfile
import unittest
from pathlib import Path

import texts


class Texts(unittest.TestCase):
    def problems(self, source: str, test: str) -> list[str]:
        """What the check says of a tree with this source and this test."""
        with tempfile.TemporaryDirectory() as folder:
            tree = Path(folder)
            for name, content in (("localdata/a.cpp", source), ("tests/localdata/a.cpp", test)):
                (tree / name).parent.mkdir(parents=True)
                (tree / name).write_text(content, encoding="utf-8")
            found, _ = texts.check(tree)
            return [problem.removeprefix(f"{folder}/") for problem in found]

    def test_a_text_that_a_test_holds_passes(self):
        for source, test in (
            ('log("All went well");', 'EXPECT_EQ(line, "All went well");'),
            ('log("Could not "\n    "save %@", x);', 'EXPECT_EQ(line, "Could not save ada");'),
            ('log("[%s] no \\"x\\" here", x);', 'EXPECT_EQ(line, "[f] no \\"x\\" here");'),
            ('log("Merging %@ into %@", a, b);', 'EXPECT_EQ(l, "Merging " + a + " into local");'),
        ):
            with self.subTest(source=source):
                self.assertEqual(self.problems(source, test), [])

    def test_a_text_that_no_test_holds_is_found(self):
        for source, text, test in (
            ('log("All went well");', "All went well", 'EXPECT_EQ(line, "All went wel");'),
            ('log("All went well");', "All went well", '// "All went well"'),
            ('log("Save of %@ failed");', "Save of %@ failed", 'EXPECT_EQ(line, "Save of x");'),
        ):
            with self.subTest(source=source):
                found = self.problems(source, test)
                self.assertEqual(found, [f'localdata/a.cpp: no test compares "{text}"'])

    def test_names_and_paths_are_not_meant(self):
        source = 'f("Identifier"); g("/var/mobile/Library/%@ x"); s.ignore("it does not matter");'
        self.assertEqual(self.problems(source, ""), [])


if __name__ == "__main__":
    unittest.main()
