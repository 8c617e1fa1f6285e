"""The code in docs/bundles.md stands word for word in files that are built; build files stand there whole."""

import unittest

from documents import TREE, samples

BUILT = [*(TREE / "examples").glob("*/*.cpp"), *(TREE / "accountservices").glob("*.cpp")]


class QuotedSamples(unittest.TestCase):
    def test_cpp_samples_are_built(self):
        texts = [path.read_text(encoding="utf-8") for path in BUILT]
        found = samples("cpp")
        self.assertEqual(len(found), 2)
        for sample in found:
            with self.subTest(sample):
                self.assertTrue(any(sample in text for text in texts), "no built file has this")

    def test_the_build_file_is_the_notifiers(self):
        built = (TREE / "examples/notifier/CMakeLists.txt").read_text(encoding="utf-8")
        self.assertEqual(samples("cmake"), [built])


if __name__ == "__main__":
    unittest.main()
