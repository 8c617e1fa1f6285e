"""library_paths.py notices a run path that leads to the current directory."""

import unittest

import library_paths

LINE = " 0x000000000000001d (RUNPATH)            Library runpath: [{}]\n"


class LibraryPaths(unittest.TestCase):
    def test_fixed_places_are_no_problem(self):
        self.assertEqual([], library_paths.problems_in(LINE.format("$ORIGIN:$ORIGIN/../lib:/usr/lib")))
        self.assertEqual([], library_paths.problems_in(" 0x1 (NEEDED)  Shared library: [libc.so.6]\n"))

    def test_empty_and_relative_entries_are(self):
        self.assertEqual(['the run path has the entry ""'] * 2, library_paths.problems_in(LINE.format("/usr/lib::")))
        self.assertEqual(['the run path has the entry "lib"'], library_paths.problems_in(LINE.format("$ORIGIN:lib")))
        self.assertEqual(['the run path has the entry "$ORIGINAL"'],
                         library_paths.problems_in(LINE.format("$ORIGINAL").replace("RUNPATH", "RPATH")))


if __name__ == "__main__":
    unittest.main()
