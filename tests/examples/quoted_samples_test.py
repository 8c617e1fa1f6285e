"""The code in docs/bundles.md stands word for word in files that are built."""

import unittest

from documents import TREE, samples

BUILT = [*(TREE / "examples").glob("*/*.cpp"), *(TREE / "examples").glob("*/CMakeLists.txt"),
         *(TREE / "accountservices").glob("*.cpp")]


class QuotedSamples(unittest.TestCase):
    def check(self, language: str, count: int):
        texts = [path.read_text(encoding="utf-8") for path in BUILT]
        found = samples(language)
        self.assertEqual(len(found), count)
        for sample in found:
            with self.subTest(sample):
                self.assertTrue(any(sample in text for text in texts), "no built file has this")

    def test_cpp_samples_are_built(self):
        self.check("cpp", 2)

    def test_cmake_samples_are_built(self):
        self.check("cmake", 1)


if __name__ == "__main__":
    unittest.main()
