"""A table that is hashed by texts is found: small trees with one line each."""

import tempfile
import unittest
from pathlib import Path

import hashed_texts


class HashedTexts(unittest.TestCase):
    def problems(self, file: str, line: str) -> tuple[list[str], int]:
        """What the check says of a tree with this one file, whose second line is `line`."""
        with tempfile.TemporaryDirectory() as folder:
            path = Path(folder) / file
            path.parent.mkdir(parents=True)
            path.write_text(f"#pragma once\n{line}\n", encoding="utf-8")
            found, count = hashed_texts.check(Path(folder))
            return [problem.removeprefix(f"{folder}/") for problem in found], count

    def test_tables_hashed_by_what_a_file_may_choose_are_found_with_their_place(self):
        for file, line in (
            ("propertylist/a.h", "std::unordered_map<std::string, Number> _texts;"),
            ("propertylist/a.cpp", "std::unordered_set<std::string_view> names;"),
            ("platform/posix/a.cpp", "std::unordered_multimap< std::string ,int> a;"),
            ("QuillnetAccountTypeRemoval/a.h", "std::unordered_map<std::string,\n  int> a;"),
            ("localdata/a.cpp", "const std::unordered_set<Row> rows(a.begin(), a.end());"),
            ("migrator/a.cpp", "std::vector<std::unordered_set<std::string>> a;"),
        ):
            with self.subTest(file=file, line=line):
                (problem,), _ = self.problems(file, line)
                self.assertTrue(problem.startswith(f"{file}:2: hashed by "), problem)

    def test_ordered_tables_and_tables_of_addresses_pass(self):
        for line in (
            "std::map<std::string, Number> _texts;",
            "std::set<std::string_view> names;",
            "std::unordered_map<const void*, Number> _byAddress;",
            "std::unordered_set<AccountPtr> replacing;",
        ):
            with self.subTest(line=line):
                self.assertEqual(self.problems("propertylist/a.h", line), ([], 1))

    def test_comments_and_fakes_for_tests_are_left_alone(self):
        self.assertEqual(
            self.problems("propertylist/a.h", "// no std::unordered_set<std::string>"), ([], 0)
        )
        self.assertEqual(
            self.problems("platform/testing/a.h", "std::unordered_set<std::string> a;"), ([], 0)
        )


if __name__ == "__main__":
    unittest.main()
